#include "backends/threads/thread_serial_queue.h"

#include "backends/threads/thread_semaphore.h"

#include <gtest/gtest.h>

#include <malloc.h>
#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// Evaluates `question` on the queue's thread.
template <class Question>
auto askThread(SerialQueue& queue, Question question) {
  decltype(question()) answer{};
  ThreadSemaphore done(0);
  queue.async([&] {
    answer = question();
    done.signal();
  });
  done.wait();
  return answer;
}

std::string nameOfThread() {
  char name[16] = {};
  pthread_getname_np(pthread_self(), name, sizeof name);
  return name;
}

TEST(ThreadSerialQueueTest, TheThreadHasTheEndOfTheLabelAsItsName) {
  const struct {
    const char* label;
    const char* name;
  } kRows[] = {
      {"receiving", "receiving"},
      {"fifteen letters", "fifteen letters"},
      {"sixteen lettersX", "ixteen lettersX"},
      {"org.quazor.projector-fault.processing", "ault.processing"},
  };
  for (const auto& row : kRows) {
    ThreadSerialQueue queue(row.label, QualityOfService::kDefault);
    EXPECT_EQ(askThread(queue, nameOfThread), row.name);
  }
}

TEST(ThreadSerialQueueTest, OnlyABackgroundThreadHasALowerPriority) {
  const auto niceOfThread = [] { return getpriority(PRIO_PROCESS, static_cast<id_t>(gettid())); };
  const int own = niceOfThread();
  ThreadSerialQueue interactive("i", QualityOfService::kUserInteractive);
  ThreadSerialQueue ordinary("o", QualityOfService::kDefault);
  ThreadSerialQueue background("b", QualityOfService::kBackground);
  EXPECT_EQ(askThread(interactive, niceOfThread), own);
  EXPECT_EQ(askThread(ordinary, niceOfThread), own);
  EXPECT_EQ(askThread(background, niceOfThread), 10);
  EXPECT_EQ(niceOfThread(), own);
}

TEST(ThreadSerialQueueTest, EachQueueHasOneThreadOfItsOwn) {
  ThreadSerialQueue one("one", QualityOfService::kDefault);
  ThreadSerialQueue other("other", QualityOfService::kDefault);
  const auto thread = askThread(one, [] { return std::this_thread::get_id(); });
  EXPECT_EQ(askThread(one, [] { return std::this_thread::get_id(); }), thread);
  EXPECT_NE(askThread(other, [] { return std::this_thread::get_id(); }), thread);
  EXPECT_NE(std::this_thread::get_id(), thread);
}

// The number of threads of this process with that name.
int threadsNamed(const std::string& name) {
  int count = 0;
  for (const auto& thread : std::filesystem::directory_iterator("/proc/self/task")) {
    std::ifstream file(thread.path() / "comm");
    std::string line;
    if (std::getline(file, line) && line == name) ++count;
  }
  return count;
}

TEST(ThreadSerialQueueTest, AQueueThatIsDroppedEndsItsThread) {
  constexpr int kQueues = 50;
  std::vector<std::unique_ptr<SerialQueue>> queues;
  for (int i = 0; i < kQueues; ++i) {
    queues.push_back(std::make_unique<ThreadSerialQueue>("to be dropped", QualityOfService::kDefault));
    askThread(*queues.back(), [] { return 0; });
  }
  EXPECT_EQ(threadsNamed("to be dropped"), kQueues);
  queues.clear();
  for (int i = 0; i < 5000 && threadsNamed("to be dropped") > 0; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  EXPECT_EQ(threadsNamed("to be dropped"), 0);
}

TEST(ThreadSerialQueueTest, AnIdleQueueGivesBackTheMemoryOfItsBusiestMoment) {
#if defined(QUAZOR_ADDRESS_SANITIZER) || defined(QUAZOR_THREAD_SANITIZER)
  GTEST_SKIP() << "a sanitizer's allocator does not tell what is in use";
#endif
  constexpr std::size_t kTasks = 20'000;
  constexpr std::size_t kMinimum = kTasks * sizeof(Task);
  const auto inUse = [] { return ::mallinfo2().uordblks; };
  ThreadSerialQueue queue("memory", QualityOfService::kDefault);
  const std::size_t before = askThread(queue, inUse);
  ThreadSemaphore gate(0);
  queue.async([&gate] { gate.wait(); });
  for (std::size_t i = 0; i < kTasks; ++i) queue.async([] {});
  EXPECT_GE(inUse(), before + kMinimum);
  gate.signal();
  askThread(queue, [] { return 0; });
  for (int i = 0; i < 5000 && inUse() > before + kMinimum / 10; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  EXPECT_LE(inUse(), before + kMinimum / 10);
}

TEST(ThreadSerialQueueTest, DroppingAQueueDoesNotWaitForItsTask) {
  ThreadSemaphore gate(0);
  ThreadSemaphore done(0);
  {
    ThreadSerialQueue queue("blocked", QualityOfService::kDefault);
    queue.async([&] {
      gate.wait();
      done.signal();
    });
  }
  gate.signal();  // never reached if the queue had waited
  done.wait();
}

TEST(ThreadSerialQueueTest, TasksThatAreNotYetDueAreDestroyedOnTheThread) {
  struct TellsItsThread {
    TellsItsThread(std::thread::id& where, ThreadSemaphore& gone) : thread(&where), done(&gone) {}
    TellsItsThread(TellsItsThread&& other) noexcept : thread(other.thread), done(std::exchange(other.done, nullptr)) {}
    TellsItsThread(const TellsItsThread&) = delete;
    ~TellsItsThread() {
      if (done == nullptr) return;
      *thread = std::this_thread::get_id();
      done->signal();
    }
    std::thread::id* thread;
    ThreadSemaphore* done;
  };
  std::thread::id own;
  std::thread::id destroying;
  ThreadSemaphore done(0);
  {
    ThreadSerialQueue queue("undue", QualityOfService::kDefault);
    own = askThread(queue, [] { return std::this_thread::get_id(); });
    queue.asyncAfter(std::chrono::hours(1), [guard = TellsItsThread(destroying, done)] { FAIL(); });
  }
  done.wait();
  EXPECT_EQ(destroying, own);
}

// Abandons a queue with every kind of pending work.
void leavePendingWork() {
  for (const auto quality : {QualityOfService::kUserInteractive, QualityOfService::kBackground}) {
    auto* const leaked = new std::shared_ptr<SerialQueue>(std::make_shared<ThreadSerialQueue>("pending", quality));
    SerialQueue& queue = **leaked;
    queue.asyncAfter(std::chrono::seconds(1'000'000'000), [leaked] { static_cast<void>(leaked); });
    queue.asyncAfter(std::chrono::nanoseconds::max(), [leaked] { static_cast<void>(leaked); });
    askThread(queue, [] { return 0; });
  }
}

TEST(ThreadSerialQueueDeathTest, PendingWorkNeitherDelaysNorCrashesTheEndOfTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        alarm(20);  // kills the process if it does not end
        leavePendingWork();
        std::exit(7);
      },
      ::testing::ExitedWithCode(7), "");
}

TEST(ThreadSerialQueueDeathTest, ATaskThatIsRunningDoesNotHoldUpTheEndOfTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        alarm(20);
        ThreadSerialQueue queue("running", QualityOfService::kDefault);
        ThreadSemaphore started(0);
        queue.async([&started] {
          started.signal();
          std::this_thread::sleep_for(std::chrono::hours(1));
        });
        started.wait();
        std::exit(7);
      },
      ::testing::ExitedWithCode(7), "");
}

}  // namespace
}  // namespace quazor
