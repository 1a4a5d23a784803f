// Brings records into the store.
#pragma once

#include "host/store/database.h"
#include "host/store/run_rows.h"
#include "host/store/summaries.h"

#include <cstddef>
#include <filesystem>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <vector>

namespace quazor {

// What became of the records.
struct ImportCounts {
  std::size_t imported = 0;    // and come to their end
  std::size_t incomplete = 0;  // imported, but counted in no rate
  std::size_t known = 0;       // there already
  std::size_t wrong = 0;       // refused: something in it is wrong
  std::size_t unreadable = 0;  // refused: no record
};

// Imports records in batches of one transaction, so that the store always has whole batches, whatever ends the process.
// A record is known by its content. One that grew since it was imported replaces what it was.
// Thread: one at a time.
class Importer {
 public:
  // `store` is borrowed and open for an import; `tell` is called with the file and the reason of each refusal.
  Importer(Database& store, std::function<void(const std::filesystem::path&, const std::string&)> tell);

  // Reads and verifies the file. Throws a CommandError if the store cannot be read or written; what was imported with
  // the batches before stays.
  void add(const std::filesystem::path& file);
  // Imports the last batch. Throws like add().
  void finish();

  const ImportCounts& counts() const { return counts_; }

 private:
  struct SummaryKey {
    std::int64_t characteristic;
    std::string day;
    std::string station;

    friend bool operator<(const SummaryKey& a, const SummaryKey& b) {
      return std::tie(a.characteristic, a.day, a.station) < std::tie(b.characteristic, b.day, b.station);
    }
  };

  enum class Place { kFree, kTaken, kOfOther };

  bool isKnown(const std::string& digest);
  // Removes what the store has of the run if there is more now.
  Place placeOf(const RunRows& rows);
  void insert(const RunRows& rows);
  void insertResults(std::int64_t run, const RunRows& rows);
  std::int64_t idOf(const Characteristic& characteristic);
  void mergeSummaries();

  Database& store_;
  const std::function<void(const std::filesystem::path&, const std::string&)> tell_;
  std::vector<RunRows> batch_;
  std::set<std::string> digests_;  // of the batch
  std::map<Characteristic, std::int64_t> characteristics_;
  std::map<SummaryKey, Summary> summaries_;  // what the batch adds
  ImportCounts counts_;
  Statement findDigest_;
  Statement insertRun_;
  Statement insertTag_;
  Statement insertEntry_;
  Statement insertResult_;
};

}  // namespace quazor
