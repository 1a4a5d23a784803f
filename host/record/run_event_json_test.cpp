#include "host/record/run_event_json.h"

#include "base/text/input_error.h"
#include "host/record/lossless_json.h"
#include "host/testing/test_events.h"
#include "host/testing/test_values.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <set>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;
using namespace std::chrono_literals;

RunEvent back(const RunEvent& event) { return eventFrom(Json::parse(eventJson(event).dump())); }

std::string problemOf(const Json& json) {
  return thrownText<InputError>([&] { eventFrom(json); }, "accepted");
}

struct EventRow {
  RunEvent event;
  const char* json;
};

// Each event with all of its members.
std::vector<EventRow> rows() {
  RunStarted run = runOf({"Good", "B\xff"});
  run.ofExperiments = true;
  run.seed = UINT64_MAX;
  DiagnosticStarted diagnostic = beginningOf("Good");
  diagnostic.experimentOnly = true;
  const DiagnosticErrorPtr error = errorWithMessage("D", -2, "m", nullptr);
  run.id = "0af3";
  run.host = "bench 7";
  run.tags = {{"serial", "C02X"}, {"station", "B\xff"}};
  run.planned = {{"B\xff", diagnostic.parameters}};
  RunStarted limited;
  limited.limits = {parseUserLimit("D*:R >= 2 V"), parseUserLimit("R == \"2\" +- 0.5")};
  limited.limits[0].name = "enough";
  limited.limits[0].severity = LimitSeverity::kWarn;
  limited.limits[0].source = "profile p.json";
  limited.limits[0].onlyIfSelected = true;
  limited.limits[1].source = "command line";
  return {
      {run, R"({"event":"runBegan","program":"0.1.0","contract":2,"date":"2026-11-21T01:08:00.000000000Z",)"
            R"("plugins":["p.so"],"phone":"phone.json","seed":18446744073709551615,"ofExperiments":true,)"
            R"("names":["Good",{"hex":"42ff"}],"limits":[],"id":"0af3","host":"bench 7",)"
            R"("tags":[["serial","C02X"],["station",{"hex":"42ff"}]],"planned":[{"name":{"hex":"42ff"},)"
            R"("parameters":{"experiment":[{"name":"duration","summary":"How long.","required":true,)"
            R"("value":{"signed":3},"source":"command line"}],"analysis":[{"name":"gain","summary":"How much.",)"
            R"("required":false}]}}]})"},
      {diagnostic,
       R"({"event":"diagnosticBegan","name":"Good","summary":"Its summary.","experiment":"E","analysis":"A",)"
       R"("experimentOnly":true,"parameters":{"experiment":[{"name":"duration","summary":"How long.",)"
       R"("required":true,"value":{"signed":3},"source":"command line"}],"analysis":[{"name":"gain",)"
       R"("summary":"How much.","required":false}]},"seed":5,"date":"2026-11-21T01:08:00.001000000Z"})"},
      {StageStarted{Stage::kTeardown, momentAt(7)},
       R"({"event":"stageBegan","stage":"teardown","date":"2026-11-21T01:08:00.007000000Z"})"},
      {StageEnded{Stage::kRun, 3s, momentAt(7)},
       R"({"event":"stageEnded","stage":"run","nanoseconds":3000000000,"date":"2026-11-21T01:08:00.007000000Z"})"},
      {Logged{{-1ns, LogLevel::kDebug, "a\nline", momentAt(7)}},
       R"({"event":"log","date":"2026-11-21T01:08:00.007000000Z","nanoseconds":-1,"level":"debug","text":"a\nline"})"},
      {MeasurementsAdded{{{"R", Measurement(0.5, QZUnit::unitWithSymbol("V"))}}},
       R"({"event":"measured","measurements":[["R",[0.5,"V"]]]})"},
      {AuxiliaryDataAdded{"k", Value(Array{1U})},
       R"({"event":"collected","key":"k","value":{"array":[{"unsigned":1}]}})"},
      {ResultsReported{{QZMeasuredResult("R", Measurement(1, QZUnit::unitWithSymbol("V")))}},
       R"({"event":"found","results":[{"name":"R","measurement":[1.0,"V"]}]})"},
      {Failed{Stage::kSetup, error}, R"({"event":"failed","stage":"setup","error":{"domain":"D","code":-2,)"
                                     R"("userInfo":[["localized-description",{"string":"m"}]]}})"},
      {FaultsCounted{{{{{"operation", "x"}}, 4}}},
       R"({"event":"faultsCounted","faults":[{"fault":{"operation":"x"},"fired":4}]})"},
      {Heartbeat{Stage::kRun, 30s, momentAt(7)},
       R"({"event":"heartbeat","stage":"run","nanoseconds":30000000000,"date":"2026-11-21T01:08:00.007000000Z"})"},
      {FramesTraced{"front", 4, {{7, -2, 10, 11}, {8, 8, 20, std::nullopt}}, 3},
       R"({"event":"frames","stream":"front","step":4,"columns":{"number":[7,1],"captured":[-2,10],)"
       R"("delivered":[10,10],"returned":[11,null]},"lost":3})"},
      {DiagnosticSkipped{{SkipKind::kNotAllowed, "it is hot"}},
       R"({"event":"skipped","kind":"not-allowed","reason":"it is hot"})"},
      {DiagnosticCompleted{}, R"({"event":"diagnosticCompleted"})"},
      {DiagnosticEnded{Verdict::kFail, momentAt(7)},
       R"({"event":"diagnosticEnded","verdict":"fail","date":"2026-11-21T01:08:00.007000000Z"})"},
      {RunEnded{"Good", momentAt(7)},
       R"({"event":"runEnded","interrupted":"Good","date":"2026-11-21T01:08:00.007000000Z"})"},
      {limited, R"({"event":"runBegan","program":"","contract":0,"date":"1970-01-01T00:00:00.000000000Z",)"
                R"("plugins":[],"phone":"","seed":0,"ofExperiments":false,"names":[],)"
                R"("limits":[{"limit":"D*:R >= 2 V","severity":"warn","source":"profile p.json",)"
                R"("onlyIfSelected":true,"name":"enough"},)"
                R"({"limit":"R == \"2\" +- 0.5","severity":"fail","source":"command line",)"
                R"("onlyIfSelected":false}],"id":"","host":"","tags":[]})"},
  };
}

TEST(EventJson, KeepsAProgramThatIsNotValidUtf8) {
  RunStarted run = runOf({});
  run.program = "0.1.0\xff";
  const RunEvent again = back(run);
  EXPECT_EQ(std::get<RunStarted>(again).program, run.program);
}

TEST(EventJson, HasAFormForEveryEvent) {
  std::set<std::size_t> kinds;
  for (const EventRow& row : rows()) {
    EXPECT_EQ(eventJson(row.event).dump(), row.json);
    kinds.insert(row.event.index());
  }
  EXPECT_EQ(kinds.size(), std::variant_size_v<RunEvent>);
}

TEST(EventFrom, ReadsEveryEventBack) {
  for (const EventRow& row : rows()) EXPECT_EQ(eventJson(back(row.event)).dump(), row.json);
}

TEST(EventFrom, ReadsLimitsBack) {
  const RunEvent limited = rows().back().event;
  EXPECT_EQ(std::get<RunStarted>(back(limited)).limits, std::get<RunStarted>(limited).limits);
}

TEST(EventFrom, ReadsTheIdentityOfARunBack) {
  const RunEvent run = rows().front().event;
  const auto read = std::get<RunStarted>(back(run));
  EXPECT_EQ(read.id, "0af3");
  EXPECT_EQ(read.host, "bench 7");
  EXPECT_EQ(read.tags, std::get<RunStarted>(run).tags);
}

TEST(EventFrom, ReadsAttemptsAndRepetitionsBack) {
  RunStarted run = runOf({});
  const std::string without = eventJson(run).dump();
  run.attempts = 3;
  run.repetitions = 1000;
  run.acceptFlaky = true;
  DiagnosticStarted diagnostic = beginningOf("A");
  diagnostic.attempt = 2;
  diagnostic.repetition = 7;
  const std::string kOfRun = R"("attempts":3,"repetitions":1000,"acceptFlaky":true})";
  EXPECT_TRUE(eventJson(run).dump().ends_with(kOfRun)) << eventJson(run).dump();
  EXPECT_EQ(eventJson(run).dump().size(), without.size() + kOfRun.size());
  EXPECT_EQ(eventJson(back(run)).dump(), eventJson(run).dump());
  EXPECT_TRUE(eventJson(diagnostic).dump().ends_with(R"("attempt":2,"repetition":7})"));
  EXPECT_EQ(eventJson(back(diagnostic)).dump(), eventJson(diagnostic).dump());
  const RunEnded ended{std::nullopt, momentAt(7), Verdict::kFail};
  EXPECT_EQ(std::get<RunEnded>(back(ended)).verdict, Verdict::kFail);
  for (const char* const wrong : {"0", "-1", "\"2\"", "1.5"}) {
    nlohmann::ordered_json changed = eventJson(diagnostic);
    changed["attempt"] = nlohmann::ordered_json::parse(wrong);
    EXPECT_THROW(eventFrom(changed), InputError) << wrong;
  }
}

TEST(EventFrom, RefusesALimitThatCannotBeRead) {
  const std::string text = rows().back().json;
  const auto refusal = [&text](const std::string& before, const std::string& after) {
    std::string changed = text;
    changed.replace(changed.find(before), before.size(), after);
    return thrownText<InputError>([&changed] { return eventFrom(nlohmann::ordered_json::parse(changed)); });
  };
  EXPECT_EQ(refusal("D*:R >= 2 V", "D*:R >="),
            "the limit \"D*:R >=\" cannot be read: a number or the name of a result is missing");
  EXPECT_EQ(refusal("\"warn\"", "\"mild\""), "unknown severity 'mild'");
  EXPECT_EQ(refusal("\"source\":\"profile p.json\",", ""), "\"source\" is missing");
}

TEST(EventFrom, ReadsBackWhatIsLeftOut) {
  const std::vector<RunEvent> events = {
      StageEnded{Stage::kRun, std::nullopt, momentAt(7)},
      Failed{std::nullopt, errorWithMessage("D", 1, "m", nullptr)},
      RunEnded{std::nullopt, momentAt(7)},
      RunEnded{"", momentAt(7)},
      MeasurementsAdded{},
      ResultsReported{},
      FaultsCounted{},
  };
  for (const RunEvent& event : events) {
    EXPECT_EQ(eventJson(back(event)).dump(), eventJson(event).dump());
  }
  EXPECT_EQ(std::get<RunEnded>(back(RunEnded{"", momentAt(7)})).interrupted, "");
  EXPECT_EQ(std::get<RunEnded>(back(RunEnded{std::nullopt, momentAt(7)})).interrupted, std::nullopt);
}

TEST(EventFrom, KeepsEveryContent) {
  RandomValues random(1);
  for (int i = 0; i < 1000; ++i) {
    const std::string key = random.text();
    const Value value = random.value(3);
    const auto collected = std::get<AuxiliaryDataAdded>(back(AuxiliaryDataAdded{key, value}));
    ASSERT_EQ(collected.key, key);
    ASSERT_TRUE(isSame(collected.value, value));

    const QZMeasuredResult result = random.result();
    const auto found = std::get<ResultsReported>(back(ResultsReported{{result, result}}));
    ASSERT_EQ(found.results.size(), 2U);
    ASSERT_TRUE(isSame(found.results[1], result));

    const Measurement measurement = random.measurement();
    const auto measured = std::get<MeasurementsAdded>(back(MeasurementsAdded{{{key, measurement}}}));
    ASSERT_EQ(measured.measurements[0].first, key);
    ASSERT_TRUE(isSame(measured.measurements[0].second, measurement));

    const DiagnosticErrorPtr error = random.error(2);
    const auto failed = std::get<Failed>(back(Failed{kStages[random.below(std::size(kStages))], error}));
    ASSERT_TRUE(isSame(failed.error, error));

    const LogLine line{std::chrono::nanoseconds(static_cast<std::int64_t>(random.bits())), LogLevel::kError,
                       random.text(), random.date()};
    const auto logged = std::get<Logged>(back(Logged{line})).line;
    ASSERT_EQ(logged.time, line.time);
    ASSERT_EQ(logged.text, line.text);
    ASSERT_EQ(logged.date, line.date);
  }
}

TEST(EventFrom, KnowsEveryStageLevelAndVerdict) {
  for (const Stage stage : kStages) {
    EXPECT_EQ(std::get<StageStarted>(back(StageStarted{stage, momentAt(1)})).stage, stage);
  }
  for (const LogLevel level : {LogLevel::kError, LogLevel::kDefault, LogLevel::kDebug}) {
    EXPECT_EQ(std::get<Logged>(back(Logged{{1ns, level, "", momentAt(1)}})).line.level, level);
  }
  for (const Verdict verdict : {Verdict::kPass, Verdict::kFail, Verdict::kError}) {
    EXPECT_EQ(std::get<DiagnosticEnded>(back(DiagnosticEnded{verdict, momentAt(1)})).verdict, verdict);
  }
}

// True if the member is optional in the event.
bool isOptional(const std::string& event, const std::string& key) {
  return (event == "failed" && key == "stage") || (event == "stageEnded" && key == "nanoseconds") ||
         (event == "runEnded" && key == "interrupted") || (event == "frames" && key == "lost") ||
         (event == "runBegan" && key == "planned");
}

TEST(EventFrom, RefusesAnEventWithoutOneOfItsMembers) {
  int removed = 0;
  for (const EventRow& row : rows()) {
    const Json whole = Json::parse(row.json);
    for (const auto& [key, ignored] : whole.items()) {
      Json without = whole;
      without.erase(key);
      const bool optional = isOptional(whole["event"], key);
      EXPECT_EQ(problemOf(without), optional ? "accepted" : "\"" + key + "\" is missing") << row.json;
      ++removed;
    }
  }
  EXPECT_EQ(removed, 79);
}

TEST(EventFrom, RefusesMembersOfAnotherKind) {
  for (const EventRow& row : rows()) {
    const Json whole = Json::parse(row.json);
    for (const auto& [key, member] : whole.items()) {
      for (const char* other : {"null", "0.5", "[0.5]", "{\"a\":0.5}", "\"strange\"", "-1e300"}) {
        Json changed = whole;
        changed[key] = Json::parse(other);
        if (changed[key].type() == member.type() && member.is_string() && key != "event" && key != "date" &&
            key != "stage" && key != "level" && key != "verdict") {
          continue;  // any text is valid
        }
        EXPECT_NE(problemOf(changed), "accepted") << key << " as " << other << " in " << row.json;
      }
    }
  }
}

TEST(EventFrom, SaysWhatIsWrong) {
  constexpr RefusedText kRows[] = {
      {"5", "expected an object"},
      {R"({"event":5})", "\"event\" has the wrong type"},
      {R"({"event":"runbegan"})", "unknown event 'runbegan'"},
      {R"({"event":"stageBegan","stage":"pause","date":""})", "unknown stage 'pause'"},
      {R"({"event":"stageBegan","stage":"run","date":"today"})",
       "\"date\" is not a timestamp of the years 1678 to 2261"},
      {R"({"event":"stageBegan","stage":"run","date":"2262-04-11T23:47:16.854775808Z"})",
       "\"date\" is not a timestamp of the years 1678 to 2261"},
      {R"({"event":"stageBegan","stage":"run","date":"9999-12-31T23:59:59.999999999Z"})",
       "\"date\" is not a timestamp of the years 1678 to 2261"},
      {R"({"event":"stageEnded","stage":"run","date":"2026-11-21T01:08:00.000000000Z","nanoseconds":1.5})",
       "\"nanoseconds\" has the wrong type"},
      {R"({"event":"stageEnded","stage":"run","date":"2026-11-21T01:08:00.000000000Z",)"
       R"("nanoseconds":9223372036854775808})",
       "\"nanoseconds\" has the wrong type"},
      {R"({"event":"log","nanoseconds":1,"level":"loud","text":"","date":"2026-11-21T01:08:00.000000000Z"})",
       "unknown log level 'loud'"},
      {R"({"event":"diagnosticEnded","verdict":"maybe","date":"2026-11-21T01:08:00.000000000Z"})",
       "unknown verdict 'maybe'"},
      {R"({"event":"failed","error":null})", "a failure has no error"},
      {R"({"event":"measured","measurements":{}})", "\"measurements\" is not an array"},
      {R"({"event":"measured","measurements":[["R"]]})", "expected a measurement: a name and a value"},
      {R"({"event":"measured","measurements":["R"]})", "expected a measurement: a name and a value"},
      {R"({"event":"faultsCounted","faults":[{"fired":1}]})", "\"fault\" is missing"},
      {R"({"event":"faultsCounted","faults":[{"fault":7,"fired":1}]})", "\"fault\" is not an object"},
      {R"({"event":"faultsCounted","faults":[{"fault":{},"fired":-1}]})", "\"fired\" has the wrong type"},
  };
  for (const auto& row : kRows)
    EXPECT_THAT(problemOf(Json::parse(row.text)), testing::HasSubstr(row.problem)) << row.text;
}

TEST(EventFrom, RefusesAParameterWithAValueFromNowhere) {
  Json json = Json::parse(rows()[1].json);
  json["parameters"]["experiment"][0].erase("source");
  EXPECT_EQ(problemOf(json), "\"source\" is missing");
}

TEST(RegistrationFrom, ReadsARegistrationBackWithoutItsFactories) {
  for (const QZLab::Kind kind : {QZLab::Kind::kExperiment, QZLab::Kind::kAnalysis, QZLab::Kind::kDiagnostic}) {
    const QZLab::Registration registration{
        kind, "N\xff", "S", "E", "A", [] { return nullptr; }, [] { return nullptr; }};
    const QZLab::Registration read = registrationFrom(Json::parse(registrationJson(registration).dump()));
    EXPECT_EQ(read.kind, kind);
    EXPECT_EQ(read.name, registration.name);
    EXPECT_EQ(read.summary, "S");
    EXPECT_EQ(read.experimentName, "E");
    EXPECT_EQ(read.analysisName, "A");
    EXPECT_EQ(read.makeExperiment, nullptr);
    EXPECT_EQ(read.makeAnalysis, nullptr);
  }
  EXPECT_THROW(registrationFrom(Json::parse(R"({"kind":"analysis","name":"N"})")), InputError);
  EXPECT_THROW(registrationFrom(Json::parse(R"({"kind":"toy","name":"N","summary":"","experiment":"","analysis":""})")),
               InputError);
}

TEST(DescriptionFrom, ReadsADescriptionBack) {
  DiagnosticDescription description{QZDescription("E"), QZDescription("A"), errorWithMessage("D", 1, "m", nullptr)};
  description.experiment.addParameter(QZNumberParameter("b's", true), "b");
  description.experiment.addParameter(QZNumberParameter("a's", false), "a");
  const DiagnosticDescription read = descriptionFrom(Json::parse(descriptionJson(description).dump()));
  EXPECT_EQ(read.experiment.summary(), "E");
  EXPECT_EQ(read.analysis.summary(), "A");
  ASSERT_EQ(read.experiment.parameters().size(), 2U);
  EXPECT_EQ(read.experiment.parameters().begin()->first, "b");
  EXPECT_TRUE(read.experiment.parameters().find("b")->required());
  EXPECT_EQ(read.experiment.parameters().find("a")->summary(), "a's");
  EXPECT_FALSE(read.experiment.parameters().find("a")->required());
  EXPECT_TRUE(isSame(read.error, description.error));
  EXPECT_EQ(descriptionFrom(descriptionJson({})).error, nullptr);
  EXPECT_TRUE(read.isAsked);
  description.isAsked = false;
  EXPECT_FALSE(descriptionFrom(descriptionJson(description)).isAsked);
  EXPECT_THROW(descriptionFrom(Json::parse(R"({"experiment":{}})")), InputError);
}

}  // namespace
}  // namespace quazor
