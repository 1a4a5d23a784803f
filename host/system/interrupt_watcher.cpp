#include "host/system/interrupt_watcher.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

bool interruptsAreIgnored() {
  struct sigaction action {};
  return sigaction(SIGINT, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

}  // namespace

InterruptWatcher::InterruptWatcher(std::function<void()> interrupted) {
  if (interruptsAreIgnored()) return;
  sigset_t interrupts;
  sigemptyset(&interrupts);
  sigaddset(&interrupts, SIGINT);
  signals_ = signalfd(-1, &interrupts, SFD_CLOEXEC);
  stop_ = eventfd(0, EFD_CLOEXEC);
  if (signals_ < 0 || stop_ < 0) throw std::system_error(errno, std::generic_category(), "watching for interrupts");
  pthread_sigmask(SIG_BLOCK, &interrupts, &maskBefore_);
  thread_ = std::thread([this, interrupted = std::move(interrupted)] { watch(interrupted); });
}

InterruptWatcher::~InterruptWatcher() {
  if (!thread_.joinable()) return;
  const std::uint64_t one = 1;
  while (::write(stop_, &one, sizeof one) < 0 && errno == EINTR) {
  }
  thread_.join();
  ::close(signals_);
  ::close(stop_);
  pthread_sigmask(SIG_SETMASK, &maskBefore_, nullptr);
}

void InterruptWatcher::watch(const std::function<void()>& interrupted) const {
  pollfd watched[] = {{signals_, POLLIN, 0}, {stop_, POLLIN, 0}};
  while (::poll(watched, 2, -1) < 0) {
    if (errno != EINTR) return;
  }
  if ((watched[0].revents & POLLIN) == 0) return;
  signalfd_siginfo taken;
  if (::read(signals_, &taken, sizeof taken) != sizeof taken) return;
  interrupted();
}

}  // namespace quazor
