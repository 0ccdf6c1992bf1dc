// The test kit as a program, for plug-ins in any language. kFooter says what it does.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>

#include "serve.h"

namespace {

constexpr int kGood = 0;
constexpr int kWrong = 1;
constexpr int kWrongCall = 2;

constexpr char kFooter[] = R"(
Without --listen, it reads lines from standard input:

  NAME HEX   the plug-in sends this message; without HEX, one of no bytes
  wait MS    so many milliseconds pass: no other time does

In the beginning, and after each of them, it writes to standard output:

  NAME HEX   for each message that is due: the plug-in receives it
  next MS    when another one is due, in milliseconds: wait so long, unless
             the plug-in sends something before
  next never if none is due until the plug-in sends something

With --listen, messages come and go in frames as those of the example, whose
framing.h describes them, and time passes by itself.

The test is over with the input or, with --listen, at the first mistake, when
the plug-in closes the connection, or when it sends nothing for --timeout while
nothing is due. Then the report goes to standard error: a sentence in each line
of what went wrong, or nothing.

Exits with 0 if everything went as expected; with 1 and a report if not, if the
scenario or the session cannot be read, or if the connection fails; with 2 if it
was called wrongly, or if a line means nothing.
)";

struct WrongCall : std::runtime_error {
  using std::runtime_error::runtime_error;
};

struct Options {
  std::string scenario;  // a file's name, or empty
  std::string replay;
  std::string ignored;
  int port = -1;
  int timeout_seconds = 10;
};

using Kit = std::unique_ptr<qel_testkit_t, decltype(&qel_testkit_release)>;

// As the usage says what the value is, the check need not.
CLI::Validator silent(CLI::Validator check) {
  return check.description("");
}

void add_options(CLI::App* app, Options* options) {
  constexpr int kMostPorts = 65535;
  constexpr int kMostSeconds = 86400;
  app->set_help_flag("--help", "what it does");
  app->footer(kFooter);
  auto* scenario =
      app->add_option("--scenario", options->scenario, "what to expect of the plug-in, and to say");
  auto* replay = app->add_option("--replay", options->replay, "the recorded session to repeat");
  for (CLI::Option* file : {scenario, replay}) {
    file->type_name("FILE")->check(silent(CLI::ExistingFile));
  }
  scenario->excludes(replay);
  app->add_option("--ignore", options->ignored, "the session's fields that may differ")
      ->type_name("'NAME...'")
      ->needs(replay);
  auto* listen = app->add_option("--listen", options->port,
                                 "serve one connection to 127.0.0.1; 0: to any port")
                     ->type_name("PORT")
                     ->check(silent(CLI::Range(0, kMostPorts)));
  app->add_option("--timeout", options->timeout_seconds,
                  "wait so long for it and for messages, instead of 10")
      ->type_name("SECONDS")
      ->check(silent(CLI::Range(1, kMostSeconds)))
      ->needs(listen);
}

std::string contents(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  std::string bytes{std::istreambuf_iterator<char>(file), {}};
  if (!file.good()) {
    throw WrongCall(path + ": " + std::strerror(errno));
  }
  return bytes;
}

Kit make_kit(const Options& options) {
  if (options.replay.empty()) {
    const std::string text = options.scenario.empty() ? "" : contents(options.scenario);
    require(text.find('\0') == std::string::npos, options.scenario + " is no text: a byte is 0");
    return {qel_testkit_new(text.c_str()), &qel_testkit_release};
  }
  const std::string session = contents(options.replay);
  return {qel_testkit_new_replay(reinterpret_cast<const unsigned char*>(session.data()),
                                 session.size(), options.ignored.c_str()),
          &qel_testkit_release};
}

// ---- Lines

constexpr char kDigits[] = "0123456789abcdef";

std::string to_hex(const unsigned char* data, int size) {
  std::string text;
  for (int i = 0; i < size; ++i) {
    text += kDigits[data[i] >> 4U];
    text += kDigits[data[i] & 15U];
  }
  return text;
}

// The whole text as a number that is not negative.
template <typename Number>
Number number(const std::string& text, int base, const char* problem) {
  Number value{};
  const char* end = text.data() + text.size();
  const auto read = std::from_chars(text.data(), end, value, base);
  if (read.ec != std::errc() || read.ptr != end || text[0] == '-') {
    throw WrongCall(problem);
  }
  return value;
}

std::string from_hex(const std::string& text) {
  constexpr char kProblem[] = "the bytes are not pairs of hexadecimal digits";
  std::string bytes;
  for (size_t i = 0; i < text.size(); i += 2) {
    if (i + 1 == text.size()) {
      throw WrongCall(kProblem);
    }
    bytes += static_cast<char>(number<unsigned char>(text.substr(i, 2), 16, kProblem));
  }
  return bytes;
}

void write_due(qel_testkit_t* kit) {
  qel_testkit_delivery_t delivery;
  while (qel_testkit_next(kit, &delivery)) {
    std::cout << delivery.message << ' ' << to_hex(delivery.data, delivery.size) << '\n';
  }
  std::cout << "next "
            << (delivery.after_ms < 0 ? std::string("never") : std::to_string(delivery.after_ms))
            << std::endl;
}

void take_line(const std::string& line, qel_testkit_t* kit) {
  if (std::any_of(line.begin(), line.end(), [](unsigned char c) { return std::iscntrl(c) != 0; })) {
    throw WrongCall("a control character");
  }
  std::istringstream words(line);
  std::string name;
  std::string value;
  std::string rest;
  words >> name >> value >> rest;
  if (!rest.empty()) {
    throw WrongCall("neither NAME HEX nor wait MS");
  }
  if (name == "wait") {
    qel_testkit_wait(kit, number<int64_t>(value, 10, "no number of milliseconds"));
  } else if (!name.empty()) {
    const std::string bytes = from_hex(value);
    qel_testkit_sent(kit, name.c_str(), reinterpret_cast<const unsigned char*>(bytes.data()),
                     static_cast<int>(bytes.size()));
  } else {
    return;  // blank
  }
  write_due(kit);
}

void take_lines(qel_testkit_t* kit) {
  write_due(kit);
  std::string line;
  for (int64_t i = 1; std::getline(std::cin, line); ++i) {
    try {
      take_line(line, kit);
    } catch (const WrongCall& problem) {
      throw WrongCall("line " + std::to_string(i) + ": " + problem.what());
    }
  }
}

void serve(const Options& options, qel_testkit_t* kit) {
  const int listener = listen_on(options.port);
  std::cout << "listening on 127.0.0.1:" << port_of(listener) << std::endl;
  serve_one(listener, options.timeout_seconds, kit, [](const Shown& /*shown*/) {});
}

int run(const Options& options) {
  const Kit kit = make_kit(options);
  require(kit != nullptr, "out of memory");
  std::string failure;
  if (*qel_testkit_report(kit.get()) == '\0') {  // otherwise there is nothing that it could play
    try {
      options.port < 0 ? take_lines(kit.get()) : serve(options, kit.get());
    } catch (const WrongExchange& problem) {
      failure = std::string("qel-testkit: ") + problem.what() + "\n";
    }
  }
  const bool is_good = qel_testkit_end(kit.get()) && failure.empty();
  std::cerr << failure << qel_testkit_report(kit.get());
  return is_good ? kGood : kWrong;
}

}  // namespace

int main(int argc, char** argv) {
  try {
    CLI::App app("Plays a chat service for a plug-in, and says what went wrong", "qel-testkit");
    Options options;
    add_options(&app, &options);
    try {
      app.parse(argc, argv);
    } catch (const CLI::ParseError& problem) {
      return app.exit(problem) == 0 ? kGood : kWrongCall;
    }
    return run(options);
  } catch (const WrongCall& problem) {
    std::cerr << "qel-testkit: " << problem.what() << "\n";
    return kWrongCall;
  } catch (const std::exception& problem) {
    std::cerr << "qel-testkit: " << problem.what() << "\n";
    return kWrong;
  }
}
