// On every installed simulated phone, a record and its page have exactly the frames that a user of the cameras sees.
#include "host/device/phone.h"
#include "host/report/page/page.h"
#include "host/run/event_pipeline.h"
#include "host/run/traced_run.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_events.h"
#include "tests/support/effort.h"
#include "tests/support/shipped_scenario.h"
#include "tests/sweeps/camera_user.h"
#include "tests/sweeps/frames_told.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <iterator>
#include <map>
#include <memory>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// The variable QUAZOR_SEEDS is for runs by hand.
std::uint64_t seedsToTry() {
  const char* const text = std::getenv("QUAZOR_SEEDS");
  if (text != nullptr) return std::strtoull(text, nullptr, 10);
  return isThorough() && !kHasSanitizer ? 100 : 3;
}

// The phone of a user.
// Thread: one at a time.
class PhoneOfUser final : public Phone {
 public:
  explicit PhoneOfUser(SimulatedPhone& phone) : phone_(phone) {}

  Platform platform() const override { return phone_.platform(); }
  std::vector<DeclaredFault> faults() const override { return {}; }
  std::uint64_t framesDelivered() const override { return phone_.framesDelivered(); }
  void traceFrames(FrameTrace& trace) override { phone_.traceFrames(trace); }

 private:
  SimulatedPhone& phone_;
};

// Thread: one at a time.
class UserExperiment final : public QZExperiment {
 public:
  explicit UserExperiment(CameraUser& user) : user_(user) {}

  QZDescription experimentDescription() const override { return QZDescription("Streams."); }
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    user_.stream(installedPlatform());
    return std::make_unique<QZExperimentResult>();
  }

 private:
  CameraUser& user_;
};

// What is left of a run: its record and its page.
struct Files {
  std::string record;
  std::string page;
};

// Runs an experiment in which the user streams, as the program does.
Files run(CameraUser& user) {
  const TestDirectory directory;
  EventPipelineOptions options;
  options.record = directory.path() / "record";
  options.report.format = Format::kHtml;
  options.report.output = directory.path() / "page";
  options.report.text.page = [](const ShownRun& shown) { return reportPage({shown}, {}); };
  std::ostringstream out;
  std::ostringstream err;
  Console console{out, err};
  EventPipeline events(options, console);
  RunStarted began = runOf({"Streaming"});
  began.ofExperiments = true;
  began.traced = true;
  events.onEvent(began);
  DiagnosticStarted diagnosticBegan = beginningOf("Streaming");
  diagnosticBegan.experimentOnly = true;
  events.onEvent(diagnosticBegan);
  Diagnostic diagnostic;
  diagnostic.name = "Streaming";
  diagnostic.makeExperiment = [&user] { return std::make_shared<UserExperiment>(user); };
  diagnostic.experimentOnly = true;
  RunOptions runOptions;
  runOptions.makePhone = [&user] { return std::make_unique<PhoneOfUser>(user.phone()); };
  runOptions.trace.isOn = true;
  runDiagnosticHere(diagnostic, {}, runOptions, events);
  events.endDiagnostic();
  events.onEvent(RunEnded{std::nullopt, momentAt(99)});
  EXPECT_NE(events.exitCode(), ExitCode::kCannotWrite) << err.str();
  return {directory.read("record"), directory.read("page")};
}

// A page has six significant digits, and milliseconds with four decimals.
void expectShown(double shown, double seen) { EXPECT_NEAR(shown, seen, 0.00006 + std::abs(seen) * 6e-6); }

double seconds(std::int64_t nanoseconds) { return static_cast<double>(nanoseconds) / 1e9; }

// The intervals in milliseconds by the time of their end in seconds.
std::vector<std::pair<double, double>> intervalsOf(const std::vector<TracedFrame>& frames) {
  std::vector<std::pair<double, double>> intervals;
  for (std::size_t i = 1; i < frames.size(); ++i) {
    intervals.emplace_back(seconds(frames[i].captured),
                           static_cast<double>(frames[i].captured - frames[i - 1].captured) / 1e6);
  }
  return intervals;
}

void compareGaps(const ShownStream& shown, const std::vector<TracedFrame>& frames) {
  std::size_t gaps = 0;
  std::int64_t missing = 0;
  for (std::size_t i = 1; i < frames.size(); ++i) {
    const std::int64_t more = frames[i].number - frames[i - 1].number - 1;
    if (more <= 0) continue;
    if (gaps++ == 0) {
      EXPECT_EQ(shown.gapAfter, frames[i - 1].number);
      expectShown(shown.gapAt, seconds(frames[i - 1].captured));
    }
    missing += more;
  }
  EXPECT_EQ(shown.gaps, gaps);
  EXPECT_EQ(shown.missing, static_cast<std::uint64_t>(missing));
}

void comparePlot(const ShownStream& shown, std::vector<std::pair<double, double>> intervals, double least,
                 double greatest) {
  std::ranges::stable_sort(intervals, {}, &std::pair<double, double>::first);
  ASSERT_EQ(shown.curve.size(), intervals.size());
  const double begin = intervals.front().first;
  const double end = intervals.back().first;
  ASSERT_EQ(shown.times.size(), 2U);
  expectShown(shown.times[0], begin);
  expectShown(shown.times[1], end);
  // The curve takes five sixths of the height, and differences below 0.1 ms are not stretched to that.
  const double span = std::max(greatest - least, 0.1) * 1.2;
  const double bottom = (greatest + least) / 2 - span / 2;
  const auto heightOf = [span, bottom](double interval) { return 118 - 110 * (interval - bottom) / span; };
  ASSERT_EQ(shown.heights.size(), heightOf(least) - heightOf(greatest) > 12 ? 2U : 1U);
  EXPECT_NEAR(shown.heights.front(), greatest, greatest * 5e-4);
  EXPECT_NEAR(shown.heights.back(), shown.heights.size() == 2 ? least : greatest, greatest * 5e-4);
  for (std::size_t i = 0; i < intervals.size(); ++i) {
    EXPECT_NEAR(shown.curve[i].first, 70 + 640 * (intervals[i].first - begin) / (end - begin), 0.06);
    EXPECT_NEAR(shown.curve[i].second, heightOf(intervals[i].second), 0.06);
  }
}

void comparePage(const ShownStream& shown, const std::vector<TracedFrame>& frames) {
  EXPECT_EQ(shown.frames, frames.size());
  EXPECT_EQ(shown.lost, 0U);
  compareGaps(shown, frames);
  const std::vector<std::pair<double, double>> intervals = intervalsOf(frames);
  ASSERT_EQ(shown.interval.size(), intervals.empty() ? 0U : 3U);
  ASSERT_EQ(shown.captured.size(), intervals.empty() ? 0U : 2U);
  if (intervals.empty()) return;
  expectShown(shown.captured[0], seconds(frames.front().captured));
  expectShown(shown.captured[1], seconds(frames.back().captured));
  std::vector<double> sorted;
  for (const auto& interval : intervals) sorted.push_back(interval.second);
  std::ranges::sort(sorted);
  expectShown(shown.interval[0], sorted[sorted.size() / 2]);
  expectShown(shown.interval[1], sorted.front());
  expectShown(shown.interval[2], sorted.back());
  if (intervals.size() > 1) comparePlot(shown, intervals, sorted.front(), sorted.back());
}

// What the seeds have in common, and a test that sees nothing else would prove little.
struct Seen {
  std::size_t frames = 0;
  std::size_t notReturned = 0;
  std::size_t streamsWithGaps = 0;
  std::size_t streamsWithout = 0;  // without frames
};

void compare(const CameraUser& user, const Files& files, Seen& all) {
  std::map<std::string, std::vector<TracedFrame>> told = framesInColumns(files.record);
  for (const SeenStream& stream : user.seen()) {
    EXPECT_TRUE(told[stream.name] == stream.frames)
        << stream.name << ": " << told[stream.name].size() << " frames are told of " << stream.frames.size();
    all.frames += stream.frames.size();
    for (const TracedFrame& frame : stream.frames) all.notReturned += frame.returned ? 0 : 1;
    if (stream.frames.empty()) {
      ++all.streamsWithout;
      EXPECT_THROW(streamOnPage(files.page, stream.name), std::out_of_range);
      continue;
    }
    const ShownStream shown = streamOnPage(files.page, stream.name);
    comparePage(shown, stream.frames);
    all.streamsWithGaps += shown.gaps > 0 ? 1 : 0;
  }
  EXPECT_EQ(told.size(), user.seen().size());
}

TEST(TracedFramesTest, AreThoseThatAUserSeesOnEveryPhone) {
  const std::uint64_t seeds = seedsToTry();
  ASSERT_GT(seeds, 0U);
  std::size_t phones = 0;
  Seen all;
  for (const std::string& name : shippedScenarios()) {
    const Scenario scenario = shippedScenario(name);
    ++phones;
    for (std::uint64_t seed = 0; seed < seeds; ++seed) {
      CameraUser user(scenario, seed);
      compare(user, run(user), all);
      ASSERT_FALSE(testing::Test::HasFailure()) << name << ", seed " << seed;
    }
  }
  std::cout << phones << " phones with " << seeds << " seeds: " << all.frames << " frames, " << all.notReturned
            << " of them not returned; " << all.streamsWithGaps << " streams with gaps, " << all.streamsWithout
            << " without frames\n";
  EXPECT_GT(phones, 150U);
  EXPECT_GT(all.frames, 10 * phones * seeds);
  EXPECT_GT(all.notReturned, phones);
  EXPECT_GT(all.streamsWithGaps, seeds);
  EXPECT_GT(all.streamsWithout, 0U);
}

}  // namespace
}  // namespace quazor
