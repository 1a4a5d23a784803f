// A fake video driver, and a machine that has its nodes, for the tests of the capture service.
//
// It does what real drivers were seen to do: takes a frame rate that it does not have and silently gives another, keeps
// a queue busy until every buffer is unmapped, gives fewer buffers than were asked for, stamps frames in the future.
#pragma once

#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"

#include <linux/videodev2.h>

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <filesystem>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace quazor {

struct FakeControl {
  std::uint32_t id = 0;
  std::string name;
  std::int64_t lowest = 0;
  std::int64_t highest = 255;
  std::int64_t value = 0;
  std::uint32_t type = V4L2_CTRL_TYPE_INTEGER;
  std::uint32_t flags = 0;
};

struct FakeSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::vector<FrameInterval> intervals;
};

struct FakeFormat {
  std::uint32_t code = 0;
  std::string text;
  std::vector<FakeSize> sizes;
};

// One node. What is above the line is for tests to fill; below it, what the driver made of it.
struct FakeNode {
  std::string path;
  std::string driver = "fake";
  std::string card = "fake camera";
  std::string bus;
  std::uint32_t capabilities = V4L2_CAP_VIDEO_CAPTURE | V4L2_CAP_STREAMING;
  std::vector<FakeFormat> formats;
  std::vector<FakeControl> controls;
  std::uint32_t mostBuffers = 32;
  std::uint32_t timestampFlags = V4L2_BUF_FLAG_TIMESTAMP_MONOTONIC;
  std::uint32_t firstSequence = 0;
  std::chrono::nanoseconds stampedAhead{0};  // by how much a frame's stamp lies behind its delivery
  std::string metadataNode;                  // its path: gets a buffer with each frame of this one
  std::vector<std::uint8_t> metadata;        // what that buffer holds
  bool delivers = true;
  int openProblem = 0;  // an error number

  v4l2_pix_format format{};
  FrameInterval interval{1, 5};
  int owner = -1;  // the descriptor that requested the buffers
  std::uint32_t buffers = 0;
  int mapped = 0;
  bool streaming = false;
  bool gone = false;
  bool broken = false;
  int opened = 0;
  int lockedBy = -1;
  std::deque<std::uint32_t> queued;
  std::deque<v4l2_buffer> filled;
  std::uint32_t sequence = 0;
  std::chrono::nanoseconds nextFrame{0};
  std::vector<std::string> history;  // controls that were set, STREAMON and STREAMOFF
};

// Thread: any.
class FakeV4l2Api : public V4l2Api {
 public:
  FakeV4l2Api();
  ~FakeV4l2Api() override;

  // The machine's device folders, which exist for as long as this does.
  const DeviceRoots& roots() const { return roots_; }
  // Adds /dev/video<number>; returns its path.
  std::string add(int number, FakeNode node);
  // Runs `look` on the node while nothing changes.
  template <class Look>
  auto with(const std::string& path, Look&& look) {
    const std::lock_guard lock(mutex_);
    return look(nodes_.at(path));
  }

  // The request fails `times` times on that node, after `after` times at which it did not.
  void failNext(const std::string& path, unsigned long request, int number, int times = 1, int after = 0);
  // Called, on its thread, before each call to a driver; to be set while none is made.
  std::function<void(unsigned long request)> beforeCall;
  int failNextMaps = 0;      // with ENOMEM
  int makeEventProblem = 0;  // an error number
  int guardProblem = 0;      // an error number

  // Fills one buffer now. A frame for which there is no buffer is lost, and its number with it.
  void produce(const std::string& path, std::uint32_t flags = 0);
  // Frame numbers go on as if so many frames had been.
  void skip(const std::string& path, std::uint32_t frames);
  // The device is removed. It is back when its last descriptor is closed.
  void disconnect(const std::string& path);
  // The stream fails for good until it is stopped.
  void breakStream(const std::string& path);
  // Lets the time pass: cameras that stream deliver at their rate, and what is delivered is taken.
  void passTime(std::chrono::nanoseconds duration);
  // Waits until everything that was delivered has been taken and all who poll wait. False after some seconds.
  bool settle();

  // Nothing open, mapped, requested, streaming, locked or guarded.
  bool isIdle();
  int guards();
  std::uint64_t pollsWithoutEffect() const { return pollsWithoutEffect_; }

  int open(const std::string& path) override;
  void close(int descriptor) override;
  int lock(int descriptor) override;
  int ioctl(int descriptor, unsigned long request, void* argument) override;
  int map(int descriptor, std::size_t length, std::int64_t offset, void** address) override;
  void unmap(void* address, std::size_t length) override;
  int poll(std::span<pollfd> descriptors, std::chrono::nanoseconds timeout) override;
  int makeEvent() override;
  void signalEvent(int event) override;
  void clearEvent(int event) override;
  std::chrono::nanoseconds now() override;
  std::unique_ptr<ControlGuard> guardControls(const std::string& path, const std::vector<ControlValue>& off,
                                              int* number) override;

 private:
  class Guard;
  struct Fault {
    int number = 0;
    int times = 0;
    int after = 0;
  };
  struct Mapping {
    std::string path;
    std::vector<std::uint8_t> memory;
  };

  int call(FakeNode& node, int descriptor, unsigned long request, void* argument);
  int format(FakeNode& node, bool sets, v4l2_format& format) const;
  int requestBuffers(FakeNode& node, int descriptor, v4l2_requestbuffers& request);
  int dequeue(FakeNode& node, v4l2_buffer& buffer);
  int enumerate(const FakeNode& node, unsigned long request, void* argument) const;
  int control(FakeNode& node, bool sets, v4l2_ext_controls& list);
  void fill(FakeNode& node, std::chrono::nanoseconds timestamp, std::uint32_t flags);
  void produceLocked(FakeNode& node, std::uint32_t flags);
  short eventsOf(int descriptor);
  bool isSettled();
  bool faulty(const FakeNode& node, unsigned long request, int& number);

  DeviceRoots roots_;
  std::mutex mutex_;
  std::condition_variable changed_;
  std::chrono::nanoseconds now_ = std::chrono::seconds(1000);
  std::map<std::string, FakeNode> nodes_;
  std::map<int, std::string> descriptors_;
  std::map<int, bool> events_;
  std::map<void*, Mapping> mappings_;
  std::map<std::pair<std::string, unsigned long>, Fault> faults_;
  int lastDescriptor_ = 99;
  int polling_ = 0;
  int guards_ = 0;
  std::uint64_t pollsWithoutEffect_ = 0;  // that returned at once for a descriptor that is dead
};

// Four characters of a pixel format.
constexpr std::uint32_t fakeCode(char a, char b, char c, char d) { return v4l2_fourcc(a, b, c, d); }

// A camera with the formats YUYV and GREY: 640x360 at 5, 25, 30 and 40 per second, and 640x480 at up to 25.
FakeNode fakeCamera(const std::string& bus);
// A metadata node at the same place.
FakeNode fakeMetadata(const std::string& bus);

}  // namespace quazor
