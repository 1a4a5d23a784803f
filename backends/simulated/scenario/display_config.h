// The main display in a scenario.
#pragma once

#include "contract/value.h"

namespace quazor {

struct DisplayConfig {
  bool present = true;          // false: the phone has no main display
  bool registryService = true;  // false: the display's driver has no registry entry
  Dictionary properties;        // of the registry entry
};

}  // namespace quazor
