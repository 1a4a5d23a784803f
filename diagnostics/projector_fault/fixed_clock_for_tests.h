// A clock with a settable date.
#pragma once

#include "platform/clock.h"

#include <chrono>

namespace quazor {

// Shows 2026-11-21 01:08:00 UTC until a test sets another date. Sleeping advances the clock.
class FixedClock final : public Clock {
 public:
  std::chrono::nanoseconds now() const override { return date_.time_since_epoch(); }
  Date date() const override { return date_; }
  void sleep(std::chrono::nanoseconds duration) override { date_ += duration; }

  void setDate(Date date) { date_ = date; }

 private:
  Date date_ = std::chrono::sys_days(std::chrono::year(2026) / 11 / 21) + std::chrono::minutes(68);
};

}  // namespace quazor
