// An object that counts how often it is made into text.
#pragma once

#include "contract/value.h"

#include <string>

namespace quazor {

class CountingObject final : public Object {
 public:
  std::string description() const override {
    ++asked;
    return "object";
  }
  mutable int asked = 0;
};

}  // namespace quazor
