// The test kit as a program, for plug-ins in any language.
//
// It serves one connection with the example's framing (examples/framing.h), or speaks in lines: it
// reads "NAME HEX" for what the plug-in sends and "wait MS" for time that passes, and after each of
// them writes "NAME HEX" for all that is due, and then "next MS" or "next never". In the end the
// report goes to standard error.

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
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
constexpr int kWrong = 1;      // something did not go as expected
constexpr int kWrongCall = 2;  // or a line on standard input that means nothing

constexpr char kUsage[] =
    "usage: qel-testkit [--scenario FILE | --replay FILE [--ignore NAMES]]\n"
    "                   [--listen PORT [--timeout SECONDS]]\n"
    "\n"
    "Plays a chat service for a plug-in, and says what went wrong.\n"
    "\n"
    "  --scenario FILE    what to expect of the plug-in, and what to say instead of the service\n"
    "  --replay FILE      the recorded session to repeat\n"
    "  --ignore NAMES     fields that may differ from the session, with blanks between them\n"
    "  --listen PORT      serve one connection to that port of 127.0.0.1, 0 for any that is free,\n"
    "                     with the example's framing, instead of lines on standard input\n"
    "  --timeout SECONDS  wait so long for the connection and for each message, 10 unless given\n"
    "\n"
    "Lines on standard input: NAME HEX for a message that the plug-in sends, wait MS for time "
    "that\n"
    "passes. Lines on standard output: NAME HEX for each message that it is to receive, then next "
    "MS\n"
    "or next never. Ends with 0 if everything went as expected, with 1 and a report if not, and "
    "with\n"
    "2 if it was called wrongly.\n";

struct WrongCall : std::runtime_error {
  using std::runtime_error::runtime_error;
};

struct Options {
  std::string scenario;
  std::string replay;
  std::string ignored;
  int port = -1;
  int timeout_seconds = 10;
};

using Kit = std::unique_ptr<qel_testkit_t, decltype(&qel_testkit_release)>;

int64_t number(const std::string& text, int64_t least, int64_t most) {
  char* end = nullptr;
  errno = 0;
  const long long value = std::strtoll(text.c_str(), &end, 10);
  if (text.empty() || *end != '\0' || errno != 0 || value < least || value > most) {
    throw WrongCall("'" + text + "' is no number of " + std::to_string(least) + " to " +
                    std::to_string(most));
  }
  return value;
}

Options options_of(int argc, char** argv) {
  constexpr int kMostPorts = 65535;
  constexpr int kMostSeconds = 86400;
  Options options;
  for (int i = 1; i < argc; i += 2) {
    const std::string name = argv[i];
    if (i + 1 == argc) {
      throw WrongCall(kUsage);
    }
    const std::string value = argv[i + 1];
    if (name == "--scenario") {
      options.scenario = value;
    } else if (name == "--replay") {
      options.replay = value;
    } else if (name == "--ignore") {
      options.ignored = value;
    } else if (name == "--listen") {
      options.port = static_cast<int>(number(value, 0, kMostPorts));
    } else if (name == "--timeout") {
      options.timeout_seconds = static_cast<int>(number(value, 1, kMostSeconds));
    } else {
      throw WrongCall(kUsage);
    }
  }
  if (!options.scenario.empty() && !options.replay.empty()) {
    throw WrongCall(kUsage);
  }
  return options;
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

std::string from_hex(const std::string& text) {
  std::string bytes;
  for (size_t i = 0; i < text.size(); i += 2) {
    const std::string pair = text.substr(i, 2);
    if (pair.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos || pair.size() != 2) {
      throw WrongCall("a line whose bytes are not pairs of hexadecimal digits");
    }
    bytes += static_cast<char>(std::stoi(pair, nullptr, 16));
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

void take_lines(qel_testkit_t* kit) {
  write_due(kit);
  for (std::string line; std::getline(std::cin, line);) {
    std::istringstream words(line);
    std::string name;
    std::string value;
    std::string rest;
    words >> name >> value;
    if (name.empty() || words >> rest) {
      throw WrongCall("a line that is neither NAME HEX nor wait MS");
    }
    if (name == "wait") {
      qel_testkit_wait(kit, number(value, 0, INT64_MAX));
    } else {
      const std::string bytes = from_hex(value);
      qel_testkit_sent(kit, name.c_str(), reinterpret_cast<const unsigned char*>(bytes.data()),
                       static_cast<int>(bytes.size()));
    }
    write_due(kit);
  }
}

void serve(const Options& options, qel_testkit_t* kit) {
  const int listener = listen_on(options.port);
  std::cout << "listening on 127.0.0.1:" << port_of(listener) << std::endl;
  serve_one(listener, options.timeout_seconds, kit, [](const Shown& /*shown*/) {});
}

int run(const Options& options) {
  const Kit kit = make_kit(options);
  if (kit == nullptr) {
    throw WrongExchange("out of memory");
  }
  std::string failure;
  if (options.port < 0) {
    take_lines(kit.get());
  } else {
    try {
      serve(options, kit.get());
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
    if (argc == 2 && std::strcmp(argv[1], "--help") == 0) {
      std::cout << kUsage;
      return kGood;
    }
    return run(options_of(argc, argv));
  } catch (const WrongCall& problem) {
    const std::string text = problem.what();
    std::cerr << (text == kUsage ? text : "qel-testkit: " + text + "\n");
    return kWrongCall;
  } catch (const std::exception& problem) {
    std::cerr << "qel-testkit: " << problem.what() << "\n";
    return kWrong;
  }
}
