#include "host/system/watched_signals.h"

#include "host/error/exit_code.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdint>
#include <system_error>

namespace quazor {

namespace {

constexpr int kRequests[] = {SIGINT, SIGTERM, SIGHUP};
constexpr std::int64_t kSecond = 1'000'000'000;
// How long an output may block after the second request, and how often that is checked.
constexpr std::int64_t kMaxBlocked = 2 * kSecond;
constexpr std::int64_t kCheckPeriod = kSecond / 10;
// In milliseconds: a longer wait takes several calls.
constexpr std::int64_t kLongestPoll = 60'000;
// A process that has used less processor time between two checks has been waiting.
constexpr std::int64_t kWorking = kSecond / 1000;

// The state of the one WatchedSignals, for its signal handlers. They run one at a time, on the only thread.
std::atomic<int> requests{0};
std::atomic<bool> waitsForChild{false};
std::atomic<int> wakeUp{-1};
timer_t outputTimer{};
std::int64_t blockedSince = 0;
std::int64_t usedBefore = 0;

static_assert(std::atomic<int>::is_always_lock_free, "a signal handler may not lock");

std::int64_t timeOf(clockid_t clock) {
  timespec now{};
  ::clock_gettime(clock, &now);
  return now.tv_sec * kSecond + now.tv_nsec;
}

void watchOutput() {
  blockedSince = timeOf(CLOCK_MONOTONIC);
  usedBefore = timeOf(CLOCK_PROCESS_CPUTIME_ID);
  const timespec tick{0, kCheckPeriod};
  const itimerspec ticks{tick, tick};
  ::timer_settime(outputTimer, 0, &ticks, nullptr);
}

extern "C" void takeRequestToEnd(int /*signal*/) {
  const int before = errno;
  const int count = ++requests;
  if (count > 2) ::_exit(static_cast<int>(ExitCode::kInterrupted));
  if (count == 2) watchOutput();
  const std::uint64_t one = 1;
  static_cast<void>(::write(wakeUp, &one, sizeof one) < 0);
  errno = before;
}

extern "C" void checkOutput(int /*signal*/) {
  const int before = errno;
  const std::int64_t now = timeOf(CLOCK_MONOTONIC);
  const std::int64_t used = timeOf(CLOCK_PROCESS_CPUTIME_ID);
  if (waitsForChild || used - usedBefore >= kWorking) {
    blockedSince = now;
  } else if (now - blockedSince >= kMaxBlocked) {
    ::_exit(static_cast<int>(ExitCode::kInterrupted));
  }
  usedBefore = used;
  errno = before;
}

bool isIgnored(int signal) {
  struct sigaction action {};
  return ::sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

[[noreturn]] void refuse() { throw std::system_error(errno, std::generic_category(), "watching for signals"); }

}  // namespace

WatchedSignals::WatchedSignals() {
  descriptor_ = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
  if (descriptor_ < 0) refuse();
  sigevent event{};
  event.sigev_notify = SIGEV_SIGNAL;
  event.sigev_signo = SIGALRM;
  if (::timer_create(CLOCK_MONOTONIC, &event, &timer_) != 0) {
    const int failure = errno;
    ::close(descriptor_);
    errno = failure;
    refuse();
  }
  requests = 0;
  wakeUp = descriptor_;
  outputTimer = timer_;
  sigset_t handled;
  sigemptyset(&handled);
  handle(SIGALRM, checkOutput);
  sigaddset(&handled, SIGALRM);
  for (const int one : kRequests) {
    if (isIgnored(one)) continue;
    handle(one, takeRequestToEnd);
    sigaddset(&handled, one);
  }
  // A parent program may have left the ends of children ignored, and then waiting for them fails.
  handle(SIGCHLD, SIG_DFL);
  // It may also have left signals blocked.
  ::sigprocmask(SIG_UNBLOCK, &handled, &maskBefore_);
  // Orphaned descendants of a child become children of this process if their guard is killed.
  ::prctl(PR_SET_CHILD_SUBREAPER, 1);
}

WatchedSignals::~WatchedSignals() {
  ::prctl(PR_SET_CHILD_SUBREAPER, 0);
  ::timer_delete(timer_);
  restore();
  ::close(descriptor_);
}

void WatchedSignals::handle(int signal, void (*handler)(int)) {
  struct sigaction action {};
  action.sa_handler = handler;
  action.sa_flags = SA_RESTART;
  for (const int one : kRequests) sigaddset(&action.sa_mask, one);
  sigaddset(&action.sa_mask, SIGALRM);
  Replaced one{signal, {}};
  if (::sigaction(signal, &action, &one.before) == 0) replaced_.push_back(one);
}

void WatchedSignals::drain() const {
  std::uint64_t count = 0;
  static_cast<void>(::read(descriptor_, &count, sizeof count) < 0);
}

int WatchedSignals::requestsToEnd() const { return requests; }

void WatchedSignals::wait(std::chrono::nanoseconds time) const {
  const auto end = std::chrono::steady_clock::now() + time;
  while (requestsToEnd() == 0) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - std::chrono::steady_clock::now());
    if (left.count() <= 0) return;
    pollfd watched{descriptor_, POLLIN, 0};
    ::poll(&watched, 1, static_cast<int>(std::min<std::int64_t>(left.count(), kLongestPoll)));
    drain();
  }
}

void WatchedSignals::restore() const {
  for (const Replaced& one : replaced_) ::sigaction(one.signal, &one.before, nullptr);
  ::sigprocmask(SIG_SETMASK, &maskBefore_, nullptr);
}

WaitForChild::WaitForChild() { waitsForChild = true; }

WaitForChild::~WaitForChild() { waitsForChild = false; }

}  // namespace quazor
