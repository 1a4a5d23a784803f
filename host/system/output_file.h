// Writing a report to a file.
#pragma once

#include <filesystem>
#include <string_view>

namespace quazor {

// Makes `text` the content of `file`, at once: it is written to a new file beside it, which then takes its place, so
// that a reader sees the old content or the new one and a failure leaves the old. Links are followed, and the
// permissions of a file that is replaced are kept. What is no regular file, such as a pipe or a device, is written to
// as it is.
//
// Throws a CommandError (kCannotWrite) that names the file and the reason.
void writeOutputFile(const std::filesystem::path& file, std::string_view text);

// Throws the error that writeOutputFile() would, as far as that shows without writing.
void validateOutputFile(const std::filesystem::path& file);

}  // namespace quazor
