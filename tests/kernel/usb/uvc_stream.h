// UvcStream: the streaming interface of a camera, which negotiates a mode and makes payloads at its pace.
#pragma once

#include "contract/value.h"
#include "tests/kernel/usb/usb_gadget.h"
#include "tests/kernel/usb/uvc_config.h"

#include <cstdint>
#include <optional>
#include <span>

namespace quazor {

// Thread: one.
class UvcStream {
 public:
  using Time = UsbGadget::Time;

  explicit UvcStream(const UvcCameraConfig& config);

  // Answers a request to the interface. What is committed is streamed by the next start().
  ControlAnswer answer(const SetupPacket& setup, std::span<const std::uint8_t> sent);
  bool isCommitted() const { return committed_; }

  // The first frame follows after its interval.
  void start(Time now);
  void stop();
  bool isStreaming() const { return streaming_; }
  // The frames that were sent since the start, whole ones and those with faults.
  std::uint64_t frames() const { return number_; }

  // The next payload with at most that many bytes, if there is one at that time.
  std::optional<Bytes> payload(Time at, std::size_t room);
  // From when on there is one; nothing: never again.
  std::optional<Time> nextPayload() const;

 private:
  struct Mode {
    std::size_t format = 0;
    std::size_t frame = 0;
    std::uint32_t rate = 0;
  };

  static bool hits(std::uint64_t every, std::uint64_t number) { return every > 0 && number % every == every - 1; }
  Mode defaultMode(std::size_t format, std::size_t frame) const;
  Mode nearestMode(std::span<const std::uint8_t> wanted) const;
  Bytes textOf(const Mode& mode) const;
  std::uint32_t bytesOf(const Mode& mode) const;
  std::uint32_t payloadSizeOf(const Mode& mode) const;
  Time frameTime() const;
  void addHeader(Bytes& payload, Time at, bool isLast) const;

  const std::vector<UvcFormat> formats_;
  const bool isBulk_;
  const UvcFaults faults_;
  Mode probed_;
  Mode mode_;
  bool committed_ = false;
  bool streaming_ = false;
  Time began_{0};
  std::uint64_t number_ = 0;  // of the frame that is being sent
  std::uint32_t sent_ = 0;    // its bytes
};

}  // namespace quazor
