#include "platform/platform.h"

#include <utility>

namespace QUAZOR_CONTRACT {

namespace {

Platform& currentPlatform() {
  // Never released: experiments that outlive the main function may still use its services.
  static auto* const platform = new Platform;
  return *platform;
}

}  // namespace

void installPlatform(Platform platform) { currentPlatform() = std::move(platform); }

const Platform& installedPlatform() { return currentPlatform(); }

}  // namespace QUAZOR_CONTRACT
