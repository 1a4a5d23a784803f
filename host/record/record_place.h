// Where the record of a run is made.
#pragma once

#include "host/model/run_event.h"

#include <filesystem>
#include <string>

namespace quazor {

// True for an existing folder, and for a name that ends in a slash.
bool isFolderOfRecords(const std::filesystem::path& given);

// DATE-ID.jsonl, for example 20261121T010800Z-00112233445566778899aabbccddeeff.jsonl: the names of a folder's records
// are in the order of their dates.
std::string recordNameOf(const RunStarted& began);

// Makes the folder, with those above it, unless it exists. Throws a CommandError (kCannotWrite) if that fails.
void makeFolderOfRecords(const std::filesystem::path& folder);

}  // namespace quazor
