#include "contract/ordered_map.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using Counts = OrderedMap<int>;

std::vector<std::string> keysOf(const Counts& map) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : map) keys.push_back(key);
  return keys;
}

std::string keyOf(int number) { return "key" + std::to_string(number); }

Counts mapOf(int count) {
  Counts map;
  for (int i = 0; i < count; ++i) map.set(keyOf(i), i);
  return map;
}

// Sizes around the creation of the index (9 entries) and around its rebuilds.
constexpr int kSizes[] = {0, 1, 7, 8, 9, 16, 17, 64, 65, 1000};

TEST(OrderedMapTest, IsMadeEmpty) {
  const Counts map;
  EXPECT_TRUE(map.empty());
  EXPECT_EQ(map.size(), 0U);
  EXPECT_EQ(map.begin(), map.end());
  EXPECT_EQ(map.find(""), nullptr);
  EXPECT_FALSE(map.contains("key"));
}

TEST(OrderedMapTest, IteratesInTheOrderOfInsertion) {
  Counts map;
  for (const char* key : {"zebra", "ant", "mole", "", "bee"}) map.set(key, 1);
  EXPECT_EQ(keysOf(map), (std::vector<std::string>{"zebra", "ant", "mole", "", "bee"}));
}

TEST(OrderedMapTest, FindsEveryKeyAndNoOtherAtEverySize) {
  for (const int size : kSizes) {
    const Counts map = mapOf(size);
    EXPECT_EQ(map.size(), static_cast<std::size_t>(size));
    EXPECT_EQ(map.empty(), size == 0);
    int expected = 0;
    for (const auto& [key, value] : map) {
      EXPECT_EQ(key, keyOf(expected));
      EXPECT_EQ(value, expected++);
    }
    for (int i = 0; i < size; ++i) {
      ASSERT_NE(map.find(keyOf(i)), nullptr) << i << " of " << size;
      EXPECT_EQ(*map.find(keyOf(i)), i);
    }
    EXPECT_EQ(map.find(keyOf(size)), nullptr);
    EXPECT_FALSE(map.contains("key"));
    EXPECT_EQ(map.size(), static_cast<std::size_t>(size)) << "a look-up inserted";
  }
}

TEST(OrderedMapTest, SettingAKeyAgainReplacesItsValueAndKeepsItsPlace) {
  for (const int size : kSizes) {
    if (size == 0) continue;
    Counts map = mapOf(size);
    const int middle = size / 2;
    map.set(keyOf(middle), -5);
    EXPECT_EQ(keysOf(map), keysOf(mapOf(size)));
    EXPECT_EQ(*map.find(keyOf(middle)), -5);
  }
}

TEST(OrderedMapTest, AValueCanBeChangedInPlace) {
  Counts map{{"a", 1}, {"b", 2}};
  *map.find("b") = 7;
  EXPECT_EQ(map, (Counts{{"a", 1}, {"b", 7}}));
}

TEST(OrderedMapTest, TheLastOfEqualKeysInAListHolds) {
  const Counts map{{"a", 1}, {"b", 2}, {"a", 3}};
  EXPECT_EQ(keysOf(map), (std::vector<std::string>{"a", "b"}));
  EXPECT_EQ(*map.find("a"), 3);
}

TEST(OrderedMapTest, SettingAllIsSettingOneBehindTheOther) {
  for (const int size : kSizes) {
    for (const int earlier : {0, 3, 20}) {
      // Every third key occurs twice, and some are already present.
      std::vector<std::pair<std::string, int>> elements;
      for (int i = 0; i < size; ++i) {
        elements.emplace_back(keyOf(i), 100 + i);
        if (i % 3 == 0) elements.emplace_back(keyOf(i / 2), 2000 + i);
      }
      Counts expected = mapOf(earlier);
      for (const auto& [key, value] : elements) expected.set(key, value);
      Counts map = mapOf(earlier);
      map.setAll(
          elements, [](const auto& element) -> const std::string& { return element.first; },
          [](const auto& element) { return element.second; });
      EXPECT_EQ(keysOf(map), keysOf(expected)) << size << " to " << earlier;
      EXPECT_EQ(map, expected) << size << " to " << earlier;
    }
  }
}

TEST(OrderedMapTest, ErasingTakesOneEntryAndLeavesTheOthersInOrder) {
  for (const int size : kSizes) {
    for (const int erased : {0, size / 2, size - 1}) {
      if (size == 0) continue;
      Counts map = mapOf(size);
      EXPECT_TRUE(map.erase(keyOf(erased)));
      EXPECT_FALSE(map.erase(keyOf(erased)));
      std::vector<std::string> expected;
      for (int i = 0; i < size; ++i) {
        if (i != erased) expected.push_back(keyOf(i));
      }
      EXPECT_EQ(keysOf(map), expected);
      EXPECT_FALSE(map.contains(keyOf(erased)));
      for (int i = 0; i < size; ++i) {
        if (i == erased) continue;
        ASSERT_NE(map.find(keyOf(i)), nullptr) << i << " of " << size << " without " << erased;
        EXPECT_EQ(*map.find(keyOf(i)), i);
      }
    }
  }
}

TEST(OrderedMapTest, AnErasedKeyThatIsSetAgainComesLast) {
  Counts map{{"a", 1}, {"b", 2}};
  map.erase("a");
  map.set("a", 3);
  EXPECT_EQ(keysOf(map), (std::vector<std::string>{"b", "a"}));
}

TEST(OrderedMapTest, ErasingAnUnknownKeyChangesNothing) {
  Counts map = mapOf(20);
  EXPECT_FALSE(map.erase("stranger"));
  EXPECT_EQ(map, mapOf(20));
}

TEST(OrderedMapTest, ShrinkingToAFewEntriesAndGrowingAgainLosesNothing) {
  Counts map = mapOf(40);
  for (int i = 0; i < 37; ++i) EXPECT_TRUE(map.erase(keyOf(i)));
  EXPECT_EQ(keysOf(map), (std::vector<std::string>{"key37", "key38", "key39"}));
  EXPECT_EQ(*map.find("key38"), 38);
  for (int i = 0; i < 37; ++i) map.set(keyOf(i), i);
  EXPECT_EQ(map.size(), 40U);
  for (int i = 0; i < 40; ++i) EXPECT_EQ(*map.find(keyOf(i)), i);
}

TEST(OrderedMapTest, EqualityLooksAtKeysAndValuesAndNotAtTheirOrder) {
  const Counts forward = mapOf(30);
  Counts backward;
  for (int i = 29; i >= 0; --i) backward.set(keyOf(i), i);
  EXPECT_EQ(forward, backward);
  Counts otherValue = forward;
  otherValue.set(keyOf(29), 0);
  EXPECT_FALSE(forward == otherValue);
  Counts otherKey = forward;
  otherKey.erase(keyOf(29));
  otherKey.set("stranger", 29);
  EXPECT_FALSE(forward == otherKey);
  EXPECT_FALSE(forward == mapOf(29));
  EXPECT_FALSE(mapOf(29) == forward);
}

TEST(OrderedMapTest, CopiesAreIndependent) {
  for (const int size : {3, 30}) {
    Counts original = mapOf(size);
    Counts copy = original;
    copy.set("more", 1);
    copy.set(keyOf(0), -1);
    EXPECT_EQ(original, mapOf(size));
    original.erase(keyOf(1));
    EXPECT_EQ(*copy.find(keyOf(1)), 1);
    EXPECT_EQ(*copy.find("more"), 1);
  }
}

TEST(OrderedMapTest, HoldsAHundredThousandKeysAndFindsEach) {
  constexpr int count = 100'000;
  Counts map;
  map.reserve(count);
  for (int i = 0; i < count; ++i) map.set(keyOf(i), i);
  ASSERT_EQ(map.size(), static_cast<std::size_t>(count));
  for (int i = 0; i < count; ++i) {
    const int* value = map.find(keyOf(i));
    ASSERT_NE(value, nullptr) << i;
    ASSERT_EQ(*value, i);
    ASSERT_FALSE(map.contains(keyOf(i) + "x"));
  }
}

TEST(OrderedMapTest, TakesKeysThatHoldNullCharacters) {
  Counts map;
  map.set(std::string_view("a\0b", 3), 1);
  map.set("a", 2);
  EXPECT_EQ(*map.find(std::string_view("a\0b", 3)), 1);
  EXPECT_EQ(*map.find("a"), 2);
}

}  // namespace
}  // namespace quazor
