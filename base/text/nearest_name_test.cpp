#include "base/text/nearest_name.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(EditDistance, CountsTheLeastChanges) {
  struct Row {
    const char* name;
    const char* a;
    const char* b;
    std::size_t distance;
  };
  constexpr Row kRows[] = {
      {"equal texts", "duration", "duration", 0},
      {"two empty texts", "", "", 0},
      {"only insertions", "", "abc", 3},
      {"only deletions", "abc", "", 3},
      {"one replaced", "cat", "cut", 1},
      {"one inserted in the middle", "duraton", "duration", 1},
      {"one too many", "durattion", "duration", 1},
      {"two neighbours swapped", "duratoin", "duration", 1},
      {"swapped at the beginning", "ba", "ab", 1},
      {"two swaps", "bacd dc", "abcd cd", 2},
      {"nothing in common", "abc", "xyz", 3},
      {"case counts", "abc", "ABC", 3},
      {"beginning and end differ", "kitten", "sitting", 3},
  };
  for (const Row& row : kRows) {
    EXPECT_EQ(editDistance(row.a, row.b), row.distance) << row.name;
    EXPECT_EQ(editDistance(row.b, row.a), row.distance) << row.name << ", the other way";
  }
}

TEST(NearestName, IsTheNearestOfSeveral) {
  EXPECT_EQ(nearestName("CameraSyncDiagnostic.Bakc", {"CameraSyncDiagnostic.Front", "CameraSyncDiagnostic.Back"}),
            "CameraSyncDiagnostic.Back");
}

TEST(NearestName, IsTheFirstOfEquals) { EXPECT_EQ(nearestName("tost", {"test", "toast"}), "test"); }

TEST(NearestName, IsNothingWhenMoreThanAThirdDiffers) {
  EXPECT_EQ(nearestName("abcdef", {"abcdxy"}), "abcdxy");
  EXPECT_EQ(nearestName("abcdef", {"abcxyz"}), std::nullopt);
}

TEST(NearestName, IsNothingWithoutCandidates) { EXPECT_EQ(nearestName("a", {}), std::nullopt); }

TEST(DidYouMean, EndsASentenceOrSaysNothing) {
  EXPECT_EQ(didYouMean("duratoin", {"timeout", "duration"}), "; did you mean 'duration'?");
  EXPECT_EQ(didYouMean("x", {"timeout", "duration"}), "");
}

TEST(DidYouMean, ListsAllCandidatesInASentenceOfItsOwnAfterAQuestion) {
  EXPECT_EQ(didYouMeanOf("rn", "the commands", {"list", "run"}), "; did you mean 'run'? The commands are list, run");
  EXPECT_EQ(didYouMeanOf("fly", "the commands", {"list", "run"}), "; the commands are list, run");
  EXPECT_EQ(didYouMeanOf("fly", "the plug-ins there", {}), "; the plug-ins there are none");
}

TEST(DidYouMean, SuggestsAPatternForTheBeginningOfSeveral) {
  const std::vector<std::string> names = {"CameraSync.Back", "CameraSync.Front", "Tessel"};
  EXPECT_EQ(didYouMeanOrPattern("Camera", names), "; did you mean 'Camera*'?");
  EXPECT_EQ(didYouMeanOrPattern("CameraSync.F", names), "; did you mean 'CameraSync.Front'?");
  EXPECT_EQ(didYouMeanOrPattern("CameraSync.Bakc", names), "; did you mean 'CameraSync.Back'?");
  EXPECT_EQ(didYouMeanOrPattern("x", names), "");
  EXPECT_EQ(didYouMeanOrPattern("", names), "");
}

TEST(NearestName, MayLackItsFolder) {
  const std::vector<std::string> names = {"a/device_missing", "b/device_missing", "b/frames_dropped", "healthy"};
  EXPECT_EQ(didYouMeanPath("frames_dropped", names), "; did you mean 'b/frames_dropped'?");
  EXPECT_EQ(didYouMeanPath("device_missing", names), "; did you mean 'a/device_missing' or 'b/device_missing'?");
  EXPECT_EQ(didYouMeanPath("devise_missing", names), "; did you mean 'a/device_missing' or 'b/device_missing'?");
  EXPECT_EQ(didYouMeanPath("frame_dropt", names), "; did you mean 'b/frames_dropped'?");
  EXPECT_EQ(didYouMeanPath("camera/frame_dropt", {"sync/frames_dropped"}), "");
  EXPECT_EQ(didYouMeanPath("b/frame_dropped", names), "; did you mean 'b/frames_dropped'?");
  EXPECT_EQ(didYouMeanPath("healty", names), "; did you mean 'healthy'?");
  EXPECT_EQ(didYouMeanPath("x", names), "");
  EXPECT_EQ(didYouMeanPath("x", {}), "");
}

}  // namespace
}  // namespace quazor
