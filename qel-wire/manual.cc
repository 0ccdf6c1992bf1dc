#include "manual.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <numeric>
#include <set>
#include <sstream>
#include <vector>

#include "schema.h"

namespace qel_wire {
namespace {

std::string joined(const std::vector<std::string>& words) {
  return CLI::detail::join(words, " ");
}

std::vector<const CLI::App*> commands_of(const CLI::App& app) {
  return app.get_subcommands(nullptr);  // all of them
}

// But for arguments.
std::vector<const CLI::Option*> options_of(const CLI::App& command) {
  return command.get_options([](const CLI::Option* option) { return !option->get_positional(); });
}

bool has_value(const CLI::Option& option) {
  return option.get_items_expected_max() > 0;
}

// What the value of the option may be, if that is known.
std::string values_of(const CLI::Option& option) {
  std::string values = option.get_type_name();
  if (values == "MESSAGE") {
    return joined(message_names());
  }
  // What stands for a value is in capitals.
  const bool is_known = !values.empty() && std::islower(static_cast<unsigned char>(values[0])) != 0;
  std::replace(values.begin(), values.end(), '|', ' ');
  return is_known ? values : "";
}

// The words that may be the command's first argument; if there are none, that is a file.
std::vector<std::string> words_of(const CLI::App& command) {
  if (command.get_option_no_throw("MESSAGE") != nullptr) {
    std::vector<std::string> words = message_names();
    if (command.get_name() != "encode") {  // which cannot guess
      words.insert(words.begin(), "auto");
    }
    return words;
  }
  if (command.get_option_no_throw("NAME") != nullptr) {
    return all_names();
  }
  const CLI::Option* shell = command.get_option_no_throw("SHELL");
  return shell != nullptr ? CLI::detail::split(shell->get_type_name(), '|')
                          : std::vector<std::string>();
}

// ---- The man page

// With dashes as they are typed.
std::string in_roff(const std::string& text) {
  std::string result;
  for (const char c : text) {
    result += c == '-' ? "\\-" : c == '\\' ? "\\e" : c == '\'' ? "\\(aq" : std::string(1, c);
  }
  return result;
}

std::string options_in_roff(const CLI::App& command) {
  std::string text;
  for (const CLI::Option* option : command.get_options()) {
    if (option == command.get_help_ptr() && command.get_parent() != nullptr) {
      continue;  // which all commands have
    }
    std::string name = option->get_name(false, !option->get_positional());
    if (!option->get_positional()) {
      name += (has_value(*option) ? "=" : "") + option->get_type_name();
    }
    text += ".TP\n.B ";
    text += in_roff(name) + "\n" + in_roff(option->get_description()) + "\n";
  }
  return text;
}

std::string arguments_of(const CLI::App& command) {
  std::string text;
  for (const CLI::Option* option :
       command.get_options([](const CLI::Option* each) { return each->get_positional(); })) {
    const bool is_many = option->get_items_expected_max() > 1;
    const std::string name = option->get_name() + (is_many ? "..." : "");
    text += option->get_required() ? " " + name : " [" + name + "]";
  }
  return text;
}

// ---- Completion

std::string options_in_bash(const CLI::App& command) {
  std::string words;
  for (const CLI::Option* option : options_of(command)) {
    words += " --" + option->get_lnames().front() + (has_value(*option) ? "=" : "");
  }
  return words;
}

std::string bash(const CLI::App& app) {
  std::ostringstream names;
  std::ostringstream cases;
  std::set<std::string> with_value;
  std::set<std::string> values;
  const auto add_values = [&](const CLI::App& command) {
    for (const CLI::Option* option : options_of(command)) {
      if (has_value(*option)) {
        with_value.insert("--" + option->get_lnames().front());
        values.insert("      --" + option->get_lnames().front() + ") choices='" +
                      values_of(*option) + "' ;;\n");
      }
    }
  };
  add_values(app);
  for (const CLI::App* command : commands_of(app)) {
    names << command->get_name() << ' ';
    cases << "    " << command->get_name() << ") options='" << options_in_bash(*command)
          << "' words='" << joined(words_of(*command)) << "' ;;\n";
    add_values(*command);
  }
  return R"(# Bash completion of qel-wire, made from its table of commands.
_qel_wire() {
  local word=${COMP_WORDS[COMP_CWORD]} before=() option='' options='' words='' choices='' i
  local with_value=' )" +
         joined({with_value.begin(), with_value.end()}) +
         R"( '
  # An option's value comes as "=" and a word, or as a word alone.
  for ((i = 1; i < COMP_CWORD; ++i)); do
    case ${COMP_WORDS[i]} in
      -*) option=${COMP_WORDS[i]} ;;
      =) ((i + 1 == COMP_CWORD)) || { ((++i)) && option=''; } ;;
      *) [[ $with_value == *" $option "* ]] || before+=("${COMP_WORDS[i]}"); option='' ;;
    esac
  done
  case ${before[0]-} in
)" + cases.str() +
         R"(    *) words=')" + names.str() + R"(' ;;
  esac
  [[ $word != = ]] || word=''
  COMPREPLY=()
  if [[ $with_value == *" $option "* || ${COMP_WORDS[COMP_CWORD]} == = || ${COMP_WORDS[COMP_CWORD - 1]} == = ]]; then
    case $option in
)" + std::accumulate(values.begin(), values.end(), std::string()) +
         R"(    esac
  elif [[ $word == -* ]]; then
    choices="$options)" +
         options_in_bash(app) + R"("
  elif ((${#before[@]} < 2)) && [[ -n $words ]]; then
    choices=$words
  else
    compopt -o default 2>/dev/null # files
    return
  fi
  mapfile -t COMPREPLY < <(compgen -W "$choices" -- "$word")
  [[ ${COMPREPLY[*]} != *= ]] || compopt -o nospace 2>/dev/null || true # where it is no completion
}
complete -F _qel_wire qel-wire
)";
}

// Quoted for a text in '...'.
std::string quoted(std::string text) {
  for (size_t at = 0; (at = text.find('\'', at)) != std::string::npos; at += 4) {
    text.replace(at, 1, "'\\''");
  }
  return text;
}

std::string options_in_zsh(const CLI::App& command) {
  std::string arguments;
  for (const CLI::Option* option : options_of(command)) {
    arguments += " '--" + option->get_lnames().front() + (has_value(*option) ? "=" : "") + "[" +
                 quoted(option->get_description()) + "]" +
                 (has_value(*option) ? ":value:(" + values_of(*option) + ")" : "") + "'";
  }
  return arguments;
}

std::string zsh(const CLI::App& app) {
  std::ostringstream commands;
  std::ostringstream cases;
  for (const CLI::App* command : commands_of(app)) {
    commands << "    '" << command->get_name() << ":" << quoted(command->get_description())
             << "'\n";
    const std::vector<std::string> words = words_of(*command);
    cases << "    " << command->get_name() << ") _arguments" << options_in_zsh(*command)
          << (words.empty() ? "" : " '1:name:(" + joined(words) + ")'") << " '*:file:_files' ;;\n";
  }
  return R"(#compdef qel-wire
# zsh completion of qel-wire, made from its table of commands.
_qel_wire() {
  local state line
  local -a commands
  commands=(
)" + commands.str() +
         "  )\n  _arguments -C" + options_in_zsh(app) +
         R"( '1:command:->command' '*::argument:->argument'
  case $state in
    command) _describe command commands; return ;;
  esac
  case $words[1] in
)" + cases.str() +
         R"(  esac
}
_qel_wire "$@"
)";
}

std::string options_in_fish(const CLI::App& command, const std::string& condition) {
  std::string lines;
  for (const CLI::Option* option : options_of(command)) {
    const std::string values = values_of(*option);
    lines += "complete -c qel-wire" + condition + " -l " + option->get_lnames().front() + " -d '" +
             quoted(option->get_description()) + "'" + (has_value(*option) ? " -x" : "") +
             (values.empty() ? "" : " -a '" + values + "'") + "\n";
  }
  return lines;
}

std::string fish(const CLI::App& app) {
  std::string lines = "# fish completion of qel-wire, made from its table of commands.\n" +
                      options_in_fish(app, "");
  for (const CLI::App* command : commands_of(app)) {
    const std::string& name = command->get_name();
    const std::string condition = " -n '__fish_seen_subcommand_from " + name + "'";
    lines += "complete -c qel-wire -f -n __fish_use_subcommand -a " + name + " -d '" +
             quoted(command->get_description()) + "'\n" + options_in_fish(*command, condition);
    const std::vector<std::string> words = words_of(*command);
    if (!words.empty()) {
      lines += "complete -c qel-wire -f -n '__fish_seen_subcommand_from " + name +
               "; and not __fish_seen_subcommand_from " + joined(words) + "' -a '" + joined(words) +
               "'\n";
    }
  }
  return lines;
}

}  // namespace

std::string man_page(const CLI::App& app) {
  std::string text = ".TH QEL\\-WIRE 1 \"\" \"qel\\-wire " QEL_WIRE_VERSION
                     "\"\n.SH NAME\nqel\\-wire \\- " +
                     in_roff(app.get_description()) +
                     "\n.SH SYNOPSIS\n.B qel\\-wire\n.I COMMAND\n[OPTION...] [ARGUMENT...]\n" +
                     ".SH OPTIONS\n" + options_in_roff(app) + ".SH COMMANDS\n";
  for (const CLI::App* command : commands_of(app)) {
    text += ".SS " + in_roff(command->get_name() + arguments_of(*command)) + "\nShows " +
            in_roff(command->get_description()) + ".\n" + options_in_roff(*command);
  }
  return text + ".SH NOTES\n" + in_roff(app.get_footer());
}

std::string completion(const CLI::App& app, const std::string& shell) {
  return shell == "bash" ? bash(app) : shell == "zsh" ? zsh(app) : fish(app);
}

}  // namespace qel_wire
