// Where the record of a run is made, and which records a folder has.
#pragma once

#include "host/model/run_event.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// True for an existing folder, and for a name that ends in a slash.
bool isFolderOfRecords(const std::filesystem::path& given);

// DATE-ID.jsonl, for example 20261121T010800Z-00112233445566778899aabbccddeeff.jsonl: the names of a folder's records
// are in the order of their dates.
std::string recordNameOf(const RunStarted& began);

// Makes the folder, with those above it, unless it exists. Throws a CommandError (kCannotWrite) if that fails.
void makeFolderOfRecords(const std::filesystem::path& folder);

// The records to read, each once: the files given, and of each folder its files in the order of their names, with those
// in the folders in it: what ends in .jsonl and is no pipe or device. Throws a CommandError (kCannotRead) for a folder
// that has none or cannot be read.
std::vector<std::filesystem::path> recordsIn(const std::vector<std::filesystem::path>& given);

// Throws a CommandError (kCannotRead) for a folder, where one record is to be read: it names the last records in it, or
// says that there is none.
void refuseFolderAsRecord(const std::filesystem::path& given);

}  // namespace quazor
