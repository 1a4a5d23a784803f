// A fake media controller: entities, pads and links, for the tests of the cameras behind one.
//
// Behaves like real drivers were observed to: a link changes only while nothing streams, an immutable link never, a
// format that a pad does not take is silently replaced, and a sink pad decides on the source pads of its entity.
#pragma once

#include "backends/linux/binding/binding.h"

#include <linux/media.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

struct FakePad {
  bool isSource = false;
  PadFormat format;
  std::vector<std::uint32_t> codes{};  // that the pad takes; empty: any
  FrameArea crop{};
  FrameInterval interval{1, 30};
};

struct FakeEntity {
  std::string name;
  std::uint32_t function = 0;  // MEDIA_ENT_F_...
  std::string node;            // the path of its device file; empty: none
  std::vector<FakePad> pads;
  std::uint32_t outputCode = 0;  // of its source pads; 0: that of its sink pad
  bool scales = false;           // its source pads may have another size than its sink pad
  bool hasIntervals = false;     // its pads have intervals
  bool cropsSources = false;     // its source pads can be cropped, too, and have the size of their crop
};

// Entities by their place in the list.
struct FakeLink {
  std::uint32_t source = 0;
  std::uint32_t sourcePad = 0;
  std::uint32_t sink = 0;
  std::uint32_t sinkPad = 0;
  std::uint32_t flags = 0;  // MEDIA_LNK_FL_...

  friend bool operator==(const FakeLink&, const FakeLink&) = default;
};

struct FakeMedia {
  std::string driver = "fake-isp";
  std::string model = "Fake ISP";
  std::string bus = "platform:fake-isp";
  std::vector<FakeEntity> entities;
  std::vector<FakeLink> links;
  std::vector<std::pair<std::uint32_t, std::uint32_t>> ancillary{};  // an entity, and one that belongs to it
  std::uint64_t version = 1;
};

}  // namespace quazor
