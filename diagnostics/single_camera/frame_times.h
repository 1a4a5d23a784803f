// FrameTimes: what the time stamps of a stream's frames say about it.
#pragma once

#include "platform/media_time.h"

#include <cstddef>
#include <vector>

namespace quazor {

// Collects the time stamps of frames in the order of their delivery.
// Thread: one at a time; any number may read while none writes.
class FrameTimes {
 public:
  // A time stamp that is not valid counts as a frame, and in nothing else.
  void add(const MediaTime& time);

  std::size_t frames() const { return frames_; }
  // Frames without a valid time stamp.
  std::size_t untimed() const { return frames_ - seconds_.size(); }
  // The median of the intervals between successive frames, in seconds; 0 if there is no positive one. A few missing
  // frames do not change it.
  double interval() const;
  // Frames per second from the first frame to the last one, as delivered; 0 if no time passed between them.
  double rate() const;
  // Frames that fit into the gaps between successive frames: a gap of three intervals has room for two.
  double missing() const;
  // The root mean square of the differences between the gaps and the nearest whole number of intervals, in seconds.
  double jitter() const;
  // Frames whose time stamp is not later than that of the frame before.
  std::size_t backward() const;

 private:
  std::vector<double> gaps() const;

  std::size_t frames_ = 0;
  std::vector<double> seconds_;
};

}  // namespace quazor
