#include "host/report/ocp_report.h"

#include "host/error/host_error.h"
#include "host/model/judge.h"
#include "host/testing/test_records.h"
#include "host/testing/test_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <iterator>
#include <limits>
#include <sstream>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;
using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr Date kStart{};

// A record whose stages all took place.
DiagnosticRecord fullRecord(Verdict verdict) {
  DiagnosticRecord record = recordOf("Diagnostic", verdict);
  record.experimentName = "E";
  record.analysisName = "A";
  record.begin = kStart;
  record.log.clear();
  Date date = kStart;
  for (const Stage stage : {Stage::kDescribe, Stage::kSetup, Stage::kRun, Stage::kTeardown, Stage::kAnalyze}) {
    record.stages.push_back({stage, date + 1s, date + 2s});
    date += 2s;
  }
  record.end = date + 1s;
  return record;
}

// An artifact and the name of its step, or "run".
struct Artifact {
  std::string step;
  std::string key;
  Json content;
  std::string timestamp;
};

std::vector<Artifact> artifactsOf(const std::string& report) {
  std::vector<Artifact> artifacts;
  std::istringstream lines(report);
  for (std::string line; std::getline(lines, line);) {
    const Json json = Json::parse(line);
    const std::string timestamp = json["timestamp"];
    if (json.contains("testStepArtifact")) {
      const Json& artifact = json["testStepArtifact"];
      artifacts.push_back(
          {artifact["testStepId"], std::prev(artifact.end()).key(), *std::prev(artifact.end()), timestamp});
    } else if (json.contains("testRunArtifact")) {
      const Json& artifact = json["testRunArtifact"];
      artifacts.push_back({"run", artifact.begin().key(), *artifact.begin(), timestamp});
    } else {
      artifacts.push_back({"", json.begin().key(), *json.begin(), timestamp});
    }
  }
  return artifacts;
}

std::vector<Artifact> artifactsOf(const DiagnosticRecord& record) {
  return artifactsOf(ocpReport(startedRun(), {record}, std::nullopt));
}

// "STEP KEY" for each artifact.
std::vector<std::string> outlineOf(const std::vector<Artifact>& artifacts) {
  std::vector<std::string> outline;
  for (const Artifact& one : artifacts) outline.push_back((one.step.empty() ? "" : one.step + " ") + one.key);
  return outline;
}

// The contents of all artifacts with that key.
std::vector<Json> allOf(const std::vector<Artifact>& artifacts, const std::string& key, const std::string& step = {}) {
  std::vector<Json> found;
  for (const Artifact& one : artifacts) {
    if (one.key == key && (step.empty() || one.step == step)) found.push_back(one.content);
  }
  return found;
}

QZMeasuredResult limited(double value, std::shared_ptr<const QZBound> lower, std::shared_ptr<const QZBound> upper) {
  QZMeasuredResult result("R", Measurement(value, QZDimensionlessUnit::frames()));
  QZLimit limit("L");
  limit.setLowerBound(std::move(lower));
  limit.setUpperBound(std::move(upper));
  result.setLimit(std::move(limit));
  return result;
}

std::shared_ptr<const QZBound> boundOf(double value, bool open, const QZUnit& unit = QZDimensionlessUnit::frames()) {
  return std::make_shared<const QZBound>(Measurement(value, unit), open);
}

// The artifact of the only measured result of a record.
Json measurementOf(const QZMeasuredResult& result) {
  DiagnosticRecord record = fullRecord(Verdict::kError);
  record.measuredResults = {judgeResult(result)};
  return allOf(artifactsOf(record), "measurement", "analysis").at(0);
}

TEST(OcpReport, HasAStepForEachHalf) {
  EXPECT_THAT(outlineOf(artifactsOf(fullRecord(Verdict::kPass))),
              ElementsAre("schemaVersion", "run testRunStart", "experiment testStepStart", "experiment measurement",
                          "experiment extension", "experiment extension", "experiment testStepEnd",
                          "analysis testStepStart", "analysis measurement", "analysis diagnosis",
                          "analysis measurement", "analysis testStepEnd", "run testRunEnd"));
}

TEST(OcpReport, StartsWithWhatWasRun) {
  EXPECT_EQ(artifactsOf(fullRecord(Verdict::kPass))[1].content, Json::parse(R"({
    "name": "Diagnostic",
    "version": "0.1.0",
    "commandLine":
        "quazor run Diagnostic --plugin p.so --phone phone.json --seed 7 --profile none --set experiment.duration=3",
    "parameters": {"experiment": {"duration": 3}},
    "dutInfo": {"dutInfoId": "phone", "name": "phone.json"},
    "metadata": {"summary": "Its summary.", "experiment": "E", "analysis": "A", "seed": 7, "contract": 2,
                 "plugins": ["p.so"]}
  })"));
}

TEST(OcpReport, LeavesOutWhatHasNoValue) {
  RunStarted bare;
  DiagnosticRecord record = fullRecord(Verdict::kPass);
  record.summary = record.experimentName = record.analysisName = "";
  record.parameters = {};
  const Json start = artifactsOf(ocpReport(bare, {record}, std::nullopt))[1].content;
  EXPECT_EQ(start["dutInfo"], Json::parse(R"({"dutInfoId": "phone"})"));
  EXPECT_EQ(start["parameters"], Json::object());
  EXPECT_EQ(start["metadata"], Json::parse(R"({"seed": 7, "contract": 0, "plugins": []})"));
  EXPECT_EQ(start["commandLine"], "quazor run Diagnostic --seed 7 --profile none");
}

TEST(OcpReport, QuotesTheCommandForAShell) {
  DiagnosticRecord record = fullRecord(Verdict::kPass);
  record.name = "it's";
  record.parameters.experiment = {};
  record.parameters.analysis.push_back({"a b", QZNumberParameter("", true), Value(0.5), ""});
  RunStarted bare;
  bare.plugins = {""};
  EXPECT_EQ(artifactsOf(ocpReport(bare, {record}, std::nullopt))[1].content["commandLine"],
            R"(quazor run 'it'\''s' --plugin '' --seed 7 --profile none --set 'analysis.a b=0.5')");
}

TEST(OcpReport, DatesTheStepsByTheirStages) {
  const std::vector<Artifact> artifacts = artifactsOf(fullRecord(Verdict::kPass));
  const auto secondsOf = [&](const std::string& step, const std::string& key) {
    for (const Artifact& one : artifacts) {
      if (one.step == step && one.key == key) return one.timestamp.substr(17, 2);
    }
    return std::string();
  };
  EXPECT_EQ(artifacts.front().timestamp, "1970-01-01T00:00:00.000000000Z");
  EXPECT_EQ(secondsOf("experiment", "testStepStart"), "01");
  EXPECT_EQ(secondsOf("experiment", "measurement"), "06");
  EXPECT_EQ(secondsOf("experiment", "testStepEnd"), "08");
  EXPECT_EQ(secondsOf("analysis", "testStepStart"), "09");
  EXPECT_EQ(secondsOf("analysis", "measurement"), "10");
  EXPECT_EQ(secondsOf("analysis", "testStepEnd"), "10");
  EXPECT_EQ(secondsOf("run", "testRunEnd"), "11");
}

TEST(OcpReport, EndsAStepThatNeverEndedWithTheRun) {
  DiagnosticRecord record = fullRecord(Verdict::kError);
  record.stages.resize(3);
  record.stages.back().end.reset();
  record.errorStage = Stage::kRun;
  record.measuredResults.clear();
  const std::vector<Artifact> artifacts = artifactsOf(record);
  const Artifact& stepEnd = artifacts[artifacts.size() - 2];
  EXPECT_EQ(stepEnd.key, "testStepEnd");
  EXPECT_EQ(stepEnd.timestamp, "1970-01-01T00:00:11.000000000Z");
}

TEST(OcpReport, NamesTheStepsAfterTheirHalves) {
  const std::vector<Json> starts = allOf(artifactsOf(fullRecord(Verdict::kPass)), "testStepStart");
  EXPECT_THAT(starts, ElementsAre(Json{{"name", "experiment E"}}, Json{{"name", "analysis A"}}));
  DiagnosticRecord nameless = fullRecord(Verdict::kPass);
  nameless.experimentName = "";
  EXPECT_EQ(allOf(artifactsOf(nameless), "testStepStart")[0], (Json{{"name", "experiment"}}));
}

TEST(OcpReport, MarksWhatTheExperimentMeasured) {
  DiagnosticRecord record = fullRecord(Verdict::kPass);
  record.measurements.set("Odd", Measurement(-kInf, QZUnit::unitWithSymbol("")));
  EXPECT_THAT(allOf(artifactsOf(record), "measurement", "experiment"),
              ElementsAre(Json::parse(R"({"name": "raw.Raw", "value": 90.0, "unit": "frames"})"),
                          Json::parse(R"({"name": "raw.Odd", "value": "-inf"})")));
}

TEST(OcpReport, HasAuxiliaryDataAndFaultsAsExtensions) {
  EXPECT_THAT(
      allOf(artifactsOf(fullRecord(Verdict::kPass)), "extension"),
      ElementsAre(
          Json::parse(R"({"name": "auxiliaryData", "content": {"bytes": "a5"}})"),
          Json::parse(
              R"({"name": "faults", "content": {"faults": [{"fault": {"operation": "CaptureStream.start"}, "fired": 1}]}})")));
  DiagnosticRecord record = fullRecord(Verdict::kPass);
  record.auxiliaryData = {};
  record.faults.clear();
  EXPECT_THAT(allOf(artifactsOf(record), "extension"), IsEmpty());
}

TEST(OcpReport, HasAValidatorForEachBound) {
  EXPECT_EQ(measurementOf(limited(2, boundOf(1, false), boundOf(3, false))), Json::parse(R"({
    "name": "R", "value": 2.0, "unit": "frames",
    "validators": [{"name": "L", "type": "GREATER_THAN_OR_EQUAL", "value": 1.0},
                   {"name": "L", "type": "LESS_THAN_OR_EQUAL", "value": 3.0}]})"));
  EXPECT_EQ(measurementOf(limited(2, boundOf(1, true), nullptr))["validators"],
            Json::parse(R"([{"name": "L", "type": "GREATER_THAN", "value": 1.0}])"));
  EXPECT_EQ(measurementOf(limited(2, nullptr, boundOf(3, true)))["validators"],
            Json::parse(R"([{"name": "L", "type": "LESS_THAN", "value": 3.0}])"));
}

TEST(OcpReport, HasNoValidatorForAResultForInformation) {
  EXPECT_EQ(measurementOf(QZMeasuredResult("R", Measurement(kNan, QZDimensionlessUnit::frames()))),
            Json::parse(R"({"name": "R", "value": "nan", "unit": "frames"})"));
  EXPECT_EQ(measurementOf(limited(2, nullptr, nullptr)),
            Json::parse(R"({"name": "R", "value": 2.0, "unit": "frames", "metadata": {"limit": {"name": "L"}}})"));
}

TEST(OcpReport, TellsALimitThatCannotBeJudgedByInTheMetadata) {
  EXPECT_EQ(measurementOf(limited(kNan, boundOf(1, false), boundOf(kInf, true))), Json::parse(R"({
    "name": "R", "value": "nan", "unit": "frames",
    "metadata": {"limit": {"name": "L", "lower": {"value": 1.0, "open": false, "unit": "frames"},
                           "upper": {"value": "inf", "open": true, "unit": "frames"}},
                 "problem": "the result R cannot be judged: its upper bound is inf"}})"));
  const Json other = measurementOf(limited(2, boundOf(1, false, QZDimensionlessUnit::events()), nullptr));
  EXPECT_FALSE(other.contains("validators"));
  EXPECT_EQ(other["metadata"]["limit"]["lower"]["unit"], "events");
}

TEST(OcpReport, HasADiagnosisForEachLimitedResult) {
  EXPECT_THAT(allOf(artifactsOf(fullRecord(Verdict::kPass)), "diagnosis"),
              ElementsAre(Json::parse(R"({"verdict": "Count-pass", "type": "PASS",
                                          "message": "Count is 90 frames, limit Enough: >= 90"})")));
  EXPECT_THAT(allOf(artifactsOf(fullRecord(Verdict::kFail)), "diagnosis"),
              ElementsAre(Json::parse(R"({"verdict": "Count-fail", "type": "FAIL",
                                          "message": "Count is 89 frames, limit Enough: >= 90"})")));
}

TEST(OcpReport, KnowsNothingOfTheHardwareWithAnError) {
  DiagnosticRecord record = fullRecord(Verdict::kError);
  record.errorStage = Stage::kTeardown;
  record.measuredResults.push_back(judgeResult(resultWithMinimum(1, 2)));
  const std::vector<Artifact> artifacts = artifactsOf(record);
  std::vector<std::string> types;
  for (const Json& one : allOf(artifacts, "diagnosis")) types.push_back(one["type"]);
  EXPECT_THAT(types, ElementsAre("UNKNOWN", "UNKNOWN"));
  EXPECT_EQ(allOf(artifacts, "diagnosis")[1]["verdict"], "Count-unknown");
  EXPECT_EQ(allOf(artifacts, "testRunEnd")[0], Json::parse(R"({"status": "ERROR", "result": "NOT_APPLICABLE"})"));
}

TEST(OcpReport, EndsAsTheVerdictSays) {
  EXPECT_EQ(artifactsOf(fullRecord(Verdict::kPass)).back().content,
            Json::parse(R"({"status": "COMPLETE", "result": "PASS"})"));
  EXPECT_EQ(artifactsOf(fullRecord(Verdict::kFail)).back().content,
            Json::parse(R"({"status": "COMPLETE", "result": "FAIL"})"));
}

struct ErrorRow {
  const char* name;
  std::optional<Stage> stage;
  const char* step;        // in which the error occurs
  const char* experiment;  // the status of the experiment's step; empty if there is no such step
  const char* analysis;
};

TEST(OcpReport, HasTheErrorInTheStepThatItCameFrom) {
  constexpr ErrorRow kRows[] = {
      {"load", Stage::kLoad, "run", "", ""},
      {"describe", Stage::kDescribe, "experiment", "ERROR", ""},
      {"setup", Stage::kSetup, "experiment", "ERROR", ""},
      {"run", Stage::kRun, "experiment", "ERROR", ""},
      {"teardown", Stage::kTeardown, "experiment", "ERROR", "COMPLETE"},
      {"analyze", Stage::kAnalyze, "analysis", "COMPLETE", "ERROR"},
      {"the judge", std::nullopt, "analysis", "COMPLETE", "ERROR"},
  };
  for (const ErrorRow& row : kRows) {
    DiagnosticRecord record = fullRecord(Verdict::kError);
    record.errorStage = row.stage;
    if (*row.experiment == '\0') {
      record.stages.clear();
      record.measurements = {};
      record.auxiliaryData = {};
    }
    if (*row.analysis == '\0') {
      record.measuredResults.clear();
      if (!record.stages.empty()) record.stages.pop_back();
    }
    const std::vector<Artifact> artifacts = artifactsOf(record);
    EXPECT_THAT(allOf(artifacts, "error", row.step),
                ElementsAre(Json::parse(R"({"symptom": "Domain:-1", "message": "it failed"})"),
                            Json::parse(R"({"symptom": "Deep:2", "message": "the cause"})")))
        << row.name;
    EXPECT_EQ(allOf(artifacts, "error").size(), 2U) << row.name;
    for (const auto& [step, status] : {std::pair("experiment", row.experiment), {"analysis", row.analysis}}) {
      const std::vector<Json> ends = allOf(artifacts, "testStepEnd", step);
      EXPECT_EQ(ends.empty() ? "" : ends[0]["status"], status) << row.name << ", " << step;
    }
  }
}

TEST(OcpReport, HasTheJudgesErrorInTheRunWhenThereWasNoAnalysis) {
  DiagnosticRecord record = fullRecord(Verdict::kError);
  record.stages.pop_back();
  record.measuredResults.clear();
  const std::vector<Artifact> artifacts = artifactsOf(record);
  EXPECT_EQ(allOf(artifacts, "error", "run").size(), 2U);
  EXPECT_EQ(allOf(artifacts, "testStepEnd")[0]["status"], "COMPLETE");
}

TEST(OcpReport, CallsAnAnalysisWithoutResultNoComplete) {
  DiagnosticRecord record = fullRecord(Verdict::kError);
  record.errorStage = Stage::kTeardown;
  record.measuredResults.clear();
  const std::vector<Artifact> artifacts = artifactsOf(record);
  EXPECT_EQ(allOf(artifacts, "testStepEnd", "analysis")[0]["status"], "ERROR");
  EXPECT_THAT(allOf(artifacts, "error", "analysis"), IsEmpty());
}

TEST(OcpReport, HasWhatWasFoundEvenWhenItsStagesAreNotKnown) {
  DiagnosticRecord record = fullRecord(Verdict::kPass);
  record.stages.clear();
  const std::vector<Artifact> artifacts = artifactsOf(record);
  EXPECT_EQ(allOf(artifacts, "measurement", "experiment").size(), 1U);
  EXPECT_EQ(allOf(artifacts, "measurement", "analysis").size(), 2U);
}

TEST(OcpReport, SaysThatAnExperimentOnItsOwnWasNotJudged) {
  DiagnosticRecord record = fullRecord(Verdict::kPass);
  record.experimentOnly = true;
  record.measuredResults.clear();
  record.stages.pop_back();
  const std::vector<Artifact> artifacts = artifactsOf(record);
  EXPECT_THAT(allOf(artifacts, "diagnosis", "experiment"), ElementsAre(Json::parse(R"({
    "verdict": "not-judged", "type": "UNKNOWN",
    "message": "The experiment was run on its own and returned a result; nothing was judged."})")));
  EXPECT_EQ(artifacts.back().content, Json::parse(R"({"status": "COMPLETE", "result": "PASS"})"));
  EXPECT_THAT(allOf(artifacts, "testStepStart", "analysis"), IsEmpty());
  EXPECT_THAT(artifacts[1].content["commandLine"], testing::StartsWith("quazor experiment Diagnostic "));
  record.verdict = Verdict::kError;
  EXPECT_THAT(allOf(artifactsOf(record), "diagnosis"), IsEmpty());
}

TEST(OcpReport, HasATestRunForEachRecord) {
  const std::string report =
      ocpReport(startedRun(), {fullRecord(Verdict::kPass), fullRecord(Verdict::kFail)}, std::nullopt);
  std::vector<std::string> results;
  for (const Json& one : allOf(artifactsOf(report), "testRunEnd")) results.push_back(one["result"]);
  EXPECT_THAT(results, ElementsAre("PASS", "FAIL"));
  EXPECT_EQ(ocpReport(startedRun(), {}, std::nullopt), "");
}

TEST(OcpReport, TellsWhatWasInterruptedAndWhatNeverRan) {
  RunStarted three = startedRun();
  three.names = {"Diagnostic", "Second", "Third"};
  const std::vector<Artifact> artifacts = artifactsOf(ocpReport(three, {fullRecord(Verdict::kPass)}, "Second"));
  const std::vector<Json> starts = allOf(artifacts, "testRunStart");
  const std::vector<Json> ends = allOf(artifacts, "testRunEnd");
  ASSERT_EQ(starts.size(), 3U);
  EXPECT_EQ(starts[1]["name"], "Second");
  EXPECT_EQ(starts[1]["commandLine"], "quazor run Second --plugin p.so --phone phone.json --seed 5 --profile none");
  EXPECT_EQ(starts[1]["parameters"], Json::object());
  EXPECT_EQ(starts[1]["metadata"], Json::parse(R"({"seed": 5, "contract": 2, "plugins": ["p.so"]})"));
  EXPECT_THAT(allOf(artifacts, "error"), ElementsAre(Json::parse(R"({"symptom": "QuazorHostErrorDomain:11",
                                          "message": "Second was interrupted"})")));
  EXPECT_EQ(ends[1], Json::parse(R"({"status": "ERROR", "result": "NOT_APPLICABLE"})"));
  EXPECT_EQ(starts[2]["name"], "Third");
  EXPECT_THAT(allOf(artifacts, "log"),
              ElementsAre(Json::parse(R"({"severity": "INFO", "message": "The run ended before this was started."})")));
  EXPECT_EQ(ends[2], Json::parse(R"({"status": "SKIP", "result": "NOT_APPLICABLE"})"));
  EXPECT_EQ(artifacts.back().timestamp, "1970-01-01T00:00:11.000000000Z");
}

TEST(OcpReport, TellsAnInterruptBetweenTwo) {
  RunStarted two = startedRun();
  two.names = {"Diagnostic", "Second"};
  two.ofExperiments = true;
  const std::vector<Artifact> artifacts = artifactsOf(ocpReport(two, {}, ""));
  const std::vector<Json> starts = allOf(artifacts, "testRunStart");
  ASSERT_EQ(starts.size(), 3U);
  EXPECT_EQ(starts[0]["name"], "quazor");
  EXPECT_THAT(std::string(starts[0]["commandLine"]), testing::StartsWith("quazor experiment Diagnostic Second "));
  EXPECT_EQ(allOf(artifacts, "testRunEnd")[0]["status"], "ERROR");
  EXPECT_EQ(allOf(artifacts, "testRunEnd")[1]["status"], "SKIP");
}

}  // namespace
}  // namespace quazor
