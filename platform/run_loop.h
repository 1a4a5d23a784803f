// Run loops: how a thread waits for what happens to it.
//
// A loop belongs to one thread and runs only while that thread calls runInMode. Sources are what can happen; observers
// are told what the loop is doing. Both are added for a mode and take part only in runs in that mode.
#pragma once

#include "contract/contract.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>

namespace QUAZOR_CONTRACT {

// The mode that loops are run in when nothing else is to be kept out.
inline constexpr std::string_view kRunLoopDefaultMode = "default";
// Stands for every common mode where something is added or removed; no run is in it. The default mode is common.
inline constexpr std::string_view kRunLoopCommonModes = "common";

// What a loop is doing, as bits of an observer's mask.
using RunLoopActivities = std::uint32_t;
inline constexpr RunLoopActivities kRunLoopEntry = 0x01;          // a run has begun
inline constexpr RunLoopActivities kRunLoopBeforeSources = 0x04;  // sources are signalled and about to be handled
inline constexpr RunLoopActivities kRunLoopBeforeWaiting = 0x20;  // nothing to do: the thread is about to sleep
inline constexpr RunLoopActivities kRunLoopAfterWaiting = 0x40;   // the thread was woken, or the time limit came
inline constexpr RunLoopActivities kRunLoopExit = 0x80;           // the run is over; the last thing it tells
inline constexpr RunLoopActivities kRunLoopAllActivities = 0x0FFFFFFF;

// Why a run ended. When several hold, the first of this list is the answer.
enum class RunLoopResult {
  kHandledSource,  // a source was handled, and the run was to end then
  kTimedOut,       // the time limit has come
  kStopped,        // stop() was called during the run
  kFinished        // the mode has no sources left
};

// Something that can happen. Made by a loop, which holds it while it is added.
// Thread: any for signal(); the rest is its loop's.
class QUAZOR_EXPORT RunLoopSource {
 public:
  RunLoopSource() = default;
  RunLoopSource(const RunLoopSource&) = delete;
  RunLoopSource& operator=(const RunLoopSource&) = delete;
  virtual ~RunLoopSource();

  // It has happened: the loop wakes and handles the source once, however often it was signalled before that. A signal
  // is kept until then, also while the source is not added or its mode is not run. Any thread.
  virtual void signal() = 0;
};

// Is told of a loop's activities. Made by a loop, which holds it while it is added.
// Thread: its loop's.
class QUAZOR_EXPORT RunLoopObserver {
 public:
  RunLoopObserver() = default;
  RunLoopObserver(const RunLoopObserver&) = delete;
  RunLoopObserver& operator=(const RunLoopObserver&) = delete;
  virtual ~RunLoopObserver();
};

// The loop of one thread.
//
// Thread: its own, but for stop() and RunLoopSource::signal(), which any thread may call while the loop lives.
// Handlers: called on the loop's thread, in the loop's run, never before a call that adds them has returned. They may
//   call everything here, add and remove themselves or others and run the loop again. What is removed is not called
//   any more, and its handler stays alive until it has returned when it removes itself. What is added is called only
//   from the next round of sources, or the next activity, on. A handler that runs the loop may be called again in that
//   run. They must not throw.
class QUAZOR_EXPORT RunLoop {
 public:
  RunLoop() = default;
  RunLoop(const RunLoop&) = delete;
  RunLoop& operator=(const RunLoop&) = delete;
  virtual ~RunLoop();

  // A source that is not yet added; `handler` must not be empty. Sources are handled in the order of their addition.
  virtual std::shared_ptr<RunLoopSource> makeSource(std::function<void()> handler) = 0;
  // Adding what is there and removing what is not have no effect. `source` was made by this loop.
  virtual void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) = 0;
  virtual void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) = 0;

  // An observer that is not yet added. It is told of the activities in `activities`, one at a time; of several
  // observers that with the lowest `order` first, equal ones as they were added. One that does not repeat is removed
  // just before it is told for the first time.
  virtual std::shared_ptr<RunLoopObserver> makeObserver(RunLoopActivities activities, bool repeats, std::int64_t order,
                                                        std::function<void(RunLoopActivities activity)> handler) = 0;
  // As for sources.
  virtual void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) = 0;
  virtual void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) = 0;

  // Runs until the time limit has come, stop() is called, the mode has no sources left or, when asked, a source was
  // handled. Sources that were signalled before are handled once even when the limit is zero or less; limits beyond
  // the clock's range never come. Every run begins with kRunLoopEntry and ends with kRunLoopExit, also when there is
  // nothing to wait for. While there is nothing to do the thread sleeps. Runs may be within runs, in any mode.
  virtual RunLoopResult runInMode(std::string_view mode, std::chrono::nanoseconds limit,
                                  bool returnAfterSourceHandled) = 0;
  // Ends the innermost run that is going on, as soon as the handler that is being called has returned and all sources
  // of that round are handled. Without a run it has no effect.
  virtual void stop() = 0;
};

// Gives threads their loops.
// Thread: any.
class QUAZOR_EXPORT RunLoops {
 public:
  RunLoops() = default;
  RunLoops(const RunLoops&) = delete;
  RunLoops& operator=(const RunLoops&) = delete;
  virtual ~RunLoops();

  // The calling thread's loop, the same at every call; it lives as long as the thread. Null when it can have none.
  virtual RunLoop* currentRunLoop() = 0;
};

}  // namespace QUAZOR_CONTRACT
