#include "diagnostics/projector_fault/record_pool.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <set>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {
namespace {

struct Record {
  explicit Record(std::uint64_t n) : number(n), check(~n) {}

  std::uint64_t number;
  std::uint64_t check;
};

std::shared_ptr<Record> make(RecordPool& pool, std::uint64_t number) {
  return std::allocate_shared<Record>(PoolAllocator<Record>(pool), number);
}

TEST(RecordPool, GivesADroppedBlockOutAgain) {
  RecordPool pool;
  const void* const first = make(pool, 1).get();
  EXPECT_EQ(make(pool, 2).get(), first);
}

TEST(RecordPool, KeepsBlocksInUseApart) {
  RecordPool pool;
  std::set<Record*> places;
  std::vector<std::shared_ptr<Record>> records;
  for (std::uint64_t i = 0; i < 100; ++i) {
    records.push_back(make(pool, i));
    places.insert(records.back().get());
  }
  EXPECT_EQ(places.size(), 100U);
  for (std::uint64_t i = 0; i < 100; ++i) EXPECT_EQ(records[i]->number, i);

  records.clear();
  for (std::uint64_t i = 0; i < 100; ++i) {
    records.push_back(make(pool, i));
    EXPECT_TRUE(places.contains(records.back().get())) << "a block that was given back was not used";
  }
}

TEST(RecordPool, GivesBlocksThatHoldItsOwnLinks) {
  RecordPool pool;
  void* const block = pool.take(1);
  pool.give(block);
  EXPECT_EQ(pool.take(1), block);
  pool.give(block);
}

TEST(RecordPool, TakesRecordsBackFromAnotherThread) {
  constexpr std::uint64_t kRounds = 200;
  constexpr std::uint64_t kBatch = 50;
  RecordPool pool;
  std::set<Record*> places;
  for (std::uint64_t round = 0; round < kRounds; ++round) {
    std::vector<std::shared_ptr<Record>> records;
    for (std::uint64_t i = 0; i < kBatch; ++i) {
      records.push_back(make(pool, round * kBatch + i));
      places.insert(records.back().get());
    }
    std::vector<std::shared_ptr<Record>> others(records.begin(), records.begin() + kBatch / 2);
    std::thread other([dropped = std::move(others)]() mutable { dropped.clear(); });
    for (std::uint64_t i = 0; i < kBatch; ++i) {
      EXPECT_EQ(records[i]->number, round * kBatch + i);
      EXPECT_EQ(records[i]->check, ~records[i]->number);
    }
    records.clear();
    other.join();
  }
  EXPECT_EQ(places.size(), kBatch) << "blocks were lost";
}

}  // namespace
}  // namespace quazor
