#include "backends/simulated/scenario/scenario.h"

#include "base/json/json_document.h"
#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#ifndef QUAZOR_SCENARIO_FOLDER
#error "the build names the folder of the scenarios"
#endif

namespace quazor {
namespace {

namespace fs = std::filesystem;
using ::testing::IsEmpty;

// Each test has its own directory.
class ScenarioReaderTest : public ::testing::Test {
 protected:
  ScenarioReaderTest() {
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    folder_ =
        fs::path(::testing::TempDir()) / (std::string("quazor-") + info->name() + "-" +
                                          std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()));
    fs::create_directories(folder_);
  }
  ~ScenarioReaderTest() override { fs::remove_all(folder_); }

  fs::path write(const std::string& name, std::string_view text) {
    const fs::path file = folder_ / name;
    fs::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary) << text;
    return file;
  }
  // The error message for a file, without the directory; "nothing" if the file is valid.
  std::string problemOf(const fs::path& file) {
    std::string problem = thrownText<InputError>([&] { readScenario(file); });
    const std::string folder = folder_.string() + "/";
    for (std::size_t at = problem.find(folder); at != std::string::npos; at = problem.find(folder)) {
      problem.erase(at, folder.size());
    }
    return problem;
  }
  std::string problemOfText(std::string_view text) { return problemOf(write("p.json", text)); }

  fs::path folder_;
};

// A scenario with a camera "a", a group "g" that contains it, and one more entry.
std::string with(const std::string& entry) {
  return R"({"title": "t", "cameras": {"a": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}]}},
             "groups": {"g": {"cameras": ["a"], "master": "a"}}, )" +
         entry + "}";
}
std::string withCamera(const std::string& entry) {
  return R"({"title": "t", "cameras": {"a": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}], )" +
         entry + R"(}}, "groups": {}})";
}
std::string withGroup(const std::string& group) {
  return R"({"title": "t", "cameras": {"wide": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}]}},
             "groups": {"g": )" +
         group + "}}";
}
std::string withFault(const std::string& entries) { return with(R"("faults": [{)" + entries + "}]"); }

// The entry `expect`, which the scenario passes on unread.
std::string expectIn(const Scenario& scenario) {
  return scenario.document->value().value("expect", nlohmann::ordered_json()).dump();
}

TEST_F(ScenarioReaderTest, ReadsAllThereIsToSay) {
  const fs::path file = write("p.json", R"({
    "$schema": "scenario.schema.json",
    "title": "Everything",
    "device": {"plugInLoads": false, "present": false},
    "cameras": {
      "z": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}, {"maximumFrameRate": 59.94}],
            "multipleOutputs": false, "firstFrameOffset": 2, "actualFrameRate": 29.97, "deliversFrames": false,
            "droppedFrames": [5, 3], "dropEvery": 7, "inSessionStatus": false,
            "errorCounters": {"MIPIErrorCount": 18446744073709551615, "Other": 1}},
      "a": {"port": "FrontFacingCamera", "formats": [{"maximumFrameRate": 1}], "errorCounters": "unreadable"}
    },
    "groups": {"y": {"cameras": ["z", "a"], "master": "a", "masterConfiguration": false},
               "b": {"cameras": ["a"], "master": "a"}},
    "faults": [
      {"operation": "CaptureStream.setValue", "object": "z", "property": "FormatIndex", "occurrence": 2,
       "action": "fail", "error": {"domain": "D", "code": -9223372036854775808, "message": "M"}},
      {"operation": "*", "object": "y", "action": "delay", "seconds": 0.5},
      {"operation": "*", "property": "ActiveStreams", "action": "nothing"},
      {"operation": "CaptureDevice.invalidate", "action": "hang"}
    ],
    "expect": {
      "Silent": {"verdict": "error", "error": null},
      "Fail": {"verdict": "fail", "failedResults": ["A.Total"]}
    }})");
  const Scenario scenario = readScenario(file);
  EXPECT_EQ(scenario.title, "Everything");
  EXPECT_FALSE(scenario.device.plugInLoads);
  EXPECT_FALSE(scenario.device.present);

  ASSERT_EQ(scenario.cameras.size(), 2U);
  const Camera& camera = scenario.cameras[0];
  EXPECT_EQ(camera.id, "z");
  EXPECT_EQ(camera.port, "BackFacingCamera");
  ASSERT_EQ(camera.formats.size(), 2U);
  EXPECT_EQ(camera.formats[1].maximumFrameRate, 59.94);
  EXPECT_FALSE(camera.multipleOutputs);
  EXPECT_EQ(camera.firstFrameOffset, 2U);
  EXPECT_EQ(camera.actualFrameRate, 29.97);
  EXPECT_FALSE(camera.deliversFrames);
  EXPECT_THAT(camera.droppedFrames, testing::ElementsAre(3U, 5U));
  EXPECT_EQ(camera.dropEvery, 7U);
  EXPECT_FALSE(camera.inSessionStatus);
  Dictionary counters = Camera::defaultErrorCounters();
  counters.set("MIPIErrorCount", std::numeric_limits<std::uint64_t>::max());
  counters.set("Other", std::uint64_t{1});
  EXPECT_EQ(camera.errorCounters, counters);
  EXPECT_EQ(scenario.cameras[1].id, "a");
  EXPECT_EQ(scenario.cameras[1].errorCounters, std::nullopt);

  ASSERT_EQ(scenario.groups.size(), 2U);
  EXPECT_EQ(scenario.groups[0].id, "y");
  EXPECT_THAT(scenario.groups[0].cameras, testing::ElementsAre("z", "a"));
  EXPECT_EQ(scenario.groups[0].master, "a");
  EXPECT_FALSE(scenario.groups[0].masterConfiguration);
  EXPECT_TRUE(scenario.groups[1].masterConfiguration);

  const auto fault = [](const char* operation, FaultAction action) {
    Fault made;
    made.operation = operation;
    made.action = action;
    return made;
  };
  Fault fail = fault("CaptureStream.setValue", FaultAction::kFail);
  fail.object = "z";
  fail.property = "FormatIndex";
  fail.occurrence = 2;
  fail.error = FaultError{"D", std::numeric_limits<std::int64_t>::min(), "M"};
  Fault delay = fault("*", FaultAction::kDelay);
  delay.object = "y";
  delay.seconds = 0.5;
  Fault nothing = fault("*", FaultAction::kNothing);
  nothing.property = "ActiveStreams";
  EXPECT_EQ(scenario.faults,
            (std::vector<Fault>{fail, delay, nothing, fault("CaptureDevice.invalidate", FaultAction::kHang)}));

  EXPECT_EQ(expectIn(scenario),
            R"({"Silent":{"verdict":"error","error":null},"Fail":{"verdict":"fail","failedResults":["A.Total"]}})");
}

TEST_F(ScenarioReaderTest, WhatIsNotSaidIsHealthy) {
  const Scenario scenario = readScenario(write("p.json", withCamera(R"("dropEvery": 1)")));
  EXPECT_TRUE(scenario.device.plugInLoads);
  EXPECT_TRUE(scenario.device.present);
  const Camera& camera = scenario.cameras[0];
  EXPECT_TRUE(camera.multipleOutputs);
  EXPECT_TRUE(camera.deliversFrames);
  EXPECT_TRUE(camera.inSessionStatus);
  EXPECT_EQ(camera.firstFrameOffset, 0U);
  EXPECT_EQ(camera.actualFrameRate, std::nullopt);
  EXPECT_THAT(camera.droppedFrames, IsEmpty());
  EXPECT_EQ(camera.errorCounters, Camera::defaultErrorCounters());
  EXPECT_THAT(scenario.faults, IsEmpty());
  EXPECT_EQ(expectIn(scenario), "null");
}

TEST_F(ScenarioReaderTest, TextsThatAreNoJsonAreRefusedWithTheirLine) {
  const NamedRefusal kRows[] = {
      {"an empty file", "", "p.json:1: not valid JSON: unexpected end of input; expected '[', '{', or a literal."},
      {"a comma too many", "{\n  \"title\": \"t\",\n}",
       "p.json:3: not valid JSON: unexpected '}'; expected string literal."},
      {"text behind the end", "{}\n\nmore",
       "p.json:3: not valid JSON: invalid literal; last read: '{}<U+000A>"
       "<U+000A>m'; expected end of input."},
      {"two documents", "{}\n{}", "p.json:2: not valid JSON: unexpected '{'; expected end of input."},
      {"a missing end", "{\"title\": [1,\n2", "p.json:2: not valid JSON: unexpected end of input; expected ']'."},
      {"a comment", "{ // why\n}",
       "p.json:1: not valid JSON: invalid literal; last read: '{ /'; expected string "
       "literal."},
      {"a byte that is no UTF-8", "{\n\"title\": \"\xFF\"}", "p.json:2: the file is not valid UTF-8."},
      {"a sequence that is too long", "{\"\xC0\x80\": 1}", "p.json:1: the file is not valid UTF-8."},
      {"a surrogate", "\"\xED\xA0\x80\"", "p.json:1: the file is not valid UTF-8."},
      {"a code point that there is not", "\"\xF4\x90\x80\x80\"", "p.json:1: the file is not valid UTF-8."},
      {"a sequence that is cut off", "\"\xE2\x82", "p.json:1: the file is not valid UTF-8."},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOfText(row.text), row.problem) << row.name;
}

TEST_F(ScenarioReaderTest, EveryLengthOfUtf8Passes) {
  const Scenario scenario = readScenario(
      write("p.json", "{\"title\": \"a \xC3\xBC \xE2\x82\xAC \xF0\x9F\x93\xB7\", \"cameras\": {}, \"groups\": {}}"));
  EXPECT_EQ(scenario.title, "a \xC3\xBC \xE2\x82\xAC \xF0\x9F\x93\xB7");
}

TEST_F(ScenarioReaderTest, DocumentsThatMeanNothingAreRefusedWithTheirPath) {
  const NamedRefusal kRows[] = {
      {"no object", "[]", "p.json:1: the document: must be an object, not an array."},
      {"no title", R"({"cameras": {}, "groups": {}})", "p.json:1: the document: the key \"title\" is missing."},
      {"an empty title", R"({"title": "", "cameras": {}, "groups": {}})",
       "p.json:1: title: must be a non-empty string, not \"\"."},
      {"no cameras", R"({"title": "t", "groups": {}})", "p.json:1: the document: the key \"cameras\" is missing."},
      {"no groups", R"({"title": "t", "cameras": {}})", "p.json:1: the document: the key \"groups\" is missing."},
      {"a key that was misspelt", with(R"("fault": [])"),
       "p.json:2: the document: unknown key \"fault\"; did you mean \"faults\"?"},
      {"a key that is far from any", with(R"("zzz": 1)"),
       "p.json:2: the document: unknown key \"zzz\"; expected one of \"$schema\", \"title\", \"base\", \"device\", "
       "\"cameras\", \"groups\", \"reports\", \"hidDevices\", \"display\", \"faults\", \"expect\", \"absent\"."},
      {"a key twice", with(R"("device": {"present": true, "present": false})"),
       "p.json:2: device: the key \"present\" is duplicated; remove one."},
      {"a key twice at the top", with(R"("title": "again")"), "p.json:2: the key \"title\" is duplicated; remove one."},
      {"a key twice in an array", withFault(R"("operation": "*", "action": "fail", "action": "hang")"),
       "p.json:2: faults[0]: the key \"action\" is duplicated; remove one."},
      {"a number beyond a double", withCamera(R"("actualFrameRate": 1e999)"),
       "p.json:1: cameras.a.actualFrameRate: the number is too large for a double."},
      {"nested too deep", std::string(40, '['), "p.json:1: the document is nested more than 32 deep."},
      {"a schema that is no name", with(R"("$schema": 1)"), "p.json:2: $schema: must be a non-empty string, not 1."},
      {"a device that is no object", with(R"("device": true)"), "p.json:2: device: must be an object, not true."},
      {"a switch that is no boolean", with(R"("device": {"present": 1})"),
       "p.json:2: device.present: must be true or false, not 1."},
      {"an unknown part of the device", with(R"("device": {"presence": true})"),
       "p.json:2: device: unknown key \"presence\"; did you mean \"present\"?"},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOfText(row.text), row.problem) << row.name;
}

TEST_F(ScenarioReaderTest, CamerasAndGroupsThatCannotBeAreRefused) {
  const NamedRefusal kRows[] = {
      {"an id with a dot", R"({"title": "t", "cameras": {"a.b": {}}, "groups": {}})",
       "p.json:1: cameras.a.b: an id may only contain letters, digits, \"-\" and \"_\"."},
      {"an empty id", R"({"title": "t", "cameras": {"": {}}, "groups": {}})",
       "p.json: cameras.: an id may only contain letters, digits, \"-\" and \"_\"."},
      {"no port", R"({"title": "t", "cameras": {"a": {"formats": []}}, "groups": {}})",
       "p.json:1: cameras.a: the key \"port\" is missing."},
      {"an unknown port", R"({"title": "t", "cameras": {"a": {"port": "BackFacingCammera"}}, "groups": {}})",
       "p.json:1: cameras.a.port: \"BackFacingCammera\" is not a port type; did you mean \"BackFacingCamera\"?"},
      {"no formats", R"({"title": "t", "cameras": {"a": {"port": "BackFacingCamera", "formats": []}}, "groups": {}})",
       "p.json:1: cameras.a.formats: a camera must have at least one format."},
      {"a format without a rate",
       R"({"title": "t", "cameras": {"a": {"port": "BackFacingCamera", "formats": [{}]}}, "groups": {}})",
       "p.json:1: cameras.a.formats[0]: the key \"maximumFrameRate\" is missing."},
      {"a rate of zero", withCamera(R"("actualFrameRate": 0)"),
       "p.json:1: cameras.a.actualFrameRate: must be a number above 0 and at most 1000.0, not 0."},
      {"a rate too high", withCamera(R"("actualFrameRate": 1000.1)"),
       "p.json:1: cameras.a.actualFrameRate: must be a number above 0 and at most 1000.0, not 1000.1."},
      {"a rate that is no number", withCamera(R"("actualFrameRate": "30")"),
       "p.json:1: cameras.a.actualFrameRate: must be a number above 0 and at most 1000.0, not \"30\"."},
      {"a negative offset", withCamera(R"("firstFrameOffset": -1)"),
       "p.json:1: cameras.a.firstFrameOffset: must be an integer from 0 to 1000000000, not -1."},
      {"an offset too far", withCamera(R"("firstFrameOffset": 1000000001)"),
       "p.json:1: cameras.a.firstFrameOffset: must be an integer from 0 to 1000000000, not 1000000001."},
      {"an offset that is no integer", withCamera(R"("firstFrameOffset": 1.0)"),
       "p.json:1: cameras.a.firstFrameOffset: must be an integer from 0 to 1000000000, not 1.0."},
      {"frames that are no list", withCamera(R"("droppedFrames": 3)"),
       "p.json:1: cameras.a.droppedFrames: must be an array, not 3."},
      {"a frame twice", withCamera(R"("droppedFrames": [3, 4, 3])"),
       "p.json:1: cameras.a.droppedFrames[2]: the frame is listed twice; remove one."},
      {"every zeroth frame", withCamera(R"("dropEvery": 0)"),
       "p.json:1: cameras.a.dropEvery: must be an integer from 1 to 1000000000, not 0."},
      {"counters of another word", withCamera(R"("errorCounters": "unreadble")"),
       "p.json:1: cameras.a.errorCounters: \"unreadble\" is not a state of the counters; did you mean \"unreadable\"?"},
      {"counters that are null", withCamera(R"("errorCounters": null)"),
       "p.json:1: cameras.a.errorCounters: must be an object, not null."},
      {"a negative counter", withCamera(R"("errorCounters": {"I2CErrorCount": -1})"),
       "p.json:1: cameras.a.errorCounters.I2CErrorCount: must be an integer from 0 to 18446744073709551615, not -1."},
      {"a group of no camera", withGroup(R"({"cameras": [], "master": "wide"})"),
       "p.json:2: groups.g.master: \"wide\" is not a camera of the group."},
      {"a group of a camera that there is not", withGroup(R"({"cameras": ["wide", "wyde"], "master": "wide"})"),
       "p.json:2: groups.g.cameras[1]: \"wyde\" is not a camera of this scenario; did you mean \"wide\"?"},
      {"a group of one camera twice", withGroup(R"({"cameras": ["wide", "wide"], "master": "wide"})"),
       "p.json:2: groups.g.cameras[1]: the camera is listed twice; remove one."},
      {"a master of another group", withGroup(R"({"cameras": ["wide"], "master": "tele"})"),
       "p.json:2: groups.g.master: \"tele\" is not a camera of the group; expected one of \"wide\"."},
      {"an unknown part of a group", withGroup(R"({"cameras": ["wide"], "master": "wide", "masters": 1})"),
       "p.json:2: groups.g: unknown key \"masters\"; did you mean \"master\"?"},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOfText(row.text), row.problem) << row.name;
}

TEST_F(ScenarioReaderTest, FaultsThatWouldNeverFireAreRefused) {
  const NamedRefusal kRows[] = {
      {"no list", with(R"("faults": {})"), "p.json:2: faults: must be an array, not an object."},
      {"no operation", withFault(R"("action": "fail")"), "p.json:2: faults[0]: the key \"operation\" is missing."},
      {"an operation that was misspelt", withFault(R"("operation": "CaptureStream.strat", "action": "fail")"),
       "p.json:2: faults[0].operation: \"CaptureStream.strat\" is not an operation that can fail; did you mean "
       "\"CaptureStream.start\"?"},
      {"no action", withFault(R"("operation": "*")"), "p.json:2: faults[0]: the key \"action\" is missing."},
      {"an action that was misspelt", withFault(R"("operation": "*", "action": "fial")"),
       "p.json:2: faults[0].action: \"fial\" is not an action; did you mean \"fail\"?"},
      {"an object that there is not",
       withFault(R"("operation": "CaptureStream.start", "object": "b", "action": "fail")"),
       "p.json:2: faults[0].object: \"b\" is not an object of CaptureStream.start; expected one of \"a\"."},
      {"a group for a stream's operation",
       withFault(R"("operation": "CaptureStream.start", "object": "g", "action": "fail")"),
       "p.json:2: faults[0].object: \"g\" is not an object of CaptureStream.start; expected one of \"a\"."},
      {"an object where there is one only",
       withFault(R"("operation": "CapturePlugIn.device", "object": "a", "action": "fail")"),
       "p.json:2: faults[0].object: CapturePlugIn.device has no object; remove this key."},
      {"a property that there is not",
       withFault(R"("operation": "CaptureStream.setValue", "property": "FormatIndx", "action": "fail")"),
       "p.json:2: faults[0].property: \"FormatIndx\" is not a property of CaptureStream.setValue; did you mean "
       "\"FormatIndex\"?"},
      {"a property of another object",
       withFault(R"("operation": "CaptureDevice.setValue", "property": "FormatIndex", "action": "fail")"),
       "p.json:2: faults[0].property: \"FormatIndex\" is not a property of CaptureDevice.setValue; expected one of "
       "\"MultiCamConfiguration\", \"MulticamSessionStatus\"."},
      {"a property where there is none",
       withFault(R"("operation": "CaptureStream.start", "property": "FormatIndex", "action": "fail")"),
       "p.json:2: faults[0].property: CaptureStream.start has no property; remove this key."},
      {"the zeroth call", withFault(R"("operation": "*", "occurrence": 0, "action": "fail")"),
       "p.json:2: faults[0].occurrence: must be an integer from 1 to 1000000000, not 0."},
      {"an error of a hang",
       withFault(R"("operation": "*", "action": "hang", "error": {"domain": "D", "code": 1, "message": "M"})"),
       "p.json:2: faults[0].error: only the action \"fail\" can have an error."},
      {"an error without a code", withFault(R"("operation": "*", "action": "fail", "error": {"domain": "D"})"),
       "p.json:2: faults[0].error: the key \"code\" is missing."},
      {"an error with a code too large",
       withFault(R"("operation": "*", "action": "fail", "error": {"domain": "D", "code": 9223372036854775808})"),
       "p.json:2: faults[0].error.code: must be a signed 64-bit integer, not 9223372036854775808."},
      {"a delay without seconds", withFault(R"("operation": "*", "action": "delay")"),
       "p.json:2: faults[0]: the key \"seconds\" is missing."},
      {"a delay into the past", withFault(R"("operation": "*", "action": "delay", "seconds": -1)"),
       "p.json:2: faults[0].seconds: must be a number above 0 and at most 1000000000.0, not -1."},
      {"seconds of a failure", withFault(R"("operation": "*", "action": "fail", "seconds": 1)"),
       "p.json:2: faults[0].seconds: only the action \"delay\" can have seconds."},
      {"the second fault", with(R"("faults": [{"operation": "*", "action": "fail"}, 3])"),
       "p.json:2: faults[1]: must be an object, not 3."},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOfText(row.text), row.problem) << row.name;
}

TEST_F(ScenarioReaderTest, FilesThatCannotBeReadAreRefused) {
  EXPECT_EQ(problemOf(folder_ / "absent.json"), "absent.json: the file does not exist.");
  write("file", "{}");
  fs::create_directories(folder_ / "folder");
  EXPECT_EQ(problemOf(folder_ / "folder"), "folder: this is a directory, not a file.");
  fs::create_symlink("loop.json", folder_ / "loop.json");
  EXPECT_EQ(problemOf(folder_ / "loop.json"), "loop.json: the file cannot be opened; check its permissions.");
}

TEST_F(ScenarioReaderTest, AScenarioStatesOnlyWhatDiffersFromItsBase) {
  write("base.json", with(R"("faults": [{"operation": "*", "action": "fail"}], "expect": {"D": {"verdict": "pass"}})"));
  write("middle.json", R"({"base": "base.json", "title": "m", "cameras": {"a": {"dropEvery": 3}}})");
  const fs::path file = write("folder/derived.json", R"({
    "base": "../middle.json", "title": "d",
    "cameras": {"a": {"formats": [{"maximumFrameRate": 60}], "dropEvery": null},
                "b": {"port": "FrontFacingCamera", "formats": [{"maximumFrameRate": 30}]}},
    "faults": null,
    "expect": {"D": {"verdict": "error", "error": null}}})");
  const Scenario scenario = readScenario(file);
  EXPECT_EQ(scenario.title, "d");
  ASSERT_EQ(scenario.cameras.size(), 2U);
  EXPECT_EQ(scenario.cameras[0].port, "BackFacingCamera");
  EXPECT_EQ(scenario.cameras[0].formats.at(0).maximumFrameRate, 60);
  EXPECT_EQ(scenario.cameras[0].dropEvery, 0U);
  EXPECT_EQ(scenario.cameras[1].id, "b");
  EXPECT_EQ(scenario.groups.size(), 1U);
  EXPECT_THAT(scenario.faults, IsEmpty());
  EXPECT_EQ(expectIn(scenario), R"({"D":{"verdict":"error"}})");
  EXPECT_EQ(readScenario(folder_ / "middle.json").cameras[0].dropEvery, 3U);
}

TEST_F(ScenarioReaderTest, WhatIsWrongWithABaseIsFoundThere) {
  write("good.json", with(R"("faults": [])"));
  write("broken.json", "{");
  write("empty.json", R"({"title": "t", "groups": {}})");
  write("self.json", R"({"base": "./self.json", "title": "t"})");
  write("one.json", R"({"base": "two.json", "title": "t"})");
  write("two.json", R"({"base": "one.json", "title": "t"})");
  const NamedRefusal kRows[] = {
      {"a base that there is not", R"({"base": "absent.json"})",
       "p.json:1: base: absent.json: the file does not exist."},
      {"a base that is no name", R"({"base": 1})", "p.json:1: base: must be a non-empty string, not 1."},
      {"a base that is no JSON", R"({"base": "broken.json"})",
       "p.json:1: base: broken.json:1: not valid JSON: unexpected end of input; expected string literal."},
      {"a base that is no scenario", R"({"base": "empty.json", "cameras": {}})",
       "p.json:1: base: empty.json:1: the document: the key \"cameras\" is missing."},
      {"a change that does not fit", R"({"base": "good.json", "cameras": {"a": null}})",
       "p.json: groups.g.cameras[0]: \"a\" is not a camera of this scenario."},
      {"a base of itself", R"({"base": "self.json"})",
       "p.json:1: base: self.json:1: base: \"./self.json\" is itself based on this file; scenarios must not be based "
       "on each other in a circle."},
      {"bases in a circle", R"({"base": "one.json"})",
       "p.json:1: base: one.json:1: base: two.json:1: base: \"one.json\" is itself based on this file; scenarios must "
       "not be based on each other in a circle."},
  };
  for (const auto& row : kRows) EXPECT_EQ(problemOfText(row.text), row.problem) << row.name;
}

TEST(Scenarios, AllScenariosOfTheProjectAreRead) {
  int read = 0;
  for (const fs::directory_entry& entry : fs::recursive_directory_iterator(QUAZOR_SCENARIO_FOLDER)) {
    if (entry.path().extension() != ".json" || entry.path().string().ends_with(".schema.json")) continue;
    const Scenario scenario = readScenario(entry.path());
    EXPECT_NE(expectIn(scenario), "null") << entry.path();
    ++read;
  }
  EXPECT_GE(read, 39);
}

}  // namespace
}  // namespace quazor
