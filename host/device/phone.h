// Phones to run diagnostics on. phone.cpp is the only place that names the backend that stands behind them.
#pragma once

#include "contract/log_channel.h"
#include "host/device/expected_outcome.h"
#include "platform/platform.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A fault that the phone was told to have, as its scenario or binding has it, and how many calls it changed.
struct DeclaredFault {
  nlohmann::ordered_json fault;
  std::uint64_t fired = 0;
};

// One phone, for one run. Its platform's services may outlive it.
// Thread: one at a time, but for framesDelivered(): any.
class Phone {
 public:
  Phone() = default;
  Phone(const Phone&) = delete;
  Phone& operator=(const Phone&) = delete;
  virtual ~Phone() = default;

  virtual Platform platform() const = 0;
  virtual std::vector<DeclaredFault> faults() const = 0;
  // How many frames its cameras have handed to handlers. Any thread.
  virtual std::uint64_t framesDelivered() const = 0;
};

// Creates a new phone on every call, all in the same initial state.
using PhoneMaker = std::function<std::unique_ptr<Phone>()>;

// Reads a scenario file and gives the maker of the phones it describes: in virtual time, or in real time when
// `realTime`. One seed is one course of events in virtual time. Makes no phone itself. Throws a CommandError
// (kCannotRead) with the reader's sentence when the file cannot be read.
PhoneMaker phonesOfScenario(const std::filesystem::path& file, bool realTime, std::uint64_t seed);

struct ScenarioSummary {
  std::string title;
  std::vector<ExpectedOutcome> expected;
  bool hasFaults = false;
};

// A phone's name that begins so is the machine that quazor runs on; what follows names the binding file.
inline constexpr std::string_view kLinuxPrefix = "linux:";

// The FILE of "linux:FILE"; nothing for other names of phones, which are scenarios'.
std::optional<std::filesystem::path> bindingNamed(const std::filesystem::path& phone);

// Reads a binding file and returns a factory for this machine as a phone, in real time.
// Throws a CommandError (kCannotRead) with the reader's sentence when the file cannot be read.
PhoneMaker phonesOfBinding(const std::filesystem::path& file);

// The devices of this machine that a binding can use: a user-readable list, and the text of a starter binding.
struct PhoneProbe {
  std::vector<std::string> lines;  // may hold any character that a device gives
  std::string binding;
};
PhoneProbe probeThisMachine();

// True if this is the name of a cleanup process of a phone, which restores the hardware (for example switches off a
// projector) and soon exits.
bool isCleanupProcess(std::string_view processName);

// The system log of this machine: the journal, or syslog(3) if there is no journal.
std::shared_ptr<LogBackend> systemLogOfThisMachine();

// The summary of a scenario file. Throws a CommandError (kCannotRead) when the file cannot be read.
ScenarioSummary summaryOfScenario(const std::filesystem::path& file);

}  // namespace quazor
