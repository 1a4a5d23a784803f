// The phones that diagnostics run on. Only phone.cpp names the backends.
#pragma once

#include "backends/capture/frame_trace.h"
#include "contract/log_channel.h"
#include "host/device/expected_outcome.h"
#include "host/device/skip.h"
#include "platform/platform.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A fault that the scenario or binding declares, and the number of calls that it changed.
struct DeclaredFault {
  nlohmann::ordered_json fault;
  std::uint64_t fired = 0;
};

// One phone, for one run. The services of its platform may outlive it.
// Thread: one at a time, except framesDelivered(): any.
class Phone {
 public:
  Phone() = default;
  Phone(const Phone&) = delete;
  Phone& operator=(const Phone&) = delete;
  virtual ~Phone() = default;

  virtual Platform platform() const = 0;
  virtual std::vector<DeclaredFault> faults() const = 0;
  // The number of frames that its cameras have delivered to handlers. Thread: any.
  virtual std::uint64_t framesDelivered() const = 0;
  // From now on, each frame that its cameras deliver is told to streams of the trace. Called once, before any stream is
  // started. The streams keep what they need.
  virtual void traceFrames(FrameTrace& trace) = 0;
  // What becomes of a task for which the trace has no room.
  virtual WhenTraceIsFull whenTraceIsFull() const { return WhenTraceIsFull::kLose; }
};

// Creates a new phone on every call, all in the same initial state.
using PhoneMaker = std::function<std::unique_ptr<Phone>()>;

// Returns a factory of phones whose course of events that seed determines.
using SeededPhoneMaker = std::function<PhoneMaker(std::uint64_t seed)>;

// Finds the file of a scenario that another one is based on by its name; empty if there is none.
using ScenarioSource = std::function<std::filesystem::path(const std::filesystem::path& name)>;

// Reads a scenario file and returns a factory for its phones, in virtual time or, if `realTime`, in real time. In
// virtual time the seed determines the course of events. Throws a CommandError (kCannotRead) with the reader's sentence
// if the file cannot be read.
PhoneMaker phonesOfScenario(const std::filesystem::path& file, bool realTime, std::uint64_t seed,
                            const ScenarioSource& find = nullptr);

// Like phonesOfScenario, for any number of seeds. The file is read once.
SeededPhoneMaker seededPhonesOfScenario(const std::filesystem::path& file, bool realTime,
                                        const ScenarioSource& find = nullptr);

// What the host reads of a phone's file.
struct ScenarioSummary {
  std::string title;
  std::vector<ExpectedOutcome> expected;
  bool hasFaults = false;
  std::vector<SkipRule> absent{};
  std::vector<std::filesystem::path> bases{};  // the files that it is based on

  // False if it expects that a run does not pass.
  bool mustPass() const { return std::ranges::all_of(expected, &ExpectedOutcome::mustPass); }
  // True if it declares a fault or expects one to be found.
  bool isFaulty() const { return hasFaults || !mustPass(); }
};

// Prefix of a phone's name that selects the machine quazor runs on; the name of the binding file follows.
inline constexpr std::string_view kLinuxPrefix = "linux:";

// The FILE of "linux:FILE"; nothing for a name without that prefix, which is a scenario's.
std::optional<std::filesystem::path> bindingNamed(const std::filesystem::path& phone);

// Reads a binding file and returns a factory for this machine as a phone, in real time.
// Throws a CommandError (kCannotRead) with the reader's sentence when the file cannot be read.
PhoneMaker phonesOfBinding(const std::filesystem::path& file);

// The devices of this machine that a binding can use, as a user-readable list, and the text of a starter binding.
struct PhoneProbe {
  std::vector<std::string> lines;  // may contain any character that a device reports
  std::string binding;
};
PhoneProbe probeThisMachine();

// True if this is the name of a cleanup process of a phone, which restores the hardware (for example switches off a
// projector) and soon exits.
bool isCleanupProcess(std::string_view processName);

// The system log of this machine: the journal, or syslog(3) if there is no journal.
std::shared_ptr<LogBackend> systemLogOfThisMachine();

// The summary of a scenario file. Throws a CommandError (kCannotRead) when the file cannot be read.
ScenarioSummary summaryOfScenario(const std::filesystem::path& file, const ScenarioSource& find = nullptr);

// The same of a binding file.
ScenarioSummary summaryOfBinding(const std::filesystem::path& file);

}  // namespace quazor
