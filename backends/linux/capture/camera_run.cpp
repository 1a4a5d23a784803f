#include "backends/linux/capture/camera_run.h"

#include "backends/linux/capture/camera_frames.h"
#include "backends/linux/system/linux_error.h"
#include "contract/log_channel.h"

#include <algorithm>
#include <cerrno>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

MediaTime mediaTimeOf(std::chrono::nanoseconds timestamp) {
  MediaTime time;
  time.value = timestamp.count();
  time.timescale = 1'000'000'000;
  return time;
}

// The driver of USB cameras numbers the buffers of both nodes alike, and stamps them alike only without hwtimestamps.
MetadataPairing pairingOf(const MetadataBinding& binding, const V4l2Device& camera) {
  constexpr std::string_view kUsbDriver = "uvcvideo";
  const bool isUsb = fixedText(camera.capability().driver) == kUsbDriver;
  return binding.pairing.value_or(isUsb ? MetadataPairing::kSequence : MetadataPairing::kTimestamp);
}

}  // namespace

CameraRun::CameraRun(CameraRunPlan plan, std::shared_ptr<DeliveredFrames> delivered)
    : camera_(std::move(plan.camera)),
      interval_(plan.interval),
      light_(std::move(plan.light)),
      delivered_(std::move(delivered)),
      traced_(std::move(plan.traced)),
      pairing_(pairingOf(camera_.metadata, *plan.node)),
      handler_(std::move(plan.handler)),
      node_(std::move(plan.node)),
      metadataNode_(handler_ == nullptr ? nullptr : std::move(plan.metadataNode)),
      controls_(std::move(plan.controls)) {
  if (metadataNode_ == nullptr) pairing_.endMetadata();
}

CameraRun::~CameraRun() { end(nullptr); }

bool CameraRun::begin(DiagnosticErrorPtr* error) {
  const bool begun = enableProjector(error) && prepare(error);
  if (!begun) end(nullptr);
  return begun;
}

bool CameraRun::enableProjector(DiagnosticErrorPtr* error) {
  return light_.empty() || (startGuards(error) && controls_->set(light_, error));
}

bool CameraRun::startGuards(DiagnosticErrorPtr* error) {
  std::vector<std::pair<std::shared_ptr<V4l2Device>, std::vector<ControlValue>>> off;
  for (const ControlSetting& setting : camera_.projector->off) {
    const std::optional<CameraControl> found = controls_->control(setting.control, error);
    if (!found) return false;
    auto device = std::ranges::find(off, found->device, [](const auto& one) { return one.first; });
    if (device == off.end()) device = off.insert(off.end(), {found->device, {}});
    device->second.push_back(valueFor(found->control, setting.value));
  }
  for (const auto& [device, values] : off) {
    int number = 0;
    auto guard = device->kernel().guardControls(device->path(), device->descriptor(), values, &number);
    if (guard == nullptr) {
      failSystemCall(error, "guarding the projector", device->path(), number);
      return false;
    }
    guards_.push_back(std::move(guard));
  }
  return true;
}

// Destroying the guards also switches the projector off.
bool CameraRun::disableProjector(DiagnosticErrorPtr* error) {
  if (guards_.empty()) return true;
  const bool dark = controls_->set(camera_.projector->off, error);
  guards_.clear();
  return dark;
}

bool CameraRun::prepare(DiagnosticErrorPtr* error) {
  {
    const std::lock_guard lock(mutex_);
    bound_ = BoundCounters::begin(camera_.errorCounters, *controls_, error);
    if (!bound_) return false;
  }
  if (handler_ != nullptr) {
    contents_ = CameraMetadata::make(camera_.metadata, *controls_, error);
    if (contents_ == nullptr) return false;
  }
  video_ = std::make_unique<CameraBuffers>(node_);
  if (!video_->prepare(camera_.buffers, error)) return false;
  if (metadataNode_ != nullptr) {
    metadata_ = std::make_unique<CameraBuffers>(metadataNode_);
    if (!metadata_->prepare(camera_.buffers, error) || !metadata_->streamOn(error)) return false;
  }
  return video_->streamOn(error);
}

bool CameraRun::end(DiagnosticErrorPtr* error) {
  if (node_ == nullptr) return true;
  bool succeeded = true;
  const auto note = [&](bool done) { succeeded = succeeded && done; };
  const auto firstError = [&] { return succeeded ? error : nullptr; };
  note(disableProjector(firstError()));
  if (video_ != nullptr) note(video_->release(firstError()));
  if (metadata_ != nullptr) note(metadata_->release(firstError()));
  const std::lock_guard lock(mutex_);
  finalCounters_ = counters(&finalError_);
  handler_.reset();
  video_.reset();
  metadata_.reset();
  metadataNode_.reset();
  contents_.reset();
  controls_.reset();
  node_.reset();
  return succeeded;
}

FrameCounts CameraRun::counts() const {
  const std::lock_guard lock(mutex_);
  return counts_;
}

std::optional<Dictionary> CameraRun::errorCounters(DiagnosticErrorPtr* error) const {
  const std::lock_guard lock(mutex_);
  if (node_ != nullptr) return counters(error);
  if (!finalCounters_) storeError(error, finalError_);
  return finalCounters_;
}

std::optional<Dictionary> CameraRun::counters(DiagnosticErrorPtr* error) const {
  Dictionary counters = errorCountersOf(camera_.errorCounters);
  if (bound_ && !bound_->addTo(counters, *controls_, error)) return std::nullopt;
  addKernelCounters(counters, counts_);
  return counters;
}

void CameraRun::watch(std::vector<pollfd>& descriptors) const {
  descriptors.push_back({video_->node().descriptor(), POLLIN, 0});
  if (metadata_ != nullptr) descriptors.push_back({metadata_->node().descriptor(), POLLIN, 0});
}

std::optional<std::chrono::nanoseconds> CameraRun::deadline() const { return pairing_.deadline(); }

bool CameraRun::serve(std::span<const pollfd> polled) {
  if (polled.size() > 1 && polled[1].revents != 0 && !serveMetadata(polled[1])) {
    metadata_->release(nullptr);
    metadata_.reset();
    pairing_.endMetadata();
  }
  bool goesOn = polled[0].revents == 0 || serveVideo(polled[0]);
  if (!goesOn) pairing_.endMetadata();
  // A handler may stop the stream.
  while (video_ != nullptr) {
    std::optional<CapturedFrame> frame = pairing_.next(video_->node().kernel().now());
    if (!frame) return goesOn;
    hand(*frame);
  }
  return false;
}

// False if the node delivers no more buffers.
bool CameraRun::serveMetadata(const pollfd& polled) {
  for (std::size_t i = 0; i < metadata_->count(); ++i) {
    DequeuedBuffer buffer;
    const int result = metadata_->dequeue(buffer);
    if (result == EAGAIN && (i > 0 || (polled.revents & (POLLERR | POLLHUP)) == 0)) return true;
    if (result != 0) {
      logFailure("VIDIOC_DQBUF", *metadata_, result);
      return false;
    }
    const std::span<const std::uint8_t> contents = metadata_->contents(buffer);
    if (!buffer.isBad) pairing_.addMetadata({buffer.timestamp, buffer.sequence}, {contents.begin(), contents.end()});
    const int queued = metadata_->queue(buffer.index);
    if (queued != 0) logFailure("VIDIOC_QBUF", *metadata_, queued);
  }
  return true;
}

// False if the camera delivers no more frames. That includes an event without a buffer, which would recur at once.
bool CameraRun::serveVideo(const pollfd& polled) {
  for (std::size_t i = 0; i < video_->count(); ++i) {
    DequeuedBuffer buffer;
    const int result = video_->dequeue(buffer);
    if (result == EAGAIN && (i > 0 || (polled.revents & (POLLERR | POLLHUP)) == 0)) return true;
    if (result != 0) {
      countFailure("VIDIOC_DQBUF", result);
      return false;
    }
    takeFrame(buffer);
    const int queued = video_->queue(buffer.index);
    if (queued != 0) countFailure("VIDIOC_QBUF", queued);
  }
  return true;
}

void CameraRun::takeFrame(const DequeuedBuffer& buffer) {
  {
    const std::lock_guard lock(mutex_);
    counts_.count(buffer.sequence, buffer.timestamp, buffer.isBad);
  }
  if (buffer.isBad || handler_ == nullptr) return;
  CapturedFrame frame;
  frame.timestamp = buffer.timestamp;
  frame.sequence = buffer.sequence;
  frame.controls = contents_->readControls();
  pairing_.addFrame(std::move(frame), node_->kernel().now());
}

void CameraRun::hand(const CapturedFrame& frame) {
  if (metadata_ != nullptr && !frame.paired && !std::exchange(toldUnpaired_, true)) {
    logError("%@: frame %@ has no metadata: %@.", camera_.port, frame.sequence, pairing_.whyUnpaired(frame));
  }
  bool complete = false;
  Value metadata = contents_->dictionaryOf(frame, &complete);
  if (!complete) {
    const std::lock_guard lock(mutex_);
    ++counts_.missingMetadata;
  }
  delivered_->fetch_add(1, std::memory_order_relaxed);
  const std::shared_ptr<PixelBufferHandler> handler = handler_;  // keeps the handler alive if it stops the stream
  PixelBuffer& buffer =
      FramePool::shared().take(std::move(metadata), TracedDelivery(traced_, frame.sequence, frame.timestamp));
  (*handler)(buffer, mediaTimeOf(frame.timestamp));
  buffer.release();
}

void CameraRun::countFailure(std::string_view call, int number) {
  {
    const std::lock_guard lock(mutex_);
    ++(number == ENODEV ? counts_.disconnects : counts_.streamErrors);
  }
  logFailure(call, *video_, number);
}

void CameraRun::logFailure(std::string_view call, const CameraBuffers& buffers, int number) const {
  DiagnosticErrorPtr error;
  failSystemCall(&error, call, buffers.node().path(), number);
  logError("%@ while streaming: %@", camera_.port, error);
}

}  // namespace quazor
