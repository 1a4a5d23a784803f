// What of a record goes into the store.
#pragma once

#include "contract/ordered_map.h"
#include "host/record/record_file.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

namespace quazor {

// A result with one limit: if the limit changes, it is another characteristic.
struct Characteristic {
  std::string diagnostic;
  std::string name;
  std::string unit;
  std::optional<double> lower{};  // the narrowest bounds, of the result's own limit and those of the user that count
  std::optional<double> upper{};
  bool lowerOpen = false;
  bool upperOpen = false;
  std::string limits{};  // of the user, in their canonical texts, separated by "; "

  friend bool operator<(const Characteristic& a, const Characteristic& b) {
    return std::tie(a.diagnostic, a.name, a.unit, a.lower, a.upper, a.lowerOpen, a.upperOpen, a.limits) <
           std::tie(b.diagnostic, b.name, b.unit, b.lower, b.upper, b.lowerOpen, b.upperOpen, b.limits);
  }
};

struct ResultRow {
  Characteristic of;
  std::int64_t number = 0;      // among those of the run with that characteristic, from 1
  std::optional<double> value;  // nothing: not finite
  std::string verdict;          // "pass", "fail", "none"
};

struct EntryRow {
  std::string diagnostic;
  std::string verdict;
  std::int64_t attempt = 0;
  std::int64_t repetition = 0;
  std::string domain{};              // of the error, as are the next two
  std::optional<std::int64_t> code;  // nothing without an error
  std::string message{};
};

struct RunRows {
  std::string digest;  // SHA-256 of the file
  std::string run;     // the ID; empty in records of format 1
  std::string date;
  std::string day;   // in UTC, as the date
  std::string kind;  // "run", "experiments", "analysis"
  std::string station;
  std::string serial;
  std::string host;
  std::string phone;
  std::string program;
  std::string file;
  std::int64_t events = 0;
  bool whole = false;    // it came to its end and was not interrupted
  bool counted = false;  // in rates: whole, with a verdict, and neither of experiments nor an analysis
  std::string verdict;   // empty if it has none
  OrderedMap<std::string> tags;
  std::vector<EntryRow> entries;
  std::vector<ResultRow> results;  // of a run that is counted, and there of diagnostics that passed or failed
};

// `digest` is that of the file.
RunRows rowsOf(StoredRecord stored, const std::filesystem::path& file, std::string digest);

}  // namespace quazor
