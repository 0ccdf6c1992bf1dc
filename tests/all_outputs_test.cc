// Every deserializer with bytes that the independent peer made: the outputs are those of the
// message that the peer was given, which itself was never bytes.

#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>
#include <string>
#include <type_traits>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "support/agreement.h"
#include "support/deserializers.h"
#include "support/exchange.h"
#include "support/exported_functions.h"
#include "support/peer.h"
#include "support/samples.h"

namespace {

using google::protobuf::Descriptor;
using google::protobuf::Message;
using support::Filling;
using support::PeerItem;
using support::Sample;

struct Function {
  std::string name;
  const Descriptor* (*message)();
  std::string (*disagreement_after_reading)(const std::string& bytes, const Message& message);
  std::string (*disagreement_at_the_exit_line)(const std::string& bytes, const Message& message);
};

template <typename Outputs, typename T>
std::string disagreement_after_reading(const std::string& bytes, const Message& message) {
  Outputs outputs;
  outputs.read(bytes);
  return disagreement(outputs, dynamic_cast<const T&>(message));
}

template <typename Outputs, typename T>
std::string disagreement_at_the_exit_line(const std::string& bytes, const Message& message) {
  Outputs outputs;
  std::string found = "no exit line";
  const support::LogObserver observer([&](const support::LogCall& call) {
    if (call.format.find("%s: exit") != std::string::npos) {
      if constexpr (std::is_same_v<Outputs, support::ForwardOnlineMessageOutputs>) {
        outputs.chat_msg.block = outputs.record.chatMsg;  // as read() does in the end
      }
      found = disagreement(outputs, dynamic_cast<const T&>(message));
    }
  });
  outputs.read(bytes);
  return found;
}

template <typename Outputs, typename T>
Function function(const support::Deserializer<Outputs, T>& deserializer) {
  return {deserializer.name, &T::descriptor, disagreement_after_reading<Outputs, T>,
          disagreement_at_the_exit_line<Outputs, T>};
}

const std::vector<Function> kFunctions =
    std::apply([](const auto&... each) { return std::vector<Function>{function(each)...}; },
               support::kDeserializers);

// Those that open the lists of refused receivers, in one reply or in both, and two that do not.
const int32_t kCodes[] = {0, 1000, 1001, 2000, 3003, 3009};

std::vector<Filling> plain_and_coded_fillings() {
  std::vector<Filling> all = support::fillings();
  for (const int32_t code : kCodes) {
    for (const int elements : {0, 1, 500}) {
      Filling filling = support::filling_with_code(code);
      filling.elements = elements;
      filling.name += "_" + std::to_string(elements) + "Elements";
      all.push_back(filling);
    }
  }
  return all;
}

std::vector<Filling> later_and_coded_fillings() {
  std::vector<Filling> all = support::later_fillings();
  for (const int32_t code : kCodes) {
    Filling filling = support::filling_with_code(code);
    filling.has_later_fields = true;
    all.push_back(filling);
  }
  return all;
}

struct Case {
  const Function* function;
  Sample sample;
  std::string peers_bytes;
};

std::vector<Case> make_cases(const std::string& peer_schema, const std::vector<Filling>& fillings) {
  std::vector<Case> cases;
  std::vector<PeerItem> texts;
  for (const Function& function : kFunctions) {
    for (const Filling& filling : fillings) {
      cases.push_back({&function, support::make_sample(*function.message(), filling), ""});
      texts.push_back({cases.back().sample.type(), cases.back().sample.text});
    }
  }
  const std::vector<std::string> encodings = support::peer_encode_all(peer_schema, texts);
  for (size_t i = 0; i < cases.size(); ++i) {
    cases[i].peers_bytes = encodings[i];
  }
  return cases;
}

// Made once for all tests of the program: starting the peer is what takes time.
const std::vector<Case>& every_case() {
  static const std::vector<Case> cases = [] {
    std::vector<Case> all = make_cases(support::library_schema(), plain_and_coded_fillings());
    std::vector<Case> later = make_cases(support::later_schema(), later_and_coded_fillings());
    std::move(later.begin(), later.end(), std::back_inserter(all));
    return all;
  }();
  return cases;
}

TEST(Functions, AreTheDeserializers) {
  EXPECT_EQ(support::names_in(kFunctions, &Function::name), support::working_deserializers());
}

class EveryDeserializer : public support::ExchangeTest,
                          public testing::WithParamInterface<size_t> {};

TEST_P(EveryDeserializer, GivenThePeersBytes_WritesTheValuesThatThePeerWasGiven) {
  const Case& that = every_case()[GetParam()];
  EXPECT_EQ(that.function->disagreement_after_reading(that.peers_bytes, *that.sample.message), "")
      << "the message:\n"
      << that.sample.text.substr(0, 2000);
}

TEST_P(EveryDeserializer, WhenItLogsItsExit_HasWrittenItsOutputs) {
  const Case& that = every_case()[GetParam()];
  const bool has_exit_line = that.function->name != "channel_auth_reply_deserialize";
  EXPECT_EQ(that.function->disagreement_at_the_exit_line(that.peers_bytes, *that.sample.message),
            has_exit_line ? "" : "no exit line");
}

INSTANTIATE_TEST_SUITE_P(Filled, EveryDeserializer, testing::Range(size_t{0}, every_case().size()),
                         [](const auto& place) {
                           const Case& that = every_case()[place.param];
                           return that.function->name + "_" + that.sample.filling;
                         });

}  // namespace
