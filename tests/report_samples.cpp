// Generates random runs and writes each of them in every report format and as a record, for a reader to compare.
//
//   report_samples DIRECTORY COUNT SEED
//
// Writes one file per format, named after it, and the file "record" to the directory. In them each run is preceded by a
// line with its length in bytes.
#include "base/text/utf8.h"
#include "host/error/host_error.h"
#include "host/model/judge.h"
#include "host/model/limit_check.h"
#include "host/report/page/page.h"
#include "host/report/report_format.h"
#include "tests/sample_record.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <iterator>
#include <limits>
#include <random>

namespace quazor {
namespace {

constexpr std::string_view kFragments[] = {"frames",
                                           "Back Wide",
                                           "a",
                                           "x.y",
                                           "\"quoted\"",
                                           "it's",
                                           "a,b",
                                           ";",
                                           "\n",
                                           "\r",
                                           "\r\n",
                                           "\t",
                                           "\n\n",
                                           "]]>",
                                           "<tag attr=\"1\">",
                                           "</testsuite>",
                                           "&amp;&#0;&",
                                           "<![CDATA[",
                                           "<!--",
                                           "-->",
                                           "\\",
                                           "\\n",
                                           "\\x00",
                                           "{}",
                                           "%@ %s",
                                           "  ",
                                           " code -1: ",
                                           "caused by ",
                                           ": >= 1",
                                           "- ",
                                           "PASS",
                                           "null",
                                           "NaN",
                                           "=1+1",
                                           "\x01",
                                           "\x1B[31m",
                                           "\x7F",
                                           "\xC2\x85",
                                           "\xC2\x9B",
                                           "\xC2\xA0",
                                           "\xE2\x80\xA8",
                                           "\xE2\x80\xAE",
                                           "\xC3\xA9",
                                           "\xE2\x82\xAC",
                                           "\xF0\x9F\x93\xB7",
                                           "\xEF\xBB\xBF",
                                           "\xEF\xBF\xBE",
                                           "\xEF\xBF\xBF",
                                           "\xEF\xBF\xBD",
                                           "\xF4\x8F\xBF\xBF",
                                           "\xFF",
                                           "\x80",
                                           "\xC3",
                                           "\xE2\x82",
                                           "\xF0\x9F\x93",
                                           "\xC0\xAF",
                                           "\xE0\x80\x80",
                                           "\xED\xA0\x80",
                                           "\xF4\x90\x80\x80",
                                           "\xF0\x8F\xBF\xBF",
                                           "\xC2\xC2\x80",
                                           std::string_view("\0", 1)};

// Parts of tags, which have no control characters and no invalid UTF-8.
constexpr std::string_view kWords[] = {"C02X", "a,b", "\"quoted\"", "line 3", "=1+1", "\xC3\xA9", "<&>", "it's", "\\n"};

constexpr double kNumbers[] = {0,
                               -0.0,
                               1,
                               -1,
                               0.1,
                               89,
                               90,
                               1.0 / 3,
                               1e15,
                               1e16,
                               9007199254740993.0,
                               1e21,
                               1e-7,
                               -123456.789,
                               std::numeric_limits<double>::max(),
                               std::numeric_limits<double>::lowest(),
                               std::numeric_limits<double>::min(),
                               std::numeric_limits<double>::denorm_min()};

constexpr double kNotFinite[] = {std::numeric_limits<double>::quiet_NaN(), std::numeric_limits<double>::infinity(),
                                 -std::numeric_limits<double>::infinity()};

struct Sample {
  RunStarted run;
  std::vector<DiagnosticRecord> records;
  std::optional<std::string> interrupted;
};

class Generator {
 public:
  explicit Generator(std::uint64_t seed) : random_(seed) {}

  Sample sample() {
    Sample sample;
    sample.run.program = "0.1.0";
    sample.run.contract = 1;
    sample.run.date = advance();
    sample.run.phone = text();
    for (std::size_t i = upTo(2); i > 0; --i) sample.run.plugins.push_back(text());
    sample.run.seed = random_();
    sample.run.ofExperiments = oneIn(4);
    sample.run.id = std::to_string(random_());
    sample.run.host = oneOf(kWords);
    for (std::size_t i = upTo(3); i > 0; --i) {
      sample.run.tags.set(oneIn(2) ? "serial" : std::to_string(i) + std::string(oneOf(kWords)),
                          std::string(oneOf(kWords)));
    }
    if (oneIn(4)) sample.run.attempts = 2 + upTo(2);
    if (oneIn(4)) sample.run.repetitions = 2 + upTo(2);
    if (!sample.run.ofExperiments && oneIn(4)) {
      sample.run.analyzed =
          AnalyzedRun{oneIn(4) ? "" : std::to_string(random_()), advance(), std::string(oneOf(kWords))};
    }
    sample.run.acceptFlaky = sample.run.attempts > 0 && oneIn(2);
    for (std::size_t i = upTo(4); i > 0; --i) {
      const std::string one = name(i);
      std::erase(sample.run.names, one);  // a run has each name once
      sample.run.names.push_back(one);
    }
    resultNames_ = {patternless(name(1001)), patternless(name(1002)), patternless(name(1003))};
    if (oneIn(2)) {
      for (std::size_t i = upTo(4); i > 0; --i) sample.run.limits.push_back(limit(sample.run.names));
    }
    limits_ = sample.run.limits;
    const std::size_t rounds = std::max<std::size_t>(sample.run.repetitions, 1);
    for (std::size_t round = 1; round <= rounds; ++round) {
      for (const std::string& name : sample.run.names) addAttempts(sample, name, round);
    }
    if (oneIn(5)) {
      interrupt(sample);
    } else if (!sample.run.ofExperiments) {
      addLimitsWithoutResult(sample);
    }
    return sample;
  }

 private:
  // The entries of a diagnostic in one repetition.
  void addAttempts(Sample& sample, const std::string& name, std::size_t round) {
    const RunStarted& run = sample.run;
    const std::size_t attempts = std::max<std::size_t>(run.attempts, 1);
    for (std::size_t attempt = 1; attempt <= attempts; ++attempt) {
      DiagnosticRecord record = run.ofExperiments ? experiment(name) : diagnostic(name);
      if (attempt > 1 && record.skip) continue;
      record.trial = {run.attempts == 0 ? 0 : attempt, run.attempts, run.repetitions == 0 ? 0 : round, run.repetitions};
      sample.records.push_back(std::move(record));
      if (sample.records.back().verdict != Verdict::kError || hasFailedResult(sample.records.back())) return;
    }
  }

  // The entries of the limits that fit no result, at the end of the run.
  void addLimitsWithoutResult(Sample& sample) {
    const std::vector<DiagnosticRecord> measured = sample.records;
    for (const UserLimit& limit : limitsWithoutResult(limits_, measured)) {
      DiagnosticRecord record;
      record.name = canonicalText(limit);
      record.summary = "A limit that fits no result.";
      record.begin = advance();
      record.error = errorOfLimitWithoutResult(limit, measured);
      record.errorStage = Stage::kAnalyze;
      sample.records.push_back(ended(std::move(record), false));
    }
  }

  // A random number from 0 to `most`.
  std::size_t upTo(std::size_t most) { return static_cast<std::size_t>(random_() % (most + 1)); }
  bool oneIn(std::size_t count) { return upTo(count - 1) == 0; }
  template <class T, std::size_t size>
  T oneOf(const T (&choices)[size]) {
    return choices[upTo(size - 1)];
  }

  std::string text() {
    std::string text;
    for (std::size_t i = oneIn(200) ? 300 : upTo(4); i > 0; --i) text += oneOf(kFragments);
    return text;
  }

  // A later time, or the same one, because the wall clock may be coarse.
  Date advance() { return now_ += std::chrono::nanoseconds(oneIn(4) ? 0 : upTo(2'000'000'000)); }
  // A slightly earlier time: log lines of several threads, or a clock that was set back.
  Date around() { return now_ - std::chrono::nanoseconds(oneIn(4) ? upTo(3'000'000'000) : 0); }

  double number() { return oneIn(3) ? static_cast<double>(upTo(1000)) / 8 : oneOf(kNumbers); }
  const QZUnit& unit() {
    if (oneIn(2)) return QZDimensionlessUnit::frames();
    return oneIn(3) ? QZUnit::unitWithSymbol("") : QZUnit::unitWithSymbol(text());
  }

  // Names with different numbers do not become equal when a report replaces invalid bytes.
  std::string name(std::size_t number) {
    const std::string name = text();
    return findInvalidUtf8(name) ? std::to_string(number) + name : name;
  }

  // A name that is not a pattern.
  static std::string patternless(std::string name) {
    return name.empty() || name.find_first_of("*?[") != std::string::npos ? "frames" : name;
  }

  // A limit of the user on results of this run, or on one that does not exist.
  UserLimit limit(const std::vector<std::string>& diagnostics) {
    UserLimit limit;
    if (oneIn(3)) limit.diagnostic = "*";
    if (!diagnostics.empty() && oneIn(3)) limit.diagnostic = patternless(diagnostics[upTo(diagnostics.size() - 1)]);
    limit.result = oneIn(8) ? "*" : resultNames_[upTo(2)];
    limit.condition = condition();
    if (oneIn(2)) limit.name = text();
    if (oneIn(2)) limit.severity = LimitSeverity::kWarn;
    limit.source = oneIn(2) ? "command line" : "profile " + text();
    limit.onlyIfSelected = oneIn(2);
    return limit;
  }

  decltype(UserLimit::condition) condition() {
    constexpr LimitOperator kOperators[] = {LimitOperator::kLess, LimitOperator::kLessOrEqual, LimitOperator::kGreater,
                                            LimitOperator::kGreaterOrEqual, LimitOperator::kEqual};
    std::optional<std::string> ofNumber;
    if (oneIn(3)) ofNumber = oneIn(4) ? text() : "frames";
    if (oneIn(3)) {
      const auto [lower, upper] = std::minmax({number(), number()});
      return IntervalCondition{lower, upper, lower < upper && oneIn(2), lower < upper && oneIn(2), ofNumber};
    }
    const LimitOperator comparison = oneOf(kOperators);
    double tolerance = comparison == LimitOperator::kEqual && oneIn(2) ? std::abs(number()) : 0;
    const bool isHuge = tolerance > 0 && oneIn(2);  // beyond it there is no bound
    if (isHuge) tolerance = std::numeric_limits<double>::max();
    if (oneIn(2)) return RelationCondition{comparison, resultNames_[upTo(2)], tolerance};
    return NumberCondition{comparison, isHuge ? tolerance : number(), tolerance, ofNumber};
  }

  DiagnosticErrorPtr error() {
    DiagnosticErrorPtr error;
    for (std::size_t i = oneIn(20) ? 60 : 1 + upTo(2); i > 0; --i) {
      const std::int64_t code =
          oneIn(4) ? std::numeric_limits<std::int64_t>::min() : static_cast<std::int64_t>(upTo(9));
      error = oneIn(8) ? std::make_shared<const DiagnosticError>(text(), code, Dictionary())
                       : errorWithMessage(text(), code, text(), error);
    }
    return error;
  }

  std::vector<ResolvedParameter> parameters() {
    std::vector<ResolvedParameter> parameters;
    for (std::size_t i = upTo(3); i > 0; --i) {
      std::optional<Value> value;
      if (!oneIn(3)) value = oneIn(2) ? Value(number()) : Value(static_cast<std::int64_t>(random_()));
      parameters.push_back({distinct(i), QZNumberParameter(text(), oneIn(2)), value, value ? text() : std::string()});
    }
    return parameters;
  }

  // Different for every number, even after a report has replaced invalid bytes.
  std::string distinct(std::size_t number) { return std::to_string(number) + text(); }

  std::shared_ptr<const QZBound> bound(double value, const QZUnit& unit, bool open) {
    return std::make_shared<const QZBound>(Measurement(value, unit), open);
  }

  // A result that passes, fails, is informational or, if `wild`, cannot be judged.
  QZMeasuredResult result(std::size_t place, bool wild, bool mayFail) {
    const QZUnit& ofValue = unit();
    const double value = wild && oneIn(3) ? oneOf(kNotFinite) : number();
    QZMeasuredResult result(oneIn(3) ? resultNames_[upTo(2)] : name(place), Measurement(value, ofValue));
    if (oneIn(4)) return result;
    QZLimit limit(text());
    const QZUnit& ofBound = wild && oneIn(3) ? unit() : ofValue;
    const auto near = [&](double step) { return wild && oneIn(4) ? oneOf(kNotFinite) : value + step * 16; };
    const double shift = mayFail && oneIn(3) ? 2 : 0;
    if (!oneIn(3)) limit.setLowerBound(bound(near(shift - 1), ofBound, oneIn(2)));
    if (!oneIn(3)) limit.setUpperBound(bound(near(shift + 1), ofBound, oneIn(2)));
    if (oneIn(6)) {
      const auto exact = bound(value, ofValue, false);
      limit.setLowerBound(exact);
      limit.setUpperBound(exact);
    }
    result.setLimit(std::move(limit));
    return result;
  }

  void addStage(DiagnosticRecord& record, Stage stage, bool ends = true) {
    record.stages.push_back({stage, advance(), std::nullopt});
    for (std::size_t i = upTo(2); i > 0; --i) {
      constexpr LogLevel kLevels[] = {LogLevel::kError, LogLevel::kDefault, LogLevel::kDebug};
      advance();
      record.log.push_back({std::chrono::nanoseconds(upTo(1'000'000'000)), oneOf(kLevels), text(), around()});
    }
    if (ends) record.stages.back().end = advance();
  }

  // Performs the stages up to one that fails, if any. Returns true if the analysis follows.
  bool goThrough(DiagnosticRecord& record) {
    std::optional<Stage> failing;
    if (oneIn(3)) failing = oneOf(kStages);
    const auto go = [&](Stage stage) {
      const bool fails = failing == stage && record.error == nullptr;
      addStage(record, stage, !fails || !oneIn(4));
      if (!fails) return true;
      record.error = oneIn(6) ? hostError(HostErrorCode::kCrashed, "the plug-in's process ended") : error();
      record.errorStage = stage;
      return false;
    };
    if (failing == Stage::kLoad) return go(Stage::kLoad);
    if (!go(Stage::kDescribe) || !go(Stage::kSetup)) return false;
    const bool ran = go(Stage::kRun);
    if (ran) addMeasurements(record);
    if (oneIn(2) || failing == Stage::kTeardown) go(Stage::kTeardown);
    return ran && !record.experimentOnly && go(Stage::kAnalyze);
  }

  void addMeasurements(DiagnosticRecord& record) {
    for (std::size_t i = upTo(5); i > 0; --i) {
      const double value = oneIn(8) ? oneOf(kNotFinite) : number();
      record.measurements.set(distinct(i), Measurement(value, unit()));
    }
    if (oneIn(3)) record.auxiliaryData.set(text(), text());
    if (oneIn(5)) record.auxiliaryData.set("numbers", Array{oneOf(kNotFinite), number(), 36.6F, Bytes{0xA5}});
  }

  DiagnosticRecord begun(const std::string& name) {
    DiagnosticRecord record;
    record.name = name;
    record.limits = limitsFor(name, limits_);
    record.summary = text();
    record.experimentName = text();
    record.parameters.experiment = parameters();
    record.seed = random_();
    record.begin = advance();
    if (oneIn(4)) record.faults.push_back({{{"operation", text()}}, upTo(3)});
    return record;
  }

  DiagnosticRecord experiment(const std::string& name) {
    DiagnosticRecord record = begun(name);
    record.experimentOnly = true;
    if (oneIn(5)) return skipped(std::move(record));
    goThrough(record);
    return ended(std::move(record));
  }

  DiagnosticRecord diagnostic(const std::string& name) {
    DiagnosticRecord record = begun(name);
    record.analysisName = text();
    record.parameters.analysis = parameters();
    if (oneIn(5)) return skipped(std::move(record));
    if (goThrough(record)) {
      const bool wild = oneIn(6);
      const bool mayFail = oneIn(3);
      for (std::size_t i = oneIn(40) ? 300 : upTo(6); i > 0; --i) {
        record.measuredResults.push_back(judgeResult(result(i, wild, mayFail)));
      }
    }
    return ended(std::move(record));
  }

  DiagnosticRecord skipped(DiagnosticRecord record) {
    constexpr SkipKind kKinds[] = {SkipKind::kNoSuchHardware, SkipKind::kNotAllowed, SkipKind::kNotReached};
    record.faults.clear();
    record.skip = Skip{oneOf(kKinds), text()};
    return ended(std::move(record), false);
  }

  DiagnosticRecord ended(DiagnosticRecord record) { return ended(std::move(record), !oneIn(30)); }

  DiagnosticRecord ended(DiagnosticRecord record, bool completed) {
    const RecordJudgement judgement = judgeRecord(record, completed);
    record.verdict = judgement.verdict;
    record.error = judgement.error;
    advance();
    record.end = around();
    return record;
  }

  void interrupt(Sample& sample) {
    sample.interrupted = oneIn(2) ? std::string() : text();
    if (!sample.interrupted->empty()) sample.run.names.push_back(*sample.interrupted);
    for (std::size_t i = upTo(2); i > 0; --i) sample.run.names.push_back(text());
    if (!oneIn(3)) return;
    // The run was interrupted during a diagnostic that has a record.
    DiagnosticRecord record = begun(sample.interrupted->empty() ? text() : *sample.interrupted);
    record.experimentOnly = sample.run.ofExperiments;
    addStage(record, Stage::kRun, false);
    record.error = hostError(HostErrorCode::kInterrupted, "it was interrupted");
    record.errorStage = Stage::kRun;
    sample.interrupted = record.name;
    sample.records.push_back(ended(std::move(record)));
  }

  std::mt19937_64 random_;
  std::vector<std::string> resultNames_;  // those that limits of the user and relations name
  std::vector<UserLimit> limits_;         // of the run
  Date now_{std::chrono::seconds(1'795'220'000)};
};

bool writeSamples(const std::filesystem::path& directory, std::size_t count, std::uint64_t seed) {
  std::vector<std::ofstream> files;
  for (const Format format : kRecordFormats) files.emplace_back(directory / nameOf(format), std::ios::binary);
  files.emplace_back(directory / "record", std::ios::binary);
  TextContent text;
  text.verbose = true;
  text.page = [](const ShownRun& run) { return reportPage({run}, {}); };
  Generator generator(seed);
  for (std::size_t i = 0; i < count; ++i) {
    const auto [run, records, interrupted] = generator.sample();
    for (std::size_t at = 0; at < files.size(); ++at) {
      const std::string report = at < std::size(kRecordFormats)
                                     ? reportText(kRecordFormats[at], run, records, interrupted, text)
                                     : recordOf(run, records, interrupted);
      files[at] << report.size() << '\n' << report;
    }
  }
  return std::all_of(files.begin(), files.end(), [](std::ofstream& file) { return static_cast<bool>(file.flush()); });
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  if (argc != 4) {
    std::cerr << "usage: report_samples DIRECTORY COUNT SEED\n";
    return EXIT_FAILURE;
  }
  if (quazor::writeSamples(argv[1], std::stoull(argv[2]), std::stoull(argv[3]))) return EXIT_SUCCESS;
  std::cerr << "cannot write to " << argv[1] << '\n';
  return EXIT_FAILURE;
}
