// Long lists and long texts, as no exchange has them today: nothing is cut, left out or mixed up.

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <functional>
#include <iterator>
#include <numeric>
#include <string>
#include <vector>

#include "qel-message-serialize.h"
#include "support/fields.h"

namespace {

using support::Fields;
using support::read;

// More than 16 bits count.
constexpr int kMany = 70000;

// Another one for each place, with bits in both halves.
int64_t id(int place) {
  return (int64_t{place} << 40) - 3 * int64_t{place} + 1;
}
int64_t other_id(int place) {
  return id(kMany + place);
}

std::vector<int64_t> ids() {
  std::vector<int64_t> all;
  for (int i = 0; i < kMany; ++i) {
    all.push_back(id(i));
  }
  return all;
}

// Such that no two pieces are alike.
std::string long_text(size_t size) {
  static const std::string numbers = [] {
    std::string text;
    for (int i = 0; i < 1500000; ++i) {
      text += std::to_string(i) + " ";
    }
    return text;
  }();
  return numbers.substr(0, size);
}

// ---- Requests

// What the function makes of the arguments.
template <typename Function, typename... Arguments>
void expect_encoding(const Fields& expected, Function serialize, Arguments... arguments) {
  unsigned char* data = nullptr;
  int size = 0;
  serialize(arguments..., &data, &size);
  ASSERT_EQ(static_cast<size_t>(size), expected.bytes().size());
  EXPECT_EQ(std::memcmp(data, expected.bytes().data(), expected.bytes().size()), 0);
  std::free(data);
}

TEST(Sizes, CreateChatroomRequest_TakesManyReceivers) {
  const std::vector<int64_t> receivers = ids();
  Fields expected = Fields().number(11, 7).number(12, 1);
  for (const int64_t receiver : receivers) {
    expected.number(13, receiver);
  }
  expect_encoding(expected, create_chatroom_request_serialize, 7, 1, receivers.data(), kMany,
                  nullptr);
}

TEST(Sizes, InviteChatRequest_TakesManyMembers) {
  const std::vector<int64_t> members = ids();
  Fields expected = Fields().number(11, 7).number(12, 42);
  for (const int64_t member : members) {
    expected.number(13, member);
  }
  const int count = kMany;
  expect_encoding(expected, invite_chat_request_serialize, 7, 42, members.data(), &count);
}

TEST(Sizes, EndChatRequest_TakesManyEntries) {
  std::vector<qel_message_endchatentry_t> entries;
  Fields expected = Fields().number(11, 7);
  for (int i = 0; i < kMany; ++i) {
    entries.push_back({id(i), i % 3 == 0});
    expected.message(12, Fields().number(1, id(i)).number(11, i % 3 == 0));
  }
  expect_encoding(expected, end_chat_request_serialize, 7, entries.data(), kMany);
}

// ---- Lists of replies and pushes

// A list's elements as the outputs have them, which are freed.
template <typename T>
void expect_elements(int count, T* elements, const std::function<bool(const T&, int)>& is_right) {
  ASSERT_EQ(count, kMany);
  for (int i = 0; i < kMany; ++i) {
    ASSERT_TRUE(is_right(elements[i], i)) << "element " << i;
  }
  std::free(elements);
}

void expect_ids(int count, int64_t* elements) {
  expect_elements<int64_t>(count, elements, [](int64_t got, int i) { return got == id(i); });
}

TEST(Sizes, ChatReply_HandsOutManyEntries) {
  Fields reply;
  for (int i = 0; i < kMany; ++i) {
    reply.message(14, Fields().number(1, id(i)).number(2, other_id(i)));
  }
  int count = 0;
  int64_t* messages = nullptr;
  int64_t* times = nullptr;
  read(chat_reply_deserialize, reply, nullptr, nullptr, nullptr, nullptr, &count, &messages,
       &times);
  expect_ids(count, messages);
  expect_elements<int64_t>(count, times, [](int64_t got, int i) { return got == other_id(i); });
}

// The outputs that a test does not look at.
int64_t ignored_number = 0;
int ignored_code = 0;

// The lists of refused users: of ids, in the order of the fields 1, 2, 3, 4 and 6, and of pairs.
struct Refused {
  int64_t* ids[5] = {};
  int counts[5] = {};
  qel_message_didviolationuser_t* pairs = nullptr;
  int pair_count = 0;

  void expect_many() const {
    for (int list = 0; list < 5; ++list) {
      if (ids[list] != nullptr) {
        expect_ids(counts[list], ids[list]);
      }
    }
    expect_elements<qel_message_didviolationuser_t>(pair_count, pairs, [](const auto& got, int i) {
      return got.userA == id(i) && got.userB == other_id(i);
    });
  }
};

Fields reply_with_many_refused() {
  Fields lists;
  for (int i = 0; i < kMany; ++i) {
    for (const int list : {1, 2, 3, 4, 6}) {
      lists.number(list, id(i));
    }
    lists.message(20, Fields().number(1, id(i)).number(2, other_id(i)));
  }
  return Fields().message(13, Fields().number(1, 1001).message(3, lists));
}

TEST(Sizes, CreateChatroomReply_HandsOutManyRefusedReceivers) {
  Refused out;
  read(create_chatroom_reply_deserialize, reply_with_many_refused(), &ignored_number,
       &ignored_number, &ignored_code, &ignored_code, nullptr, &out.ids[0], &out.counts[0],
       &out.ids[2], &out.counts[2], &out.pairs, &out.pair_count, &out.ids[4], &out.counts[4]);
  EXPECT_EQ(out.counts[0] + out.counts[2] + out.counts[4], 3 * kMany);
  out.expect_many();
}

TEST(Sizes, InviteReply_HandsOutManyRefusedMembers) {
  Refused out;
  read(invite_reply_deserialize, reply_with_many_refused(), &ignored_number, &ignored_number,
       &ignored_number, &ignored_code, nullptr, &out.ids[0], &out.counts[0], &out.ids[1],
       &out.counts[1], &out.ids[2], &out.counts[2], &out.ids[3], &out.counts[3], &out.pairs,
       &out.pair_count, &out.ids[4], &out.counts[4]);
  EXPECT_EQ(std::accumulate(std::begin(out.counts), std::end(out.counts), 0), 5 * kMany);
  out.expect_many();
}

// A text that is handed out, which is freed.
bool is_text(char* got, const std::string& expected) {
  const bool is_right = got != nullptr && got == expected;
  std::free(got);
  return is_right;
}

TEST(Sizes, AllowChatReply_HandsOutManyMembersAndMarks) {
  Fields reply;
  for (int i = 0; i < kMany; ++i) {
    reply.message(16, Fields().number(1, id(i)).number(2, i % 3 == 0).text(3, std::to_string(i)));
    const Fields mark = Fields().number(1, id(i)).number(2, i).number(3, other_id(i));
    reply.message(17, mark).message(20, mark);
  }
  qel_message_watermarkentry_t **deliveries = nullptr, **reads = nullptr;
  qel_message_chatroommember_t** members = nullptr;
  int delivery_count = 0, read_count = 0, member_count = 0;
  read(allow_chat_reply_deserialize, reply, &ignored_number, &ignored_number, &ignored_code,
       nullptr, &deliveries, &delivery_count, &ignored_number, &reads, &read_count, &ignored_number,
       &members, &member_count, nullptr, &ignored_code);
  expect_elements<qel_message_chatroommember_t*>(member_count, members, [](auto* got, int i) {
    const bool is_right = got->userId == id(i) && got->available == (i % 3 == 0) &&
                          is_text(got->name, std::to_string(i));
    std::free(got);
    return is_right;
  });
  const auto is_mark = [](qel_message_watermarkentry_t* got, int i) {
    const bool is_right = got->userId == id(i) && got->msgId == i && got->timestamp == other_id(i);
    std::free(got);
    return is_right;
  };
  expect_elements<qel_message_watermarkentry_t*>(delivery_count, deliveries, is_mark);
  expect_elements<qel_message_watermarkentry_t*>(read_count, reads, is_mark);
}

struct Page {
  qel_message_inboxentry_t** entries = nullptr;
  int count = 0;
  char* key = nullptr;

  explicit Page(const Fields& push) {
    read(forward_unread_message_deserialize, push, &ignored_number, &entries, &count, &key);
  }
};

TEST(Sizes, ForwardUnreadMessage_HandsOutManyEntries) {
  Fields push;
  for (int i = 0; i < kMany; ++i) {
    push.message(12, Fields().number(1, id(i)).number(3, other_id(i)).text(6, std::to_string(i)));
  }
  const Page page(push);
  expect_elements<qel_message_inboxentry_t*>(page.count, page.entries, [](auto* got, int i) {
    const bool is_right = got->msgId == id(i) && got->sender == other_id(i) &&
                          is_text(got->chatMsg, std::to_string(i));
    std::free(got);
    return is_right;
  });
}

// ---- Texts

class LongTexts : public ::testing::TestWithParam<size_t> {
 protected:
  const std::string text_ = long_text(GetParam());
};

INSTANTIATE_TEST_SUITE_P(Bytes, LongTexts, ::testing::Values(70000, size_t{9} << 20),
                         [](const auto& size) { return std::to_string(size.param); });

TEST_P(LongTexts, OfRequests_AreSentWhole) {
  const char* text = text_.c_str();
  expect_encoding(Fields().number(1, 7).number(2, 1).number(3, 2).text(5, text_).text(6, text_),
                  channel_auth_request_serialize, 7, 1, 2, text, text);
  const int64_t receiver = 5;
  expect_encoding(Fields().number(11, 7).number(12, 1).number(13, 5).text(14, text_),
                  create_chatroom_request_serialize, 7, 1, &receiver, 1, text);
  expect_encoding(Fields().number(11, 7).text(12, text_), forward_unread_message_reply_serialize, 7,
                  &text, nullptr);
  expect_encoding(Fields().number(11, 7).number(12, 42).number(13, 5).number(14, 9).text(15, text_),
                  unseal_message_request_serialize, 7, 42, 5, 9, text);
  expect_encoding(Fields()
                      .number(11, 7)
                      .number(12, 42)
                      .text(20, text_)
                      .text(21, text_)
                      .number(22, 5)
                      .number(23, 6)
                      .number(25, 60),
                  save_call_log_request_serialize, 7, 42, text, text, 5, 6, 60);
  expect_encoding(Fields().number(11, 7).number(12, 42).text(13, text_),
                  is_typing_request_serialize, 7, 42, text, nullptr, nullptr);
  expect_encoding(Fields().number(11, 7).number(12, 42).text(13, text_),
                  change_chatroom_meta_request_serialize, 7, 42, text, nullptr);
}

TEST_P(LongTexts, OfResults_AreHandedOutWhole) {
  const Fields result = Fields().number(1, 3).text(2, text_);
  char* text = nullptr;
  read(channel_auth_reply_deserialize, Fields().message(2, result), &ignored_number, &ignored_code,
       &text);
  EXPECT_TRUE(is_text(text, text_));
  read(unseal_message_reply_deserialize, Fields().message(13, result), &ignored_number,
       &ignored_number, &ignored_code, &text);
  EXPECT_TRUE(is_text(text, text_));
}

TEST_P(LongTexts, OfARoom_AreHandedOutWhole) {
  const Fields reply = Fields()
                           .message(13, Fields().text(2, text_))
                           .message(16, Fields().text(3, text_))
                           .text(18, text_);
  qel_message_watermarkentry_t** marks = nullptr;
  qel_message_chatroommember_t** members = nullptr;
  int count = 0;
  char* text = nullptr;
  char* title = nullptr;
  read(allow_chat_reply_deserialize, reply, &ignored_number, &ignored_number, &ignored_code, &text,
       &marks, &count, &ignored_number, &marks, &count, &ignored_number, &members, &count, &title,
       &ignored_code);
  EXPECT_TRUE(is_text(text, text_));
  EXPECT_TRUE(is_text(title, text_));
  EXPECT_TRUE(is_text(members[0]->name, text_));
  std::free(members[0]);
  std::free(members);
}

TEST_P(LongTexts, OfPushes_AreHandedOutWhole) {
  const Fields entry = Fields().text(6, text_);
  const Page page(Fields().message(12, entry).text(13, text_));
  EXPECT_TRUE(is_text(page.entries[0]->chatMsg, text_));
  EXPECT_TRUE(is_text(page.key, text_));
  std::free(page.entries[0]);
  std::free(page.entries);

  qel_message_inboxentry_t record = {};
  auto* pointer = &record;
  bool skip_reply = false;
  char* text = nullptr;
  read(forward_online_message_get_deserialize, Fields().message(14, entry), &ignored_number,
       &ignored_number, &ignored_code, &pointer, &skip_reply, &ignored_code, &text);
  EXPECT_TRUE(is_text(record.chatMsg, text_));

  read(typing_updated_deserialize, Fields().text(14, text_), &ignored_number, &ignored_number,
       &ignored_number, &text, &ignored_code, &ignored_code);
  EXPECT_TRUE(is_text(text, text_));
}

// Whether a reply can be read that has unknown groups in one another behind its text.
bool is_read(const std::string& text, int levels) {
  const std::string groups = std::string(static_cast<size_t>(levels), '\x63') +
                             std::string(static_cast<size_t>(levels), '\x64');
  const Fields result = Fields().text(2, text);
  int64_t request_id = -1;
  read(end_chat_reply_deserialize, Fields(Fields().message(12, result).bytes() + groups),
       &request_id, nullptr, nullptr);
  return request_id != -1;
}

TEST_P(LongTexts, BeforeAHundredLevels_AreRead) {
  EXPECT_TRUE(is_read(text_, 100));
}

TEST_P(LongTexts, BeforeMoreLevels_AreNotRead) {
  EXPECT_FALSE(is_read(text_, 101));
}

}  // namespace
