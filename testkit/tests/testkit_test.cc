// What the C functions do where no scenario can be played.

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "qel-testkit.h"

namespace {

using Kit = std::unique_ptr<qel_testkit_t, decltype(&qel_testkit_release)>;

// A text of blanks as long as its address space, which takes the memory of one piece.
class LongText {
 public:
  LongText() : file_(memfd_create("blanks", MFD_CLOEXEC)) {
    const std::string blanks(kPiece, ' ');
    is_there_ = begin_ != MAP_FAILED && write(file_, blanks.data(), kPiece) == kPiece;
    for (size_t i = 0; is_there_ && i < kPieces; ++i) {
      is_there_ = mmap(text() + i * kPiece, kPiece, PROT_READ, MAP_PRIVATE | MAP_FIXED, file_, 0) !=
                  MAP_FAILED;
    }
  }
  ~LongText() {
    munmap(begin_, kSize);
    close(file_);
  }
  LongText(const LongText&) = delete;
  LongText& operator=(const LongText&) = delete;

  bool is_there() const { return is_there_; }
  char* text() const { return static_cast<char*>(begin_); }

 private:
  static constexpr size_t kPiece = size_t{1} << 21U;
  static constexpr size_t kPieces = 1024;
  static constexpr size_t kSize = kPiece * kPieces + 1;  // and the end

  int file_;
  void* begin_ = mmap(nullptr, kSize, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  bool is_there_ = false;
};

TEST(TestKitFunctions, New_WhenTheScenarioHas2GiB_RefusesIt) {
  constexpr bool is_possible = PTRDIFF_MAX > INT32_MAX;
  const LongText scenario;
  if (!is_possible || !scenario.is_there()) {
    GTEST_SKIP() << "there is no address space for it";
  }
  const Kit kit(qel_testkit_new(scenario.text()), &qel_testkit_release);
  EXPECT_STREQ(qel_testkit_report(kit.get()),
               "The scenario cannot be read: line 1, column 1: it has 2 GiB or more.\n");
}

TEST(TestKitFunctions, Sent_WhenTheCallIsWrong_SaysSoRatherThanThatThereIsNoMemory) {
  const Kit kit(qel_testkit_new(nullptr), &qel_testkit_release);
  qel_testkit_sent(kit.get(), nullptr, nullptr, 0);  // without a name
  EXPECT_EQ(std::string(qel_testkit_report(kit.get()))
                .find("The test kit has a mistake, or was called wrongly: "),
            0U);
}

}  // namespace
