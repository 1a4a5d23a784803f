// What a scenario says of the main display.
#pragma once

#include "contract/value.h"

namespace quazor {

struct DisplayConfig {
  bool present = true;          // false: the phone has no main display
  bool registryService = true;  // false: the display's driver has no entry in the registry
  Dictionary properties;        // of that entry
};

}  // namespace quazor
