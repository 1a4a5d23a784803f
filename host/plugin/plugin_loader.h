// Loads plug-ins into the process.
#pragma once

#include "contract/lab.h"

#include <cstddef>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A plug-in that was loaded.
struct LoadedPlugin {
  std::filesystem::path file;
  std::size_t last;  // the position after its last registration, among the lab's
};

// Throws the CommandError (kCannotRead) "the plug-in 'FILE' WHAT".
[[noreturn]] void refusePlugin(const std::filesystem::path& file, const std::string& what);

// The files without those that are listed again, by whatever name.
std::vector<std::filesystem::path> distinctFiles(const std::vector<std::filesystem::path>& files);

// Loads one plug-in, which registers with the process-wide lab. Throws InputError if it cannot be loaded, was built
// against another version of the contract, or registers nothing or a name already in use; what() is the end of a
// sentence that begins with the plug-in.
void loadPlugin(const std::filesystem::path& file);

// Throws InputError, as loadPlugin() does, if the lab has no more than `registered` registrations or more than
// `refused` refused names: what a plug-in added to those is missing or already taken.
void checkNewRegistrations(const QZLab& lab, std::size_t registered, std::size_t refused);

// Loads the plug-ins in order. A file that is listed twice is loaded once. Plug-ins stay loaded until the process ends,
// because the lab holds their factories. Returns the loaded plug-ins.
//
// Throws a CommandError (kCannotRead) if loadPlugin() throws, and like checkDiagnostics().
std::vector<LoadedPlugin> loadPlugins(const std::vector<std::filesystem::path>& files);

// Like loadPlugins, but for a subset of the plug-ins: a diagnostic may name something that none of them registers.
// `isNext`, if not empty, is called before each plug-in is loaded.
void loadSomePlugins(const std::vector<std::filesystem::path>& files, const std::function<void()>& isNext = nullptr);

// Throws a CommandError (kCannotRead) if a diagnostic in the lab names an experiment or analysis that is not in it.
// `plugins` are those that made the registrations.
void checkDiagnostics(const QZLab& lab, const std::vector<LoadedPlugin>& plugins);

// The same for one plug-in, whose registrations begin at `first`.
void checkDiagnosticsOf(const QZLab& lab, std::size_t first, const LoadedPlugin& plugin);

// The contract version of the missing symbol in a dynamic linker's message; nothing if the message has another cause.
std::optional<int> contractVersionIn(std::string_view linkerMessage);

}  // namespace quazor
