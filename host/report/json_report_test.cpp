#include "host/report/json_report.h"

#include "host/error/host_error.h"
#include "host/testing/test_records.h"

#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// recordOf("Name", Verdict::kError), as a diagnostic's run has it.
Json wholeRecord() {
  return Json::parse(R"({
    "name": "Name",
    "summary": "Its summary.",
    "verdict": "error",
    "parameters": {"experiment": {"duration": 3}, "analysis": {}},
    "measuredResults": [
      {"name": "Count", "value": 90.0, "unit": "frames",
       "limit": {"name": "Enough", "lower": {"value": 90.0, "open": false}, "upper": null}, "verdict": "pass"},
      {"name": "Offset", "value": 0.5, "unit": "events", "limit": null, "verdict": "none"}
    ],
    "measurements": {"Raw": {"value": 90.0, "unit": "frames"}},
    "auxiliaryData": {"bytes": "a5"},
    "error": {"message": "it failed", "code": -1, "domain": "Domain",
              "underlying-error": {"message": "the cause", "code": 2, "domain": "Deep"}},
    "log": [{"time": 0.25, "level": "error", "text": "a line"}],
    "faults": [{"operation": "CaptureStream.start", "fired": 1}],
    "seed": 7,
    "durations": {"setup": 0.0, "run": 3.0, "teardown": null, "analysis": 0.0}
  })");
}

TEST(RecordJson, HoldsEverythingInItsOrder) { EXPECT_EQ(recordJson(recordOf("Name", Verdict::kError)), wholeRecord()); }

TEST(RecordJson, HasNoErrorWithAnotherVerdict) {
  EXPECT_TRUE(recordJson(recordOf("Name", Verdict::kPass))["error"].is_null());
  EXPECT_EQ(recordJson(recordOf("Name", Verdict::kPass))["verdict"], "pass");
  EXPECT_EQ(recordJson(recordOf("Name", Verdict::kFail))["verdict"], "fail");
  EXPECT_EQ(recordJson(recordOf("Name", Verdict::kFail))["measuredResults"][0]["verdict"], "fail");
}

TEST(RecordJson, WritesNumbersThatJsonDoesNotHaveAsText) {
  DiagnosticRecord record = recordOf("Name", Verdict::kError);
  const double nan = std::numeric_limits<double>::quiet_NaN();
  record.measuredResults = {judgeResult(resultWithMinimum(nan, -std::numeric_limits<double>::infinity()))};
  const Json result = recordJson(record)["measuredResults"][0];
  EXPECT_EQ(result["value"], "nan");
  EXPECT_EQ(result["limit"]["lower"]["value"], "-inf");
}

TEST(RecordJson, SaysWhetherABoundIsOpen) {
  DiagnosticRecord record = recordOf("Name", Verdict::kPass);
  record.measuredResults = {resultWithMaximum(1, 2)};
  EXPECT_EQ(recordJson(record)["measuredResults"][0]["limit"],
            Json::parse(R"({"name": "L", "lower": null, "upper": {"value": 2.0, "open": true}})"));
}

TEST(RunDocument, HoldsTheRecordsInTheirOrder) {
  const Json document = runDocument({recordOf("B", Verdict::kPass), recordOf("A", Verdict::kFail)}, std::nullopt);
  EXPECT_EQ(document["schema"], 1);
  ASSERT_EQ(document["diagnostics"].size(), 2U);
  EXPECT_EQ(document["diagnostics"][0]["name"], "B");
  EXPECT_EQ(document["diagnostics"][1]["name"], "A");
  EXPECT_FALSE(document.contains("interrupted"));
}

TEST(RunDocument, NamesWhatWasInterrupted) {
  const Json document = runDocument({}, "Slow");
  EXPECT_EQ(document, Json::parse(R"({"schema": 1, "diagnostics": [], "interrupted": "Slow"})"));
}

TEST(ExperimentJson, HoldsEverythingInItsOrder) {
  DiagnosticRecord record = recordOf("Name", Verdict::kError);
  record.experimentOnly = true;
  Json expected = wholeRecord();
  expected["parameters"] = {{"duration", 3}};
  expected.erase("measuredResults");
  expected["durations"].erase("analysis");
  EXPECT_EQ(experimentJson(record).dump(), expected.dump());
  EXPECT_EQ(experimentJson(recordOf("Name", Verdict::kPass))["verdict"], "pass");
  EXPECT_TRUE(experimentJson(recordOf("Name", Verdict::kPass))["error"].is_null());
}

TEST(ExperimentJson, KeepsTheKindsOfSamples) {
  DiagnosticRecord record = recordOf("Name", Verdict::kPass);
  record.auxiliaryData = Dictionary{
      {"images", Array{Dictionary{{"samples", Array{-2147483648, 4294967295U, 0.1, true}}, {"celsius", 36.6F}}}}};
  EXPECT_EQ(experimentJson(record)["auxiliaryData"].dump(),
            R"({"images":[{"samples":[-2147483648,4294967295,0.1,true],"celsius":36.6}]})");
}

TEST(ExperimentDocument, HoldsTheRecordsInTheirOrder) {
  const Json document = experimentDocument({recordOf("B", Verdict::kPass), recordOf("A", Verdict::kError)}, "Slow");
  EXPECT_EQ(document["schema"], 1);
  ASSERT_EQ(document["experiments"].size(), 2U);
  EXPECT_EQ(document["experiments"][0]["name"], "B");
  EXPECT_EQ(document["experiments"][1]["name"], "A");
  EXPECT_EQ(document["interrupted"], "Slow");
  EXPECT_FALSE(document.contains("diagnostics"));
  EXPECT_FALSE(experimentDocument({}, std::nullopt).contains("interrupted"));
}

DescribedDiagnostic experimentAlone() {
  DescribedDiagnostic described;
  described.diagnostic.name = described.diagnostic.experimentName = "X";
  described.diagnostic.experimentOnly = true;
  described.description.experiment = QZDescription("About X.");
  return described;
}

TEST(ListDocument, NamesDiagnosticsAndTheirHalvesAndExperimentsApart) {
  DescribedDiagnostic broken = experimentAlone();
  broken.diagnostic.name = "Broken";
  broken.description.error = hostError(HostErrorCode::kException, "it threw");
  const DescribedDiagnostic diagnostic{{"D", "S.", "E", "A", nullptr, nullptr}, {}};
  EXPECT_EQ(listDocument({diagnostic, experimentAlone(), broken}), Json::parse(R"({"schema": 1,
    "diagnostics": [{"name": "D", "summary": "S.", "experiment": "E", "analysis": "A"}],
    "experiments": [{"name": "X", "summary": "About X."}, {"name": "Broken", "summary": null}]})"));
}

TEST(DescriptionDocument, HoldsExperimentsApart) {
  ResolvedDiagnostic bound;
  bound.described = experimentAlone();
  bound.parameters.experiment.push_back({"x", QZNumberParameter("About x.", true), Value(2.5), "profile p.json"});
  EXPECT_EQ(descriptionDocument({bound}), Json::parse(R"({"schema": 1, "diagnostics": [], "experiments": [
    {"name": "X", "summary": "About X.", "parameters": [
      {"name": "x", "summary": "About x.", "required": true, "range": null, "value": 2.5,
       "source": "profile p.json"}],
     "error": null}]})"));
}

TEST(DescriptionDocument, HoldsDeclarationsAndValues) {
  ResolvedDiagnostic bound;
  bound.described.diagnostic = {"D", "S.", "E", "A", nullptr, nullptr};
  bound.described.description = {QZDescription("About E."), QZDescription("About A."), nullptr};
  bound.parameters.experiment.push_back({"x", QZNumberParameter("About x.", true), Value(2.5), "profile p.json"});
  bound.parameters.experiment.back().range.emplace().setMinimum(1);
  bound.parameters.experiment.back().range->setUnit("s");
  bound.parameters.experiment.push_back({"y", QZNumberParameter("About y.", false), std::nullopt, ""});
  EXPECT_EQ(descriptionDocument({bound}), Json::parse(R"({"schema": 1, "diagnostics": [
    {"name": "D", "summary": "S.",
     "experiment": {"name": "E", "summary": "About E.", "parameters": [
       {"name": "x", "summary": "About x.", "required": true, "range": {"minimum": 1.0, "unit": "s"}, "value": 2.5,
        "source": "profile p.json"},
       {"name": "y", "summary": "About y.", "required": false, "range": null, "value": null,
        "source": null}]},
     "analysis": {"name": "A", "summary": "About A.", "parameters": []},
     "error": null}], "experiments": []})"));
}

TEST(DescriptionDocument, TellsWhyADiagnosticCannotBeDescribed) {
  ResolvedDiagnostic bound;
  bound.described.description.error = hostError(HostErrorCode::kException, "it threw");
  EXPECT_EQ(descriptionDocument({bound})["diagnostics"][0]["error"]["message"], "it threw");
}

}  // namespace
}  // namespace quazor
