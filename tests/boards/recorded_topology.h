// Recorded topologies: media controllers as `media-ctl -p` prints them, for the fake kernel.
#pragma once

#include "tests/support/fake_v4l2_api.h"

#include <filesystem>
#include <string>

namespace quazor {

// Adds the media controller of the file with its sub-devices and video nodes to a fake machine. Pads take no format but
// the recorded one, and have another one until it is set. Throws std::runtime_error if the file has not that form.
void addRecordedTopology(FakeV4l2Api& kernel, const std::filesystem::path& file);

}  // namespace quazor
