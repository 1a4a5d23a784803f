#include "backends/simulated/time/fiber.h"

#include <gtest/gtest.h>

#include <exception>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace quazor {
namespace {

using Words = std::vector<std::string>;

TEST(Fiber, RunsNothingBeforeItIsResumed) {
  bool ran = false;
  Fiber fiber([&] { ran = true; });
  EXPECT_FALSE(ran);
  fiber.resume();
  EXPECT_TRUE(ran);
}

TEST(Fiber, GoesOnWhereItSuspendedItself) {
  Words words;
  Fiber* own = nullptr;
  Fiber fiber([&] {
    const std::string local = "kept";
    words.push_back("begins");
    own->suspend();
    words.push_back(local);
  });
  own = &fiber;
  fiber.resume();
  words.push_back("meanwhile");
  fiber.resume();
  EXPECT_EQ(words, (Words{"begins", "meanwhile", "kept"}));
}

TEST(Fiber, BeginsAnewWhenItsBodyHasReturned) {
  int runs = 0;
  Fiber fiber([&] { ++runs; });
  for (int i = 0; i < 3; ++i) fiber.resume();
  EXPECT_EQ(runs, 3);
}

TEST(Fiber, MayResumeAnother) {
  Words words;
  Fiber inner([&] { words.push_back("inner"); });
  Fiber outer([&] {
    words.push_back("outer begins");
    inner.resume();
    words.push_back("outer ends");
  });
  outer.resume();
  EXPECT_EQ(words, (Words{"outer begins", "inner", "outer ends"}));
}

TEST(Fiber, ThrowsAndCatchesOnItsOwnStack) {
  std::string caught;
  Fiber fiber([&] {
    try {
      throw std::runtime_error("thrown inside");
    } catch (const std::runtime_error& error) {
      caught = error.what();
    }
  });
  fiber.resume();
  EXPECT_EQ(caught, "thrown inside");
}

// A caught exception belongs to the fiber that caught it, even if the handlers of several fibers overlap.
TEST(Fiber, SuspendsInsideAHandlerWithoutDisturbingOthers) {
  const auto current = [] {
    try {
      throw;
    } catch (const std::exception& error) {
      return std::string(error.what());
    }
  };
  Words words;
  std::unique_ptr<Fiber> fibers[2];
  for (int i = 0; i < 2; ++i) {
    fibers[i] = std::make_unique<Fiber>([&, i] {
      try {
        throw std::runtime_error("of fiber " + std::to_string(i));
      } catch (...) {
        fibers[i]->suspend();
        words.push_back(current());
      }
      words.push_back(std::current_exception() == nullptr ? "none" : "left over");
    });
  }
  try {
    throw std::runtime_error("of the resumer");
  } catch (...) {
    fibers[0]->resume();
    fibers[1]->resume();
    words.push_back(current());
    fibers[0]->resume();
    fibers[1]->resume();
    words.push_back(current());
  }
  EXPECT_EQ(words, (Words{"of the resumer", "of fiber 0", "none", "of fiber 1", "none", "of the resumer"}));
}

TEST(Fiber, DoesNotShowItsResumersExceptionsAsItsOwn) {
  int seen = -1;
  Fiber fiber([&] { seen = std::uncaught_exceptions(); });
  struct ResumesOnTheWayOut {
    Fiber& fiber;
    ~ResumesOnTheWayOut() { fiber.resume(); }
  };
  try {
    const ResumesOnTheWayOut resumer{fiber};
    throw std::runtime_error("on its way");
  } catch (const std::runtime_error&) {
  }
  EXPECT_EQ(seen, 0);
}

}  // namespace
}  // namespace quazor
