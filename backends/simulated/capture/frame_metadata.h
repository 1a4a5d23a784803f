// The metadata that the simulated capture service attaches to frames.
#pragma once

#include "backends/simulated/scenario/frame_config.h"
#include "contract/value.h"

#include <optional>

namespace quazor {

// The eighteen entries that a healthy projector module reports with a frame. `lit`: the projector is on.
Dictionary healthyMetadata(bool lit);

// The attachment of a frame with the metadata `base`: with the overrides of `special`, without its removed keys, or of
// another kind. Nothing if the frame has no attachment.
std::optional<Value> attachmentOf(Dictionary base, const FrameMetadata& special);

}  // namespace quazor
