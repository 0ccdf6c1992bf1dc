#include "cli.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>

#include "framing.h"
#include "manual.h"
#include "schema.h"

namespace qel_wire {
namespace {

constexpr char kFooter[] = R"(
A CONDITION is PATH=VALUE, as result.code=0, with = != < <= > >= or ~ (has that text); PATH if the
field is there; !PATH if it is not.

Exits with 0; with 1 if the bytes or the text are broken (guess: if no message takes them, diff: if
they differ); with 2 if it was called wrongly; with 3 if a file cannot be read, the output not be
written, or memory runs out.
)";

// What --hex and --base64 have as their values if they were given none.
constexpr char kNoValue[] = "-";

class Formatter : public CLI::Formatter {
 public:
  Formatter() { column_width(34); }

  // As --hex[=BYTES] and --color=WHEN.
  std::string make_option_opts(const CLI::Option* option) const override {
    const std::string value = option->get_type_name();
    return option->get_positional() || value.empty() || value[0] == '[' ? value : "=" + value;
  }
};

std::vector<std::string> parts_of(const std::string& choices) {
  return CLI::detail::split(choices, '|');
}

// The options of one command.
class Options {
 public:
  Options(CLI::App* command, Call* call) : command_(*command), call_(*call) {}

  Options& message(const char* description = "its name, or 'auto' for the best guess") {
    command_.add_option("MESSAGE", call_.message, description)->type_name("")->required();
    return *this;
  }

  Options& files(const char* description, int least = 0,
                 int most = CLI::detail::expected_max_vector_size) {
    command_.add_option("FILE", call_.files, description)
        ->type_name("")
        ->expected(least, most)
        ->required(least > 0);
    return *this;
  }

  Options& notation(const std::string& what, const char* type = "") {
    auto* hex = command_.add_flag("--hex", call_.hex, what + "hex, as dumps and programs have it");
    auto* base64 = command_.add_flag("--base64", call_.base64, what + "base64");
    for (CLI::Option* option : {hex, base64}) {
      option->type_name(type)->multi_option_policy(CLI::MultiOptionPolicy::Throw);
    }
    hex->excludes(base64);
    return *this;
  }

  Options& flag(const char* name, bool* value, const char* description) {
    command_.add_flag(name, *value, description)->disable_flag_override();
    return *this;
  }

  // The choices are parted by '|', as help shows them. An argument has to be given, an option not.
  Options& choice(const char* name, std::string* value, const std::string& choices,
                  const char* description) {
    command_.add_option(name, *value, description)
        ->type_name(choices)
        ->required(name[0] != '-')
        ->check([choices](const std::string& chosen) -> std::string {
          const auto all = parts_of(choices);
          return std::count(all.begin(), all.end(), chosen) > 0 ? "" : "not one of " + choices;
        });
    return *this;
  }

  // What commands that take bytes have in common.
  Options& input() {
    return files(
               "bytes, packets as pcap or pcapng, or a session file; standard input if there is "
               "none, or for '-'")
        .notation("the bytes, or a file's, are ", "[=BYTES]")
        .choice("--frames", &call_.frames, kFramings,
                "many messages: what tells where each of them ends");
  }

  Options& name(const char* option, const char* type, const char* description) {
    command_.add_option(option, call_.message, description)->type_name(type);
    return *this;
  }

  Options& number() {
    command_.add_option("--number", call_.number, "only the message with this number")
        ->type_name("N")
        ->check([](const std::string& number) -> std::string {
          const bool is_one = number.find_first_not_of("0123456789") == std::string::npos;
          return is_one && number.find_first_not_of('0') != std::string::npos
                     ? ""
                     : "not a number from 1 on";
        });
    return *this;
  }

  Options& messages() {
    command_.add_option("--message", call_.messages, "only such messages; may be repeated")
        ->type_name("MESSAGE")
        ->allow_extra_args(false);
    return *this;
  }

  Options& where() {
    command_.add_option("--where", call_.where, "only messages with such a field; may be repeated")
        ->type_name("CONDITION")
        ->allow_extra_args(false);
    return *this;
  }

  Options& output() {
    return choice("--bytes", &call_.bytes, "hex", "how to write what is no text")
        .flag("--show-token", &call_.show_token, "show what may be the access token");
  }

 private:
  CLI::App& command_;
  Call& call_;
};

std::unique_ptr<CLI::App> make_table(Call* call) {
  auto app = std::make_unique<CLI::App>(
      "Shows and makes the messages of a chat client's wire protocol", "qel-wire");
  app->formatter(std::make_shared<Formatter>());
  app->set_help_flag("-h,--help", "what the program, or a command of it, does");
  app->set_version_flag("--version", "qel-wire " QEL_WIRE_VERSION, "which version it is");
  app->footer(kFooter);
  app->allow_extras()->fallthrough();
  app->require_subcommand(0, 1);  // words behind it are files, even if they are called like one
  Options(app.get(), call)
      .choice("--color", &call->colour, "always|never|auto",
              "on a terminal, unless NO_COLOR is set or TERM is dumb");
  const auto command = [&](const char* name, const char* description) {
    return Options(app->add_subcommand(name, description)->ignore_case()->allow_extras(), call);
  };
  command("decode", "the fields, in the text form of Protocol Buffers or as JSON")
      .message()
      .input()
      .number()
      .where()
      .flag("--json", &call->json, "as JSON")
      .flag("--partial", &call->partial, "of broken bytes, what comes before the place")
      .output();
  command("encode", "the bytes of a message that is given in the text form or as JSON")
      .message("its name")
      .files("the text; standard input if there is none, or for '-'", 0, 1)
      .notation("write ")
      .choice("--bytes", &call->bytes, "hex", "how JSON has what is no text");
  command("explain", "each field with its offset and its bytes, and what is wrong with them")
      .message()
      .input()
      .number()
      .where()
      .flag("--json", &call->json, "an object in a line for each row")
      .flag("--all", &call->all, "all bytes of long fields")
      .output();
  command("guess", "which messages the bytes fit best")
      .input()
      .number()
      .flag("--sent", &call->sent, "not those that a plug-in receives")
      .flag("--received", &call->received, "not those that it sends")
      .flag("--all", &call->all, "all messages");
  const auto exclude = [&](const char* command, const char* one, const char* other) {
    app->get_subcommand(command)->get_option(one)->excludes(other);
  };
  exclude("guess", "--sent", "--received");
  exclude("explain", "--all", "--json");      // which has all bytes anyway
  exclude("decode", "--partial", "--where");  // which leaves broken messages out
  command("session", "messages in order, how their calls ended, and which of them answers which")
      .input()
      .messages()
      .where()
      .flag("--json", &call->json, "an object in a line for each message")
      .flag("--follow", &call->follow, "of a session file, what comes, too, until Ctrl-C")
      .flag("--show-token", &call->show_token, "let --where see what may be the access token");
  command("export", "messages as pcapng, for Wireshark's own dissector")
      .input()
      .messages()
      .where()
      .flag("--ports", &call->ports, "print which port stands for which message there");
  command("diff", "in which fields the messages of two files differ")
      .files("the two files, of one message each", 2, 2)
      .notation("the files are ")
      .name("--message", "MESSAGE", "their name, instead of the best guesses")
      .flag("--show-token", &call->show_token, "show what may be the access token");
  command("schema", "the names of messages and enumerations, or the definition of one")
      .name("NAME", "", "the message or the enumeration");
  command("completion", "what a shell needs to complete commands, options and names")
      .choice("SHELL", &call->message, "bash|zsh|fish", "bash, zsh or fish");
  command("man", "its man page, for man -l");
  return app;
}

std::vector<std::string> option_names_of(const CLI::App& command) {
  std::vector<std::string> names;
  for (const CLI::Option* option : command.get_options()) {
    for (const std::string& name : option->get_lnames()) {
      names.push_back("--" + name);
    }
  }
  return names;
}

[[noreturn]] void refuse(const std::string& reason, const std::string& command) {
  throw Failure{kWrongCall,
                reason + " ('qel-wire " + (command.empty() ? "" : command + " ") + "--help')"};
}

[[noreturn]] void refuse_command(const CLI::App& app, const std::string& word) {
  std::vector<std::string> names;
  for (const CLI::App* command : app.get_subcommands(nullptr)) {  // all of them
    names.push_back(command->get_name());
  }
  refuse("there is no command " + named(word) + did_you_mean(word, names), "");
}

// Refuses words that are neither an option nor an argument of the command.
void refuse_rest(const CLI::App& app, const CLI::App& command) {
  std::vector<std::string> rest = command.remaining();
  for (const std::string& argument : app.remaining()) {
    rest.push_back(argument);
  }
  for (const std::string& argument : rest) {
    if (argument[0] != '-') {
      refuse(command.get_name() + " takes no argument " + named(argument), command.get_name());
    }
    const std::string name = argument.substr(0, argument.find('='));
    refuse(command.get_name() + " has no option " + named(name) +
               did_you_mean(name, option_names_of(command)),
           command.get_name());
  }
}

void check_command(const CLI::App& app) {
  if (!app.get_subcommands().empty()) {
    refuse_rest(app, *app.get_subcommands().front());
    return;
  }
  const std::vector<std::string> rest = app.remaining();
  const auto word = std::find_if(rest.begin(), rest.end(),
                                 [](const std::string& argument) { return argument[0] != '-'; });
  if (word != rest.end()) {
    refuse_command(app, *word);
  }
  if (!rest.empty()) {
    const std::string name = rest.front().substr(0, rest.front().find('='));
    refuse("there is no option " + named(name) + did_you_mean(name, option_names_of(app)), "");
  }
  refuse("a command is missing", "");
}

bool is_command(CLI::App* app, const std::string& word) {
  return !app->get_subcommands([&](CLI::App* each) { return each->check_name(word); }).empty();
}

// Words behind "--" are files: written "./-x", the library takes them for no options.
void name_files(std::vector<std::string>* arguments) {
  const auto mark = std::find(arguments->begin(), arguments->end(), "--");
  if (mark == arguments->end()) {
    return;
  }
  for (auto file = arguments->erase(mark); file != arguments->end(); ++file) {
    if (file->size() > 1 && file->front() == '-') {
      file->insert(0, "./");
    }
  }
}

void parse(CLI::App* app, std::vector<std::string> arguments) {
  name_files(&arguments);
  // Options may stand before the command that they belong to.
  const auto command = std::find_if(arguments.begin(), arguments.end(),
                                    [&](const auto& word) { return is_command(app, word); });
  if (command != arguments.end()) {
    std::rotate(arguments.begin(), command, command + 1);
  }
  for (const std::string name : {"--hex", "--base64", "--where"}) {
    if (name != "--where") {
      std::replace(arguments.begin(), arguments.end(), name, name + "=" + kNoValue);
    }
    // Nothing behind the sign is an empty value, rather than none.
    std::replace(arguments.begin(), arguments.end(), name + "=", name + "= ");
  }
  std::reverse(arguments.begin(), arguments.end());  // as the library takes them
  app->parse(arguments);
}

}  // namespace

Notation Call::notation() const {
  return !hex.empty() ? Notation::kHex : !base64.empty() ? Notation::kBase64 : Notation::kRaw;
}

bool Call::has_bytes() const {
  return notation() != Notation::kRaw && hex != kNoValue && base64 != kNoValue;
}

Call read_call(int argc, char** argv) {
  Call call;
  const auto app = make_table(&call);
  std::vector<std::string> arguments(argv + 1, argv + argc);
  if (!arguments.empty() && arguments.front() == "help") {
    std::rotate(arguments.begin(), arguments.begin() + 1, arguments.end());
    arguments.back() = "--help";
    if (arguments.size() > 1 && !is_command(app.get(), arguments.front())) {
      refuse_command(*app, arguments.front());
    }
  }
  const auto chosen = [&] {
    const auto commands = app->get_subcommands();
    return commands.empty() ? std::string() : commands.front()->get_name();
  };
  try {
    parse(app.get(), arguments);
    check_command(*app);
  } catch (const CLI::CallForHelp&) {
    call.answer = app->help();
    return call;
  } catch (const CLI::CallForVersion& version) {
    call.answer = std::string(version.what()) + "\n";
    return call;
  } catch (const CLI::ArgumentMismatch& error) {
    const std::string what = error.what();
    const auto says = [&](const char* words) { return what.find(words) != std::string::npos; };
    const std::string name = what.substr(0, what.find(':'));
    refuse(says("flag override") ? "--" + what.substr(0, what.find(' ')) + " takes no value"
           : says("At Most")     ? name + " is given too often"
           : says("At least")    ? name + " is not given often enough"
                                 : name + " needs a value",
           chosen());
  } catch (const CLI::ParseError& error) {
    refuse(error.what(), chosen());
  }
  call.command = chosen();
  if (call.command == "completion") {
    call.answer = completion(*app, call.message);
  } else if (call.command == "man") {
    call.answer = man_page(*app);
  }
  return call;
}

}  // namespace qel_wire
