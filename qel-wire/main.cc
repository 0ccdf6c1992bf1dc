// qel-wire: a capture of the protocol, as people read it.

#include <getopt.h>
#include <google/protobuf/message.h>
#include <google/protobuf/stubs/common.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iomanip>
#include <iostream>
#include <memory>
#include <new>
#include <optional>
#include <string>
#include <vector>

#include "decode.h"
#include "explain.h"
#include "forms.h"
#include "guess.h"
#include "schema.h"
#include "text.h"
#include "token.h"
#include "walk.h"

namespace {

using google::protobuf::Descriptor;
using qel_wire::Notation;

// What the program exits with.
constexpr int kDone = 0;
constexpr int kBroken = 1;
constexpr int kWrongCall = 2;
constexpr int kNoAccess = 3;

constexpr char kUsage[] = R"(usage: qel-wire COMMAND [OPTION...] [ARGUMENT...]

  decode MESSAGE [FILE]     the fields, in the text form of Protocol Buffers or as JSON
  encode MESSAGE [FILE]     the bytes of a message that is given in the text form
  explain MESSAGE [FILE]    each field with its offset and its bytes, and what is wrong with them
  guess [FILE]              which messages the bytes fit best
  schema [NAME]             the names of all messages and enumerations, or the definition of one

FILE is standard input if it is left out or '-'. What is in it are the bytes themselves, unless

  --hex[=BYTES]             it is hex, or these are, instead of a file
  --base64[=BYTES]          the same in base64

which for encode say how the bytes are written.

  --json                    decode: as JSON
  --all                     explain: all bytes of long fields; guess: all messages
  --show-token              decode, explain: what is hidden because it may be the access token
  --color=WHEN              always, never, or auto: on a terminal, unless NO_COLOR is set
  --help, --version

Exits with 0, with 1 if the bytes or the text are broken (guess: if no message takes them), with 2 if
it was called wrongly, and with 3 if a file cannot be read, the output not be written, or memory runs
out.
)";

// Ends the program with that status.
struct Failure {
  int status;
  std::string reason;
};

struct Call {
  std::string command;
  std::vector<std::string> arguments;
  Notation notation = Notation::kRaw;
  std::optional<std::string> written;  // the bytes, in the call itself
  std::string colour = "auto";
  std::vector<int> options;  // all that were given

  bool has(int option) const { return std::count(options.begin(), options.end(), option) > 0; }
};

enum Option { kHex = 256, kBase64, kJson, kAll, kShowToken, kColor, kHelp, kVersion };

constexpr option kOptions[] = {
    {"hex", optional_argument, nullptr, kHex},
    {"base64", optional_argument, nullptr, kBase64},
    {"json", no_argument, nullptr, kJson},
    {"all", no_argument, nullptr, kAll},
    {"show-token", no_argument, nullptr, kShowToken},
    {"color", required_argument, nullptr, kColor},
    {"help", no_argument, nullptr, kHelp},
    {"version", no_argument, nullptr, kVersion},
    {nullptr, 0, nullptr, 0},
};

// An argument that a complaint names, but for bytes in the wrong place: these may hold a token.
std::string named(const std::string& argument) {
  const bool is_hex =
      argument.find_first_not_of("0123456789abcdefABCDEF :,x\\") == std::string::npos;
  return is_hex && argument.size() >= 8 ? qel_wire::kNotShown : "'" + argument + "'";
}

void take_option(int option, const char* value, Call* call) {
  call->options.push_back(option);
  switch (option) {
    case kHex:
    case kBase64:
      call->notation = option == kHex ? Notation::kHex : Notation::kBase64;
      call->written = value == nullptr ? std::nullopt : std::optional<std::string>(value);
      break;
    case kColor:
      call->colour = value;
      if (call->colour != "always" && call->colour != "never" && call->colour != "auto") {
        throw Failure{kWrongCall, "--color is always, never or auto, not '" + call->colour + "'"};
      }
      break;
    case kHelp:
      call->command = "help";
      break;
    case kVersion:
      call->command = "version";
      break;
    default:  // a flag
      break;
  }
}

Call read_call(int argc, char** argv) {
  Call call;
  opterr = 0;  // the complaint is ours
  for (int option; (option = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
    if (option == '?') {
      const std::string name = argv[optind - 1];
      throw Failure{kWrongCall, "there is no option '" + name.substr(0, name.find('=')) +
                                    "', or it takes another value ('qel-wire --help')"};
    }
    take_option(option, optarg, &call);
  }
  call.arguments.assign(argv + optind, argv + argc);
  if (call.command.empty() && !call.arguments.empty()) {
    call.command = call.arguments.front();
    call.arguments.erase(call.arguments.begin());
  }
  return call;
}

std::string read_file(const std::string& name) {
  const bool is_standard_input = name == "-";
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
      is_standard_input ? stdin : std::fopen(name.c_str(), "rb"), std::fclose);
  std::string content;
  char block[65536];
  size_t size = 0;
  while (file != nullptr && content.size() <= qel_wire::kMostBytes &&
         (size = std::fread(block, 1, sizeof block, file.get())) > 0) {
    content.append(block, size);
  }
  if (file == nullptr || std::ferror(file.get()) != 0) {
    throw Failure{kNoAccess, "cannot read " + (is_standard_input ? "standard input" : named(name)) +
                                 ": " + std::strerror(errno)};
  }
  if (content.size() > qel_wire::kMostBytes) {
    throw Failure{kBroken, "the input has more than 64 MiB"};
  }
  return content;
}

// The last argument, where there is one more than the command needs.
std::string read_source(const Call& call, size_t needed) {
  return read_file(call.arguments.size() > needed ? call.arguments[needed] : "-");
}

std::string read_bytes(const Call& call, size_t needed) {
  const bool is_given = call.written.has_value();
  if (!is_given && call.notation != Notation::kRaw && call.arguments.size() > needed &&
      call.arguments[needed] != "-" && access(call.arguments[needed].c_str(), F_OK) != 0) {
    // The bytes, if that is what they are, may hold a token.
    throw Failure{kNoAccess,
                  "there is no such file; bytes in the call itself are written --hex=BYTES, "
                  "--base64=BYTES"};
  }
  const std::string source = is_given ? *call.written : read_source(call, needed);
  const std::optional<std::string> bytes = qel_wire::from_notation(source, call.notation);
  if (!bytes.has_value()) {
    throw Failure{kBroken, std::string("the input is no ") +
                               (call.notation == Notation::kHex ? "hex" : "base64")};
  }
  return *bytes;
}

const Descriptor& message_of(const Call& call) {
  const Descriptor* type = qel_wire::message_named(call.arguments[0]);
  if (type == nullptr) {
    throw Failure{kWrongCall, "there is no message " + named(call.arguments[0]) +
                                  "; 'qel-wire schema' lists them"};
  }
  return *type;
}

bool is_coloured(const Call& call) {
  if (call.colour != "auto") {
    return call.colour == "always";
  }
  const char* no_colour = std::getenv("NO_COLOR");
  return isatty(STDOUT_FILENO) == 1 && (no_colour == nullptr || *no_colour == '\0');
}

int decode(const Call& call) {
  const Descriptor& type = message_of(call);
  qel_wire::DecodeOptions options;
  options.colours = qel_wire::Colours(is_coloured(call));
  options.as_json = call.has(kJson);
  options.show_token = call.has(kShowToken);
  const qel_wire::Decoded decoded = qel_wire::decode(read_bytes(call, 1), type, options);
  if (const auto& problem = decoded.problem) {
    throw Failure{kBroken, "broken at offset " + std::to_string(problem->offset) + ": " +
                               problem->reason + " ('qel-wire explain' shows what comes before)"};
  }
  std::cout << decoded.text;
  for (const std::string& note : decoded.notes) {
    std::cerr << "qel-wire: " << note << '\n';
  }
  return kDone;
}

int encode(const Call& call) {
  const auto message = qel_wire::new_message(message_of(call));
  if (call.written.has_value()) {
    throw Failure{kWrongCall, "encode takes a text: --hex and --base64 have no bytes there"};
  }
  if (const auto complaint = qel_wire::parse_text(read_source(call, 1), message.get())) {
    throw Failure{kBroken, "the text is no " + call.arguments[0] + ": " + *complaint};
  }
  if (qel_wire::lacks_hidden_text(*message)) {
    throw Failure{kBroken, "the text has " + std::string(qel_wire::kNotShown) +
                               " for what was hidden: decode the bytes with --show-token"};
  }
  std::cout << qel_wire::to_notation(message->SerializeAsString(), call.notation);
  if (call.notation != Notation::kRaw) {
    std::cout << '\n';
  }
  return kDone;
}

int explain(const Call& call) {
  const Descriptor& type = message_of(call);
  qel_wire::ExplainOptions options;
  options.colours = qel_wire::Colours(is_coloured(call));
  options.show_token = call.has(kShowToken);
  options.show_all = call.has(kAll);
  return qel_wire::explain(read_bytes(call, 1), type, options, &std::cout) ? kDone : kBroken;
}

void print_fit(const qel_wire::Fit& fit, const qel_wire::Colours& colours) {
  std::cout << std::setw(4) << fit.rank << "  " << colours.name << std::left << std::setw(30)
            << fit.type->name() << colours.end << std::right << ' ' << std::setw(4) << fit.known
            << " known " << std::setw(3) << fit.absent << " absent " << std::setw(3) << fit.unknown
            << " unknown " << std::setw(3) << fit.doubtful << " doubtful"
            << (fit.is_broken ? "  " + colours.wrong + "broken" + colours.end : "") << '\n';
}

int guess(const Call& call) {
  constexpr int kMostRanks = 10;
  const qel_wire::Colours colours(is_coloured(call));
  const std::vector<qel_wire::Fit> fits = qel_wire::guess(read_bytes(call, 0));
  for (const qel_wire::Fit& fit : fits) {
    if (call.has(kAll) || fit.rank <= kMostRanks) {
      print_fit(fit, colours);
    }
  }
  return fits.front().is_broken ? kBroken : kDone;
}

int schema(const Call& call) {
  if (call.arguments.empty()) {
    std::cout << qel_wire::schema_names();
    return kDone;
  }
  const std::string definition =
      qel_wire::schema_of(call.arguments[0], qel_wire::Colours(is_coloured(call)));
  if (definition.empty()) {
    throw Failure{kWrongCall, "there is no message and no enumeration " + named(call.arguments[0]) +
                                  "; 'qel-wire schema' lists them"};
  }
  std::cout << definition;
  return kDone;
}

// Of those that not every command takes.
using Options = std::vector<int>;

struct Command {
  const char* name;
  size_t needed;   // arguments
  size_t allowed;  // at most
  Options options;
  int (*run)(const Call& call);
};

const std::vector<Command>& commands() {
  static const std::vector<Command> all = {
      {"decode", 1, 2, {kHex, kBase64, kJson, kShowToken}, decode},
      {"encode", 1, 2, {kHex, kBase64}, encode},
      {"explain", 1, 2, {kHex, kBase64, kAll, kShowToken}, explain},
      {"guess", 0, 1, {kHex, kBase64, kAll}, guess},
      {"schema", 0, 1, {}, schema},
  };
  return all;
}

void check_call(const Call& call, const Command& command) {
  for (const int option : call.options) {
    if (option != kColor &&
        std::count(command.options.begin(), command.options.end(), option) == 0) {
      throw Failure{kWrongCall, call.command + " has no option --" + kOptions[option - kHex].name};
    }
  }
  const size_t most = call.written.has_value() ? command.needed : command.allowed;
  if (call.arguments.size() < command.needed || call.arguments.size() > most) {
    throw Failure{kWrongCall, call.command + " takes other arguments ('qel-wire --help')"};
  }
}

int run(const Call& call) {
  if (call.command == "help" || call.command == "version") {
    std::cout << (call.command == "help" ? kUsage : "qel-wire " QEL_WIRE_VERSION "\n");
    return kDone;
  }
  for (const Command& command : commands()) {
    if (call.command == command.name) {
      check_call(call, command);
      return command.run(call);
    }
  }
  throw Failure{kWrongCall, call.command.empty() ? "a command is missing ('qel-wire --help')"
                                                 : "there is no command " + named(call.command) +
                                                       " ('qel-wire --help')"};
}

}  // namespace

int main(int argc, char** argv) {
  google::protobuf::SetLogHandler(nullptr);  // the runtime's complaints: they are in our own words
  int status = kDone;
  try {
    status = run(read_call(argc, argv));
  } catch (const Failure& failure) {
    std::cerr << "qel-wire: " << qel_wire::readable(failure.reason) << '\n';
    status = failure.status;
  } catch (const std::bad_alloc&) {
    std::cerr << "qel-wire: there is not enough memory\n";
    status = kNoAccess;
  }
  if (!std::cout.flush()) {
    std::cerr << "qel-wire: the output cannot be written\n";
    return kNoAccess;
  }
  return status;
}
