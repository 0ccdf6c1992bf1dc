// Session files that are made here byte by byte, whole and damaged.

#include "recording.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <vector>

#include "failure.h"
#include "numbers.h"

namespace {

using qel_wire::read_recording;
using namespace std::string_literals;

constexpr uint16_t kUser0 = 147;
constexpr uint64_t kTime = 1'700'000'000'123'456'789;

std::string beginning(uint16_t link = kUser0) {
  return block(0x0a0d0d0a,
               little_endian(0x1a2b3c4d, 4) + little_endian(1, 4) + std::string(8, '\xff')) +
         block(1, little_endian(link, 4) + little_endian(0, 4) + "\x09\0\1\0\x09\0\0\0\0\0\0\0"s);
}

std::string packet(const std::string& data, size_t size) {
  return block(6, little_endian(0, 4) + little_endian(kTime >> 32U, 4) + little_endian(kTime, 4) +
                      little_endian(data.size(), 4) + little_endian(size, 4) + data);
}

std::string data_of(uint32_t number, const std::string& bytes, const std::string& name = "f",
                    char direction = '\2', char end = '\1') {
  return "qel\1" + little_endian(number, 4) + direction + end + little_endian(name.size(), 2) +
         name + bytes;
}

std::string record(uint32_t number, const std::string& bytes) {
  const std::string data = data_of(number, bytes);
  return packet(data, data.size());
}

std::string room(size_t size) {
  return block(0x80000000, std::string(size - 12, '\0'));
}

// The records' numbers and bytes, and then the notes.
std::string told(const qel_wire::Recording& recording) {
  std::string text;
  for (const qel_wire::Record& each : recording.records) {
    text += std::to_string(each.number) + each.bytes + " ";
  }
  for (const std::string& note : recording.notes) {
    text += "\n" + note;
  }
  return text;
}

std::string told(const std::string& file) {
  return told(read_recording(file));
}

std::string refusal_of(const std::string& file) {
  try {
    return told(file);
  } catch (const qel_wire::Failure& failure) {
    return failure.reason;
  }
}

TEST(Recording, Record_HasWhatWasWritten) {
  const std::string data = data_of(7, "hello", "chat_reply_deserialize", '\2', '\2');
  const auto recording = read_recording(beginning() + packet(data, data.size() + 10));
  const qel_wire::Record& record = recording.records.at(0);
  EXPECT_EQ(record.number, 7U);
  EXPECT_EQ(record.use, qel_wire::Use::kReceives);
  EXPECT_EQ(record.outcome, qel_wire::Outcome::kRefused);
  EXPECT_EQ(record.time, std::chrono::nanoseconds(kTime));
  EXPECT_EQ(record.name, "chat_reply_deserialize");
  EXPECT_EQ(record.bytes, "hello");
  EXPECT_EQ(record.missing, 10U);
}

TEST(Recording, OfTwoSections_IsInTheOrderOfNumbers) {
  EXPECT_EQ(told(beginning() + record(5, "e") + room(64) + beginning() + record(3, "c") +
                 record(4, "d") + room(12)),
            "3c 4d 5e ");
}

TEST(Recording, WithASectionThatIsEmpty_HasTheOther) {
  EXPECT_EQ(told(beginning() + room(4096) + beginning() + record(1, "a") + room(64)), "1a ");
}

TEST(Recording, WithoutRecords_IsEmpty) {
  EXPECT_EQ(told(beginning() + room(64)), "");
}

TEST(Recording, OfALargeMessage_HasAllOfIt) {
  const std::string large(262144 - data_of(1, "").size(), 'x');
  EXPECT_EQ(told(beginning() + record(1, large) + record(2, "b")), "1" + large + " 2b ");
}

// At each byte: the records whose last byte is there are read, and that a block is cut is told.
TEST(Recording, ThatIsCutAnywhere_IsReadUpToThere) {
  std::string file = beginning();
  size_t records = 0;
  for (const std::string& each :
       {record(4, "d"), record(5, "ee"), room(64), beginning().substr(0, 28),
        beginning().substr(28), record(2, "b"), record(3, ""), room(1024), record(6, "f")}) {
    for (size_t size = 1; size < each.size(); ++size) {
      const auto cut = read_recording(file + each.substr(0, size));
      EXPECT_EQ(cut.records.size(), records) << file.size() + size;
      EXPECT_FALSE(cut.notes.empty()) << file.size() + size;
    }
    file += each;
    records += each[0] == '\6' ? 1 : 0;
    EXPECT_EQ(read_recording(file).records.size(), records);
    EXPECT_TRUE(read_recording(file).notes.empty()) << file.size();
  }
}

TEST(Recording, ThatIsCutBeforeItsFirstRecord_IsRefused) {
  for (size_t size = 12; size < beginning().size(); ++size) {
    EXPECT_THROW(qel_wire::is_recording(beginning().substr(0, size)), qel_wire::Failure) << size;
  }
}

TEST(Recording, WithZerosBehindARecord_HasWhatComesBefore) {
  const std::string file = beginning() + record(1, "a");
  EXPECT_EQ(told(file + std::string(100, '\0')),
            "1a \n100 bytes from offset " + std::to_string(file.size()) +
                " on cannot be read: block in pcapng dump file has a length of 0 < 12");
}

TEST(Recording, WithADamagedSection_HasTheNext) {
  EXPECT_EQ(told(beginning() + record(1, "a") + std::string(100, '\0') + beginning() +
                 record(2, "b") + std::string(7, '\1') + beginning() + record(3, "c"))
                .substr(0, 9),
            "1a 2b 3c ");
}

TEST(Recording, WithOtherPackets_CountsThem) {
  const std::string none = packet("none", 4);
  EXPECT_EQ(told(beginning() + record(1, "a") + none + none),
            "1a \n2 packets left out: no messages of a session");
}

// Shorter than its head or its name; of no direction, no end, no number.
TEST(Recording, OfRecordsThatAreNone_IsRefused) {
  const std::string data = data_of(1, "", "name");
  for (const std::string& none :
       {data.substr(0, 11), data.substr(0, 15), data_of(1, "", "", '\0'), data_of(1, "", "", '\3'),
        data_of(1, "", "", '\1', '\4'), data_of(0, "")}) {
    EXPECT_EQ(refusal_of(beginning() + packet(none, none.size())),
              "its packets are no messages of a session: it is of another use of this link type");
  }
}

TEST(Recording, OfAnotherVersion_IsRefused) {
  const std::string data = "qel\2" + data_of(1, "").substr(4);
  EXPECT_EQ(refusal_of(beginning() + packet(data, data.size())),
            "it is a session file of another version, which is not read");
}

TEST(Recording, IsToldByTheKindOfItsPackets) {
  EXPECT_TRUE(qel_wire::is_recording(beginning()));
  EXPECT_FALSE(qel_wire::is_recording(beginning(101)));
}

}  // namespace
