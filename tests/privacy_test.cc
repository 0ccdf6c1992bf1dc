// What the library says of its callers' data, in the log and on standard error: never a text, and
// few numbers.

#include <cstdio>
#include <new>
#include <ostream>
#include <set>

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/function_calls.h"
#include "support/heap.h"
#include "support/process_death.h"

namespace {

using support::FunctionCall;
using support::LogCall;

// Recognisable, even where a part is cut off.
const char kPrivate[] = "private-4711";
// The runtime says on standard error that such a text is no UTF-8.
const std::string kPrivateNoUtf8 = std::string(kPrivate) + "\xff";

bool shows(const std::string& said, const std::string& text) {
  return said.find(text) != std::string::npos;
}

// The texts of all lines logged since the last time, with the texts among their arguments.
std::string logged_texts() {
  std::string texts;
  for (const LogCall& call : support::logged_calls()) {
    texts += call.tag + "\n" + call.format + "\n";
    for (const auto& argument : call.arguments) {
      if (const auto* text = std::get_if<std::string>(&argument)) {
        texts += *text + "\n";
      }
    }
  }
  support::clear_log();
  return texts;
}

// What a call logs and prints.
struct Said {
  std::string log;
  std::string standard_error;
};

template <typename Call>
Said said_by(Call&& call) {
  support::clear_log();
  ::testing::internal::CaptureStderr();
  call();
  std::string standard_error = ::testing::internal::GetCapturedStderr();
  return {logged_texts(), std::move(standard_error)};
}

// Of an ended process's standard error, for EXPECT_EXIT.
struct HidesPrivateText {
  using is_gtest_matcher = void;
  static bool MatchAndExplain(const std::string& said, std::ostream* /*out*/) {
    return !shows(said, kPrivate);
  }
  static void DescribeTo(std::ostream* out) { *out << "does not show " << kPrivate; }
  static void DescribeNegationTo(std::ostream* out) { *out << "shows " << kPrivate; }
};

// ---- All texts

TEST(Privacy, WhateverAFunctionIsGiven_TheLogShowsNoText) {
  for (const FunctionCall& function : support::function_calls()) {
    SCOPED_TRACE(function.function + ", " + function.situation);
    const Said said = said_by([&] { function.call({4711, kPrivate}); });
    EXPECT_FALSE(shows(said.log, kPrivate)) << said.log;
    EXPECT_EQ(said.standard_error, "");
  }
}

TEST(Privacy, WhenATextIsNoUtf8_NeitherTheLogNorStandardErrorShowsIt) {
  bool runtime_spoke = false;
  for (const FunctionCall& function : support::function_calls()) {
    SCOPED_TRACE(function.function + ", " + function.situation);
    const Said said = said_by([&] { function.call({4711, kPrivateNoUtf8}); });
    EXPECT_FALSE(shows(said.log, kPrivate)) << said.log;
    EXPECT_FALSE(shows(said.standard_error, kPrivate)) << said.standard_error;
    runtime_spoke = runtime_spoke || shows(said.standard_error, "invalid UTF-8");
  }
  EXPECT_TRUE(runtime_spoke);  // or nothing was tested
}

TEST(Privacy, IdsInTheLog_AreThoseOfRefusedUsersAndOfOneRequest) {
  std::set<std::string> functions;
  for (const FunctionCall& function : support::function_calls()) {
    support::clear_log();
    function.call({4711, kPrivate});
    for (const LogCall& call : support::logged_calls()) {
      for (const auto& argument : call.arguments) {
        if (std::holds_alternative<long long>(argument)) {
          functions.insert(function.function);
        }
      }
    }
  }
  EXPECT_EQ(functions,
            (std::set<std::string>{"create_chatroom_reply_deserialize", "invite_reply_deserialize",
                                   "change_chatroom_meta_request_serialize"}));
}

// ---- Texts of calls that end the process

// The call, with its log lines on standard error.
template <typename Call>
void call_with_log_shown(Call&& call) {
  const support::LogObserver observer([](const LogCall& line) {
    std::fprintf(stderr, "%s\n", line.format.c_str());
    for (const auto& argument : line.arguments) {
      if (const auto* text = std::get_if<std::string>(&argument)) {
        std::fprintf(stderr, "%s\n", text->c_str());
      }
    }
  });
  call();
}

TEST(PrivacyDeathTest, WhenAnEnumSetterAborts_NothingShowsTheText) {
  support::Encoded out;
  const int64_t receiver = 1;
  const int content_type = 4;
  EXPECT_EXIT(call_with_log_shown([&] {
                create_chatroom_request_serialize(1, 5, &receiver, 1, kPrivate, &out.data.block,
                                                  &out.size);
              }),
              support::aborts, HidesPrivateText());
  EXPECT_EXIT(call_with_log_shown([&] {
                chat_request_serialize(1, 2, 3, 7, kPrivate, 4, 0, &out.data.block, &out.size);
              }),
              support::aborts, HidesPrivateText());
  EXPECT_EXIT(call_with_log_shown([&] {
                is_typing_request_serialize(1, 2, kPrivate, &content_type, nullptr, &out.data.block,
                                            &out.size);
              }),
              support::aborts, HidesPrivateText());
}

// ---- The access token

class AccessToken : public support::ExchangeTest {
 protected:
  support::Encoded out_;

  int serialize(const std::string& token) {
    return channel_auth_request_serialize(1, 2, 3, "app", token.c_str(), &out_.data.block,
                                          &out_.size);
  }
  void expect_hidden(const Said& said) {
    EXPECT_TRUE(shows(said.log, "channel_auth_request_serialize"));  // or nothing was captured
    EXPECT_FALSE(shows(said.log, kPrivate)) << said.log;
    EXPECT_FALSE(shows(said.standard_error, kPrivate)) << said.standard_error;
  }
};

using AccessTokenDeathTest = AccessToken;

// Longer than a string object holds in itself, so that it is a block of its own.
const std::string kToken = kPrivate + std::string(100, 'x');

TEST_F(AccessToken, WhenTheCallSucceeds_IsInTheMessageAlone) {
  expect_hidden(said_by([&] { ASSERT_EQ(serialize(kToken), 0); }));
  EXPECT_TRUE(shows(out_.bytes(), kToken));
}

TEST_F(AccessToken, WhenItIsNoUtf8_IsNotShown) {
  const Said said = said_by([&] { ASSERT_EQ(serialize(kPrivateNoUtf8), 0); });
  expect_hidden(said);
  EXPECT_TRUE(shows(said.standard_error, "contains invalid UTF-8"));
}

TEST_F(AccessToken, WhenTheBufferCannotBeAllocated_IsNotShown) {
  expect_hidden(said_by([&] {
    const support::FailingCalloc fault(1);
    ASSERT_EQ(serialize(kToken), -1);
  }));
}

TEST_F(AccessToken, WhenTheMessageCannotBeAllocated_IsNotShown) {
  bool thrown = true;
  int n = 0;
  while (thrown) {
    ++n;
    expect_hidden(said_by([&] {
      const support::FailingNew fault(n);
      try {
        serialize(kToken);
        thrown = false;
      } catch (const std::bad_alloc& error) {
        EXPECT_FALSE(shows(error.what(), kPrivate));
      }
    }));
  }
  EXPECT_GT(n, 3);  // both texts' strings and what they hold
}

TEST_F(AccessTokenDeathTest, WhenAnExceptionEndsTheProcess_IsNotShown) {
  EXPECT_EXIT(call_with_log_shown([&]() noexcept {
                const support::FailingNew fault(3);
                serialize(kToken);
              }),
              support::aborts, HidesPrivateText());
}

TEST_F(AccessTokenDeathTest, WhenAnotherArgumentFaults_IsNotShown) {
  EXPECT_EXIT(call_with_log_shown([&] {
                channel_auth_request_serialize(1, 2, 3, nullptr, kToken.c_str(), &out_.data.block,
                                               &out_.size);
              }),
              support::faults, HidesPrivateText());
}

}  // namespace
