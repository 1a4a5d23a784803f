// HostileKernel: a fake kernel whose answers the fuzzer damages.
#pragma once

#include "tests/fuzz/byte_input.h"
#include "tests/support/fake_v4l2_api.h"

#include <cstddef>
#include <cstdint>
#include <optional>

namespace quazor {

// Each call of a driver takes bytes of the input: most of them let the answer of the fake driver pass, others replace
// its error number or bytes of its answer. Pointers in an answer stay, as the kernel never changes them.
//
// Thread: one at a time.
class HostileKernel final : public FakeV4l2Api {
 public:
  explicit HostileKernel(ByteInput& input) : input_(input) {}

  int ioctl(int descriptor, unsigned long request, void* argument) override;

  // If set, media controllers tell it instead of their own, and set up its links.
  std::optional<MediaTopology> topology;
  // The number of calls so far: a driver that never ends a list must not keep the program busy.
  std::size_t calls() const { return calls_; }

 private:
  int tell(media_v2_topology& asked) const;
  int setUp(const media_link_desc& wanted);
  int answer(int descriptor, unsigned long request, void* argument);
  void damage(unsigned long request, void* argument);
  void damageBytes(void* at, std::size_t size);

  ByteInput& input_;
  std::size_t calls_ = 0;
};

}  // namespace quazor
