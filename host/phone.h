// Phones to run diagnostics on. phone.cpp is the only place that names the backend that stands behind them.
#pragma once

#include "platform/platform.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <vector>

namespace quazor {

// A fault that the phone was told to have, as its scenario has it, and how many calls it changed.
struct DeclaredFault {
  nlohmann::ordered_json fault;
  std::uint64_t fired = 0;
};

// One phone, for one run. Its platform's services may outlive it.
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

// Makes a new phone on every call, each like the first.
using PhoneMaker = std::function<std::unique_ptr<Phone>()>;

// Reads a scenario file and gives the maker of the phones it describes: in virtual time, or in real time when
// `realTime`. One seed is one course of events in virtual time. Makes no phone itself. Throws a Refusal (kCannotRead)
// with the reader's sentence when the file cannot be read.
PhoneMaker phonesOfScenario(const std::filesystem::path& file, bool realTime, std::uint64_t seed);

}  // namespace quazor
