// Any bytes into the test kit: as a session file, as a scenario, or as a message of the schema that
// the first byte chooses, to the service alone. It has an end, and does not tell the access token.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>

#include <cstring>
#include <memory>
#include <string>

#include "qel-testkit.h"
#include "target.h"

namespace fuzz {
namespace {

const unsigned char* data_of(const std::string& bytes) {
  return reinterpret_cast<const unsigned char*>(bytes.data());
}

// What is due, and what comes later; more than that is a loop.
void take_all(qel_testkit_t* kit) {
  constexpr int kMost = 100000;
  qel_testkit_delivery_t delivery;
  for (int i = 0; qel_testkit_next(kit, &delivery) || delivery.after_ms > 0; ++i) {
    if (delivery.message == nullptr) {
      qel_testkit_wait(kit, delivery.after_ms);
    }
    if (i == kMost) {
      fail("deliveries without end");
    }
  }
}

qel_testkit_t* make_kit(const std::string& bytes) {
  constexpr char kSessionFile[] = "\n\r\r\n";
  if (bytes.rfind(kSessionFile, 0) == 0) {
    return qel_testkit_new_replay(data_of(bytes), bytes.size(), "requestId");
  }
  const bool is_text = bytes[0] >= 'a' && bytes[0] <= 'z';
  const std::string scenario = is_text ? bytes : "world { isSignedIn: true }";
  return qel_testkit_new(scenario.c_str());
}

}  // namespace

void check_testkit(const std::string& bytes) {
  if (bytes.empty()) {
    return;
  }
  const std::unique_ptr<qel_testkit_t, decltype(&qel_testkit_release)> kit(make_kit(bytes),
                                                                           &qel_testkit_release);
  const auto message = new_message(static_cast<unsigned char>(bytes[0]));
  take_all(kit.get());
  qel_testkit_sent(kit.get(), message->GetTypeName().c_str(), data_of(bytes) + 1,
                   static_cast<int>(bytes.size()) - 1);
  take_all(kit.get());
  const bool is_good = qel_testkit_end(kit.get());
  const char* report = qel_testkit_report(kit.get());
  if (is_good != (*report == '\0') || std::strstr(report, "example-access-token") != nullptr) {
    fail(report);
  }
}

}  // namespace fuzz
