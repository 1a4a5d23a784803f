// Run loops: a thread waits for events in its run loop.
//
// A loop belongs to one thread and runs only while that thread calls runInMode. Sources deliver events; observers
// are notified of the loop's activities. Both are added for a mode and are active only in runs in that mode.
#pragma once

#include "contract/contract.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>

namespace QUAZOR_CONTRACT {

// The default mode of a run.
inline constexpr std::string_view kRunLoopDefaultMode = "default";
// Adding or removing something for this pseudo-mode applies to all common modes. A loop never runs in it. The default
// mode is a common mode.
inline constexpr std::string_view kRunLoopCommonModes = "common";

// Activities of a loop, as bits of an observer's mask.
using RunLoopActivities = std::uint32_t;
inline constexpr RunLoopActivities kRunLoopEntry = 0x01;          // a run has begun
inline constexpr RunLoopActivities kRunLoopBeforeSources = 0x04;  // sources are signalled and about to be handled
inline constexpr RunLoopActivities kRunLoopBeforeWaiting = 0x20;  // nothing to do: the thread is about to sleep
inline constexpr RunLoopActivities kRunLoopAfterWaiting = 0x40;   // the thread was woken, or the time limit expired
inline constexpr RunLoopActivities kRunLoopExit = 0x80;           // the run is over; the last notification
inline constexpr RunLoopActivities kRunLoopAllActivities = 0x0FFFFFFF;

// The reason why a run ended. If several apply, the first in this list is returned.
enum class RunLoopResult {
  kHandledSource,  // a source was handled, and the caller asked to return after that
  kTimedOut,       // the time limit expired
  kStopped,        // stop() was called during the run
  kFinished        // the mode has no sources left
};

// A source of events. Created by a loop, which keeps it alive while it is added.
// Thread: any for signal(); its loop's for the rest.
class QUAZOR_EXPORT RunLoopSource {
 public:
  RunLoopSource() = default;
  RunLoopSource(const RunLoopSource&) = delete;
  RunLoopSource& operator=(const RunLoopSource&) = delete;
  virtual ~RunLoopSource();

  // Wakes the loop, which handles the source once, no matter how often it was signalled. The signal remains pending
  // while the source is not added or its mode is not running. Any thread.
  virtual void signal() = 0;
};

// Is notified of a loop's activities. Created by a loop, which keeps it alive while it is added.
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
// Thread: its own, except stop() and RunLoopSource::signal(), which any thread may call while the loop lives.
// Handlers: called on the loop's thread, in the loop's run, never before a call that adds them has returned. They may
//   call everything here, add and remove themselves or others, and run the loop again. A removed handler is no longer
//   called; one that removes itself stays alive until it has returned. A handler that is added takes effect with the
//   next round of sources or the next activity. A handler that runs the loop may be called again in that run. Handlers
//   must not throw.
class QUAZOR_EXPORT RunLoop {
 public:
  RunLoop() = default;
  RunLoop(const RunLoop&) = delete;
  RunLoop& operator=(const RunLoop&) = delete;
  virtual ~RunLoop();

  // Creates a source without adding it. `handler` must not be empty. Sources are handled in the order of addition.
  virtual std::shared_ptr<RunLoopSource> makeSource(std::function<void()> handler) = 0;
  // Adding a source twice, or removing one that is not added, has no effect. `source` must have been created by this
  // loop.
  virtual void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) = 0;
  virtual void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) = 0;

  // Creates an observer without adding it. It is notified of each activity in `activities` separately. Observers are
  // notified by ascending `order`, then in the order of addition. A non-repeating observer is removed just before its
  // first notification.
  virtual std::shared_ptr<RunLoopObserver> makeObserver(RunLoopActivities activities, bool repeats, std::int64_t order,
                                                        std::function<void(RunLoopActivities activity)> handler) = 0;
  // As for sources.
  virtual void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) = 0;
  virtual void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) = 0;

  // Runs until the time limit expires, stop() is called, the mode has no sources left or, if requested, a source was
  // handled. Sources that are already signalled are handled once even if the limit is zero or negative; a limit beyond
  // the clock's range never expires. Every run begins with kRunLoopEntry and ends with kRunLoopExit, even if there is
  // nothing to wait for. The thread sleeps while there is nothing to do. Runs may be nested, in any mode.
  virtual RunLoopResult runInMode(std::string_view mode, std::chrono::nanoseconds limit,
                                  bool returnAfterSourceHandled) = 0;
  // Ends the innermost active run as soon as the current handler has returned and all sources of that round are
  // handled. No effect if the loop is not running.
  virtual void stop() = 0;
};

// Provides each thread with its run loop.
// Thread: any.
class QUAZOR_EXPORT RunLoops {
 public:
  RunLoops() = default;
  RunLoops(const RunLoops&) = delete;
  RunLoops& operator=(const RunLoops&) = delete;
  virtual ~RunLoops();

  // Returns the calling thread's loop, always the same one; it lives as long as the thread. Null if the thread cannot
  // have one.
  virtual RunLoop* currentRunLoop() = 0;
};

}  // namespace QUAZOR_CONTRACT
