#include "host/model/stage.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(Stages, HaveNamesByWhichTheyAreFound) {
  constexpr std::string_view kNames[] = {"load", "describe", "setup", "run", "teardown", "analyze"};
  ASSERT_EQ(std::size(kStages), std::size(kNames));
  for (std::size_t i = 0; i < std::size(kStages); ++i) {
    EXPECT_EQ(static_cast<std::size_t>(kStages[i]), i);
    EXPECT_EQ(nameOf(kStages[i]), kNames[i]);
    EXPECT_EQ(stageNamed(kNames[i]), kStages[i]);
  }
}

TEST(Stages, AreNotFoundByOtherNames) {
  for (const char* name : {"", "Run", "runs", "Analyze", "load "}) EXPECT_EQ(stageNamed(name), std::nullopt) << name;
}

TEST(Stages, ReadTheFormerNameOfAnalyze) { EXPECT_EQ(stageNamed("analyse"), Stage::kAnalyze); }

}  // namespace
}  // namespace quazor
