// A machine with four fake cameras and a user of their capture device, for the tests of this folder.
#pragma once

#include "backends/linux/capture/linux_capture.h"
#include "backends/linux/system/linux_error.h"
#include "contract/log_channel.h"
#include "contract/message_format.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"
#include "tests/support/fake_v4l2_api.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

inline constexpr std::uint32_t kStrobe = V4L2_CID_FLASH_LED_MODE;
inline constexpr std::uint32_t kPower = V4L2_CID_FLASH_TORCH_INTENSITY;

// The result of a call with an error out-argument: "done", or the code and message of the error.
template <class Call>
std::string outcome(Call&& call) {
  DiagnosticErrorPtr error;
  if (static_cast<bool>(call(&error))) return error == nullptr ? "done" : "done, with an error";
  return error == nullptr ? "no error" : std::to_string(error->code()) + " " + error->localizedDescription();
}

// A backend of the log that keeps the lines. Thread: any.
class LogLines final : public LogBackend {
 public:
  void write(LogLevel, std::string_view, std::string_view, std::string_view text) override {
    const std::lock_guard lock(mutex_);
    lines_.emplace_back(text);
  }
  std::vector<std::string> lines() const {
    const std::lock_guard lock(mutex_);
    return lines_;
  }

 private:
  mutable std::mutex mutex_;
  std::vector<std::string> lines_;  // guarded by mutex_
};

inline std::string text(std::string_view key) { return std::string(key); }

// Binds the back camera ports to buses fake:0 to fake:2 and the infrared port, with a projector and a metadata node, to
// fake:3. All frames are 640 x 360.
inline Binding fakeBinding() {
  Binding binding;
  int bus = 0;
  for (const std::string_view port : {port_type::BackFacingCamera, port_type::BackFacingTelephotoCamera,
                                      port_type::BackFacingSuperWideCamera, port_type::FrontFacingInfraredCamera}) {
    CameraBinding camera;
    camera.port = port;
    camera.node.busInfo = "fake:" + std::to_string(bus++);
    camera.width = 640;
    camera.height = 360;
    binding.cameras.push_back(std::move(camera));
  }
  binding.groups = {
      {{binding.cameras[0].port, binding.cameras[1].port, binding.cameras[2].port}, binding.cameras[0].port}};
  CameraBinding& infrared = binding.cameras[3];
  infrared.projector = ProjectorBinding{{{"Strobe", 1}}, {{"Strobe", 0}}, {}, {}, "Power"};
  infrared.metadata.node = infrared.node;
  infrared.metadata.fields = {{"Lit", 0, 1, 0, {}}};
  infrared.metadata.constants = Dictionary{{"Fixed", 7}};
  return binding;
}

class FakeCameras {
 public:
  // `make` makes the node of the camera at a bus.
  explicit FakeCameras(Binding used = fakeBinding(), FakeNode (*make)(const std::string& bus) = &fakeCamera)
      : binding(std::move(used)) {
    for (int i = 0; i < 4; ++i) {
      FakeNode node = make("fake:" + std::to_string(i));
      if (i == 3) {
        node.controls = {{kStrobe, "Strobe", 0, 2, 2}, {kPower, "Power", 0, 100, 5}};
        node.metadata = {1, 2, 3, 4};
        node.metadataNode = metadataNode = kernel->add(13, fakeMetadata("fake:3"));
      }
      nodes.push_back(kernel->add(i, std::move(node)));
    }
    open();
  }

  void open() {
    capture = makeLinuxCapture(binding, kernel, kernel->roots());
    device = capture->defaultPlugIn()->device(nullptr);
    streams = *device->streams(nullptr);
    group = device->synchronizedStreamsGroups(nullptr)->front();
  }
  CaptureStream& stream(std::size_t index) const { return *streams[index]; }
  CaptureStream& wide() const { return *streams[0]; }
  CaptureStream& infrared() const { return *streams[3]; }
  CaptureStreams backStreams() const { return {streams[0], streams[1], streams[2]}; }
  std::string take(const CaptureStreams& wanted) const {
    return outcome([&](auto* error) { return device->requestControlOfStreams(wanted, error); });
  }
  std::string take(std::size_t index) const { return take(CaptureStreams{streams[index]}); }
  std::string set(CaptureObject& object, std::string_view key, const Value& value) const {
    return outcome([&](auto* error) { return object.setValue(value, key, error); });
  }
  std::string start(std::size_t index) const {
    return outcome([&](auto* error) { return streams[index]->start(error); });
  }
  std::string stop(std::size_t index) const {
    return outcome([&](auto* error) { return streams[index]->stop(error); });
  }
  // Takes control of the stream and sets the default format and rate.
  void prepare(std::size_t index) const {
    ASSERT_EQ(take(index), "done");
    ASSERT_EQ(set(*streams[index], capture_key::FormatIndex, 0), "done");
    ASSERT_EQ(set(*streams[index], capture_key::MinimumFrameRate, 30), "done");
    ASSERT_EQ(set(*streams[index], capture_key::MaximumFrameRate, 30), "done");
  }
  void handle(std::size_t index, PixelBufferHandler::Function function) const {
    const Dictionary handlers{
        {text(capture_key::PixelBufferHandler), std::make_shared<PixelBufferHandler>(std::move(function))}};
    ASSERT_EQ(set(*streams[index], capture_key::VideoOutputsEnabled, output(true)), "done");
    ASSERT_EQ(set(*streams[index], capture_key::VideoOutputHandlers, output(handlers)), "done");
  }
  // The usual camera, started, with or without a handler.
  void begin(std::size_t index) const {
    prepare(index);
    ASSERT_EQ(start(index), "done");
  }
  void begin(std::size_t index, PixelBufferHandler::Function function) const {
    prepare(index);
    handle(index, std::move(function));
    ASSERT_EQ(start(index), "done");
  }
  // The text with the paths of the infrared camera's nodes for NODE and META.
  std::string withPaths(std::string text) const {
    if (const auto at = text.find("NODE"); at != std::string::npos) text.replace(at, 4, nodes[3]);
    if (const auto at = text.find("META"); at != std::string::npos) text.replace(at, 4, metadataNode);
    return text;
  }
  static Dictionary output(Value value) { return Dictionary{{text(capture_key::PrimaryScaler), std::move(value)}}; }
  static Dictionary light(int mode, int pattern = 0, int current = 0) {
    return Dictionary{{text(capture_key::Mode), mode},
                      {text(capture_key::StructuredLightPattern), pattern},
                      {text(capture_key::StructuredLightCurrent), current}};
  }
  // A number from ErrorCounters; -1 if it is missing.
  std::int64_t counter(std::size_t index, std::string_view name) const {
    const std::optional<Value> counters = streams[index]->valueForProperty(capture_key::ErrorCounters, nullptr);
    const Value* const number = entryOf(pointerTo(counters), name);
    return number == nullptr ? -1 : toSigned(number);
  }
  std::int64_t control(std::uint32_t id) const {
    return kernel->with(
        nodes[3], [id](const FakeNode& node) { return std::ranges::find(node.controls, id, &FakeControl::id)->value; });
  }
  void release() {
    device.reset();
    streams.clear();
    group.reset();
  }

  std::shared_ptr<FakeV4l2Api> kernel = std::make_shared<FakeV4l2Api>();
  Binding binding;
  std::vector<std::string> nodes;  // the cameras' paths
  std::string metadataNode;        // the infrared camera's
  std::shared_ptr<LinuxCapture> capture;
  std::shared_ptr<CaptureDevice> device;
  CaptureStreams streams;
  std::shared_ptr<SynchronizedStreamsGroup> group;
};

// A frame as a handler received it.
struct SeenFrame {
  std::int64_t time = 0;  // nanoseconds
  Dictionary metadata;
};

// Collects the frames that a handler receives. Thread: any.
class SeenFrames {
 public:
  PixelBufferHandler::Function handler() {
    return [this](PixelBuffer& buffer, MediaTime time) {
      const std::optional<Value> metadata = buffer.attachment(capture_key::MetadataDictionary);
      const std::lock_guard lock(mutex_);
      frames_.push_back({time.value, metadata && metadata->dictionary() ? *metadata->dictionary() : Dictionary()});
      changed_.notify_all();
    };
  }
  // Waits for that many frames, for at most a few seconds.
  std::vector<SeenFrame> wait(std::size_t count) {
    std::unique_lock lock(mutex_);
    changed_.wait_for(lock, std::chrono::minutes(1), [&] { return frames_.size() >= count; });
    return frames_;
  }

 private:
  std::mutex mutex_;
  std::condition_variable changed_;
  std::vector<SeenFrame> frames_;
};

// A test of one such machine.
class FakeCamerasTest : public testing::Test {
 protected:
  SeenFrames seen;  // outlives those that call it
  FakeCameras fake;
};

}  // namespace quazor
