// The summary table: what the results of a characteristic were, by day and station.
#pragma once

#include "host/statistics/moments.h"
#include "host/store/database.h"
#include "host/store/filter.h"
#include "host/store/run_rows.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Thread: one at a time.
struct Summary {
  Moments values{};              // those that are finite
  std::uint64_t runs = 0;        // that gave these values
  std::uint64_t fractional = 0;  // how many of the values are not whole numbers
  std::uint64_t passed = 0;
  std::uint64_t failed = 0;

  void add(std::optional<double> value, std::string_view verdict);
  void merge(const Summary& other);
};

// The columns of the table that nextSummary() takes.
inline constexpr const char* kSummaryColumns = "runs, n, mean, m2, low, high, fractional, passed, failed";
Summary nextSummary(Statement& row);

struct DaySummary {
  std::string day;
  std::string station;
  Summary summary;
};

// A characteristic of the store.
struct StoredCharacteristic {
  std::int64_t id = 0;
  Characteristic of;
};

// Those that the patterns of the filter fit, by diagnostic and name.
std::vector<StoredCharacteristic> characteristicsOf(Database& store, const Filter& filter);

// Of one characteristic, in the order of day and station: from the table, or from the results if the filter has a
// serial number.
std::vector<DaySummary> summariesOf(Database& store, std::int64_t characteristic, const Filter& filter);

// Of one characteristic, from the results alone.
std::vector<DaySummary> summariesOfResults(Database& store, std::int64_t characteristic, const Filter& filter);

// Where the table differs from what the results say, one sentence each.
std::vector<std::string> problemsOfSummaries(Database& store);

}  // namespace quazor
