// A fake video driver, and a machine with its nodes, for the tests of the capture service.
//
// Behaves like real drivers were observed to: it silently replaces a frame rate that it does not support, keeps
// a queue busy until every buffer is unmapped, provides fewer buffers than requested, and stamps frames in the future.
#pragma once

#include "backends/linux/media/media_graph.h"
#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "tests/support/fake_media.h"

#include <linux/v4l2-subdev.h>
#include <linux/videodev2.h>

#include <atomic>
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
  std::int64_t minimum = 0;
  std::int64_t maximum = 255;
  std::int64_t value = 0;
  std::uint32_t type = V4L2_CTRL_TYPE_INTEGER;
  std::uint32_t flags = 0;
  int describeProblem = 0;              // an error number of VIDIOC_QUERY_EXT_CTRL
  std::optional<std::int64_t> stuck{};  // the value that the driver sets whatever is requested
};

struct FakeSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::vector<FrameInterval> intervals;
};

struct FakeFormat {
  std::uint32_t fourcc = 0;
  std::string description;
  std::vector<FakeSize> sizes;
  std::uint32_t busCode = 0;  // of the pads from which frames of the format can come
};

// One node. Tests set the members above the blank line; the driver sets those below.
struct FakeNode {
  std::string path;
  std::string driver = "fake";
  std::string card = "fake camera";
  std::string bus;
  std::string device;                         // its folder below /sys/devices; empty: none
  std::optional<std::uint32_t> usbInterface;  // of that device
  std::uint32_t capabilities = V4L2_CAP_VIDEO_CAPTURE | V4L2_CAP_STREAMING;
  std::vector<FakeFormat> formats;
  std::vector<FakeControl> controls;
  std::uint32_t mostBuffers = 32;
  std::uint32_t planes = 2;  // of each buffer of a multi-planar node
  bool hasIntervals = true;
  bool isSubdevice = false;          // with controls, and with pads if it belongs to an entity
  std::optional<FakeMedia> media{};  // of a media controller, which has nothing else
  std::uint32_t timestampFlags = V4L2_BUF_FLAG_TIMESTAMP_MONOTONIC;
  std::uint32_t firstSequence = 0;
  std::chrono::nanoseconds stampedAhead{0};          // the difference between a frame's time stamp and its delivery
  std::chrono::nanoseconds metadataStampedAhead{0};  // the same for its metadata, relative to the frame
  std::string metadataNode;                          // its path: receives a buffer with each frame of this node
  std::vector<std::uint8_t> metadata;                // the content of that buffer
  bool delivers = true;
  int openProblem = 0;  // an error number
  v4l2_meta_format metadataFormat{v4l2_fourcc('F', 'A', 'K', 'E'), 64};

  v4l2_pix_format format{};
  FrameInterval interval{1, 5};
  int owner = -1;  // the descriptor that requested the buffers
  std::uint32_t buffers = 0;
  int mapped = 0;
  bool streaming = false;
  bool gone = false;
  bool broken = false;
  int opened = 0;
  int queried = 0;  // how often it was opened for queries only
  int lockedBy = -1;
  std::deque<std::uint32_t> queued;
  std::deque<v4l2_buffer> filled;
  std::uint32_t sequence = 0;
  std::chrono::nanoseconds nextFrame{0};
  std::vector<std::string> history;  // the controls that were set, STREAMON and STREAMOFF
};

// Thread: any.
class FakeV4l2Api : public V4l2Api {
 public:
  FakeV4l2Api();
  ~FakeV4l2Api() override;

  // The device directories of the machine, which exist during the lifetime of this object.
  const DeviceRoots& roots() const { return roots_; }
  // Adds /dev/video<number> and returns its path.
  std::string add(int number, FakeNode node);
  // The same for /dev/v4l-subdev<number> and /dev/media<number>. The entities name the paths of their device files.
  std::string addSubdevice(int number, FakeNode node);
  std::string addMedia(int number, FakeMedia media);
  // Calls `look` with the node while nothing changes.
  template <class Look>
  auto with(const std::string& path, Look&& look) {
    const std::lock_guard lock(mutex_);
    return look(nodes_.at(path));
  }

  // Makes the request fail `times` times on that node, after `after` successful calls.
  void failNext(const std::string& path, unsigned long request, int number, int times = 1, int after = 0);
  // Called before each open(), on the same thread. Set it while there are no calls.
  std::function<void(const std::string& path)> beforeOpen;
  // Called before each call of a driver, on the same thread. Set it while there are no calls.
  std::function<void(unsigned long request)> beforeCall;
  // Called after each successful call, and may change its answer. Set it while there are no calls.
  std::function<void(unsigned long request, void* argument)> afterCall;
  int failNextMaps = 0;              // with ENOMEM
  int mapsBeforeFailure = 0;         // that succeed before those
  int makeEventProblem = 0;          // an error number
  int guardProblem = 0;              // an error number
  std::atomic<int> pollProblem = 0;  // an error number
  std::atomic<int> failedPolls = 0;

  // Fills one buffer now. Without a queued buffer the frame is lost, and its number is skipped.
  void produce(const std::string& path, std::uint32_t flags = 0);
  // Skips that many frame numbers.
  void skip(const std::string& path, std::uint32_t frames);
  // Removes the device. It is present again after its last descriptor was closed.
  void disconnect(const std::string& path);
  // Makes the stream fail permanently until it is stopped.
  void breakStream(const std::string& path);
  // Advances the time: streaming cameras deliver frames at their rate, and all of them are dequeued.
  void passTime(std::chrono::nanoseconds duration);
  // Waits until all delivered buffers have been dequeued and all pollers wait. Returns false after some seconds.
  bool settle();

  // True if nothing is open, mapped, requested, streaming, locked or guarded.
  bool isIdle();
  int guards();
  std::uint64_t pollsWithoutEffect() const { return pollsWithoutEffect_; }

  int open(const std::string& path) override;
  int openForQueries(const std::string& path) override;
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
  std::unique_ptr<ControlGuard> guardControls(const std::string& path, int descriptor,
                                              const std::vector<ControlValue>& off, int* number) override;

 private:
  class Guard;
  struct Fault {
    int number = 0;
    int times = 0;
    int after = 0;
  };
  struct Mapping {
    std::string path;
    std::int64_t offset = 0;
    std::vector<std::uint8_t> memory;
  };
  struct FakePlace {
    FakeMedia* media = nullptr;
    FakeEntity* entity = nullptr;
  };

  int call(FakeNode& node, int descriptor, unsigned long request, void* argument);
  int format(FakeNode& node, bool sets, v4l2_format& format) const;
  static int requestBuffers(FakeNode& node, int descriptor, v4l2_requestbuffers& request);
  static int queryBuffer(const FakeNode& node, v4l2_buffer& buffer);
  static int queue(FakeNode& node, const v4l2_buffer& buffer);
  static int dequeue(FakeNode& node, v4l2_buffer& buffer);
  bool isFree(const FakeNode& node, std::int64_t offset) const;
  void makeDeviceFile(const std::string& name, std::uint32_t minor);
  FakePlace placeOf(const std::string& path);
  int mediaCall(FakeNode& node, unsigned long request, void* argument);
  int topology(const FakeMedia& media, media_v2_topology& asked) const;
  int setUpLink(FakeNode& node, const media_link_desc& wanted);
  int subdeviceCall(FakeNode& node, int descriptor, unsigned long request, void* argument);
  int padFormat(FakeNode& node, FakeEntity& entity, int descriptor, bool sets, v4l2_subdev_format& format);
  int streamProblem(const FakeNode& camera);
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
  std::map<std::string, std::uint32_t> minors_;  // of device files, by path
  std::map<int, FakeEntity> tried_;              // what was tried on a sub-device, by descriptor
  std::map<int, std::string> descriptors_;
  std::map<int, bool> events_;
  std::map<void*, Mapping> mappings_;
  std::map<std::pair<std::string, unsigned long>, Fault> faults_;
  int lastDescriptor_ = 99;
  int polling_ = 0;
  int guards_ = 0;
  std::uint64_t pollsWithoutEffect_ = 0;  // calls that returned at once because of an unusable descriptor
};

// The four characters of a pixel format.
constexpr std::uint32_t fakeCode(char a, char b, char c, char d) { return v4l2_fourcc(a, b, c, d); }

// A camera with the formats YUYV and GREY: 640x360 at 5, 25, 30 and 40 per second, and 640x480 at up to 25.
FakeNode fakeCamera(const std::string& bus);
// The same with the formats NM12 and NM16, whose frames have two planes.
FakeNode fakeMultiplanarCamera(const std::string& bus);
// A metadata node at the same bus.
FakeNode fakeMetadata(const std::string& bus);

bool isMetadata(const FakeNode& node);
bool isMultiplanar(const FakeNode& node);
// V4L2_BUF_TYPE_...
std::uint32_t bufferTypeOf(const FakeNode& node);

}  // namespace quazor
