#include "backends/log/standard_error_log.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <pthread.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <csignal>
#include <cstddef>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

using std::chrono::milliseconds;
using std::chrono::nanoseconds;

class FixedClock final : public Clock {
 public:
  nanoseconds now() const override { return nanoseconds(0); }
  Date date() const override { return Date(nanoseconds(1'795'223'280'000'000'000)); }  // 2026-11-21 01:08:00 UTC
  void sleep(nanoseconds) override {}
};

TEST(ReadableLogLineTest, ShowsTimeLevelCategoryAndText) {
  const Date date = FixedClock().date();
  const struct {
    const char* name;
    Date date;
    LogLevel level;
    const char* text;
    const char* line;
  } kRows[] = {
      {"error", date, LogLevel::kError, "Failed!", "2026-11-21 01:08:00.000 error quazor: Failed!\n"},
      {"default", date, LogLevel::kDefault, "Text.", "2026-11-21 01:08:00.000 default quazor: Text.\n"},
      {"debug", date, LogLevel::kDebug, "Text.", "2026-11-21 01:08:00.000 debug quazor: Text.\n"},
      {"milliseconds", date + milliseconds(7), LogLevel::kDebug, "a", "2026-11-21 01:08:00.007 debug quazor: a\n"},
      {"a nanosecond before the next second", date + nanoseconds(999'999'999), LogLevel::kDebug, "a",
       "2026-11-21 01:08:00.999 debug quazor: a\n"},
      {"before 1970", Date(milliseconds(-1)), LogLevel::kDebug, "a", "1969-12-31 23:59:59.999 debug quazor: a\n"},
      {"no text", date, LogLevel::kError, "", "2026-11-21 01:08:00.000 error quazor: \n"},
      {"two lines", date, LogLevel::kError, "one\ntwo", "2026-11-21 01:08:00.000 error quazor: one\n    two\n"},
      {"an empty line within", date, LogLevel::kError, "one\n\ntwo",
       "2026-11-21 01:08:00.000 error quazor: one\n    \n    two\n"},
      {"line breaks at the end", date, LogLevel::kError, "one\n\n", "2026-11-21 01:08:00.000 error quazor: one\n"},
      {"percent signs", date, LogLevel::kError, "100%d", "2026-11-21 01:08:00.000 error quazor: 100%d\n"},
  };
  for (const auto& row : kRows)
    EXPECT_EQ(readableLogLine(row.date, row.level, "quazor", row.text), row.line) << row.name;
}

// A pair of connected descriptors that preserves the boundaries of writes.
class StandardErrorLogTest : public ::testing::Test {
 protected:
  StandardErrorLogTest() {
    if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends_.data()) != 0) ADD_FAILURE() << "no socket pair";
  }
  ~StandardErrorLogTest() override {
    for (const int end : ends_) ::close(end);
  }

  // The bytes of one write.
  std::string receive() {
    std::string packet(100'000, '\0');
    const ssize_t size = ::recv(ends_[1], packet.data(), packet.size(), MSG_DONTWAIT);
    packet.resize(size < 0 ? 0 : static_cast<std::size_t>(size));
    return packet;
  }

  std::array<int, 2> ends_{-1, -1};
};

TEST_F(StandardErrorLogTest, ALineIsOneWrite) {
  StandardErrorLog log(std::make_shared<FixedClock>(), ends_[0]);
  log.write(LogLevel::kError, "subsystem", "quazor", "one\ntwo");
  log.write(LogLevel::kDebug, "subsystem", "quazor", "three");
  EXPECT_EQ(receive(), "2026-11-21 01:08:00.000 error quazor: one\n    two\n");
  EXPECT_EQ(receive(), "2026-11-21 01:08:00.000 debug quazor: three\n");
  EXPECT_EQ(receive(), "");
}

TEST_F(StandardErrorLogTest, ALineThatCannotBeWrittenIsDropped) {
  StandardErrorLog log(std::make_shared<FixedClock>(), -1);
  log.write(LogLevel::kError, "subsystem", "quazor", "lost");
}

TEST(StandardErrorLogPipeTest, ALineIsWrittenWholeAlthoughASignalInterruptsIt) {
  struct sigaction action {};
  struct sigaction before {};
  action.sa_handler = [](int) {};  // without SA_RESTART, write() returns the count so far
  ASSERT_EQ(::sigaction(SIGUSR1, &action, &before), 0);
  std::array<int, 2> ends{-1, -1};
  ASSERT_EQ(::pipe2(ends.data(), O_CLOEXEC), 0);
  const int capacity = ::fcntl(ends[1], F_GETPIPE_SZ);
  ASSERT_GT(capacity, 0);
  const std::string text(2 * static_cast<std::size_t>(capacity), 'a');
  std::thread writer([&] {
    StandardErrorLog(std::make_shared<FixedClock>(), ends[1]).write(LogLevel::kError, "s", "quazor", text);
    ::close(ends[1]);
  });
  for (int filled = 0; filled < capacity; ::ioctl(ends[0], FIONREAD, &filled)) std::this_thread::yield();
  ::pthread_kill(writer.native_handle(), SIGUSR1);
  std::string received;
  std::array<char, 4096> part{};
  for (ssize_t size = 0; (size = ::read(ends[0], part.data(), part.size())) > 0;) {
    received.append(part.data(), static_cast<std::size_t>(size));
  }
  writer.join();
  ::close(ends[0]);
  ::sigaction(SIGUSR1, &before, nullptr);
  EXPECT_EQ(received, std::string("2026-11-21 01:08:00.000 error quazor: ") + text + "\n");
}

TEST(StandardErrorLogPipeTest, LongLinesOfSeveralThreadsDoNotMix) {
  constexpr int kLines = 40;
  std::array<int, 2> ends{-1, -1};
  ASSERT_EQ(::pipe2(ends.data(), O_CLOEXEC), 0);
  std::string received;
  std::thread reader([&] {
    std::array<char, 1000> part{};
    for (ssize_t size = 0; (size = ::read(ends[0], part.data(), part.size())) > 0;) {
      received.append(part.data(), static_cast<std::size_t>(size));
    }
  });
  {
    StandardErrorLog log(std::make_shared<FixedClock>(), ends[1]);
    std::vector<std::thread> writers;
    for (const char letter : {'a', 'b', 'c'}) {
      writers.emplace_back([&log, letter] {  // longer than a pipe takes in one piece
        for (int i = 0; i < kLines; ++i) log.write(LogLevel::kError, "s", "quazor", std::string(100'000, letter));
      });
    }
    for (std::thread& writer : writers) writer.join();
  }
  ::close(ends[1]);
  reader.join();
  ::close(ends[0]);

  std::set<std::string> expected;
  for (const char letter : {'a', 'b', 'c'}) {
    expected.insert(std::string("2026-11-21 01:08:00.000 error quazor: ") + std::string(100'000, letter));
  }
  std::istringstream lines(received);
  int count = 0;
  for (std::string line; std::getline(lines, line); ++count) {
    ASSERT_TRUE(expected.contains(line)) << "line " << count << " of " << line.size() << " bytes";
  }
  EXPECT_EQ(count, 3 * kLines);
}

}  // namespace
}  // namespace quazor
