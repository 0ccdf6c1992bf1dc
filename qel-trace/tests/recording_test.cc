// The ring, record by record, as a reader finds it at that moment.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <map>
#include <string>
#include <vector>

extern "C" {
#include "recording.h"
}

namespace {

uint32_t number_at(const std::string& bytes, size_t at) {
  uint32_t number = 0;
  std::memcpy(&number, bytes.data() + at, sizeof number);
  return number;
}

std::string content_of(const std::string& file) {
  std::ifstream input(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(input), {}};
}

struct Found {
  int outcome;
  std::string message;
  size_t original_size;
};

// The records by their numbers; none if the file is not a row of whole blocks.
std::map<uint32_t, Found> records_of(const std::string& file) {
  const std::string bytes = content_of(file);
  std::map<uint32_t, Found> records;
  for (size_t at = 0; at < bytes.size();) {
    const size_t size = number_at(bytes, at + 4);
    if (size < 12 || size > bytes.size() - at || number_at(bytes, at + size - 4) != size) {
      ADD_FAILURE() << "no whole block at " << at;
      return {};
    }
    if (number_at(bytes, at) == 6) {
      const std::string data = bytes.substr(at + 28, number_at(bytes, at + 20));
      const size_t head = 12 + static_cast<unsigned char>(data[10]);
      records[number_at(data, 4)] = {data[9], data.substr(head), number_at(bytes, at + 24) - head};
    }
    at += size;
  }
  return records;
}

class Recording : public ::testing::Test {
 protected:
  void SetUp() override {
    folder_ = ::testing::TempDir() + "recording-XXXXXX";
    ASSERT_NE(mkdtemp(folder_.data()), nullptr);
    file_ = folder_ + "/session";
  }
  void TearDown() override {
    recording_leave(&recording_);
    unlink((file_ + ".old").c_str());
    unlink(file_.c_str());
    rmdir(folder_.c_str());
  }

  int create(size_t size = LEAST_SIZE) {
    return recording_create(&recording_, file_.c_str(), size, "a test");
  }
  record_place_t add(const std::string& message, const std::vector<std::string>& hidden = {}) {
    std::vector<secret_t> secrets;
    for (const std::string& secret : hidden) {
      secrets.push_back({secret.data(), secret.size()});
    }
    const record_t record = {RECEIVED,
                             NOT_ENDED,
                             1,
                             "name",
                             reinterpret_cast<const unsigned char*>(message.data()),
                             message.size(),
                             secrets.data(),
                             secrets.size()};
    return recording_add(&recording_, &record);
  }

  std::string folder_, file_;
  recording_t recording_ = {};
};

TEST_F(Recording, AfterEachOfManyRecords_HasTheLastOnesInARow) {
  ASSERT_EQ(create(), 0);
  std::map<uint32_t, std::string> added;
  for (uint32_t number = 1; number <= 700; ++number) {
    added[number] = std::string(number * 7919 % 997, static_cast<char>('a' + number % 26));
    add(added[number]);
    const auto records = records_of(file_);
    ASSERT_FALSE(records.empty());
    ASSERT_EQ(records.rbegin()->first, number);
    ASSERT_EQ(records.size(), number - records.begin()->first + 1);
    size_t size = 0;
    for (const auto& [found, record] : records) {
      ASSERT_EQ(record.message, added[found]);
      size += record.message.size() + 64;
    }
    ASSERT_TRUE(records.begin()->first == 1 || size > LEAST_SIZE / 2) << "too few are left";
  }
  EXPECT_GT(records_of(file_).begin()->first, 1U) << "the ring has never turned";
  EXPECT_EQ(content_of(file_).size(), size_t{LEAST_SIZE});
}

// From messages of the size that just fits into what is left, on to those that do not.
TEST_F(Recording, WhereTheRoomOfAHalfEnds_StaysARowOfBlocks) {
  for (size_t size = LEAST_SIZE / 2 - 400; size < LEAST_SIZE / 2; ++size) {
    ASSERT_EQ(create(), 0);
    add(std::string(size, 'x'));
    add("");
    const auto records = records_of(file_);
    ASSERT_EQ(records.size(), 2U);
    ASSERT_EQ(records.at(1).original_size, size);
    recording_leave(&recording_);
  }
}

TEST_F(Recording, WhenAMessageIsLongerThanAHalf_CutsItAndTellsItsSize) {
  ASSERT_EQ(create(), 0);
  const std::string message(LEAST_SIZE, 'x');
  add(message);
  const Found found = records_of(file_).at(1);
  EXPECT_EQ(found.original_size, message.size());
  EXPECT_EQ(found.message, message.substr(0, found.message.size()));
  EXPECT_GT(found.message.size(), LEAST_SIZE / 2 - 400);
}

TEST_F(Recording, OfSecrets_WritesAsterisksWhereverTheyAre) {
  ASSERT_EQ(create(), 0);
  add("secret, a secret and secre", {"secret"});
  EXPECT_EQ(records_of(file_).at(1).message, "******, a ****** and secre");
  add("one, two, one", {"two", "one"});
  EXPECT_EQ(records_of(file_).at(2).message, "***, ***, ***");
}

TEST_F(Recording, OfALongSecret_ComparesAllOfIt) {
  ASSERT_EQ(create(), 0);
  const std::string secret(100, 'x');
  add(std::string(99, 'x') + "!" + secret, {secret});
  EXPECT_EQ(records_of(file_).at(1).message, std::string(99, 'x') + "!" + std::string(100, '*'));
}

TEST_F(Recording, OfASecretWhereTheMessageIsCut_WritesNoPart) {
  ASSERT_EQ(create(), 0);
  for (size_t size = LEAST_SIZE / 2 - 400; size < LEAST_SIZE / 2; ++size) {
    add(std::string(size, 'x') + "secret" + std::string(400, 'x'), {"secret"});
    ASSERT_EQ(content_of(file_).find("se", 400), std::string::npos) << size;
  }
}

TEST_F(Recording, OfAMessageThatNeedsMoreOfTheUnusedBlocks_StaysARowOfBlocks) {
  ASSERT_EQ(create(1 << 20), 0);
  std::map<uint32_t, size_t> added;
  for (uint32_t number = 1; number <= 100; ++number) {
    added[number] = number * size_t{48271} % 200000;
    add(std::string(added[number], 'x'));
    for (const auto& [found, record] : records_of(file_)) {
      ASSERT_EQ(record.message.size(), added[found]);
    }
  }
}

TEST_F(Recording, WhenACallEnds_HasItsOutcome) {
  ASSERT_EQ(create(), 0);
  const record_place_t first = add("1");
  const record_place_t second = add("2");
  recording_end(&recording_, &first, DONE);
  EXPECT_EQ(records_of(file_).at(1).outcome, DONE);
  EXPECT_EQ(records_of(file_).at(2).outcome, NOT_ENDED);
  recording_end(&recording_, &second, REFUSED);
  EXPECT_EQ(records_of(file_).at(2).outcome, REFUSED);
}

TEST_F(Recording, WhenACallEndsWhoseRecordHasGone_ChangesNothing) {
  ASSERT_EQ(create(), 0);
  const record_place_t place = add("1");
  while (records_of(file_).count(1) > 0) {
    add(std::string(4000, 'x'));
  }
  const std::string before = content_of(file_);
  recording_end(&recording_, &place, DONE);
  EXPECT_EQ(content_of(file_), before);
}

TEST_F(Recording, WhenACallEndsWhoseFileIsAnother_ChangesNothing) {
  ASSERT_EQ(create(), 0);
  const record_place_t place = add("1");
  recording_leave(&recording_);
  ASSERT_EQ(create(), 0);
  add("1");
  recording_end(&recording_, &place, DONE);
  EXPECT_EQ(records_of(file_).at(1).outcome, NOT_ENDED);
}

TEST_F(Recording, WhenItsFileIsThere_RenamesIt) {
  std::ofstream(file_) << "before";
  ASSERT_EQ(create(), 0);
  EXPECT_EQ(content_of(file_ + ".old"), "before");
}

TEST_F(Recording, OfTheFile_LetsNobodyElseRead) {
  ASSERT_EQ(create(), 0);
  struct stat status {};
  ASSERT_EQ(stat(file_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0600U);
}

}  // namespace
