#include "host/plugin/plugin_loader.h"

#include "host/error/exit_code.h"
#include "host/testing/test_environment.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cfenv>
#include <filesystem>

namespace quazor {
namespace {

// command_line_test.py covers real files, because each needs a separate process.
TEST(ContractVersionIn, IsThatOfTheMissingSymbol) {
  struct Row {
    const char* name;
    const char* message;
    std::optional<int> version;
  };
  constexpr Row kRows[] = {
      {"a later version", "p.so: undefined symbol: _ZN6quazor12contract_9995QZLab10defaultLabEv", 999},
      {"an earlier version", "p.so: undefined symbol: _ZN6quazor10contract_05QZLab10defaultLabEv", 0},
      {"a type's information", "undefined symbol: _ZTIN6quazor11contract_1212QZExperimentE", 12},
      {"a symbol of another name space", "undefined symbol: _ZN6other12contract_9995QZLabE", std::nullopt},
      {"a symbol outside the contract", "undefined symbol: _ZN6quazor5innerEv", std::nullopt},
      {"a contract without a version", "undefined symbol: _ZN6quazor9contract_5QZLabE", std::nullopt},
      {"a contract with letters for a version", "undefined symbol: _ZN6quazor12contract_abc5QZLabE", std::nullopt},
      {"a missing library", "libnothing.so: cannot open shared object file", std::nullopt},
      {"nothing after the name space", "_ZN6quazor", std::nullopt},
      {"no text", "", std::nullopt},
  };
  for (const Row& row : kRows) EXPECT_EQ(contractVersionIn(row.message), row.version) << row.name;
}

TEST(LoadSomePlugins, RestoresTheFloatingPointEnvironment) {
  const EnvironmentVariable way("FATAL_PLUGIN", "round");
  const std::filesystem::path plugin = std::filesystem::path(QUAZOR_TEST_PLUGINS) / "fatal_plugin.so";
  EXPECT_THAT(thrownText<CommandError>([&] { loadSomePlugins({plugin}); }, ""), testing::EndsWith("registers nothing"));
  EXPECT_EQ(std::fegetround(), FE_TONEAREST);
}

}  // namespace
}  // namespace quazor
