#include "host/command/commands.h"

#include "host/record/record_file.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_events.h"
#include "host/testing/test_refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

class RecordCommandsTest : public testing::Test {
 protected:
  std::filesystem::path record(const std::string& name, const std::vector<RunEvent>& events) const {
    RecordWriter writer(directory_.path() / name);
    for (const RunEvent& event : events) writer.onEvent(event);
    return writer.file();
  }

  ExitCode verify(const std::filesystem::path& file) { return verifyAll({file}); }

  ExitCode verifyAll(const std::vector<std::filesystem::path>& files) {
    out_.str("");
    Options options;
    options.records = files;
    return verifyCommand(options, console_, nullptr);
  }

  ExitCode diff(const std::filesystem::path& before, const std::filesystem::path& after) {
    out_.str("");
    Options options;
    options.records = {before, after};
    return diffCommand(options, console_);
  }

  TestDirectory directory_;
  std::ostringstream out_;
  std::ostringstream err_;
  Console console_{out_, err_};
};

TEST_F(RecordCommandsTest, VerifyCountsWhatItHasSeen) {
  EXPECT_EQ(verify(record("a", wholeRun())), ExitCode::kAllPassed);
  EXPECT_EQ(out_.str(),
            std::to_string(wholeRun().size()) + " events, 4 verdicts (1 pass, 1 fail, 2 error), 0 problems\n");
}

TEST_F(RecordCommandsTest, VerifyTellsWhatIsWrong) {
  std::vector<RunEvent> events = {runOf({"A\n"}), beginningOf("A\n"), DiagnosticEnded{Verdict::kPass, momentAt(3)},
                                  RunEnded{std::nullopt, momentAt(4)}};
  EXPECT_EQ(verify(record("a", events)), ExitCode::kFailed);
  EXPECT_EQ(out_.str(),
            "WRONG  A\\x0a: the recorded error of quazor is none, but the results, limits and errors give "
            "QuazorHostErrorDomain 9 "
            "'the run was not completed'\n"
            "WRONG  A\\x0a: the recorded verdict is pass, but the results, limits and errors give error\n"
            "4 events, 1 verdict (1 pass), 2 problems\n");
}

TEST_F(RecordCommandsTest, VerifyTellsThatARunDidNotComeToItsEnd) {
  std::vector<RunEvent> events = wholeRun();
  events.pop_back();
  EXPECT_EQ(verify(record("a", events)), ExitCode::kIncomplete);
  EXPECT_THAT(out_.str(), testing::EndsWith("0 problems\nThe record is incomplete: the run did not end.\n"));
  const std::string text = directory_.read("a");
  EXPECT_EQ(verify(directory_.write("b", text.substr(0, text.size() - 3))), ExitCode::kIncomplete);
  EXPECT_THAT(
      out_.str(),
      testing::EndsWith("The record is incomplete: the run did not end, and the record's last line is cut off.\n"));
  EXPECT_EQ(verify(record("c", {runOf({})})), ExitCode::kIncomplete);
  EXPECT_THAT(out_.str(), testing::StartsWith("1 event, 0 verdicts, 0 problems\n"));
}

TEST_F(RecordCommandsTest, VerifyAcceptsARunThatWasInterruptedAndEnded) {
  EXPECT_EQ(verify(record("a", {runOf({"A"}), RunEnded{"", momentAt(1)}})), ExitCode::kAllPassed);
  EXPECT_EQ(out_.str(), "2 events, 0 verdicts, 0 problems\nThe run was interrupted while no diagnostic was running.\n");
}

TEST_F(RecordCommandsTest, VerifyTellsOfALineThatIsWrong) {
  const std::filesystem::path file = directory_.write("a", "{}\n");
  EXPECT_EQ(verify(file), ExitCode::kFailed);
  EXPECT_EQ(out_.str(), "WRONG  the record '" + file.string() + "', line 1: \"record\" is missing\n");
}

TEST_F(RecordCommandsTest, TheWorstOfSeveralRecordsCounts) {
  const std::filesystem::path whole = record("whole", wholeRun());
  const std::filesystem::path cut = record("cut", {runOf({"A"})});
  const std::filesystem::path wrong = directory_.write("wrong", "{}\n");
  const std::filesystem::path empty = directory_.write("empty", "");
  const struct {
    std::vector<std::filesystem::path> files;
    ExitCode code;
  } kRows[] = {{{whole, whole}, ExitCode::kAllPassed},         {{whole, cut}, ExitCode::kIncomplete},
               {{wrong, cut, whole}, ExitCode::kFailed},       {{cut, wrong}, ExitCode::kFailed},
               {{whole, empty, wrong}, ExitCode::kCannotRead}, {{cut, empty}, ExitCode::kCannotRead}};
  for (const auto& row : kRows) {
    EXPECT_EQ(verifyAll(row.files), row.code) << out_.str();
    for (const auto& file : row.files) EXPECT_THAT(out_.str(), testing::HasSubstr(file.string() + ": "));
  }
}

TEST_F(RecordCommandsTest, DiffTellsWhatIsDifferent) {
  std::vector<RunEvent> events = wholeRun();
  const std::filesystem::path whole = record("a", events);
  EXPECT_EQ(diff(whole, whole), ExitCode::kAllPassed);
  EXPECT_EQ(out_.str(), "The records do not differ.\n");
  std::get<DiagnosticStarted>(events[1]).name = "Go\nod";
  EXPECT_EQ(diff(whole, record("b", events)), ExitCode::kFailed);
  EXPECT_EQ(out_.str(), "Good is only in the first\nGo\\x0aod is only in the second\n");
}

TEST_F(RecordCommandsTest, NeedRecords) {
  const std::filesystem::path whole = record("a", wholeRun());
  EXPECT_THROW(verify(directory_.path() / "nothing"), CommandError);
  EXPECT_THROW(diff(whole, directory_.path() / "nothing"), CommandError);
  EXPECT_THROW(diff(directory_.path() / "nothing", whole), CommandError);
}

TEST_F(RecordCommandsTest, TellWhenTheStandardOutputCannotBeWritten) {
  const std::filesystem::path whole = record("a", wholeRun());
  out_.setstate(std::ios::badbit);
  for (const auto& action : {std::function<void()>([&] { verify(whole); }), {[&] { diff(whole, whole); }}}) {
    EXPECT_THAT(refusalOf(ExitCode::kCannotWrite, action), testing::HasSubstr("standard output cannot be written"));
  }
}

}  // namespace
}  // namespace quazor
