#include "backends/linux/system/journal_log.h"

#include "backends/log/recording_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using namespace std::string_literals;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

constexpr int kSeals = F_SEAL_SEAL | F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE;

// Listens on a given path, like the journal.
class FakeJournal {
 public:
  explicit FakeJournal(const std::string& path, int type = SOCK_DGRAM)
      : path_(path), socket_(::socket(AF_UNIX, type | SOCK_CLOEXEC, 0)) {
    const sockaddr_un address = this->address();
    EXPECT_EQ(::bind(socket_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  FakeJournal(const FakeJournal&) = delete;
  FakeJournal& operator=(const FakeJournal&) = delete;
  ~FakeJournal() { std::filesystem::remove(path_); }

  // The fields of the next line, marked if they came in a file; nothing if there is no line.
  std::optional<std::string> receive() {
    std::string datagram(300'000, '\0');
    iovec part{datagram.data(), datagram.size()};
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int))] = {};
    msghdr message{};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    message.msg_control = control;
    message.msg_controllen = sizeof control;
    const ssize_t size = ::recvmsg(socket_.get(), &message, MSG_DONTWAIT | MSG_CMSG_CLOEXEC);
    if (size < 0) return std::nullopt;
    datagram.resize(static_cast<std::size_t>(size));
    const cmsghdr* const header = CMSG_FIRSTHDR(&message);
    cameInAFile = header != nullptr;
    if (!cameInAFile) return datagram;
    EXPECT_EQ(datagram, "");
    EXPECT_EQ(header->cmsg_type, SCM_RIGHTS);
    int descriptor = -1;
    std::memcpy(&descriptor, CMSG_DATA(header), sizeof descriptor);
    return contentOf(FileDescriptor(descriptor));
  }

  // Fills the queue and returns the number of lines that it holds.
  int fill() const {
    const FileDescriptor sender(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    const sockaddr_un to = address();
    int sent = 0;
    while (::sendto(sender.get(), "filler", 6, MSG_DONTWAIT, reinterpret_cast<const sockaddr*>(&to), sizeof to) > 0) {
      ++sent;
    }
    EXPECT_GT(sent, 0);
    return sent;
  }

  bool cameInAFile = false;

 private:
  sockaddr_un address() const {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    EXPECT_LT(path_.size(), sizeof address.sun_path);
    path_.copy(address.sun_path, sizeof address.sun_path - 1);
    return address;
  }
  static std::string contentOf(const FileDescriptor& file) {
    EXPECT_EQ(::fcntl(file.get(), F_GET_SEALS), kSeals);
    std::string content(static_cast<std::size_t>(::lseek(file.get(), 0, SEEK_END)), '\0');
    EXPECT_EQ(::pread(file.get(), content.data(), content.size(), 0), static_cast<ssize_t>(content.size()));
    return content;
  }

  const std::string path_;
  const FileDescriptor socket_;
};

class JournalLogTest : public ::testing::Test {
 protected:
  JournalLogTest() {
    folder_ = ::testing::TempDir() + "quazor-journal-XXXXXX";
    EXPECT_NE(::mkdtemp(folder_.data()), nullptr);
    path_ = folder_ + "/socket";
  }
  ~JournalLogTest() override {
    journal_.reset();
    std::filesystem::remove_all(folder_);
  }

  void startJournal() { journal_.emplace(path_); }
  std::string received() { return journal_->receive().value_or("nothing"); }
  void expectArrives(JournalLog& log, LogLevel level, const std::string& text) {
    log.write(level, "s", "c", text);
    EXPECT_THAT(received(), StartsWith("MESSAGE=" + text + '\n'));
  }
  std::vector<std::string> textsOfFallback() const {
    std::vector<std::string> texts;
    for (const LogRecord& record : fallback_->records()) texts.push_back(record.text);
    return texts;
  }

  std::string folder_;
  std::string path_;
  std::optional<FakeJournal> journal_;
  const std::shared_ptr<RecordingLog> fallback_ = std::make_shared<RecordingLog>();
};

// The fields after the text of a line that is written with LogLevel::kError, "s" and "c".
constexpr std::string_view kRest = "PRIORITY=3\nSYSLOG_IDENTIFIER=quazor\nSUBSYSTEM=s\nCATEGORY=c\n";

TEST_F(JournalLogTest, ALineIsOneDatagramWithItsFields) {
  startJournal();
  JournalLog log(fallback_, path_);
  log.write(LogLevel::kError, "org.quazor.test", "quazor", "Failed at 50%!");
  EXPECT_EQ(received(),
            "MESSAGE=Failed at 50%!\nPRIORITY=3\nSYSLOG_IDENTIFIER=quazor\n"
            "SUBSYSTEM=org.quazor.test\nCATEGORY=quazor\n");
  EXPECT_FALSE(journal_->cameInAFile);
  EXPECT_EQ(received(), "nothing");
  EXPECT_THAT(textsOfFallback(), IsEmpty());
}

TEST_F(JournalLogTest, EachLevelHasItsPriority) {
  startJournal();
  JournalLog log(fallback_, path_);
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
    EXPECT_THAT(received(), testing::HasSubstr(row.field));
  }
}

TEST_F(JournalLogTest, TextsArriveAsTheyAre) {
  startJournal();
  JournalLog log(fallback_, path_);
  const struct {
    const char* name;
    std::string text;
    std::string field;
  } kRows[] = {
      {"empty", "", "MESSAGE=\n"},
      {"text of another script", "20 \u00B0C", "MESSAGE=20 \u00B0C\n"},
      {"a line that looks like a field", "one\nPRIORITY=0", "MESSAGE\n\x0E\0\0\0\0\0\0\0one\nPRIORITY=0\n"s},
      {"nothing but a line break", "\n", "MESSAGE\n\x01\0\0\0\0\0\0\0\n\n"s},
      {"a line break at the end", std::string(300, 'a') + "\n",
       "MESSAGE\n\x2D\x01\0\0\0\0\0\0"s + std::string(300, 'a') + "\n\n"},
      {"bytes that are no UTF-8", "\xFF\xC3(\x80", "MESSAGE=\xFF\xC3(\x80\n"},
      {"a zero byte", "a\0b"s, "MESSAGE=a\0b\n"s},
      {"what looks like a format", "%s%n", "MESSAGE=%s%n\n"},
  };
  for (const auto& row : kRows) {
    log.write(LogLevel::kError, "s", "c", row.text);
    EXPECT_EQ(received(), row.field + std::string(kRest)) << row.name;
  }
}

TEST_F(JournalLogTest, LineBreaksInTheOtherFieldsMakeNoFieldsEither) {
  startJournal();
  JournalLog log(fallback_, path_);
  log.write(LogLevel::kError, "s\nPRIORITY=0", "c\n", "text");
  EXPECT_EQ(received(),
            "MESSAGE=text\nPRIORITY=3\nSYSLOG_IDENTIFIER=quazor\nSUBSYSTEM\n\x0C\0\0\0\0\0\0\0s\nPRIORITY=0\n"
            "CATEGORY\n\x02\0\0\0\0\0\0\0c\n\n"s);
}

TEST_F(JournalLogTest, WhatIsTooLongForADatagramArrivesInASealedFile) {
  startJournal();
  JournalLog log(fallback_, path_);
  const std::string text = std::string(5'000'000, 'a') + "z";  // exceeds the maximum buffer size of a socket
  log.write(LogLevel::kError, "s", "c", text);
  const std::string fields = received();
  EXPECT_TRUE(journal_->cameInAFile);
  EXPECT_TRUE(fields == "MESSAGE=" + text + "\n" + std::string(kRest)) << fields.size();
  expectArrives(log, LogLevel::kError, "short");
  EXPECT_FALSE(journal_->cameInAFile);
  EXPECT_THAT(textsOfFallback(), IsEmpty());
}

// Lowers a resource limit of this process during its lifetime.
class Limit {
 public:
  Limit(__rlimit_resource_t resource, rlim_t most) : resource_(resource) {
    EXPECT_EQ(::getrlimit(resource, &before_), 0);
    rlimit lower = before_;
    lower.rlim_cur = most;
    EXPECT_EQ(::setrlimit(resource, &lower), 0);
  }
  Limit(const Limit&) = delete;
  Limit& operator=(const Limit&) = delete;
  ~Limit() { EXPECT_EQ(::setrlimit(resource_, &before_), 0); }

 private:
  const __rlimit_resource_t resource_;
  rlimit before_{};
};

TEST_F(JournalLogTest, WithoutADescriptorForTheFileALongLineGoesToTheFallback) {
  startJournal();
  JournalLog log(fallback_, path_);
  const std::string text(5'000'000, 'a');
  {
    const Limit none(RLIMIT_NOFILE, 0);
    log.write(LogLevel::kError, "s", "c", text);
  }
  EXPECT_TRUE(textsOfFallback() == std::vector<std::string>{text});
  EXPECT_EQ(received(), "nothing");
}

TEST_F(JournalLogTest, WithoutADescriptorForTheSocketLinesGoToTheFallback) {
  startJournal();
  std::optional<JournalLog> log;
  {
    const Limit none(RLIMIT_NOFILE, 0);
    log.emplace(fallback_, path_);
  }
  log->write(LogLevel::kError, "s", "c", "text");
  EXPECT_THAT(textsOfFallback(), ElementsAre("text"));
  EXPECT_EQ(received(), "nothing");
}

TEST_F(JournalLogTest, WithoutAJournalTheFallbackGetsWholeLines) {
  JournalLog log(fallback_, path_);
  log.write(LogLevel::kDebug, "s", "c", "two\nlines");
  EXPECT_THAT(fallback_->records(), ElementsAre(LogRecord{LogLevel::kDebug, "s", "c", "two\nlines"}));
}

TEST_F(JournalLogTest, WhatIsNoJournalCountsAsNone) {
  {
    const FakeJournal refusesDatagrams(path_, SOCK_STREAM);
    JournalLog(fallback_, path_).write(LogLevel::kError, "s", "c", "a socket of another kind");
  }
  std::filesystem::create_directory(path_);
  JournalLog(fallback_, path_).write(LogLevel::kError, "s", "c", "a directory");
  JournalLog(fallback_, "/" + std::string(300, 'x')).write(LogLevel::kError, "s", "c", "a path too long");
  JournalLog(fallback_, "").write(LogLevel::kError, "s", "c", "no path");
  EXPECT_THAT(textsOfFallback(), ElementsAre("a socket of another kind", "a directory", "a path too long", "no path"));
}

TEST_F(JournalLogTest, ASocketThatNobodyListensOnAnyMoreCountsAsNone) {
  std::optional<FakeJournal> ended(path_);
  std::filesystem::create_hard_link(path_, folder_ + "/left");
  ended.reset();
  JournalLog(fallback_, folder_ + "/left").write(LogLevel::kError, "s", "c", "refused");
  EXPECT_THAT(textsOfFallback(), ElementsAre("refused"));
}

TEST_F(JournalLogTest, AJournalThatIsRestartedIsFoundAgain) {
  startJournal();
  JournalLog log(fallback_, path_);
  expectArrives(log, LogLevel::kError, "before");
  journal_.reset();
  log.write(LogLevel::kError, "s", "c", "between");
  EXPECT_THAT(textsOfFallback(), ElementsAre("between"));
  startJournal();
  expectArrives(log, LogLevel::kError, "after");
  EXPECT_THAT(textsOfFallback(), ElementsAre("between"));
}

TEST_F(JournalLogTest, AJournalThatDoesNotReadIsWaitedForOnceAndToldWhatItMissed) {
  startJournal();
  JournalLog log(fallback_, path_);
  const int fillers = journal_->fill();
  const auto begin = std::chrono::steady_clock::now();
  log.write(LogLevel::kError, "s", "c", "dropped after a wait");
  EXPECT_GE(std::chrono::steady_clock::now() - begin, 90ms);
  const auto afterTheFirst = std::chrono::steady_clock::now();
  for (int i = 0; i < 99; ++i) log.write(LogLevel::kError, "s", "c", "dropped at once");
  EXPECT_LT(std::chrono::steady_clock::now() - afterTheFirst, 99 * 90ms / 4);
  for (int i = 0; i < fillers; ++i) EXPECT_EQ(received(), "filler");
  EXPECT_EQ(received(), "nothing");
  expectArrives(log, LogLevel::kDebug, "taken");
  EXPECT_EQ(received(), "MESSAGE=the journal did not accept 100 log lines before this one\n" + std::string(kRest));
  expectArrives(log, LogLevel::kDebug, "taken too");
  EXPECT_EQ(received(), "nothing");
  EXPECT_THAT(textsOfFallback(), IsEmpty());
}

TEST_F(JournalLogTest, WhatWasMissedIsToldLaterWhenThereIsNoPlaceForIt) {
  startJournal();
  JournalLog log(fallback_, path_);
  const int fillers = journal_->fill();
  log.write(LogLevel::kError, "s", "c", "dropped");
  EXPECT_EQ(received(), "filler");
  log.write(LogLevel::kError, "s", "c", "in the one place");
  for (int i = 1; i < fillers; ++i) EXPECT_EQ(received(), "filler");
  EXPECT_THAT(received(), StartsWith("MESSAGE=in the one place\n"));
  EXPECT_EQ(received(), "nothing");
  expectArrives(log, LogLevel::kError, "next");
  EXPECT_THAT(received(), StartsWith("MESSAGE=the journal did not accept 1 log lines"));
}

TEST_F(JournalLogTest, LinesOfSeveralThreadsArriveWhole) {
  startJournal();
  JournalLog log(fallback_, path_);
  std::atomic<int> ended{0};
  const auto write = [&](const char* text) {
    for (int i = 0; i < 200; ++i) log.write(LogLevel::kError, "s", "c", text);
    ++ended;
  };
  std::thread one(write, "one\nof two");
  std::thread other(write, "other");
  const std::string rest(kRest);
  std::map<std::string, int> lines;
  for (bool isLast = false; !isLast;) {
    isLast = ended.load() == 2;
    for (auto fields = journal_->receive(); fields; fields = journal_->receive()) ++lines[*fields];
  }
  one.join();
  other.join();
  const std::string expected[] = {"MESSAGE\n\x0A\0\0\0\0\0\0\0one\nof two\n"s + rest, "MESSAGE=other\n" + rest};
  for (const std::string& line : expected) EXPECT_GT(lines[line], 0);
  // On a very busy machine the queue may have stayed full for the whole wait.
  for (const auto& [line, times] : lines) {
    EXPECT_TRUE(line == expected[0] || line == expected[1] || line.starts_with("MESSAGE=the journal did not accept"))
        << line;
  }
  EXPECT_THAT(textsOfFallback(), IsEmpty());
}

}  // namespace
}  // namespace quazor
