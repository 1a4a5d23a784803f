#include "backends/threads/system_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/socket.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pair;
using namespace std::string_literals;

class SystemLogTest : public ::testing::Test {
 protected:
  SystemLogTest() : folder_(::testing::TempDir() + "quazor-" + std::to_string(::getpid())), path_(folder_ + "/socket") {
    std::filesystem::create_directories(folder_);
  }
  ~SystemLogTest() override {
    stopJournal();
    std::filesystem::remove_all(folder_);
  }

  // Listens as the journal does.
  void startJournal() {
    journal_ = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    ASSERT_LT(path_.size(), sizeof address.sun_path);
    path_.copy(address.sun_path, path_.size());
    ASSERT_EQ(::bind(journal_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  void stopJournal() {
    if (journal_ >= 0) ::close(std::exchange(journal_, -1));
    std::filesystem::remove(path_);
  }
  std::optional<std::string> receive() {
    std::string datagram(200'000, '\0');
    const ssize_t size = ::recv(journal_, datagram.data(), datagram.size(), MSG_DONTWAIT);
    if (size < 0) return std::nullopt;
    datagram.resize(static_cast<std::size_t>(size));
    return datagram;
  }

  // Sends the journal as many datagrams as its queue holds; returns their number.
  int fillJournal() const {
    const int sender = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path_.copy(address.sun_path, path_.size());
    int sent = 0;
    while (::sendto(sender, "filler", 6, MSG_DONTWAIT, reinterpret_cast<const sockaddr*>(&address), sizeof address) >
           0) {
      ++sent;
    }
    ::close(sender);
    return sent;
  }

  SystemLog makeLog() {
    return SystemLog(path_, [this](int priority, const std::string& line) { syslog_.emplace_back(priority, line); });
  }

  const std::string folder_;
  const std::string path_;
  int journal_ = -1;
  std::vector<std::pair<int, std::string>> syslog_;
};

TEST_F(SystemLogTest, ALineIsOneDatagramWithItsFields) {
  startJournal();
  SystemLog log = makeLog();
  log.write(LogLevel::kError, "org.quazor.test", "quazor", "Failed at 50%!");
  EXPECT_EQ(receive(),
            "MESSAGE=Failed at 50%!\nPRIORITY=3\nSYSLOG_IDENTIFIER=quazor\n"
            "QUAZOR_SUBSYSTEM=org.quazor.test\nQUAZOR_CATEGORY=quazor\n");
  EXPECT_EQ(receive(), std::nullopt);
  EXPECT_THAT(syslog_, IsEmpty());
}

TEST_F(SystemLogTest, EachLevelHasItsPriority) {
  startJournal();
  SystemLog log = makeLog();
  const struct {
    LogLevel level;
    const char* field;
  } kRows[] = {
      {LogLevel::kError, "\nPRIORITY=3\n"},
      {LogLevel::kDefault, "\nPRIORITY=5\n"},
      {LogLevel::kDebug, "\nPRIORITY=7\n"},
  };
  for (const auto& row : kRows) {
    log.write(row.level, "s", "c", "text");
    EXPECT_THAT(receive().value_or(""), ::testing::HasSubstr(row.field));
  }
}

TEST_F(SystemLogTest, AValueWithLineBreaksCarriesItsLength) {
  startJournal();
  SystemLog log = makeLog();
  log.write(LogLevel::kError, "s", "c", "one\nMESSAGE=two");
  EXPECT_EQ(receive(),
            "MESSAGE\n\x0F\0\0\0\0\0\0\0one\nMESSAGE=two\n"
            "PRIORITY=3\nSYSLOG_IDENTIFIER=quazor\nQUAZOR_SUBSYSTEM=s\nQUAZOR_CATEGORY=c\n"s);
  log.write(LogLevel::kError, "s", "c", std::string(300, 'a') + "\n");
  EXPECT_EQ(receive().value_or("").substr(0, 18), "MESSAGE\n\x2D\x01\0\0\0\0\0\0aa"s);
}

TEST_F(SystemLogTest, AVeryLongTextIsCutBetweenCharacters) {
  startJournal();
  SystemLog log = makeLog();
  const std::string fits(SystemLog::kLongestText, 'a');
  log.write(LogLevel::kError, "s", "c", fits);
  EXPECT_EQ(receive().value_or("").substr(0, 9 + fits.size()), std::string("MESSAGE=") + fits + "\n");
  std::string too_long(SystemLog::kLongestText - 1, 'a');
  too_long += "\u20AC and more";  // three bytes, the first of which would fit
  log.write(LogLevel::kError, "s", "c", too_long);
  EXPECT_EQ(receive().value_or("").substr(0, 8 + fits.size()),
            std::string("MESSAGE=") + std::string(SystemLog::kLongestText - 1, 'a') + "\n");
  log.write(LogLevel::kError, "s", "c", std::string(SystemLog::kLongestText + 10, '\x80'));
  EXPECT_GE(receive().value_or("").size(), SystemLog::kLongestText) << "bytes that are no text are kept too";
  EXPECT_THAT(syslog_, IsEmpty());
}

TEST_F(SystemLogTest, WithoutAJournalTheLineGoesToSyslog) {
  SystemLog log = makeLog();
  log.write(LogLevel::kError, "s", "quazor", "100%s");
  log.write(LogLevel::kDefault, "s", "quazor", "two\nlines");
  log.write(LogLevel::kDebug, "s", "other", "");
  EXPECT_THAT(syslog_, ElementsAre(Pair(LOG_ERR, "quazor: 100%s"), Pair(LOG_NOTICE, "quazor: two\nlines"),
                                   Pair(LOG_DEBUG, "other: ")));
}

TEST_F(SystemLogTest, AJournalThatIsRestartedIsFoundAgain) {
  startJournal();
  SystemLog log = makeLog();
  log.write(LogLevel::kError, "s", "c", "before");
  EXPECT_TRUE(receive().has_value());
  stopJournal();
  log.write(LogLevel::kError, "s", "c", "between");
  EXPECT_THAT(syslog_, ElementsAre(Pair(LOG_ERR, "c: between")));
  startJournal();
  log.write(LogLevel::kError, "s", "c", "after");
  EXPECT_TRUE(receive().has_value());
  EXPECT_EQ(syslog_.size(), 1U);
}

TEST_F(SystemLogTest, AJournalThatDoesNotReadCostsALineAndNotTheProcess) {
  startJournal();
  SystemLog log = makeLog();
  const int sent = fillJournal();
  ASSERT_GT(sent, 0);
  log.write(LogLevel::kError, "s", "c", "dropped");
  EXPECT_THAT(syslog_, IsEmpty());
  int received = 0;
  for (auto datagram = receive(); datagram.has_value(); datagram = receive()) {
    EXPECT_EQ(datagram, "filler");
    ++received;
  }
  EXPECT_EQ(received, sent);
}

TEST_F(SystemLogTest, APathTooLongForASocketCountsAsAbsent) {
  std::vector<std::string> lines;
  SystemLog log(std::string("/") + std::string(107, 'x'), [&](int, const std::string& line) { lines.push_back(line); });
  log.write(LogLevel::kError, "s", "c", "text");
  EXPECT_THAT(lines, ElementsAre("c: text"));
}

}  // namespace
}  // namespace quazor
