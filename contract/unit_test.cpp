#include "contract/unit.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

TEST(UnitTest, OneSymbolIsOneObject) {
  const QZUnit& lux = QZUnit::unitWithSymbol("lux");
  EXPECT_EQ(lux.symbol(), "lux");
  EXPECT_EQ(&QZUnit::unitWithSymbol(std::string("lu") + "x"), &lux);
  EXPECT_NE(&QZUnit::unitWithSymbol("Lux"), &lux);
}

TEST(UnitTest, TheSharedUnitsOfCountsAreKnownByTheirSymbols) {
  EXPECT_EQ(&QZDimensionlessUnit::frames(), &QZUnit::unitWithSymbol("frames"));
  EXPECT_EQ(&QZDimensionlessUnit::errors(), &QZUnit::unitWithSymbol("errors"));
  EXPECT_EQ(&QZDimensionlessUnit::events(), &QZUnit::unitWithSymbol("events"));
  EXPECT_EQ(QZDimensionlessUnit::frames().symbol(), "frames");
  EXPECT_EQ(QZDimensionlessUnit::errors().symbol(), "errors");
  EXPECT_EQ(QZDimensionlessUnit::events().symbol(), "events");
}

TEST(UnitTest, ManyThreadsThatAskAtOnceGetOneObject) {
  std::vector<const QZUnit*> seen(8);
  std::vector<std::thread> threads;
  for (const QZUnit*& unit : seen) {
    threads.emplace_back([&unit] { unit = &QZUnit::unitWithSymbol("asked by many"); });
  }
  for (std::thread& thread : threads) thread.join();
  for (const QZUnit* unit : seen) EXPECT_EQ(unit, seen.front());
}

TEST(MeasurementTest, IsEqualInValueAndUnit) {
  const Measurement three(3, QZDimensionlessUnit::frames());
  EXPECT_EQ(three.value(), 3);
  EXPECT_EQ(&three.unit(), &QZDimensionlessUnit::frames());
  EXPECT_EQ(three, Measurement(3, QZUnit::unitWithSymbol("frames")));
  EXPECT_FALSE(three == Measurement(4, QZDimensionlessUnit::frames()));
  EXPECT_FALSE(three == Measurement(3, QZDimensionlessUnit::errors()));
}

}  // namespace
}  // namespace quazor
