#include "host/command/output_check.h"

#include "host/command/explanations.h"
#include "host/device/phone.h"
#include "host/error/exit_code.h"
#include "host/record/previous_run.h"
#include "host/record/record_file.h"
#include "host/system/output_file.h"

#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <system_error>
#include <vector>

namespace quazor {

namespace {

namespace fs = std::filesystem;

// True if both names lead to one file, which need not exist yet.
bool isSameFile(const fs::path& a, const fs::path& b) {
  struct stat first {};
  struct stat second {};
  const bool isFirst = ::stat(a.c_str(), &first) == 0;
  const bool isSecond = ::stat(b.c_str(), &second) == 0;
  if (isFirst && isSecond) return first.st_dev == second.st_dev && first.st_ino == second.st_ino;
  if (isFirst || isSecond) return false;
  std::error_code error;
  const auto placeOf = [&error](const fs::path& file) {
    const fs::path absolute = fs::absolute(file, error);  // fails where the working folder was deleted
    return fs::weakly_canonical(error ? file : absolute, error);
  };
  return placeOf(a) == placeOf(b);
}

// Devices and pipes may be written by several, and are no input that a run could damage.
bool isSpecial(const fs::path& file) {
  std::error_code error;
  return fs::exists(file, error) && !fs::is_regular_file(file, error);
}

std::vector<fs::path> inputsOf(const Options& options, const Installation& installation, const RunStarted& began) {
  std::vector<fs::path> inputs = options.records;
  for (const fs::path& name : options.parameterFiles) inputs.push_back(installation.profile(name));
  inputs.insert(inputs.end(), began.plugins.begin(), began.plugins.end());
  inputs.push_back(bindingNamed(began.phone).value_or(began.phone));
  inputs.push_back(options.profile.empty() ? installation.defaultProfile() : installation.profile(options.profile));
  inputs.push_back(options.failedOf);
  // Every run reads or replaces the record of the last one.
  if (options.command == Command::kRun) inputs.push_back(previousRunFile());
  const std::vector<fs::path> explanations = explanationFiles(installation.explanations());
  inputs.insert(inputs.end(), explanations.begin(), explanations.end());
  inputs.insert(inputs.end(), options.bases.begin(), options.bases.end());
  std::erase_if(inputs, [](const fs::path& file) { return file.empty(); });
  return inputs;
}

}  // namespace

void refuseRecordAsReport(const fs::path& file) {
  if (!isRecord(file)) return;
  throw CommandError(ExitCode::kCannotWrite, "the file '" + file.string() +
                                                 "' is a record, which a report would replace; choose another file for "
                                                 "the report, or remove the record first");
}

void checkOutputs(const Options& options, const Installation& installation, const RunStarted& began) {
  const std::vector<fs::path> inputs = inputsOf(options, installation, began);
  std::vector<fs::path> outputs;
  const auto check = [&](const fs::path& file) {
    if (file.empty() || isSpecial(file)) return;
    const auto isThis = [&file](const fs::path& other) { return isSameFile(file, other); };
    if (std::any_of(outputs.begin(), outputs.end(), isThis)) {
      throw CommandError(ExitCode::kUsage, "the file '" + file.string() + "' would be written twice");
    }
    if (std::any_of(inputs.begin(), inputs.end(), isThis)) {
      throw CommandError(ExitCode::kUsage,
                         "the file '" + file.string() + "' is an input of this run and would be overwritten");
    }
    outputs.push_back(file);
  };
  const auto checkReport = [&check](const fs::path& file) {
    validateOutputFile(file);
    check(file);
    refuseRecordAsReport(file);
  };
  check(options.record);
  // A folder that will be made for the record.
  const fs::path folder = options.record.parent_path();
  if (std::error_code ignored; !folder.empty() && !fs::exists(folder, ignored)) outputs.push_back(folder);
  if (!options.report.output.empty()) checkReport(options.report.output);
  for (const OutputRequest& output : options.report.outputs) checkReport(output.file);
}

}  // namespace quazor
