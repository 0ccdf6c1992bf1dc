// The workstation's log service. On its own: the other test programs bring one of theirs.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <regex.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <numeric>
#include <string>
#include <thread>
#include <vector>

extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...);

namespace {

// What write puts on standard error while that is connected to the descriptor into; read from from,
// one read after the other.
template <typename Write>
std::vector<std::string> pieces(int into, int from, const Write& write) {
  const int before = dup(STDERR_FILENO);
  dup2(into, STDERR_FILENO);
  write();
  dup2(before, STDERR_FILENO);
  close(before);

  std::vector<std::string> read_pieces;
  char chunk[8192];
  fcntl(from, F_SETFL, O_NONBLOCK);
  for (ssize_t n = 0; (n = read(from, chunk, sizeof chunk)) > 0;) {
    read_pieces.emplace_back(chunk, static_cast<size_t>(n));
  }
  return read_pieces;
}

// A socket keeps apart what was written apart.
template <typename Write>
std::vector<std::string> pieces_on_socket(const Write& write) {
  int ends[2];
  EXPECT_EQ(socketpair(AF_UNIX, SOCK_SEQPACKET, 0, ends), 0);
  auto all = pieces(ends[1], ends[0], write);
  close(ends[0]);
  close(ends[1]);
  return all;
}

std::string joined(const std::vector<std::string>& all) {
  return std::accumulate(all.begin(), all.end(), std::string());
}

// What a call prints where there is no terminal.
template <typename... Arguments>
std::string printed(int priority, const char* tag, const char* format, Arguments... arguments) {
  return joined(pieces_on_socket([&] { __dlog_print(0, priority, tag, format, arguments...); }));
}

// A pseudo-terminal that passes line ends on as they are written.
class Terminal {
 public:
  Terminal() : master_(posix_openpt(O_RDWR | O_NOCTTY)) {
    if (master_ >= 0 && grantpt(master_) == 0 && unlockpt(master_) == 0) {
      slave_ = open(ptsname(master_), O_RDWR | O_NOCTTY);
    }
    termios mode;
    if (exists() && tcgetattr(slave_, &mode) == 0) {
      cfmakeraw(&mode);
      tcsetattr(slave_, TCSANOW, &mode);
    }
  }
  ~Terminal() {
    close(slave_);
    close(master_);
  }
  Terminal(const Terminal&) = delete;
  Terminal& operator=(const Terminal&) = delete;

  bool exists() const { return slave_ >= 0; }

  template <typename Write>
  std::string captured(const Write& write) const {
    return joined(pieces(slave_, master_, write));
  }

 private:
  int master_;
  int slave_ = -1;
};

// The line's text, behind time, priority, tag, process and thread.
std::string text_of(const std::string& line) {
  const size_t at = line.find(": ");
  return at == std::string::npos ? "no line: " + line : line.substr(at + 2);
}

class DlogStandin : public ::testing::Test {
 protected:
  DlogStandin() {  // whatever the environment of the tests has
    unsetenv("DLOG_STANDIN_PRIORITY");
    unsetenv("NO_COLOR");
  }
};

class DlogStandinOnATerminal : public DlogStandin {
 protected:
  void SetUp() override {
    if (!terminal_.exists()) {
      GTEST_SKIP() << "no pseudo-terminals on this machine";
    }
  }
  const Terminal terminal_;
};

TEST_F(DlogStandin, WhenCalled_PrintsTimePriorityTagProcessAndThread) {
  const std::string line = printed(5, "TAG", "%s is %d and %lld", "x", -1, 5000000000LL);
  const std::string process = std::to_string(getpid());
  const std::string pattern = "^[0-2][0-9]:[0-5][0-9]:[0-6][0-9][.][0-9]{3} W TAG P" + process +
                              " T" + process + ": x is -1 and 5000000000\n$";
  regex_t compiled;  // of the C library, as std::regex takes seconds to compile
  ASSERT_EQ(regcomp(&compiled, pattern.c_str(), REG_EXTENDED | REG_NOSUB), 0);
  EXPECT_EQ(regexec(&compiled, line.c_str(), 0, nullptr, 0), 0) << line;
  regfree(&compiled);
}

int64_t milliseconds_now() {
  using std::chrono::milliseconds;
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return std::chrono::duration_cast<milliseconds>(now).count();
}

TEST_F(DlogStandin, WhenCalled_PrintsTheLocalTimeInMilliseconds) {
  setenv("TZ", "HERE-05:45", 1);
  tzset();
  const int64_t before = milliseconds_now();
  const std::string line = printed(5, "TAG", "text");
  const int64_t after = milliseconds_now();

  int hours = 0;
  int minutes = 0;
  int seconds = 0;
  int fraction = 0;
  ASSERT_EQ(sscanf(line.c_str(), "%d:%d:%d.%d", &hours, &minutes, &seconds, &fraction), 4) << line;
  const int64_t local = ((hours * 60 + minutes) * 60 + seconds) * 1000 + fraction;
  constexpr int64_t kDay = 24 * 60 * 60 * 1000;
  const int64_t since = (local - (5 * 60 + 45) * 60 * 1000 - before) % kDay;
  EXPECT_LE((since + kDay) % kDay, after - before) << line;
}

TEST_F(DlogStandin, WhenCalled_WritesTheLineAtOnce) {
  EXPECT_EQ(pieces_on_socket([] { __dlog_print(0, 5, "TAG", "text"); }).size(), 1u);
}

TEST_F(DlogStandin, WhenCalledByAnotherThread_PrintsThatThreadsId) {
  long id = 0;
  const std::string line = joined(pieces_on_socket([&] {
    std::thread([&] {
      id = syscall(SYS_gettid);
      __dlog_print(0, 3, "TAG", "text");
    }).join();
  }));
  EXPECT_NE(line.find(" T" + std::to_string(id) + ": text\n"), std::string::npos) << line;
}

TEST_F(DlogStandin, OfEachPriority_PrintsTheLetter) {
  const std::string letters = "??VDIWEFS?";
  for (int priority = 0; priority < static_cast<int>(letters.size()); ++priority) {
    const std::string line = printed(priority, "TAG", "text");
    EXPECT_EQ(line.substr(13, 2), letters.substr(static_cast<size_t>(priority), 1) + " ");
  }
}

TEST_F(DlogStandin, WhenPriorityIsNegative_PrintsAQuestionMark) {
  const std::string line = printed(-1, "TAG", "text");
  EXPECT_EQ(line.substr(13, 2), "? ");
}

TEST_F(DlogStandinOnATerminal, KeepsColours) {
  const std::string line =
      terminal_.captured([] { __dlog_print(0, 6, "T", "a \033[31m[%d]b\033[0m", 7); });
  EXPECT_EQ(text_of(line), "a \033[31m[7]b\033[0m\n");
}

TEST_F(DlogStandinOnATerminal, WhenNoColorIsSet_RemovesColours) {
  const auto write = [] { __dlog_print(0, 6, "T", "a \033[31m[%d]b\033[0m", 7); };
  setenv("NO_COLOR", "1", 1);
  EXPECT_EQ(text_of(terminal_.captured(write)), "a [7]b\n");
  setenv("NO_COLOR", "", 1);
  EXPECT_EQ(text_of(terminal_.captured(write)), "a \033[31m[7]b\033[0m\n");
}

TEST_F(DlogStandin, ElsewhereThanOnATerminal_RemovesColours) {
  const std::string line = printed(6, "T", "a \033[31m[%d]b\033[0m", 7);
  EXPECT_EQ(text_of(line), "a [7]b\n");
}

TEST_F(DlogStandin, WhenTextHasALineBreak_StaysOneLine) {
  const std::string line = printed(3, "T", "count=3\n\033[0m");
  EXPECT_EQ(text_of(line), "count=3\\n\n");
}

TEST_F(DlogStandin, WhenTextIsTooLong_PrintsOneLineOf4096Bytes) {
  const std::string text(10000, 'x');
  const std::string line = printed(3, "T", "%s", text.c_str());
  EXPECT_LE(line.size(), 4096u);
  EXPECT_GT(line.size(), 4000u);
  EXPECT_EQ(std::count(line.begin(), line.end(), '\n'), 1);
  EXPECT_EQ(line.back(), '\n');
}

TEST_F(DlogStandinOnATerminal, WhenAColouredTextIsTooLong_EndsTheColour) {
  // Shorter than the log service's memory, longer than its line.
  const std::string text(4080, 'x');
  const std::string line =
      terminal_.captured([&] { __dlog_print(0, 6, "T", "\033[31m%s\033[0m", text.c_str()); });
  EXPECT_EQ(line.substr(line.size() - 6), "x\033[0m\n");
}

TEST_F(DlogStandin, WhenTagIsTooLong_PrintsOneLine) {
  const std::string tag(10000, 'x');
  const std::string line = printed(3, tag.c_str(), "text");
  EXPECT_LE(line.size(), 4096u);
  EXPECT_EQ(line.back(), '\n');
}

TEST_F(DlogStandin, WhenAPriorityIsAskedFor_PrintsItAndThoseAbove) {
  setenv("DLOG_STANDIN_PRIORITY", "W", 1);
  EXPECT_EQ(printed(4, "T", "text"), "");
  EXPECT_NE(printed(5, "T", "text"), "");
}

TEST_F(DlogStandin, WhenSilenceIsAskedFor_PrintsNothing) {
  setenv("DLOG_STANDIN_PRIORITY", "S", 1);
  EXPECT_EQ(printed(6, "T", "text"), "");
}

TEST_F(DlogStandin, WhenThePrioritySettingIsEmpty_PrintsAll) {
  setenv("DLOG_STANDIN_PRIORITY", "", 1);
  EXPECT_NE(printed(2, "T", "text"), "");
}

}  // namespace
