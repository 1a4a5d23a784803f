// A user of one stream who records frames and events, for the tests of this folder.
#pragma once

#include "backends/simulated/capture/frame_metadata.h"
#include "backends/simulated/phone_for_tests.h"
#include "platform/pixel_buffer.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Has control of the stream of the third camera of smallScenario(), whose output is enabled and has handlers. The
// recorded data can be read on any thread; handlers run on the phone's threads.
class StreamUser {
 public:
  struct Frame {
    std::chrono::nanoseconds arrived{0};  // on the phone's clock
    MediaTime time;
    std::optional<Value> metadata;
  };
  struct Event {
    std::chrono::nanoseconds arrived{0};
    std::int32_t number = 0;
    MediaTime time;

    friend bool operator==(const Event&, const Event&) = default;
  };

  explicit StreamUser(const SimulatedPhone& phone) : user(phone), clock_(phone.platform().clock) {
    frameHandler_ =
        std::make_shared<PixelBufferHandler>([this](PixelBuffer& buffer, MediaTime time) { takeFrame(buffer, time); });
    auto events = std::make_shared<EventHandler>([this](std::int32_t number, MediaTime time, const Value* info) {
      const std::lock_guard lock(mutex_);
      if (info == nullptr) events_.push_back({clock_->now(), number, time});
    });
    user.control({user.streams[2]});
    set("VideoOutputsEnabled", Dictionary{{"PrimaryScaler", true}});
    set("VideoOutputHandlers",
        Dictionary{{"PrimaryScaler", Dictionary{{"PixelBufferHandler", frameHandler_}, {"EventHandler", events}}}});
  }
  ~StreamUser() { static_cast<void>(user.device->invalidate(nullptr)); }

  CaptureStream& stream() const { return *user.streams[2]; }
  bool set(std::string_view key, const Value& value) { return stream().setValue(value, key, nullptr); }
  bool start() { return stream().start(nullptr); }
  bool stop() { return stream().stop(nullptr); }

  std::vector<Frame> frames() const {
    const std::lock_guard lock(mutex_);
    return frames_;
  }
  std::vector<Event> events() const {
    const std::lock_guard lock(mutex_);
    return events_;
  }
  // The numbers of the frames, from 0, derived from their presentation times at 30 frames per second.
  std::vector<std::uint64_t> numbers() const {
    std::vector<std::uint64_t> numbers;
    for (const Frame& frame : frames()) numbers.push_back(numberOf(frame.time));
    return numbers;
  }
  // The default texts of the frames' metadata.
  std::vector<std::string> metadata() const {
    std::vector<std::string> texts;
    for (const Frame& frame : frames()) texts.push_back(defaultText(frame.metadata));
    return texts;
  }
  // The buffers of the frames in `keep`, each with an additional reference.
  std::vector<PixelBuffer*> kept() const {
    const std::lock_guard lock(mutex_);
    return kept_;
  }
  std::weak_ptr<Object> handler() const { return frameHandler_; }
  void forgetHandlers() { frameHandler_ = nullptr; }

  PhoneUser user;
  // Set these while no frame arrives: the numbers of frames whose buffers are kept, and an additional action of the
  // handlers.
  std::set<std::uint64_t> keep;
  std::function<void()> onFrame;

 private:
  static std::uint64_t numberOf(MediaTime time) {
    return static_cast<std::uint64_t>(std::llround(time.seconds() * 30)) - 1;
  }

  void takeFrame(PixelBuffer& buffer, MediaTime time) {
    {
      const std::lock_guard lock(mutex_);
      frames_.push_back({clock_->now(), time, buffer.attachment(capture_key::MetadataDictionary)});
      if (keep.contains(numberOf(time))) {
        buffer.retain();
        kept_.push_back(&buffer);
      }
    }
    if (onFrame) onFrame();
  }

  const std::shared_ptr<Clock> clock_;
  std::shared_ptr<PixelBufferHandler> frameHandler_;
  mutable std::mutex mutex_;  // guards the members below
  std::vector<Frame> frames_;
  std::vector<Event> events_;
  std::vector<PixelBuffer*> kept_;
};

}  // namespace quazor
