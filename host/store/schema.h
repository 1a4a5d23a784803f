// The layout of the store. docs/records.md is the public description.
#pragma once

#include "host/store/database.h"

#include <filesystem>

namespace quazor {

// What the store's `PRAGMA user_version` says of this layout.
inline constexpr int kStoreVersion = 1;

// $XDG_DATA_HOME/quazor/records.sqlite, by default in ~/.local/share. Empty if the environment has neither variable.
std::filesystem::path usualStore();

// Opens the store, makes it if there is none, with its folder, and brings one of an earlier version to this one. Throws
// a CommandError: kCannotRead for a store of a later version and a file that is no store, kCannotWrite.
void openForImport(Database& store);

// Throws a CommandError (kCannotRead) if it is no store, of another version, or has nothing in it yet.
void requireStore(Database& store);

// Makes the folder of the store. Throws a CommandError (kCannotWrite).
void makeFolderOfStore(const std::filesystem::path& store);

}  // namespace quazor
