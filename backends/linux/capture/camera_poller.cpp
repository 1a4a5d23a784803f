#include "backends/linux/capture/camera_poller.h"

#include "backends/linux/system/linux_error.h"

#include <pthread.h>

#include <algorithm>
#include <cerrno>
#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <system_error>
#include <utility>

namespace quazor {

// Shared with the thread, which outlives the poller if it runs the poller's destructor.
struct CameraPoller::State {
  explicit State(std::shared_ptr<V4l2Api> videoKernel) : kernel(std::move(videoKernel)) {}
  State(const State&) = delete;
  State& operator=(const State&) = delete;
  ~State() {
    if (event >= 0) kernel->close(event);
  }

  using Streams = std::vector<std::shared_ptr<PolledStream>>;

  void run();
  int waitForEvents(std::unique_lock<std::mutex>& lock, std::vector<pollfd>& polled, const Streams& watched);
  void endAll(std::unique_lock<std::mutex>& lock, const Streams& watched, int number);
  void serve(std::unique_lock<std::mutex>& lock, const std::shared_ptr<PolledStream>& stream,
             std::span<const pollfd> polled);
  bool isAdded(const PolledStream* stream) const {
    return std::ranges::any_of(streams, [stream](const auto& one) { return one.get() == stream; });
  }

  const std::shared_ptr<V4l2Api> kernel;
  int event = -1;  // wakes the thread; set before the thread starts

  std::mutex mutex;  // guards the members below
  std::condition_variable changed;
  Streams streams;
  bool ended = false;
  bool waiting = false;     // the thread is in poll()
  std::uint64_t waits = 0;  // the number of completed waits
  const PolledStream* served = nullptr;
};

void CameraPoller::State::run() {
  std::unique_lock lock(mutex);
  while (!ended) {
    Streams watched = streams;
    std::vector<pollfd> polled{{event, POLLIN, 0}};
    std::vector<std::size_t> begins;
    for (const auto& stream : watched) {
      begins.push_back(polled.size());
      stream->watch(polled);
    }
    begins.push_back(polled.size());
    if (const int failure = waitForEvents(lock, polled, watched); failure != 0) {
      endAll(lock, watched, failure);
      watched.clear();
      continue;
    }
    for (std::size_t i = 0; i < watched.size(); ++i) {
      if (isAdded(watched[i].get())) {
        serve(lock, watched[i], std::span(polled).subspan(begins[i], begins[i + 1] - begins[i]));
      }
    }
    lock.unlock();
    watched.clear();  // may destroy streams
    lock.lock();
  }
}

int CameraPoller::State::waitForEvents(std::unique_lock<std::mutex>& lock, std::vector<pollfd>& polled,
                                       const Streams& watched) {
  std::optional<std::chrono::nanoseconds> until;
  for (const auto& stream : watched) {
    const auto deadline = stream->deadline();
    if (deadline && (!until || *deadline < *until)) until = deadline;
  }
  waiting = true;
  lock.unlock();
  std::chrono::nanoseconds timeout(-1);
  if (until) timeout = std::max(std::chrono::nanoseconds(0), *until - kernel->now());
  const int result = kernel->poll(polled, timeout);
  if (polled.front().revents != 0) kernel->clearEvent(event);
  lock.lock();
  waiting = false;
  ++waits;
  changed.notify_all();
  return result < 0 ? -result : 0;
}

// Ends the streams that were watched: the next wait would fail at once, over and over.
void CameraPoller::State::endAll(std::unique_lock<std::mutex>& lock, const Streams& watched, int number) {
  for (const auto& stream : watched) {
    if (!isAdded(stream.get())) continue;
    std::erase(streams, stream);
    served = stream.get();
    lock.unlock();
    stream->onPollFailed(number);
    lock.lock();
    served = nullptr;
    changed.notify_all();
  }
  changed.wait(lock, [this] { return ended || !streams.empty(); });
}

void CameraPoller::State::serve(std::unique_lock<std::mutex>& lock, const std::shared_ptr<PolledStream>& stream,
                                std::span<const pollfd> polled) {
  served = stream.get();
  lock.unlock();
  const bool goesOn = stream->serve(polled);
  lock.lock();
  served = nullptr;
  if (!goesOn) std::erase(streams, stream);
  changed.notify_all();
}

CameraPoller::CameraPoller(std::shared_ptr<V4l2Api> kernel) : state_(std::make_shared<State>(std::move(kernel))) {}

CameraPoller::~CameraPoller() {
  State::Streams left;  // destroyed without the lock
  {
    const std::lock_guard lock(state_->mutex);
    state_->ended = true;
    left.swap(state_->streams);
    state_->changed.notify_all();
  }
  if (!thread_.joinable()) return;
  state_->kernel->signalEvent(state_->event);
  if (thread_.get_id() == std::this_thread::get_id()) {
    thread_.detach();
  } else {
    thread_.join();
  }
}

bool CameraPoller::add(std::shared_ptr<PolledStream> stream, DiagnosticErrorPtr* error) {
  const std::lock_guard lock(state_->mutex);
  if (!thread_.joinable() && !begin(error)) return false;
  state_->streams.push_back(std::move(stream));
  state_->changed.notify_all();
  state_->kernel->signalEvent(state_->event);
  return true;
}

bool CameraPoller::begin(DiagnosticErrorPtr* error) {
  if (state_->event < 0) state_->event = state_->kernel->makeEvent();
  if (state_->event < 0) {
    failSystemCall(error, "eventfd", "the capture device's thread", -state_->event);
    return false;
  }
  try {
    thread_ = std::thread([state = state_] { state->run(); });
  } catch (const std::system_error& problem) {
    failSystemCall(error, "pthread_create", "the capture device's thread", problem.code().value());
    return false;
  }
  ::pthread_setname_np(thread_.native_handle(), "quazor-capture");
  return true;
}

void CameraPoller::remove(const PolledStream& stream) {
  std::unique_lock lock(state_->mutex);
  std::erase_if(state_->streams, [&stream](const auto& one) { return one.get() == &stream; });
  if (thread_.get_id() == std::this_thread::get_id() || !thread_.joinable()) return;
  // poll() keeps the devices of its descriptors in use. Later calls of poll() no longer include them.
  if (state_->waiting) {
    state_->kernel->signalEvent(state_->event);
    state_->changed.wait(lock, [this, waits = state_->waits] { return state_->waits != waits; });
  }
  state_->changed.wait(lock, [this, &stream] { return state_->served != &stream; });
}

}  // namespace quazor
