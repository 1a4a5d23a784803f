#include "host/error/nesting.h"

#include "base/json/json_limits.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>

namespace quazor {
namespace {

Value inLevels(int levels, const std::function<Value(Value)>& around) {
  Value value(1);
  for (int i = 1; i < levels; ++i) value = around(std::move(value));
  return value;
}

Value inError(Value value) {
  return DiagnosticErrorPtr(std::make_shared<const DiagnosticError>("D", 1, Dictionary{{"a", std::move(value)}}));
}

TEST(IsWithinLevels, CountsEveryKindOfContainer) {
  const std::function<Value(Value)> kinds[] = {
      [](Value value) {
        return Value(Array{2, std::move(value)});
      },
      [](Value value) {
        return Value(Dictionary{{"a", 2}, {"b", std::move(value)}});
      },
      inError,
  };
  for (const auto& kind : kinds) {
    EXPECT_TRUE(isWithinLevels(inLevels(kMaxValueLevels, kind)));
    EXPECT_FALSE(isWithinLevels(inLevels(kMaxValueLevels + 1, kind)));
    EXPECT_FALSE(isWithinLevels(inLevels(100'000, kind)));
  }
  EXPECT_TRUE(isWithinLevels(Value(DiagnosticErrorPtr())));
}

TEST(ErrorOfDeepEntry, NamesTheEntry) {
  const DiagnosticErrorPtr error = errorOfDeepEntry("key", "LampExperiment");
  EXPECT_EQ(error->code(), 13);
  EXPECT_EQ(error->localizedDescription(),
            "the entry 'key' in the result of LampExperiment is nested more than 500 levels deep");
}

TEST(ErrorWithinLevels, LeavesAnErrorThatFits) {
  EXPECT_EQ(errorWithinLevels(nullptr), nullptr);
  const auto error = errorWithMessage("Lamp", 2, "dark", errorWithMessage("Bus", 1, "stalled", nullptr));
  EXPECT_EQ(errorWithinLevels(error), error);
}

TEST(ErrorWithinLevels, CutsALongChain) {
  DiagnosticErrorPtr chain;
  for (int i = 0; i < 120'000; ++i) chain = errorWithMessage("Bus", i, "stalled", std::move(chain));
  const DiagnosticErrorPtr cut = errorWithinLevels(chain);
  DiagnosticErrorPtr one = cut;
  for (int i = 0; i <= kMaxCausesKept; ++i, one = one->underlyingError()) {
    ASSERT_NE(one, nullptr) << i;
    ASSERT_EQ(one->code(), 119'999 - i);
    ASSERT_EQ(one->domain(), "Bus");
    ASSERT_EQ(one->localizedDescription(), "stalled");
  }
  ASSERT_NE(one, nullptr);
  EXPECT_EQ(one->localizedDescription(),
            "the rest of the error is left out, because it is nested more than 500 levels deep");
  EXPECT_EQ(one->underlyingError(), nullptr);
}

TEST(ErrorWithinLevels, KeepsDomainCodeAndMessageOfAnErrorWithADeepEntry) {
  const Value deep = inLevels(100'000, [](Value value) { return Value(Array{std::move(value)}); });
  const DiagnosticErrorPtr cut = errorWithinLevels(std::make_shared<const DiagnosticError>(
      "Lamp", 7, Dictionary{{"localized-description", "dark"}, {"detail", deep}}));
  EXPECT_EQ(cut->domain(), "Lamp");
  EXPECT_EQ(cut->code(), 7);
  EXPECT_EQ(cut->localizedDescription(), "dark");
  EXPECT_EQ(cut->userInfo().find("detail"), nullptr);
}

}  // namespace
}  // namespace quazor
