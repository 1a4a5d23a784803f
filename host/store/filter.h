// Which records and results a question is about.
#pragma once

#include "host/store/database.h"

#include <optional>
#include <string>

namespace quazor {

struct Filter {
  std::string since{};  // the first day, "2026-11-21"; empty: the beginning
  std::string until{};  // the last day; empty: the end
  std::optional<std::string> station{};
  std::optional<std::string> serial{};
  std::string diagnostic{};  // a name or pattern; empty: all
  std::string result{};      // likewise
};

// A condition on the columns `day` and `station`, whose parameters bindDayAndStation() sets.
inline constexpr const char* kOfDayAndStation = "day >= ? AND (? = '' OR day <= ?) AND (? = 0 OR station = ?)";
Statement& bindDayAndStation(Statement& statement, const Filter& filter);

}  // namespace quazor
