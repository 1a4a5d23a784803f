// CameraPoller: the one thread of a capture device that waits for its streams' descriptors.
#pragma once

#include "backends/linux/video/v4l2_api.h"
#include "contract/diagnostic_error.h"

#include <chrono>
#include <memory>
#include <optional>
#include <span>
#include <thread>
#include <vector>

namespace quazor {

// What is served by the thread. Its calls come one at a time, and only while it is added.
// Thread: the poller's.
class PolledStream {
 public:
  PolledStream() = default;
  PolledStream(const PolledStream&) = delete;
  PolledStream& operator=(const PolledStream&) = delete;
  virtual ~PolledStream() = default;

  // Adds what to wait for.
  virtual void watch(std::vector<pollfd>& descriptors) const = 0;
  // When it wants to be served though nothing happened; nothing: never.
  virtual std::optional<std::chrono::nanoseconds> deadline() const = 0;
  // Serves what happened; `polled` is what watch() added, with the results. May remove itself and others. False when
  // there is no more to wait for: the stream is removed then.
  virtual bool serve(std::span<const pollfd> polled) = 0;
};

// The thread begins with the first stream and ends with the poller.
// Thread: any.
class CameraPoller final {
 public:
  explicit CameraPoller(std::shared_ptr<V4l2Api> kernel);
  CameraPoller(const CameraPoller&) = delete;
  CameraPoller& operator=(const CameraPoller&) = delete;
  // May be called on the thread itself, by what it serves.
  ~CameraPoller();

  bool add(std::shared_ptr<PolledStream> stream, DiagnosticErrorPtr* error);
  // When it returns, the stream is not served any more and its descriptors are not waited for, so they can be closed.
  // What serves on this very thread is not waited for.
  void remove(const PolledStream& stream);

 private:
  struct State;

  bool begin(DiagnosticErrorPtr* error);

  const std::shared_ptr<State> state_;
  std::thread thread_;  // guarded by the state's mutex
};

}  // namespace quazor
