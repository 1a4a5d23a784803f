// The metadata that the simulated capture service attaches to frames.
#pragma once

#include "backends/simulated/scenario/frame_config.h"
#include "contract/value.h"

#include <optional>

namespace quazor {

// What a healthy projector module reports with a frame: its eighteen entries. `lit`: the projector fires.
Dictionary healthyMetadata(bool lit);

// The attachment of a frame whose metadata would be `base`: with the overrides of `special`, without what it leaves
// out, or something else altogether. Nothing when the frame has no attachment.
std::optional<Value> attachmentOf(Dictionary base, const FrameMetadata& special);

}  // namespace quazor
