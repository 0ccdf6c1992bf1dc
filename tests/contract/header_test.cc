// The cases of the contract through qel-message.h, each with a record or a buffer of an earlier
// call: what a call hands out, that another call releases it, and that it can be released.

#include <gtest/gtest.h>

#include <algorithm>
#include <deque>
#include <memory>
#include <string>
#include <utility>

#include "case_tests.h"
#include "cases.h"
#include "header_calls.h"
#include "msgspec_frontend.pb.h"
#include "qel-message.h"

namespace {

using contract::CaseRun;
using contract::Course;
using contract::Json;

// Where an output points that was not written and that may become NULL.
const char kNoBlock[] = "a pointer to no block of calloc, malloc or strdup";

// The outputs of which can be told that a message does not have them, and those that may be NULL
// without memory.
const char* const kNumbersTold[] = {
    "requestId", "resultCode",  "msgTtl", "lastDeliveryAckTimestamp",
    "sentTime",  "contentType", "sender", "lastReadAckTimestamp",
    "refresh"};
const char* const kBlocksTold[] = {"resultMsg", "title", "nextPaginationKey", "state", "msgIds"};

// What a zeroed record holds when the function is called.
Json preset_of(Json record) {
  for (const char* name : kNumbersTold) {
    if (record.contains(name)) {
      record[name] = QEL_ABSENT;
    }
  }
  for (const char* name : kBlocksTold) {
    if (record.contains(name)) {
      record[name] = kNoBlock;
    }
  }
  return record;
}

// Whether a text or a list of the outputs could not be allocated, which the header can tell. Before
// the call the outputs held what is preset.
bool lacks_block(const std::string& function, const Json& preset, const Json& outputs) {
  for (const auto& [name, value] : outputs.items()) {
    const bool may_be_null = name == "resultMsg" && function == "channel_auth_reply_deserialize";
    if (preset[name] == kNoBlock && value.is_null() && !may_be_null) {
      return true;
    }
    for (const Json& element : value.is_array() ? value : Json::array({value})) {
      if (element.is_object() && (element.value("chatMsg", Json("")).is_null() ||
                                  element.value("name", Json("")).is_null())) {
        return true;
      }
    }
  }
  return (outputs.contains("msgIds") && outputs["msgIds"] != kNoBlock &&
          outputs["sentTimes"].is_null()) ||
         (outputs.contains("inboxEntries") && outputs["inboxEntries"].is_null() &&
          outputs["count"] > 0);
}

// What the header makes of the outputs of a function that has read a message.
void complete(const std::string& function, Json* outputs) {
  Json& to = *outputs;
  for (auto& value : to) {
    if (value == kNoBlock) {
      value = nullptr;
    }
  }
  if (function == "create_chatroom_reply_deserialize" && to["invalidReceivers"].is_null()) {
    std::swap(to["invalidReceiversCount"], to["unlistedInvalidReceivers"]);
  } else if (function == "forward_online_message_get_deserialize") {
    to["inboxEntry"]["chatroomId"] = to["chatroomId"];
    to["inboxEntry"]["chatType"] = to["chatType"];
  } else if (function == "channel_auth_reply_deserialize" && to["requestId"] == 0 &&
             to["resultCode"] == 0 && to["resultMsg"].is_null()) {
    to["resultCode"] = QEL_ABSENT;
  } else if (function == "current_time_deserialize" && to["currentTimeMillis"] == -1) {
    to["currentTimeMillis"] = QEL_ABSENT;
  }
}

class HeaderRun : public CaseRun {
 public:
  using CaseRun::CaseRun;

 private:
  contract::Invocation make_invocation(contract::Call* call) override {
    contract::HeaderCall made = header_call_of(function(), call);
    release_ = std::move(made.release);
    again_ = made.invocation;
    zeroed_ = outputs();
    made.fill();
    return made.invocation;
  }

  void begin() override {
    preset_ = outputs();
    set_model(preset_);
    if (preset_ != preset_of(zeroed_)) {
      problem("the function is called with\n  " + preset_.dump());
    }
  }

  std::optional<int> expected_return(Json* model) override {
    const qel_status_t status = expected_status(*model);
    if (status != QEL_OK) {
      *model = zeroed_;
    } else if (!is_serializer()) {
      complete(function(), model);
    }
    return status;
  }

  qel_status_t expected_status(const Json& model) const {
    if (preset_.is_null()) {  // the function was not called
      return QEL_BAD_ARGUMENT;
    }
    if (is_serializer()) {
      return !model["serialized_data"].is_null() ? QEL_OK
             : model["size"] > 0                 ? QEL_NO_MEMORY
                                                 : QEL_BAD_ARGUMENT;
    }
    if (model["requestId"] == QEL_ABSENT) {
      return QEL_UNREADABLE;
    }
    return lacks_block(function(), preset_, model) ? QEL_NO_MEMORY : QEL_OK;
  }

  bool is_serializer() const { return zeroed_.contains("serialized_data"); }

  void check_blocks() override {
    CaseRun::check_blocks();
    {
      const contract::Observation observation(this);
      again_();
      if (owns_blocks()) {
        problem("another call does not release everything of this one");
      }
    }
    release_();
    if (outputs() != zeroed_) {
      problem("what is released holds\n  " + outputs().dump());
    }
    release_();
  }

  std::function<void()> release_;
  contract::Invocation again_;
  Json zeroed_;
  Json preset_;
};

// 0 if it is not given.
int number(const Json& given, const std::string& name) {
  const Json value = given.value(name, Json());
  return value.is_number() ? value.get<int>() : 0;
}

// Whether the header alone refuses the arguments.
bool is_refused(const std::string& function, const Json& given) {
  const auto lacks = [&](const char* name) { return given.value(name, Json()).is_null(); };
  if (function == "channel_auth_request_serialize") {
    return lacks("appId") || lacks("accessToken");
  }
  if (function == "create_chatroom_request_serialize") {
    return !ChatType_IsValid(number(given, "chatType")) || number(given, "receiversCount") < 0;
  }
  if (function == "chat_request_serialize") {
    return !MsgType_IsValid(number(given, "msgType"));
  }
  if (function == "read_message_request_serialize") {
    return !lacks("inboxEntry") && !MsgType_IsValid(number(given["inboxEntry"], "msgType"));
  }
  if (function == "end_chat_request_serialize") {
    const int count = number(given, "count");
    return count < 0 || (count > 0 && lacks("entries"));
  }
  if (function == "invite_chat_request_serialize") {
    const int count = number(given, "invitingMembersCount");
    return count < 0 || (count > 0 && lacks("invitingMembers"));
  }
  if (function == "save_call_log_request_serialize") {
    return lacks("callId") || lacks("callLogType");
  }
  return !IsTypingContentType_IsValid(number(given, "contentType"));
}

// Whether the case can be had through the header: it has all outputs and a count by value.
bool is_reachable(const std::string& function, const Json& given) {
  if (function == "invite_chat_request_serialize") {
    return !given.value("invitingMembersCount", Json()).is_null();
  }
  if (function.find("_deserialize") == std::string::npos) {
    return !given.contains("serialized_data") && !given.contains("size");
  }
  return std::none_of(given.begin(), given.end(),
                      [](const Json& value) { return value.is_null() || value.is_object(); });
}

std::unique_ptr<CaseRun> make_run(const Json& contract_case, const Course& course,
                                  int refused_new) {
  return std::make_unique<HeaderRun>(contract_case, course, refused_new);
}

TEST(Header, HasCallsOfAllFunctionsButThePlaceholders) {
  EXPECT_EQ(contract::functions_without_header_call(),
            (std::vector<std::string>{"forward_stored_message_deserialize",
                                      "forward_stored_message_reply_serialize"}));
}

class CountLines : public contract::Observer {
 public:
  int lines() const { return lines_; }

 private:
  void on_line(const contract::LogLine& /*line*/) override { ++lines_; }
  int lines_ = 0;
};

// Reads so many bytes at data, which is NULL without received bytes.
void expect_no_bytes(const std::string& function, const std::string& received, int size) {
  contract::Call call({{"size", size}}, received);
  const contract::HeaderCall made = header_call_of(function, &call);
  contract::Reader reader([](const void*) { return std::nullopt; });
  const Json zeroed = call.outputs(&reader);
  made.fill();
  CountLines log;
  const contract::Observation observation(&log);
  EXPECT_EQ(made.invocation(), QEL_UNREADABLE) << function;
  EXPECT_EQ(log.lines(), 0) << function;
  EXPECT_EQ(call.outputs(&reader), zeroed) << function;
}

TEST(Header, WhenThereAreNoBytes_NoFunctionIsCalled) {
  const auto without = contract::functions_without_header_call();
  int readers = 0;
  for (const std::string& function : contract::function_names()) {
    if (function.find("_deserialize") != std::string::npos &&
        std::count(without.begin(), without.end(), function) == 0) {
      ++readers;
      expect_no_bytes(function, "", 1);
      expect_no_bytes(function, "x", -1);
    }
  }
  EXPECT_EQ(readers, 16);
}

}  // namespace

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  contract::load_library();
  const auto without = contract::functions_without_header_call();
  std::deque<Json> cases;
  for (const Json& contract_case : contract::cases()) {
    const std::string function = contract_case.at("call");
    Json given = contract_case.value("given", Json::object());
    given.erase("reserved");
    if (std::count(without.begin(), without.end(), function) > 0 ||
        !is_reachable(function, given)) {
      continue;
    }
    cases.push_back(contract_case);
    cases.back()["given"] = given;
    Course course = contract::course_of(cases.back());
    if (is_refused(function, given)) {
      course.steps.clear();
      course.end = Json::object();
    }
    contract::add_case_tests(cases.back(), course, make_run);
  }
  return RUN_ALL_TESTS();
}
