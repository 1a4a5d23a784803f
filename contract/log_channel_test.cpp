#include "contract/log_channel.h"

#include "contract/counting_object_for_tests.h"
#include "contract/diagnostic_error.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <mutex>
#include <new>
#include <string>
#include <thread>
#include <vector>

namespace {
thread_local long allocations = 0;  // by operator new on this thread
}

// The replaced operators count allocations. They apply to the whole test program.
void* operator new(std::size_t size) {
  ++allocations;
  if (void* memory = std::malloc(size == 0 ? 1 : size)) return memory;
  throw std::bad_alloc();
}
void* operator new[](std::size_t size) { return operator new(size); }
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete[](void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, std::size_t /*size*/) noexcept { std::free(memory); }
void operator delete[](void* memory, std::size_t /*size*/) noexcept { std::free(memory); }

namespace quazor {
namespace {

// Keeps the lines it is given, as "level subsystem category text".
class KeepingBackend final : public LogBackend {
 public:
  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override {
    const std::lock_guard lock(mutex_);
    lines_.push_back(
        formatMessage("%d %@ %@ %@", static_cast<int>(level), std::string(subsystem), std::string(category), text));
  }

  std::vector<std::string> lines() const {
    const std::lock_guard lock(mutex_);
    return lines_;
  }

 private:
  mutable std::mutex mutex_;
  std::vector<std::string> lines_;
};

class LogChannelTest : public testing::Test {
 protected:
  void TearDown() override { sharedLog().setBackend(nullptr, LogLevel::kDebug); }

  static void writeOneLinePerLevel() {
    logError("error");
    logDefault("default");
    logDebug("debug");
  }

  std::shared_ptr<KeepingBackend> backend_ = std::make_shared<KeepingBackend>();
};

TEST_F(LogChannelTest, TheSharedChannelIsOneObjectForAllThreads) {
  std::vector<LogChannel*> seen(8);
  std::vector<std::thread> threads;
  for (LogChannel*& channel : seen) threads.emplace_back([&channel] { channel = &sharedLog(); });
  for (std::thread& thread : threads) thread.join();
  for (const LogChannel* channel : seen) EXPECT_EQ(channel, &sharedLog());
}

TEST_F(LogChannelTest, TheSharedChannelIsOfThePlugInsSubsystemAndCategory) {
  EXPECT_EQ(sharedLog().category(), "quazor");
  EXPECT_EQ(sharedLog().subsystem(), "org.quazor.camera-sensor-diagnostics");
}

TEST_F(LogChannelTest, HandsOverALineWithItsLevelSubsystemAndCategory) {
  sharedLog().setBackend(backend_, LogLevel::kDebug);
  logError("Lamp %@ at %lf!", "front", 0.5);
  logDefault("%d of %lu", -1, 2U);
  logDebug("100%%");
  const std::string source = sharedLog().subsystem() + " quazor ";
  EXPECT_THAT(backend_->lines(), testing::ElementsAre("1 " + source + "Lamp front at 0.500000!",
                                                      "2 " + source + "-1 of 2", "3 " + source + "100%"));
}

TEST_F(LogChannelTest, ALevelEnablesItselfAndTheLevelsBeforeIt) {
  const struct {
    const char* name;
    LogLevel level;
    std::size_t lines;
  } kRows[] = {{"error", LogLevel::kError, 1}, {"default", LogLevel::kDefault, 2}, {"debug", LogLevel::kDebug, 3}};
  for (const auto& row : kRows) {
    const auto backend = std::make_shared<KeepingBackend>();
    sharedLog().setBackend(backend, row.level);
    writeOneLinePerLevel();
    EXPECT_EQ(backend->lines().size(), row.lines) << row.name;
    EXPECT_TRUE(LogChannel::isEnabled(LogLevel::kError)) << row.name;
    EXPECT_EQ(LogChannel::isEnabled(LogLevel::kDefault), row.lines >= 2) << row.name;
    EXPECT_EQ(LogChannel::isEnabled(LogLevel::kDebug), row.lines == 3) << row.name;
  }
}

TEST_F(LogChannelTest, WithoutABackendNothingIsEnabledAndLinesAreDropped) {
  sharedLog().setBackend(backend_, LogLevel::kDebug);
  sharedLog().setBackend(nullptr, LogLevel::kDebug);
  EXPECT_FALSE(LogChannel::isEnabled(LogLevel::kError));
  writeOneLinePerLevel();
  sharedLog().write(LogLevel::kError, "written without asking");
  EXPECT_THAT(backend_->lines(), testing::IsEmpty());
}

TEST_F(LogChannelTest, WritingDirectlyAsksForNoLevel) {
  sharedLog().setBackend(backend_, LogLevel::kError);
  sharedLog().write(LogLevel::kDebug, "100%@");
  EXPECT_THAT(backend_->lines(), testing::ElementsAre("3 org.quazor.camera-sensor-diagnostics quazor 100%@"));
}

TEST_F(LogChannelTest, AReplacedBackendIsReleasedAndGetsNoMoreLines) {
  const std::weak_ptr<KeepingBackend> first = backend_;
  sharedLog().setBackend(std::move(backend_), LogLevel::kDebug);
  EXPECT_FALSE(first.expired());
  const auto second = std::make_shared<KeepingBackend>();
  sharedLog().setBackend(second, LogLevel::kDebug);
  EXPECT_TRUE(first.expired());
  logError("line");
  EXPECT_EQ(second->lines().size(), 1U);
}

TEST_F(LogChannelTest, ADisabledLineFormatsNothingAndAllocatesNothing) {
  sharedLog().setBackend(backend_, LogLevel::kError);
  const auto object = std::make_shared<CountingObject>();
  const std::string longText(1000, 'x');
  const Value value(Array{1, "two", object});
  const DiagnosticErrorPtr error = makeError("Lamp", 1, "Dark.");
  const long before = allocations;
  logDebug("%@ %@ %@ %@ %lu %lf", object, longText, value, error, 3U, 0.5);
  logDefault("%@ %@ %@ %@ %lu %lf", object, longText, value, error, 3U, 0.5);
  EXPECT_EQ(allocations, before);
  EXPECT_EQ(object->asked, 0);
  EXPECT_THAT(backend_->lines(), testing::IsEmpty());
}

TEST_F(LogChannelTest, AnEnabledLineFormatsOnce) {
  sharedLog().setBackend(backend_, LogLevel::kError);
  const auto object = std::make_shared<CountingObject>();
  const long before = allocations;
  logError("%@ and some more text than fits into a short string", object);
  EXPECT_EQ(object->asked, 1);
  EXPECT_GT(allocations, before);  // proves that the counter works
}

TEST_F(LogChannelTest, ABackendMayBeReplacedWhileOtherThreadsWrite) {
  constexpr std::size_t kWriters = 4;
  constexpr std::size_t kSwaps = 200;
  std::vector<std::shared_ptr<KeepingBackend>> backends;
  for (int i = 0; i < 20; ++i) backends.push_back(std::make_shared<KeepingBackend>());
  sharedLog().setBackend(backends.front(), LogLevel::kDebug);
  std::atomic<bool> stop = false;
  std::vector<std::atomic<std::size_t>> written(kWriters);
  std::vector<std::thread> writers;
  for (std::atomic<std::size_t>& lines : written) {
    writers.emplace_back([&stop, &lines] {
      while (!stop) {
        logDebug("line %lu", lines.load());
        ++lines;
      }
    });
  }
  for (const std::atomic<std::size_t>& lines : written) {
    while (lines == 0) std::this_thread::yield();
  }
  for (std::size_t swap = 1; swap <= kSwaps; ++swap) {
    sharedLog().setBackend(backends[swap % backends.size()], LogLevel::kDebug);
  }
  stop = true;
  for (std::thread& writer : writers) writer.join();
  std::size_t kept = 0;
  for (const auto& backend : backends) kept += backend->lines().size();
  std::size_t expected = 0;
  for (const std::atomic<std::size_t>& lines : written) expected += lines;
  EXPECT_EQ(kept, expected);
}

}  // namespace
}  // namespace quazor
