// Questions about runs.
#pragma once

#include "host/statistics/gauge.h"
#include "host/store/database.h"
#include "host/store/filter.h"
#include "host/store/run_rows.h"
#include "host/store/summaries.h"

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// A run as the list shows it.
struct RunLine {
  std::int64_t number = 0;  // in the store
  std::string run;
  std::string date;
  std::string kind;
  std::string station;
  std::string serial;
  std::string host;
  std::string phone;
  std::string file;
  bool whole = false;
  bool counted = false;
  std::string verdict;
};

// The latest first.
std::vector<RunLine> runsOf(Database& store, const Filter& filter);

// A stored run with all of it.
struct RunDetails {
  RunLine line;
  std::vector<std::pair<std::string, std::string>> tags;
  std::vector<EntryRow> entries;
  std::vector<ResultRow> results;
};

// The run whose number it is, or whose ID begins with it. Throws a CommandError (kUsage) for none and for several.
RunDetails runNamed(Database& store, const std::string& name);

// The runs of a station, and the first runs of phones. A phone's first run is the first that counts and has its serial
// number, at that station; of all stations together it is the first anywhere. A question about some days counts the
// phones whose first run was on one of them.
struct Yield {
  std::string station;       // or the value of the tag by which the runs are grouped
  std::uint64_t passed = 0;  // phones, in their first run
  std::uint64_t failed = 0;
  std::uint64_t neither = 0;  // an error, or skipped
  std::uint64_t runs = 0;
  std::uint64_t unnamed = 0;  // runs without a serial number
};

struct Yields {
  std::vector<Yield> stations;
  Yield all;
  std::uint64_t uncounted = 0;  // runs that came to no end, of experiments, or analyses
};

// By station, or by the value of another tag: a phone's first run is then the first with that value.
Yields yieldOf(Database& store, const Filter& filter, const std::string& tag = "station");

// A diagnostic that ended in the same error.
struct ErrorCount {
  std::string diagnostic;
  std::string domain;
  std::int64_t code = 0;
  std::uint64_t runs = 0;
  std::string message;  // of one of them
};

// In whole runs; the most frequent first.
std::vector<ErrorCount> errorsOf(Database& store, const Filter& filter);

// A phone with both verdicts for one characteristic, without a repair between them.
struct FlakyPhone {
  std::string serial;
  Characteristic of;
  std::uint64_t passed = 0;
  std::uint64_t failed = 0;
  std::vector<std::string> stations;  // where it failed, in their order
  std::string first;                  // the date of the first result between two repairs
  std::string last;
};

// The latest first.
std::vector<FlakyPhone> flakyPhones(Database& store, const Filter& filter);

// Keeps that the phone was repaired now.
void markRepaired(Database& store, const std::string& serial, const std::string& note);

// The values of a characteristic with a serial number, for the study of a gauge.
std::vector<GaugeReading> readingsOf(Database& store, std::int64_t characteristic, const Filter& filter);

}  // namespace quazor
