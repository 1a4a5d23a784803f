// A simulated phone to run camera synchronisation on, and what healthy runs on it look like.
#pragma once

#include "backends/faults/fault.h"
#include "backends/simulated/scenario/scenario.h"
#include "tests/support/run_transcript.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <iosfwd>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

enum class Side { kBack, kFront };

// Three back and two front cameras, a group for each side. Frame offsets in the order of the groups are 0, 1, 2 and
// 0, 3; every camera counts its own error.
Scenario cameraSyncScenario();
// The same, but no group supports SlaveConfigurationByPortType.
Scenario withoutMasterConfiguration(Scenario scenario);
// A camera of the scenario, to change it.
Camera& cameraOf(Scenario& scenario, std::string_view id);

// A run of 2 s on a new phone.
struct BenchRun {
  std::string told;  // as runAndTell() tells it
  // How often the fault has fired; 0 when there was none.
  std::uint64_t fired = 0;
};
BenchRun runOnBench(Side side, const Scenario& scenario, const std::optional<Fault>& fault, ErrorPlace place);

// What runOnBench() tells of healthy runs, in full.
extern const std::string kHealthyBackRun;
extern const std::string kHealthyFrontRun;
// The back run on the phone without the master configuration.
extern const std::string kHealthyBackRunWithoutMasterConfiguration;
// The part of it in which the slaves are configured.
extern const char* const kSlavesConfiguredByThemselves;

// A call of the run: the nth one of the operation, on that object, for that property; nothing is any.
struct CallOfRun {
  std::string operation;
  std::optional<std::string> object = {};
  std::optional<std::string> property = {};
  std::uint64_t occurrence = 1;
};

// Operations that fault rows name often.
inline constexpr const char* kReadStream = "CaptureStream.valueForProperty";
inline constexpr const char* kSetStream = "CaptureStream.setValue";

// A call that fails, and all that comes of it.
struct FaultRow {
  std::string name;
  CallOfRun call;
  // What is told from the call on. Up to there the run is the healthy one. {error} stands for the text of the call's
  // error, {cause} for the end of an error's chain that it makes.
  std::string told;
  // The line from which on the run is the healthy one again; empty when the failure ends it.
  std::string_view resumesAt = {};
};

inline std::string nameOf(const testing::TestParamInfo<FaultRow>& row) { return row.param.name; }
void PrintTo(const FaultRow& row, std::ostream* out);

// Makes the row's call fail with an error of its own and with none, each with and without the caller's place for an
// error, and compares the runs.
void expectToldWithFault(const FaultRow& row, Side side, const Scenario& scenario, std::string_view healthyRun);

// Compares a run without a fault, with and without the caller's place for an error.
void expectTold(std::string_view expected, Side side, const Scenario& scenario);

// The healthy run up to the given line, without it, followed by `rest`: for scenarios that go wrong by themselves.
std::string healthyUpTo(std::string_view healthyRun, std::string_view line, std::string_view rest);

}  // namespace quazor
