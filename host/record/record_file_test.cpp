#include "host/record/record_file.h"

#include "base/json/json_limits.h"
#include "host/error/exit_code.h"
#include "host/record/run_event_json.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_events.h"
#include "host/testing/test_refusals.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <functional>
#include <iterator>
#include <vector>

namespace {

int syncs = 0;

}  // namespace

// Takes the place of the C library's, which has no effect that a test could see.
extern "C" int fdatasync(int) {
  ++syncs;
  return 0;
}

namespace quazor {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::StartsWith;

std::vector<std::string> linesOf(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  return lines;
}

std::string textOf(const std::vector<std::string>& lines) {
  std::string text;
  for (const std::string& line : lines) text += line + "\n";
  return text;
}

class RecordFileTest : public testing::Test {
 protected:
  void write(const std::vector<RunEvent>& events) const {
    RecordWriter writer(file_, RecordWriter::Existing::kReplace);
    for (const RunEvent& event : events) writer.onEvent(event);
    EXPECT_EQ(writer.problem(), "");
  }

  std::string refusalOfText(const std::string& text) const {
    const fs::path file = directory_.write("bad", text);
    const std::string refusal = refusalOf(ExitCode::kCannotRead, [&] { readRecord(file); });
    EXPECT_THAT(refusal, StartsWith("the record '" + file.string() + "'"));
    return refusal;
  }

  TestDirectory directory_;
  const fs::path file_ = directory_.path() / "record";
};

TEST_F(RecordFileTest, ReadsBackWhatWasWritten) {
  const std::vector<RunEvent> events = wholeRun();
  write(events);
  const StoredRecord stored = readRecord(file_);
  EXPECT_FALSE(stored.cutOff);
  ASSERT_EQ(stored.events.size(), events.size());
  for (std::size_t i = 0; i < events.size(); ++i) EXPECT_EQ(eventJson(stored.events[i]), eventJson(events[i]));
}

TEST_F(RecordFileTest, HasALineForEachEventWithItsNumber) {
  write(wholeRun());
  const std::vector<std::string> lines = linesOf(directory_.read("record"));
  ASSERT_EQ(lines.size(), wholeRun().size());
  EXPECT_THAT(lines[0], StartsWith(R"({"sequence":0,"record":2,"event":"runBegan",)"));
  EXPECT_THAT(lines[1], StartsWith(R"({"sequence":1,"event":"diagnosticBegan",)"));
}

TEST_F(RecordFileTest, HoldsEachEventAsSoonAsItWasTaken) {
  RecordWriter writer(file_);
  EXPECT_EQ(directory_.read("record"), "");
  EXPECT_EQ(writer.file(), file_);
  std::size_t taken = 0;
  for (const RunEvent& event : wholeRun()) {
    writer.onEvent(event);
    const std::string text = directory_.read("record");
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), static_cast<std::ptrdiff_t>(++taken));
    EXPECT_EQ(text.back(), '\n');
  }
}

TEST_F(RecordFileTest, IsWrittenToTheDiskAtTheEndOfTheRunAndNotBefore) {
  RecordWriter writer(file_);
  syncs = 0;
  for (const RunEvent& event : wholeRun()) {
    EXPECT_EQ(syncs, 0);
    writer.onEvent(event);
  }
  EXPECT_EQ(syncs, 1);
}

TEST_F(RecordFileTest, GivesTheWholeLinesOfARecordThatWasCutOffAnywhere) {
  const std::vector<RunEvent> events = {
      runOf({"A\n\u00e4"}), beginningOf("A\n\u00e4"), StageStarted{Stage::kRun, momentAt(2)},
      DiagnosticEnded{Verdict::kError, momentAt(3)}, RunEnded{std::nullopt, momentAt(4)}};
  write(events);
  const std::string whole = directory_.read("record");
  const fs::path cut = directory_.path() / "cut";
  for (std::size_t size = 0; size <= whole.size(); ++size) {
    const std::string text = whole.substr(0, size);
    directory_.write("cut", text);
    const auto lines = static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
    if (lines == 0) {
      EXPECT_THAT(refusalOf(ExitCode::kCannotRead, [&] { readRecord(cut); }), HasSubstr("contains no events")) << size;
      continue;
    }
    const StoredRecord stored = readRecord(cut);
    ASSERT_EQ(stored.events.size(), lines) << size;
    EXPECT_EQ(stored.cutOff, text.back() != '\n') << size;
    for (std::size_t i = 0; i < lines; ++i) EXPECT_EQ(eventJson(stored.events[i]), eventJson(events[i])) << size;
  }
}

TEST_F(RecordFileTest, RefusesARecordThatWasChanged) {
  write(wholeRun());
  const std::vector<std::string> lines = linesOf(directory_.read("record"));
  const auto changed = [&lines](const std::function<void(std::vector<std::string>&)>& change) {
    std::vector<std::string> copy = lines;
    change(copy);
    return textOf(copy);
  };
  const auto replaced = [&](std::size_t at, const std::string& what, const std::string& by) {
    return changed([&](auto& copy) { copy[at].replace(copy[at].find(what), what.size(), by); });
  };
  EXPECT_THAT(refusalOfText(replaced(3, R"("sequence":3)", R"("sequence":4)")),
              HasSubstr("line 4: the sequence number is 4 instead of 3; a line is missing or has been moved"));
  EXPECT_THAT(refusalOfText(replaced(3, R"("sequence":3)", R"("sequence":"3")")),
              HasSubstr("sequence number is \"3\""));
  EXPECT_THAT(refusalOfText(replaced(3, R"("sequence":3)", R"("number":3)")),
              HasSubstr("line 4: \"sequence\" is missing"));
  for (std::size_t i = 0; i + 1 < lines.size(); ++i) {
    const std::string without = changed([i](auto& copy) { copy.erase(copy.begin() + static_cast<std::ptrdiff_t>(i)); });
    EXPECT_NE(refusalOfText(without), "accepted") << i;
  }
  EXPECT_THAT(refusalOfText(changed([](auto& copy) { std::swap(copy[4], copy[5]); })), HasSubstr("line 5: "));
  EXPECT_THAT(refusalOfText(changed([](auto& copy) { copy[2] = "garbage"; })), HasSubstr("line 3: not valid JSON"));
  EXPECT_THAT(refusalOfText(changed([](auto& copy) { copy[2] = ""; })), HasSubstr("line 3: not valid JSON"));
  EXPECT_THAT(refusalOfText(changed([](auto& copy) { copy[2] = "[2]"; })), HasSubstr("line 3: expected an object"));
  EXPECT_THAT(refusalOfText(replaced(2, "stageBegan", "stageBegun")), HasSubstr("line 3: unknown event 'stageBegun'"));
  EXPECT_THAT(refusalOfText(replaced(0, R"("record":2)", R"("record":5)")),
              HasSubstr("' says version 5, but this program reads versions 1 to 4; read it with the quazor that wrote "
                        "it, 0.1.0, or a later one"));
  EXPECT_THAT(refusalOfText(replaced(0, R"("record":2)", R"("record":0)")),
              HasSubstr("line 1: the version of the record is 0, but must be a number from 1"));
  EXPECT_THAT(refusalOfText(replaced(0, R"("record":2)", R"("record":"2")")),
              HasSubstr("line 1: the version of the record is \"2\""));
  EXPECT_THAT(refusalOfText(replaced(0, R"("record":2)", R"("recorder":2)")), HasSubstr("\"record\" is missing"));
}

TEST_F(RecordFileTest, ReadsFormat1) {
  write(wholeRun());
  std::string text = directory_.read("record");
  const auto replace = [&text](std::string_view before, std::string_view after) {
    text.replace(text.find(before), before.size(), after);
  };
  replace(R"("record":2)", R"("record":1)");
  replace(R"(,"limits":[])", "");
  replace(R"(,"id":"","host":"","tags":[])", "");
  directory_.write("record", text);
  EXPECT_EQ(readRecord(file_).events.size(), wholeRun().size());
  replace(R"("record":1)", R"("record":2)");
  EXPECT_THAT(refusalOfText(text), HasSubstr("line 1: \"limits\" is missing"));
}

TEST_F(RecordFileTest, RefusesAKeyThatALineHasTwice) {
  write(wholeRun());
  std::string text = directory_.read("record");
  const std::string verdict = R"("verdict":"pass")";
  text.replace(text.find(verdict), verdict.size(), R"("verdict":"fail",)" + verdict);
  EXPECT_THAT(refusalOfText(text), HasSubstr(R"(: the key "verdict" is duplicated)"));
}

TEST_F(RecordFileTest, RefusesWhatIsTooDeepOrTooLongAnywhereInALine) {
  write({runOf({})});
  const std::string first = directory_.read("record");
  const std::string deep = std::string(100'000, '[') + std::string(100'000, ']');
  const std::string lines[] = {
      R"({"sequence":1,"event":"faultsCounted","faults":[{"fault":)" + deep + R"(,"fired":1}]})",
      R"({"sequence":1,"event":"collected","key":"k","value":)" + deep + "}",
      R"({"sequence":)" + deep + R"(,"event":"diagnosticCompleted"})",
      R"({"sequence":1,"event":)" + deep + "}",
      R"({"unknown":)" + deep + R"(,"sequence":1,"event":"diagnosticCompleted"})",
      std::string(100'000, '['),
  };
  for (const std::string& line : lines) {
    EXPECT_THAT(refusalOfText(first + line + "\n"), HasSubstr("line 2: the line is nested more than 2016 levels deep"))
        << line.substr(0, 60);
  }
  EXPECT_THAT(refusalOfText(R"({"record":)" + deep + "}\n"), HasSubstr("line 1: the line is nested more than"));
  EXPECT_THAT(refusalOfText(first + std::string(kMaxLine + 1, ' ') + "\n"),
              HasSubstr("line 2: the line is longer than 64 MiB"));
  EXPECT_THAT(refusalOf(ExitCode::kCannotRead, [] { readRecord("/dev/zero"); }),
              HasSubstr("line 1: the line is longer than 64 MiB"));
}

TEST_F(RecordFileTest, ReadsLinesOfAnyLengthUpToTheLimit) {
  std::vector<RunEvent> events = {runOf({})};
  for (const std::size_t length : {65'400U, 65'500U, 65'535U, 65'536U, 65'537U, 131'072U, 1'000'000U}) {
    events.emplace_back(AuxiliaryDataAdded{"key", Value(std::string(length, 'x'))});
  }
  write(events);
  const StoredRecord stored = readRecord(file_);
  ASSERT_EQ(stored.events.size(), events.size());
  for (std::size_t i = 0; i < events.size(); ++i) EXPECT_TRUE(eventJson(stored.events[i]) == eventJson(events[i])) << i;
}

TEST_F(RecordFileTest, WritesNoEventThatCouldNotBeReadBack) {
  const RunEvent event = AuxiliaryDataAdded{"key", Value("value")};
  for (const bool tooLong : {false, true}) {
    fs::remove(file_);
    RecordWriter writer(file_);
    writer.onEvent(runOf({}));
    writer.onEvent(event, std::string(kMaxLine + (tooLong ? 1 : 0), 'x') + "\n");
    EXPECT_EQ(writer.problem(), tooLong ? "an event takes more than 64 MiB" : "");
    EXPECT_EQ(directory_.read("record").size() > kMaxLine, !tooLong);
  }
  EXPECT_EQ(readRecord(file_).events.size(), 1U);
}

TEST_F(RecordFileTest, RefusesARecordThatAnotherWriterHasNotFinished) {
  const auto refusalOfWriter = [](const fs::path& file) {
    return refusalOf(ExitCode::kCannotWrite,
                     [&] { const RecordWriter second(file, RecordWriter::Existing::kReplace); });
  };
  fs::create_symlink("record", directory_.path() / "link");
  for (int i = 0; i < 2; ++i) {  // a new file, then one that is replaced
    RecordWriter first(file_, i == 0 ? RecordWriter::Existing::kRefuse : RecordWriter::Existing::kReplace);
    first.onEvent(runOf({}));
    const std::string before = directory_.read("record");
    EXPECT_EQ(refusalOfWriter(file_),
              "the record '" + file_.string() + "' cannot be written: another process is writing it");
    EXPECT_THAT(refusalOfWriter(directory_.path() / "link"), HasSubstr("another process is writing it"));
    first.onEvent(RunEnded{std::nullopt, momentAt(1)});
    EXPECT_EQ(readRecord(file_).events.size(), 2U);
    EXPECT_THAT(directory_.read("record"), StartsWith(before));
    EXPECT_EQ(std::distance(fs::directory_iterator(directory_.path()), fs::directory_iterator()), 2);
  }
  RecordWriter first(file_, RecordWriter::Existing::kReplace);
  first.onEvent(runOf({}));
  RecordWriter second(file_, RecordWriter::Existing::kReplaceAll);
  first.onEvent(RunEnded{std::nullopt, momentAt(1)});
  EXPECT_EQ(directory_.read("record"), "");
}

TEST_F(RecordFileTest, RefusesAFileThatIsThere) {
  const auto refusalOfFile = [](const fs::path& file) {
    return refusalOf(ExitCode::kCannotWrite, [&] { const RecordWriter writer(file); });
  };
  directory_.write("record", "old");
  fs::create_symlink("record", directory_.path() / "link");
  fs::create_symlink("nowhere", directory_.path() / "dangling");
  for (const char* name : {"record", "link", "dangling"}) {
    EXPECT_THAT(refusalOfFile(directory_.path() / name),
                HasSubstr("cannot be written: it exists already; replace it with --replace"));
  }
  EXPECT_EQ(directory_.read("record"), "old");
  EXPECT_EQ(std::distance(fs::directory_iterator(directory_.path()), fs::directory_iterator()), 3);
}

TEST_F(RecordFileTest, KeepsAnOldFileUntilTheFirstEventIsWritten) {
  directory_.write("record", "old");
  { const RecordWriter writer(file_, RecordWriter::Existing::kReplace); }
  EXPECT_EQ(directory_.read("record"), "old");
  RecordWriter writer(file_, RecordWriter::Existing::kReplace);
  RunStarted tooLong = runOf({});
  tooLong.phone = std::string(kMaxLine, 'x');
  EXPECT_THAT(refusalOf(ExitCode::kCannotWrite, [&] { writer.onEvent(tooLong); }), HasSubstr("more than 64 MiB"));
  EXPECT_EQ(directory_.read("record"), "old");
}

TEST_F(RecordFileTest, RefusesWhatIsNoRecord) {
  EXPECT_THAT(refusalOfText(""), HasSubstr("contains no events"));
  EXPECT_THAT(refusalOfText("no end of the line"), HasSubstr("contains no events"));
  EXPECT_THAT(refusalOfText("\n"), HasSubstr("line 1: not valid JSON"));
  EXPECT_THAT(refusalOfText(std::string("\x7f"
                                        "ELF\x02\x01\0\0\n",
                                        9)),
              HasSubstr("line 1: not valid JSON"));
  EXPECT_THAT(refusalOfText("{\"schema\": 1}\n"), HasSubstr("line 1: \"record\" is missing"));
  EXPECT_THAT(refusalOfText("{\"sequence\":0,\"record\":1,\"event\":\"diagnosticCompleted\"}\n"),
              HasSubstr("line 1: the first event of a record must be runBegan"));
}

TEST_F(RecordFileTest, RefusesWhatCannotBeRead) {
  const auto refusalOfFile = [](const fs::path& file) {
    return refusalOf(ExitCode::kCannotRead, [&] { readRecord(file); });
  };
  EXPECT_EQ(refusalOfFile(directory_.path() / "nothing"),
            "the record '" + (directory_.path() / "nothing").string() + "' cannot be read: No such file or directory");
  EXPECT_EQ(refusalOfFile(directory_.path()),
            "the record '" + directory_.path().string() + "' cannot be read: it is a directory");
  EXPECT_THAT(refusalOfFile(directory_.write("file", "") / "x"), HasSubstr("cannot be read: Not a directory"));
  EXPECT_EQ(refusalOfFile("/proc/self/mem"), "the record '/proc/self/mem' cannot be read to its end");
}

TEST_F(RecordFileTest, TakesThePlaceOfAnOldFileAtOnce) {
  directory_.write("record", "old");
  const int old = ::open(file_.c_str(), O_RDONLY);
  RecordWriter writer(file_, RecordWriter::Existing::kReplace);
  writer.onEvent(runOf({}));
  EXPECT_EQ(directory_.read("record"), recordLine(runOf({}), 0));
  char text[4] = {};
  EXPECT_EQ(::read(old, text, sizeof text), 3);  // readers of the old file are not affected
  ::close(old);
  EXPECT_EQ(std::distance(fs::directory_iterator(directory_.path()), fs::directory_iterator()), 1);
}

TEST_F(RecordFileTest, KeepsPermissionsAndOwnerOfTheRecordThatItReplaces) {
  write(wholeRun());
  ASSERT_EQ(::chmod(file_.c_str(), 0640), 0);
  const uid_t owner = ::geteuid() == 0 ? 54'321 : ::geteuid();
  if (::geteuid() == 0) {
    ASSERT_EQ(::chown(file_.c_str(), owner, 54'322), 0);
  }
  write(wholeRun());
  struct stat status {};
  ASSERT_EQ(::stat(file_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0640U);
  EXPECT_EQ(status.st_uid, owner);
}

TEST_F(RecordFileTest, DoesNotTakeARecordFromAnotherUser) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root can make a file another's";
  write(wholeRun());
  ASSERT_EQ(::chmod(directory_.path().c_str(), 0777), 0);
  ASSERT_EQ(::seteuid(54'321), 0);
  const std::string refusal =
      refusalOf(ExitCode::kCannotWrite, [&] { const RecordWriter writer(file_, RecordWriter::Existing::kReplace); });
  ASSERT_EQ(::seteuid(0), 0);
  EXPECT_THAT(refusal,
              testing::EndsWith("cannot be written: it belongs to another user; remove it first, or name another "
                                "file"));
  EXPECT_EQ(readRecord(file_).events.size(), wholeRun().size());
}

TEST_F(RecordFileTest, ReplacesWhateverSomebodyPlantedWhereItMay) {
  const auto replaceIt = [this] {
    RecordWriter writer(file_, RecordWriter::Existing::kReplaceAll);
    writer.onEvent(runOf({}));
  };
  directory_.write("precious", "precious");
  fs::create_symlink("precious", file_);
  replaceIt();
  EXPECT_EQ(directory_.read("precious"), "precious");
  EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(file_)));
  EXPECT_EQ(readRecord(file_).events.size(), 1U);
  fs::remove(file_);
  ASSERT_EQ(::mkfifo(file_.c_str(), 0600), 0);
  replaceIt();
  EXPECT_EQ(readRecord(file_).events.size(), 1U);
  fs::remove(file_);
  fs::create_directory(file_);
  EXPECT_THROW(replaceIt(), CommandError);
}

TEST_F(RecordFileTest, WritesToADescriptorOfThisProcessAndDoesNotReplaceTheFileBehindIt) {
  const fs::path out = directory_.write("out", "before\n");
  const int descriptor = ::open(out.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
  {
    RecordWriter writer("/dev/fd/" + std::to_string(descriptor));
    writer.onEvent(runOf({}));
  }
  ASSERT_EQ(::write(descriptor, "after", 5), 5);
  ::close(descriptor);
  EXPECT_EQ(directory_.read("out"), "before\n" + recordLine(runOf({}), 0) + "after");
}

TEST_F(RecordFileTest, FollowsALink) {
  directory_.write("target", "old");
  fs::create_symlink("target", file_);
  write(wholeRun());
  EXPECT_TRUE(fs::is_symlink(file_));
  EXPECT_THAT(directory_.read("target"), StartsWith("{\"sequence\":0"));
}

TEST_F(RecordFileTest, WritesToWhatIsNoRegularFileAsItIs) {
  ASSERT_EQ(mkfifo(file_.c_str(), 0600), 0);
  const int reader = ::open(file_.c_str(), O_RDONLY | O_NONBLOCK);
  ASSERT_GE(reader, 0);
  RecordWriter writer(file_);
  writer.onEvent(runOf({}));
  char text[13] = {};
  EXPECT_EQ(::read(reader, text, 12), 12);
  EXPECT_STREQ(text, "{\"sequence\":");
  EXPECT_TRUE(fs::is_fifo(file_));
  ::close(reader);
}

TEST_F(RecordFileTest, RefusesAFileThatCannotBeMade) {
  const auto refusalOfFile = [](const fs::path& file) {
    return refusalOf(ExitCode::kCannotWrite, [&] { const RecordWriter writer(file); });
  };
  EXPECT_EQ(refusalOfFile(directory_.path()),
            "the record '" + directory_.path().string() + "' cannot be written: it is a directory");
  EXPECT_THAT(refusalOfFile(directory_.path() / "nowhere" / "x"),
              HasSubstr("cannot be written: No such file or directory"));
  EXPECT_THAT(refusalOfFile(directory_.write("file", "") / "x"), HasSubstr("cannot be written: Not a directory"));
  EXPECT_THAT(refusalOfFile(directory_.path() / std::string(256, 'x')), HasSubstr("File name too long"));
  fs::create_symlink("itself", directory_.path() / "itself");
  EXPECT_THAT(refusalOfFile(directory_.path() / "itself" / "x"), HasSubstr("Too many levels of symbolic links"));
}

TEST_F(RecordFileTest, TellsWhyItCouldNotBeWrittenAndWritesNoMore) {
  RecordWriter writer("/dev/full");
  EXPECT_EQ(writer.problem(), "");
  writer.onEvent(runOf({}));
  EXPECT_EQ(writer.problem(), "No space left on device");
  writer.onEvent(RunEnded{std::nullopt, momentAt(1)});
  EXPECT_EQ(writer.problem(), "No space left on device");
}

TEST_F(RecordFileTest, EndsInACutOffLineWhenTheDiskIsFull) {
  rlimit before{};
  ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
  const auto handler = std::signal(SIGXFSZ, SIG_IGN);
  RecordWriter writer(file_);
  const rlimit small{700, before.rlim_max};  // maximum file size in bytes
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  for (const RunEvent& event : wholeRun()) writer.onEvent(event);
  setrlimit(RLIMIT_FSIZE, &before);
  std::signal(SIGXFSZ, handler);
  EXPECT_EQ(writer.problem(), "File too large");
  EXPECT_EQ(fs::file_size(file_), 700U);
  const StoredRecord stored = readRecord(file_);
  EXPECT_TRUE(stored.cutOff);
  EXPECT_GE(stored.events.size(), 1U);
}

TEST_F(RecordFileTest, MakesRecordsOfTheRunInIt) {
  write(wholeRun());
  const RecordedRun run = runIn(file_);
  EXPECT_EQ(run.began.phone, "phone.json");
  EXPECT_EQ(run.began.seed, 5U);
  ASSERT_EQ(run.records.size(), 4U);
  EXPECT_EQ(run.records[0].name, "Good");
  EXPECT_EQ(run.records[0].verdict, Verdict::kPass);
  EXPECT_EQ(run.records[1].verdict, Verdict::kFail);
  EXPECT_EQ(run.records[2].verdict, Verdict::kError);
  EXPECT_EQ(run.records[3].verdict, Verdict::kError);
  ASSERT_TRUE(run.ended);
  EXPECT_EQ(run.ended->date, momentAt(99));
}

TEST_F(RecordFileTest, TakesADiagnosticThatItDoesNotHoldToTheEndForAnError) {
  std::vector<RunEvent> events = wholeRun();
  const auto firstEnd = std::find_if(events.begin(), events.end(), [](const RunEvent& event) {
    return std::holds_alternative<DiagnosticEnded>(event);
  });
  events.erase(firstEnd, events.end());
  write(events);
  const RecordedRun run = runIn(file_);
  ASSERT_EQ(run.records.size(), 1U);
  EXPECT_EQ(run.records[0].verdict, Verdict::kError);
  EXPECT_EQ(run.records[0].measuredResults.size(), 1U);
  EXPECT_FALSE(run.ended);
}

}  // namespace
}  // namespace quazor
