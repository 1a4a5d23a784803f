// An object that counts its conversions to text.
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
