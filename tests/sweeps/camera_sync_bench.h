// A simulated phone for camera synchronisation, and the traces of healthy runs on it.
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

// Three back and two front cameras, with one group per side. The frame offsets in group order are 0, 1, 2 and 0, 3;
// every camera counts a different error.
Scenario cameraSyncScenario();
// The same scenario without support for SlaveConfigurationByPortType.
Scenario withoutMasterConfiguration(Scenario scenario);
// A camera of the scenario, for modification.
Camera& cameraOf(Scenario& scenario, std::string_view id);

// A run of 2 s on a new phone.
struct BenchRun {
  std::string told;  // in the format of runAndTell()
  // The number of times the fault has fired; 0 if there was none.
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

// A call of the run: the nth call of the operation, on that object and for that property; nothing matches any.
struct CallOfRun {
  std::string operation;
  std::optional<std::string> object = {};
  std::optional<std::string> property = {};
  std::uint64_t occurrence = 1;
};

// Frequent operations in fault rows.
inline constexpr const char* kReadStream = "CaptureStream.valueForProperty";
inline constexpr const char* kSetStream = "CaptureStream.setValue";

// A failing call and its consequences.
struct FaultRow {
  std::string name;
  CallOfRun call;
  // The trace from the call on; before it the run equals the healthy one. {error} stands for the text of the call's
  // error, {cause} for the part of an error chain that it causes.
  std::string told;
  // The line from which on the run equals the healthy one again; empty if the failure ends it.
  std::string_view resumesAt = {};
};

inline std::string nameOf(const testing::TestParamInfo<FaultRow>& row) { return row.param.name; }
void PrintTo(const FaultRow& row, std::ostream* out);

// Makes the row's call fail with and without an error of its own, each with and without an error variable of the
// caller, and compares the runs.
void expectToldWithFault(const FaultRow& row, Side side, const Scenario& scenario, std::string_view healthyRun);

// Compares a run without faults, with and without an error variable of the caller.
void expectTold(std::string_view expected, Side side, const Scenario& scenario);

// The trace of the healthy run before the given line, followed by `rest`: for scenarios that fail without a fault.
std::string healthyUpTo(std::string_view healthyRun, std::string_view line, std::string_view rest);

}  // namespace quazor
