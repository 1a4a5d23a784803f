#include "host/cli/option_values.h"

#include "host/error/exit_code.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace quazor {
namespace {

TEST(LimitsOfCommandLine, RefusesOneThatIsGivenTwice) {
  EXPECT_EQ(limitsOfCommandLine({"A > 1", "A > 2", "D:A > 1"}).size(), 3U);
  EXPECT_EQ(refusalOf(ExitCode::kUsage,
                      [] {
                        return limitsOfCommandLine({"A > 1", "A < 2", "A>1.0"});
                      }),
            "--limit 'A>1.0': this limit is given twice, the first time as 'A > 1'");
}

TEST(LimitsOfCommandLine, NamesTheirSourceAndRefusesOtherTexts) {
  EXPECT_EQ(limitsOfCommandLine({"A > 1"}).front().source, "command line");
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [] { return limitsOfCommandLine({"A >"}); }),
            "--limit 'A >': a number or the name of a result is missing");
}

class TagsTest : public testing::Test {
 protected:
  static std::string refusal(const std::vector<std::string>& texts) {
    return refusalOf(ExitCode::kUsage, [&texts] { return tagsOf(texts); });
  }

  EnvironmentVariable environment_{kTagsVariable, nullptr};
};

TEST_F(TagsTest, KeepTheirOrder) {
  const OrderedMap<std::string> tags = tagsOf({"serial=C02X", "station=S 3", "empty==", "key=a=b", "grad=\xc2\xb0"});
  const std::vector<std::pair<std::string, std::string>> expected = {
      {"serial", "C02X"}, {"station", "S 3"}, {"empty", "="}, {"key", "a=b"}, {"grad", "\xc2\xb0"}};
  EXPECT_TRUE(std::equal(tags.begin(), tags.end(), expected.begin(), expected.end(),
                         [](const auto& a, const auto& b) { return a.first == b.first && a.second == b.second; }));
}

TEST_F(TagsTest, ComeFromTheEnvironmentToo) {
  const EnvironmentVariable set(kTagsVariable, " station=S3\tserial=old ");
  const OrderedMap<std::string> tags = tagsOf({"serial=new"});
  EXPECT_EQ(*tags.find("station"), "S3");
  EXPECT_EQ(*tags.find("serial"), "new");
  const EnvironmentVariable wrong(kTagsVariable, "station");
  EXPECT_EQ(refusal({}), "QUAZOR_TAGS 'station': expected KEY=VALUE");
}

TEST_F(TagsTest, AreRefusedWithTheReason) {
  EXPECT_EQ(refusal({"serial"}), "--tag 'serial': expected KEY=VALUE");
  EXPECT_EQ(refusal({"=x"}), "--tag '=x': the key is empty");
  EXPECT_EQ(refusal({"x="}), "--tag 'x=': the value is empty");
  EXPECT_EQ(refusal({"a=1", "a=2"}), "--tag 'a=2': the key is set twice");
  EXPECT_EQ(refusal({"a=\x01"}), "--tag 'a=\x01': a tag has no control characters");
  EXPECT_EQ(refusal({"a=\x7f"}), "--tag 'a=\x7f': a tag has no control characters");
  EXPECT_EQ(refusal({"a=\xC2\x9B"
                     "2J"}),
            "--tag 'a=\xC2\x9B"
            "2J': a tag has no control characters");
  EXPECT_EQ(refusal({"a=\xff"}), "--tag 'a=\xff': the text is not valid UTF-8");
  EXPECT_EQ(tagsOf({"a=" + std::string(254, 'x')}).size(), 1U);
  EXPECT_THAT(refusal({"a=" + std::string(255, 'x')}), testing::EndsWith("a tag has at most 256 bytes"));
}

}  // namespace
}  // namespace quazor
