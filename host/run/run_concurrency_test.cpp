#include "host/run/run_concurrency.h"

#include "contract/log_channel.h"
#include "host/run/diagnostic_run.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"
#include "platform/platform.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// Thread: one at a time.
class KeepingQueue final : public SerialQueue {
 public:
  explicit KeepingQueue(std::vector<Task>& kept) : kept_(kept) {}

  void async(Task task) override { kept_.push_back(std::move(task)); }
  void asyncAfter(std::chrono::nanoseconds /*delay*/, Task task) override { kept_.push_back(std::move(task)); }

 private:
  std::vector<Task>& kept_;
};

// Thread: one at a time.
class KeepingConcurrency final : public Concurrency {
 public:
  explicit KeepingConcurrency(std::vector<Task>& kept) : kept_(kept) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view /*label*/, QualityOfService /*quality*/) override {
    return std::make_shared<KeepingQueue>(kept_);
  }
  std::shared_ptr<Semaphore> makeSemaphore(long /*count*/) override { return nullptr; }

 private:
  std::vector<Task>& kept_;
};

// A phone whose queues keep their tasks for the test.
// Thread: one at a time.
class KeepingPhone final : public TestPhone {
 public:
  explicit KeepingPhone(std::vector<Task>& kept) : kept_(kept) {}

  Platform platform() const override {
    Platform platform = TestPhone::platform();
    platform.concurrency = std::make_shared<KeepingConcurrency>(kept_);
    return platform;
  }

 private:
  std::vector<Task>& kept_;
};

class RunConcurrencyTest : public testing::Test {
 protected:
  // The log of a run whose experiment is made by `make`.
  std::vector<std::string> logOf(std::function<void()> make) {
    Diagnostic diagnostic{"Fake", "", "Fake", "", nullptr, nullptr, true};
    diagnostic.makeExperiment = [make = std::move(make)] {
      make();
      return std::make_shared<fake::FakeExperiment>();
    };
    RunOptions options;
    options.makePhone = [this] { return std::make_unique<KeepingPhone>(kept_); };
    EventList events;
    runDiagnostic(diagnostic, {}, options, events);
    std::vector<std::string> texts;
    for (const RunEvent& event : events.events) {
      if (const auto* const logged = std::get_if<Logged>(&event)) texts.push_back(logged->line.text);
    }
    return texts;
  }

  void performKept() {
    for (Task& task : std::exchange(kept_, {})) task();
  }

  std::vector<Task> kept_;
};

bool contains(const std::vector<std::string>& texts, const std::string& text) {
  return std::find(texts.begin(), texts.end(), text) != texts.end();
}

TEST_F(RunConcurrencyTest, TasksThatBeginAreToldInTheirOrder) {
  const auto clock = std::make_shared<ManualClock>();
  EventList events;
  const auto rings = std::make_shared<FrameRings>(0);
  rings->begin(clock->now());
  const std::shared_ptr<Concurrency> concurrency =
      concurrencyOfRun(std::make_shared<KeepingConcurrency>(kept_), std::make_shared<RunLog>(clock, events),
                       {rings, clock, WhenTraceIsFull::kLose});
  const auto queue = concurrency->makeSerialQueue("Work", QualityOfService::kDefault);
  queue->async([&] { clock->sleep(5ns); });
  clock->sleep(10ns);
  queue->asyncAfter(20ns, [] {});
  clock->sleep(100ns);
  queue->async([] {});  // never begins
  Task last = std::move(kept_.back());
  kept_.pop_back();
  performKept();
  FrameDrain drain(*rings);
  std::vector<TracedFrame> told;
  drain.drain(true, [&](std::size_t, const TracedFrame& task, std::uint64_t) { told.push_back(task); });
  ASSERT_EQ(told.size(), 2U);
  EXPECT_EQ(drain.nameOf(0), "Work");
  EXPECT_EQ(drain.kindOf(0), TracedKind::kTasks);
  EXPECT_EQ(told[0], (TracedFrame{told[0].number, 0, 110, 115}));
  EXPECT_EQ(told[1], (TracedFrame{told[0].number, 10, 115, 115}));
}

TEST_F(RunConcurrencyTest, ALateTaskDoesNotWriteIntoTheLogOfTheNextRunNorDoesWhatItOwns) {
  logOf([] {
    const auto queue = installedPlatform().concurrency->makeSerialQueue("queue", QualityOfService::kDefault);
    queue->asyncAfter(1s, [] { logError("delayed"); });
    std::shared_ptr<int> atTheEnd(nullptr, [](int*) { logError("destroyed"); });
    queue->async([atTheEnd = std::move(atTheEnd)] { logError("at once"); });
  });
  ASSERT_EQ(kept_.size(), 2U);
  const std::vector<std::string> next = logOf([this] {
    performKept();
    logError("of the next run");
  });
  EXPECT_TRUE(contains(next, "of the next run"));
  EXPECT_FALSE(contains(next, "delayed"));
  EXPECT_FALSE(contains(next, "at once"));
  EXPECT_FALSE(contains(next, "destroyed"));
}

TEST_F(RunConcurrencyTest, ATaskWritesIntoTheLogOfItsRunAlsoWhenItIsDestroyed) {
  const std::vector<std::string> texts = logOf([this] {
    std::shared_ptr<int> atTheEnd(nullptr, [](int*) { logError("destroyed"); });
    installedPlatform()
        .concurrency->makeSerialQueue("queue", QualityOfService::kDefault)
        ->async([atTheEnd = std::move(atTheEnd)] { logError("performed"); });
    performKept();
  });
  EXPECT_TRUE(contains(texts, "performed"));
  EXPECT_TRUE(contains(texts, "destroyed"));
}

}  // namespace
}  // namespace quazor
