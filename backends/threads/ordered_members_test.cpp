#include "backends/threads/ordered_members.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

using Item = std::string;

class OrderedMembersTest : public ::testing::Test {
 protected:
  static constexpr std::uint64_t kAll = ~std::uint64_t{0};

  std::shared_ptr<Item> add(const std::string& text, std::int64_t rank = 0) {
    auto item = std::make_shared<Item>(text);
    members_.add(item, rank, ++number_);
    return item;
  }
  std::string visited(std::uint64_t newest = kAll, const std::function<void(const std::shared_ptr<Item>&)>& act = {}) {
    std::string all;
    members_.visit(
        newest, [](const Item& item) { return item != "unwanted"; },
        [&](const std::shared_ptr<Item>& item) {
          all += *item;
          if (act) act(item);
        });
    return all;
  }

  OrderedMembers<Item> members_;
  std::uint64_t number_ = 0;
};

TEST_F(OrderedMembersTest, AreVisitedByRankAndThenAsTheyWereAdded) {
  add("c");
  add("a", -1);
  add("d");
  add("e", 1);
  add("b", -1);
  EXPECT_EQ(visited(), "abcde");
}

TEST_F(OrderedMembersTest, AddingWhatIsThereLeavesItWhereItIs) {
  const auto first = add("a");
  add("b");
  members_.add(first, 5, ++number_);
  EXPECT_EQ(visited(), "ab");
}

TEST_F(OrderedMembersTest, RemovingWhatIsNotThereHasNoEffect) {
  const auto first = add("a");
  members_.remove(first.get());
  members_.remove(first.get());
  members_.remove(nullptr);
  EXPECT_TRUE(members_.empty());
  EXPECT_EQ(first.use_count(), 1);
}

TEST_F(OrderedMembersTest, WhatIsNotWantedOrTooNewIsPassedOver) {
  add("a");
  add("unwanted");
  add("b");
  add("new", -1);
  EXPECT_EQ(visited(3), "ab");
}

TEST_F(OrderedMembersTest, AVisitorMayRemoveAndAddAnywhere) {
  const auto first = add("a");
  const auto second = add("b");
  const auto third = add("c");
  add("d");
  EXPECT_EQ(visited(number_,
                    [&](const std::shared_ptr<Item>& item) {
                      if (*item != "b") return;
                      members_.remove(first.get());
                      members_.remove(second.get());
                      members_.remove(third.get());
                      add("before", -1);
                      add("behind");
                    }),
            "abd");
  EXPECT_EQ(visited(), "beforedbehind");
}

TEST_F(OrderedMembersTest, AVisitorMayRemoveAll) {
  const auto first = add("a");
  const auto second = add("b");
  EXPECT_EQ(visited(kAll,
                    [&](const std::shared_ptr<Item>&) {
                      members_.remove(first.get());
                      members_.remove(second.get());
                    }),
            "a");
  EXPECT_TRUE(members_.empty());
}

TEST_F(OrderedMembersTest, AnyOfAsksEachUntilOneIsFound) {
  add("a");
  add("b");
  EXPECT_TRUE(members_.anyOf([](const Item& item) { return item == "b"; }));
  EXPECT_FALSE(members_.anyOf([](const Item& item) { return item == "c"; }));
}

// Removes another item when it is destroyed.
struct Remover {
  Remover(OrderedMembers<Remover>& all, std::shared_ptr<Remover> other) : members(all), removed(std::move(other)) {}
  Remover(const Remover&) = delete;
  Remover& operator=(const Remover&) = delete;
  ~Remover() { members.remove(removed.get()); }

  OrderedMembers<Remover>& members;
  std::shared_ptr<Remover> removed;
};

TEST(OrderedMembersDestructionTest, TheDestructorOfOneMayRemoveAnother) {
  OrderedMembers<Remover> members;
  const auto second = std::make_shared<Remover>(members, nullptr);
  const auto third = std::make_shared<Remover>(members, nullptr);
  auto first = std::make_shared<Remover>(members, second);
  members.add(first, 0, 1);
  members.add(second, 0, 2);
  members.add(third, 0, 3);
  const Remover* const removed = first.get();
  first.reset();
  members.remove(removed);
  EXPECT_EQ(second.use_count(), 1);
  EXPECT_EQ(third.use_count(), 2);
  members.remove(third.get());
  EXPECT_TRUE(members.empty());
}

TEST(OrderedMembersDestructionTest, AnItemThatGoesAfterItsVisitMayRemoveOneBeforeIt) {
  OrderedMembers<Remover> members;
  std::vector<const Remover*> visited;
  const auto first = std::make_shared<Remover>(members, nullptr);
  const auto third = std::make_shared<Remover>(members, nullptr);
  members.add(first, 0, 1);
  members.add(std::make_shared<Remover>(members, first), 0, 2);
  members.add(third, 0, 3);
  members.visit(
      3, [](const Remover&) { return true; },
      [&](const std::shared_ptr<Remover>& item) {
        visited.push_back(item.get());
        if (visited.size() == 2) members.remove(item.get());
      });
  ASSERT_EQ(visited.size(), 3U);
  EXPECT_EQ(visited.back(), third.get());
  members.remove(third.get());
  EXPECT_TRUE(members.empty());
}

}  // namespace
}  // namespace quazor
