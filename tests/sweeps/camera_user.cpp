#include "tests/sweeps/camera_user.h"

#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>
#include <optional>

namespace quazor {

using namespace std::chrono_literals;

CameraUser::CameraUser(const Scenario& scenario, std::uint64_t seed)
    : random_(seed), phone_(scenario, PhoneTime::kVirtual, seed), clock_(phone_.platform().clock) {
  clock_->sleep(std::chrono::nanoseconds(seed * 977));
  origin_ = clock_->now();
  for (const Camera& camera : scenario.cameras) seen_.push_back({camera.id, {}});
  uses_.resize(seen_.size());
}

void CameraUser::stream(const Platform& platform) {
  clock_->sleep(13ns);
  const std::shared_ptr<CapturePlugIn> plugIn = platform.capture->createPlugIn();
  const std::shared_ptr<CaptureDevice> device = plugIn == nullptr ? nullptr : plugIn->device(nullptr);
  const auto found = device == nullptr ? std::nullopt : device->streams(nullptr);
  if (!found || found->size() != seen_.size()) return;
  const CaptureStreams& streams = *found;
  static_cast<void>(device->requestControlOfStreams(streams, nullptr));
  for (std::size_t i = 0; i < streams.size(); ++i) handle(*streams[i], i);
  for (const std::chrono::nanoseconds duration : {500ms, 90ms}) {
    for (std::size_t i = 0; i < streams.size(); ++i) {
      // A phone that delays the call starts the stream at its end.
      if (streams[i]->start(nullptr)) uses_[i].started = now();
    }
    clock_->sleep(duration);
    for (const auto& stream : streams) static_cast<void>(stream->stop(nullptr));
    clock_->sleep(50ms);  // for frames that come after the stop
  }
}

void CameraUser::handle(CaptureStream& stream, std::size_t index) {
  const std::string output(capture_key::PrimaryScaler);
  const auto handler = std::make_shared<PixelBufferHandler>(
      [this, index](PixelBuffer& buffer, MediaTime time) { take(index, buffer, time); });
  static_cast<void>(stream.setValue(Dictionary{{output, true}}, capture_key::VideoOutputsEnabled, nullptr));
  static_cast<void>(
      stream.setValue(Dictionary{{output, Dictionary{{std::string(capture_key::PixelBufferHandler), handler}}}},
                      capture_key::VideoOutputHandlers, nullptr));
}

// The phone says which buffers of the camera are in use; one of them is new.
std::int64_t CameraUser::numberOfNewFrame(std::size_t index) {
  std::vector<std::uint64_t> held;
  for (const SimulatedPhone::HeldBuffer& one : phone_.buffersHeld()) {
    if (one.camera == seen_[index].name) held.push_back(one.frame);
  }
  Use& use = uses_[index];
  std::vector<std::uint64_t> added;
  std::ranges::sort(use.held);
  std::ranges::set_difference(held, use.held, std::back_inserter(added));
  EXPECT_EQ(added.size(), 1U);
  use.held.push_back(added.at(0));
  return static_cast<std::int64_t>(added.at(0));
}

void CameraUser::forget(Use& use, std::int64_t number) {
  use.held.erase(std::ranges::find(use.held, static_cast<std::uint64_t>(number)));
}

void CameraUser::take(std::size_t index, PixelBuffer& buffer, MediaTime time) {
  std::vector<TracedFrame>& frames = seen_[index].frames;
  Use& use = uses_[index];
  const std::size_t place = frames.size();
  EXPECT_EQ(time.timescale, 1'000'000'000);
  const std::int64_t number = numberOfNewFrame(index);
  frames.push_back({number, use.started.count() + time.value, now().count(), std::nullopt});
  if (random_() % 8 == 0) clock_->sleep(std::chrono::nanoseconds(random_() % 5'000'000));
  if (random_() % 6 == 0) {
    buffer.retain();
    use.kept.emplace(&buffer, place);
    return;
  }
  if (random_() % 4 == 0 && !use.kept.empty()) {
    const auto [kept, itsPlace] = *use.kept.begin();
    use.kept.erase(use.kept.begin());
    frames[itsPlace].returned = now().count();
    forget(use, frames[itsPlace].number);
    kept->release();
  }
  frames[place].returned = now().count();  // the phone hands it back when this function returns
  forget(use, number);
}

}  // namespace quazor
