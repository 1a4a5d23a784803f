// CameraPoller: the thread of a capture device that waits for the descriptors of its streams.
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

// A stream served by the thread. Calls do not overlap and are made only while the stream is added.
// Thread: the poller's.
class PolledStream {
 public:
  PolledStream() = default;
  PolledStream(const PolledStream&) = delete;
  PolledStream& operator=(const PolledStream&) = delete;
  virtual ~PolledStream() = default;

  // Appends the descriptors to wait for.
  virtual void watch(std::vector<pollfd>& descriptors) const = 0;
  // When to call serve() even without an event; nothing: never.
  virtual std::optional<std::chrono::nanoseconds> deadline() const = 0;
  // Handles events; `polled` contains the descriptors of watch() with their results. May remove this and other streams.
  // Returns false if there is nothing left to wait for: the stream is then removed.
  virtual bool serve(std::span<const pollfd> polled) = 0;
  // The wait itself failed with this error number. The stream is removed.
  virtual void onPollFailed(int number) = 0;
};

// The thread starts with the first stream and ends with the poller.
// Thread: any.
class CameraPoller final {
 public:
  explicit CameraPoller(std::shared_ptr<V4l2Api> kernel);
  CameraPoller(const CameraPoller&) = delete;
  CameraPoller& operator=(const CameraPoller&) = delete;
  // May run on the poller's own thread.
  ~CameraPoller();

  bool add(std::shared_ptr<PolledStream> stream, DiagnosticErrorPtr* error);
  // After the return the stream is no longer served and its descriptors can be closed. Does not wait for a serve() on
  // the calling thread.
  void remove(const PolledStream& stream);

 private:
  struct State;

  bool begin(DiagnosticErrorPtr* error);

  const std::shared_ptr<State> state_;
  std::thread thread_;  // guarded by the state's mutex
};

}  // namespace quazor
