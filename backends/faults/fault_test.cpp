#include "backends/faults/fault.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace quazor {
namespace {

Fault plain(FaultAction action) {
  Fault fault;
  fault.operation = "*";
  fault.action = action;
  return fault;
}

TEST(Fault, StandsInJsonAsInAScenario) {
  Fault full{"CaptureStream.setValue", "wide", "FormatIndex", 2, FaultAction::kFail, FaultError{"D", -7, "Broken."}, 0};
  Fault delay{"*", std::nullopt, std::nullopt, std::nullopt, FaultAction::kDelay, std::nullopt, 0.5};
  const struct {
    const char* name;
    Fault fault;
    const char* json;
  } kRows[] = {
      {"all of it", full,
       R"({"operation":"CaptureStream.setValue","object":"wide","property":"FormatIndex","occurrence":2,)"
       R"("action":"fail","error":{"domain":"D","code":-7,"message":"Broken."}})"},
      {"a delay", delay, R"({"operation":"*","action":"delay","seconds":0.5})"},
      {"a hang", plain(FaultAction::kHang), R"({"operation":"*","action":"hang"})"},
      {"nothing", plain(FaultAction::kNothing), R"({"operation":"*","action":"nothing"})"},
  };
  for (const auto& row : kRows) EXPECT_EQ(faultJson(row.fault).dump(), row.json) << row.name;
}

}  // namespace
}  // namespace quazor
