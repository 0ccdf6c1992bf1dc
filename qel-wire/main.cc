// qel-wire: captures of the protocol, as people read them.

#include <google/protobuf/message.h>
#include <google/protobuf/stubs/common.h>
#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <iomanip>
#include <iostream>
#include <new>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "cli.h"
#include "decode.h"
#include "encode.h"
#include "explain.h"
#include "export.h"
#include "guess.h"
#include "input.h"
#include "listing.h"
#include "misread.h"
#include "notation.h"
#include "query.h"
#include "schema.h"
#include "session.h"
#include "text.h"
#include "token.h"
#include "walk.h"

namespace {

using google::protobuf::Descriptor;
using qel_wire::BytesForm;
using qel_wire::Call;
using qel_wire::Failure;
using qel_wire::kBroken;
using qel_wire::kDone;
using qel_wire::kNoAccess;
using qel_wire::kWrongCall;
using qel_wire::Notation;

// Which name is not said: it may be a piece of a token, if the stream is cut.
constexpr char kNoSuchName[] = "its frame or its record has a name that no message has";

void complain_about(const qel_wire::Found& found, const std::string& text) {
  qel_wire::complain((found.place.empty() ? "" : found.place + ": ") + text);
}

const Descriptor& message_of(const std::string& name) {
  const Descriptor* type = qel_wire::message_named(name);
  if (type == nullptr) {
    const bool is_file = access(name.c_str(), F_OK) == 0;
    throw Failure{kWrongCall, "there is no message " + qel_wire::named(name) +
                                  qel_wire::did_you_mean(name, qel_wire::message_names()) +
                                  (is_file ? "; a message's name comes before the file" : "") +
                                  " ('qel-wire schema' lists them)"};
  }
  return *type;
}

bool is_auto(const std::string& name) {
  return strcasecmp(name.c_str(), "auto") == 0;
}

// What messages must have.
class Conditions {
 public:
  Conditions(const Call& call, const Descriptor* type) : shows_token_(call.show_token) {
    for (const std::string& text : call.where) {
      conditions_.emplace_back(text, type);
    }
  }

  // The status with which the message is left out, or nothing if it meets all of them. Broken
  // messages and what is hidden meet none, which is said.
  std::optional<int> refuse(const qel_wire::Found& found, const Descriptor& type) const {
    if (conditions_.empty()) {
      return std::nullopt;
    }
    const auto problem = qel_wire::problem_of(found.bytes, type);
    if (problem.has_value() && found.missing == 0) {
      complain_about(found, "broken, and so left out");
      return kBroken;
    }
    const auto whole =
        found.bytes.substr(0, problem.has_value() ? problem->readable : found.size());
    const qel_wire::Hidden hidden(found.bytes, type, shows_token_);
    if (std::all_of(conditions_.begin(), conditions_.end(),
                    [&](const auto& condition) { return condition.holds(whole, type, hidden); })) {
      return std::nullopt;
    }
    if (hidden.hides_any()) {
      complain_about(found, "left out; some of its fields are hidden: --show-token shows them");
    }
    return kDone;
  }

 private:
  std::vector<qel_wire::Condition> conditions_;
  bool shows_token_;
};

// What is said of a guess.
std::string guessed(const qel_wire::Fit& fit) {
  std::string text = fit.types.front()->name() + ", the best guess";
  if (fit.types.size() > 1) {
    text += "; as good:";
    for (size_t i = 1; i < fit.types.size(); ++i) {
      text += (i == 1 ? " " : ", ") + fit.types[i]->name();
    }
  }
  return text;
}

// Calls take(found, type) for each message that meets the conditions, behind a line that says which
// message it is, where that is needed.
template <typename Take>
int for_each_known(const Call& call, Take take) {
  const bool is_guessing = is_auto(call.message);
  const Descriptor* named = is_guessing ? nullptr : &message_of(call.message);
  const Conditions conditions(call, named);
  return qel_wire::for_each_message(call, [&](const qel_wire::Found& found) {
    const Descriptor* type = found.name.empty() ? named : qel_wire::message_named(found.name);
    if (!found.name.empty() && type == nullptr) {
      complain_about(found, kNoSuchName);
      return kBroken;
    }
    if (!is_guessing && type != named) {
      return kDone;
    }
    const bool is_guess = type == nullptr;
    std::string name = is_guess ? "" : type->name();
    if (is_guess) {
      const qel_wire::Fit fit = qel_wire::guess(found.bytes, found.use).front();
      type = fit.types.front();
      name = guessed(fit);
    }
    if (const auto status = conditions.refuse(found, *type)) {
      return *status;
    }
    if (!found.place.empty()) {
      name = qel_wire::readable(found.place) + ", " + name;
    }
    if (call.json) {
      if (is_guess) {
        qel_wire::complain(name);
      }
    } else if (is_guess || !found.place.empty()) {
      std::cout << "# " << name << '\n';
    }
    return take(found, *type);
  });
}

// ---- Commands

qel_wire::Colours colours_of(const Call& call) {
  if (call.colour != "auto") {
    return qel_wire::Colours(call.colour == "always");
  }
  const auto value = [](const char* name) {
    const char* text = std::getenv(name);
    return std::string(text != nullptr ? text : "");
  };
  return qel_wire::Colours(isatty(STDOUT_FILENO) == 1 && value("NO_COLOR").empty() &&
                           value("TERM") != "dumb");
}

BytesForm bytes_form_of(const Call& call) {
  return call.bytes.empty() ? BytesForm::kUsual : BytesForm::kHex;
}

// What decode and explain have in common.
template <typename Options>
Options options_of(const Call& call) {
  Options options;
  options.colours = colours_of(call);
  options.bytes_form = bytes_form_of(call);
  options.as_json = call.json;
  options.show_token = call.show_token;
  return options;
}

int decode(const Call& call) {
  auto options = options_of<qel_wire::DecodeOptions>(call);
  options.is_partial = call.partial;
  return for_each_known(call, [&](const qel_wire::Found& found, const Descriptor& type) {
    const auto decoded = qel_wire::decode(found.bytes, type, options, &std::cout);
    for (const std::string& note : decoded.notes) {
      complain_about(found, note);
    }
    if (const auto& problem = decoded.problem) {
      complain_about(
          found, "broken at offset " + std::to_string(problem->offset) + ": " + problem->reason +
                     (call.partial ? "" : " ('qel-wire explain' shows what comes before)"));
      return kBroken;
    }
    return kDone;
  });
}

// From the text form, or from JSON.
void read_message(const Call& call, google::protobuf::Message* message) {
  std::string text = qel_wire::read_file(call.files.empty() ? "-" : call.files.front());
  if (text.compare(0, 3, "\xef\xbb\xbf") == 0) {  // which some editors write
    text.erase(0, 3);
  }
  try {
    const size_t first = text.find_first_not_of(" \t\r\n");
    if (first != std::string::npos && text[first] == '{') {
      qel_wire::parse_json(text, bytes_form_of(call), message);
    } else {
      qel_wire::parse_text(text, message);
    }
  } catch (const qel_wire::Misread& misread) {
    throw Failure{kBroken, "the text is no " + message->GetTypeName() + ": " + misread.text()};
  }
}

void refuse_bytes(const Call& call) {
  if (call.has_bytes()) {
    throw Failure{kWrongCall, call.command + " takes no bytes in --hex or --base64"};
  }
}

int encode(const Call& call) {
  const auto message = qel_wire::new_message(message_of(call.message));
  refuse_bytes(call);
  read_message(call, message.get());
  if (call.notation() == Notation::kRaw) {
    message->SerializeToOstream(&std::cout);
  } else {
    std::cout << qel_wire::to_notation(message->SerializeAsString(), call.notation()) << '\n';
  }
  return kDone;
}

int explain(const Call& call) {
  auto options = options_of<qel_wire::ExplainOptions>(call);
  options.show_all = call.all;
  return for_each_known(call, [&](const qel_wire::Found& found, const Descriptor& type) {
    options.message = found.number;
    return qel_wire::explain(found.bytes, type, options, &std::cout) ? kDone : kBroken;
  });
}

void print_fit(size_t rank, const qel_wire::Fit& fit, const qel_wire::Colours& colours) {
  std::cout << std::setw(4) << rank << ' ' << std::setw(3) << fit.known << " known " << std::setw(3)
            << fit.absent << " absent " << std::setw(3) << fit.unknown << " unknown "
            << std::setw(3) << fit.doubtful << " doubtful "
            << (fit.is_broken ? " " + colours.wrong + "broken" + colours.end : "");
  for (size_t i = 0; i < fit.types.size(); ++i) {
    std::cout << (i == 0 ? " " : ", ") << colours.name << fit.types[i]->name() << colours.end;
  }
  std::cout << '\n';
}

int guess(const Call& call) {
  constexpr size_t kMostRanks = 10;
  const qel_wire::Colours colours = colours_of(call);
  const qel_wire::Use use = call.sent       ? qel_wire::Use::kSends
                            : call.received ? qel_wire::Use::kReceives
                                            : qel_wire::Use::kNone;
  return qel_wire::for_each_message(call, [&](const qel_wire::Found& found) {
    if (!found.place.empty()) {
      std::cout << "# " << qel_wire::readable(found.place) << '\n';
    }
    const std::vector<qel_wire::Fit> fits = qel_wire::guess(found.bytes, use);
    const size_t shown = call.all ? fits.size() : std::min(fits.size(), kMostRanks);
    for (size_t i = 0; i < shown; ++i) {
      print_fit(i + 1, fits[i], colours);
    }
    return fits.front().is_broken ? kBroken : kDone;
  });
}

// Calls take(entry, found) for each message that is wanted.
template <typename Take>
int for_each_entry(const Call& call, qel_wire::Session* session, Take take) {
  const Conditions conditions(call, nullptr);
  std::set<const Descriptor*> wanted;
  for (const std::string& name : call.messages) {
    wanted.insert(&message_of(name));
  }
  return qel_wire::for_each_message(call, [&](const qel_wire::Found& found) {
    const qel_wire::Entry entry = session->add(found);
    const bool is_named = found.name.empty() || qel_wire::message_named(found.name) != nullptr;
    if (!is_named) {
      complain_about(found, kNoSuchName);
    }
    if (!wanted.empty() && wanted.count(entry.types.front()) == 0) {
      return kDone;
    }
    if (const auto status = conditions.refuse(found, *entry.types.front())) {
      return *status;
    }
    const int status = take(entry, found);
    return is_named ? status : kBroken;
  });
}

int session(const Call& call) {
  const qel_wire::Colours colours = colours_of(call);
  qel_wire::Session session;
  std::set<size_t> shown;
  const auto show = [&](const qel_wire::Entry& entry, const qel_wire::Found& found) {
    shown.insert(entry.number);
    const auto problem = found.missing > 0
                             ? std::nullopt  // nobody knows
                             : qel_wire::problem_of(found.bytes, *entry.types.front());
    if (call.json) {
      print_entry_json(entry, found, problem, &std::cout);
    } else {
      print_entry(entry, found, problem, colours, &std::cout);
    }
    return problem.has_value() ? kBroken : kDone;
  };
  const int status = for_each_entry(call, &session, show);
  const auto print = call.json ? qel_wire::print_unanswered_json : qel_wire::print_unanswered;
  for (const qel_wire::Entry& entry : session.unanswered()) {
    if (shown.count(entry.number) > 0) {
      print(entry, &std::cout);
    }
  }
  return status;
}

int export_messages(const Call& call) {
  if (call.ports) {
    qel_wire::write_ports(&std::cout);
    return kDone;
  }
  qel_wire::Session session;
  qel_wire::write_head(&std::cout);
  return for_each_entry(call, &session,
                        [](const qel_wire::Entry& entry, const qel_wire::Found& found) {
                          if (!found.is_unsent()) {
                            write_packet(entry, found, &std::cout);
                          }
                          return kDone;
                        });
}

// The message of the call's file.
qel_wire::Side side_of(const qel_wire::Found& found, const Call& call) {
  const std::string& file = call.files.front();
  const Descriptor& type = is_auto(call.message)
                               ? *qel_wire::guess(found.bytes).front().types.front()
                               : message_of(call.message);
  qel_wire::Side side{std::string(found.bytes), &type, {}};
  side.hidden = qel_wire::Hidden(side.bytes, type, call.show_token);
  std::vector<std::string> notes;
  if (const auto problem = qel_wire::check(side.bytes, type, side.hidden, &notes)) {
    throw Failure{kBroken, qel_wire::named(file) + " is broken at offset " +
                               std::to_string(problem->offset) + ": " + problem->reason};
  }
  const std::string place = file + ": ";
  for (const std::string& note : notes) {
    qel_wire::complain(place + note);
  }
  return side;
}

int diff(const Call& call) {
  refuse_bytes(call);
  if (call.files[0] == call.files[1]) {
    throw Failure{kWrongCall, "diff takes two different files"};
  }
  Call one = call;
  one.message = call.message.empty() ? "auto" : call.message;
  std::vector<qel_wire::Side> sides;
  for (size_t i = 0; i < call.files.size(); ++i) {
    one.files = {call.files[i]};
    qel_wire::for_each_message(one, [&](const qel_wire::Found& found) {
      sides.push_back(side_of(found, one));
      return kDone;
    });
    if (sides.size() != i + 1) {
      throw Failure{kWrongCall, "diff takes one message of each file"};
    }
  }
  if (is_auto(one.message)) {
    std::cout << "# " << sides[0].type->name() << ", " << sides[1].type->name()
              << ", the best guesses\n";
  }
  return qel_wire::diff(sides[0], sides[1], colours_of(call), &std::cout) ? kBroken : kDone;
}

int schema(const Call& call) {
  if (call.message.empty()) {
    for (const std::string& name : qel_wire::all_names()) {
      std::cout << name << '\n';
    }
    return kDone;
  }
  const std::string definition = qel_wire::schema_of(call.message, colours_of(call));
  if (definition.empty()) {
    throw Failure{kWrongCall, "there is no message and no enumeration " +
                                  qel_wire::named(call.message) +
                                  qel_wire::did_you_mean(call.message, qel_wire::all_names()) +
                                  " ('qel-wire schema' lists them)"};
  }
  std::cout << definition;
  return kDone;
}

int run(const Call& call) {
  std::cout << call.answer;
  if (!call.answer.empty()) {
    return kDone;
  }
  using Command = int (*)(const Call& call);
  static const std::pair<const char*, Command> commands[] = {
      {"decode", decode},   {"encode", encode},          {"explain", explain}, {"guess", guess},
      {"session", session}, {"export", export_messages}, {"diff", diff},       {"schema", schema}};
  return std::find_if(std::begin(commands), std::end(commands),
                      [&](const auto& command) { return call.command == command.first; })
      ->second(call);
}

}  // namespace

int main(int argc, char** argv) {
  std::ios::sync_with_stdio(false);
  google::protobuf::SetLogHandler(nullptr);  // the runtime's complaints: they are in our own words
  int status = kDone;
  try {
    status = run(qel_wire::read_call(argc, argv));
  } catch (const Failure& failure) {
    qel_wire::complain(failure.reason);
    status = failure.status;
  } catch (const std::bad_alloc&) {
    qel_wire::complain("there is not enough memory");
    status = kNoAccess;
  }
  if (!std::cout.flush()) {
    qel_wire::complain("the output cannot be written");
    return kNoAccess;
  }
  return status;
}
