#include "host/command/failed_only.h"

#include "host/command/selection.h"
#include "host/device/phone.h"
#include "host/model/incomplete_run.h"
#include "host/model/limit_check.h"
#include "host/record/previous_run.h"
#include "host/record/record_file.h"
#include "host/text/table.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <iterator>
#include <utility>

namespace quazor {

namespace {

OrderedMap<Value> valuesOf(const std::vector<ResolvedParameter>& parameters) {
  OrderedMap<Value> values;
  for (const ResolvedParameter& one : parameters) {
    if (one.value) values.set(one.name, *one.value);
  }
  return values;
}

void refuseFailedPlugins(const RecordedRun& run) {
  for (const DiagnosticRecord& one : run.records) {
    if (!one.experimentName.empty() || isOfLimit(one)) continue;  // a record without an experiment is that of a plug-in
    throw CommandError(
        ExitCode::kCannotRead,
        "the plug-in " + one.name +
            " could not be loaded in that run, so none of its diagnostics ran; name the diagnostics to run, or use "
            "--all");
  }
}

// The recorded parameters of the diagnostics with these names. In earlier records, those that never started have none.
Profile recordedProfile(const std::filesystem::path& record, const RecordedRun& run,
                        const std::vector<std::string>& names) {
  Profile profile{record, {}};
  profile.kind = "record";
  profile.mayNameOthers = true;
  std::vector<DiagnosticRecord> records = run.records;
  std::ranges::move(neverBegun(run.began, run.records), std::back_inserter(records));
  for (const DiagnosticRecord& one : records) {
    if (std::find(names.begin(), names.end(), one.name) == names.end()) continue;
    const bool isKnown = std::any_of(profile.entries.begin(), profile.entries.end(),
                                     [&one](const ProfileEntry& known) { return known.name == one.name; });
    if (isKnown) continue;  // another attempt or repetition has the same parameters
    profile.entries.push_back({one.name, valuesOf(one.parameters.experiment), valuesOf(one.parameters.analysis)});
  }
  return profile;
}

// The recorded limits that fit a result of the diagnostics with these names, or may do so: some have no results yet.
std::vector<UserLimit> limitsOfFailed(const RecordedRun& run, const std::vector<std::string>& names) {
  std::vector<UserLimit> limits;
  for (const UserLimit& limit : run.began.limits) {
    for (const std::string& name : names) {
      const auto found = std::find_if(run.records.begin(), run.records.end(),
                                      [&name](const DiagnosticRecord& one) { return one.name == name; });
      const bool mayFit =
          appliesTo(limit, name) && (found == run.records.end() || limitsWithoutResult({limit}, {*found}).empty());
      if (!mayFit) continue;
      limits.push_back(limit);
      break;
    }
  }
  return limits;
}

void refuseOnlyLimits(const RecordedRun& run) {
  for (const DiagnosticRecord& one : run.records) {
    if (!isOfLimit(one)) continue;
    throw CommandError(ExitCode::kUsage, "in that run every diagnostic passed, but the limit '" + one.name +
                                             "' fits no result; correct the limit and name the diagnostics to run");
  }
}

// True for the record that quazor wrote for this user.
bool isOwn(const std::filesystem::path& record, const Options& options) {
  struct stat status {};
  return options.failedOf.empty() && ::stat(record.c_str(), &status) == 0 && status.st_uid == ::geteuid();
}

std::vector<std::filesystem::path> pluginsToLoadAgain(const RecordedRun& run, bool own,
                                                      const Installation& installation) {
  if (!own) return recordedPlugins(run.began.plugins, installation);
  return {run.began.plugins.begin(), run.began.plugins.end()};
}

// The seed with which the diagnostic can be expected not to pass again: that of its first entry that did not pass. One
// that never started has that of the run.
std::uint64_t seedToRepeat(const RecordedRun& run, const std::string& name) {
  for (const DiagnosticRecord& one : run.records) {
    if (one.name == name && one.verdict != Verdict::kPass) return one.seed;
  }
  return run.began.seed;
}

// The run gets the seed of the first diagnostic, and the others keep their own.
void repeatSeeds(const RecordedRun& run, Options& options) {
  // A seed means nothing on a machine, neither in that run nor in this one.
  if (bindingNamed(run.began.phone) || bindingNamed(options.phone) || options.names.empty()) return;
  for (const std::string& name : options.names) options.seedOf[name] = seedToRepeat(run, name);
  options.seed = options.seedOf[options.names.front()];
}

}  // namespace

Options optionsToRunAgain(Options options, const Installation& installation) {
  const std::filesystem::path record = options.failedOf.empty() ? previousRunFile() : options.failedOf;
  if (record.empty() || (options.failedOf.empty() && !hasPreviousRun(record))) {
    throw CommandError(ExitCode::kCannotRead, "no previous run is recorded; use --of RECORD to name a record");
  }
  const RecordedRun run = runIn(record);
  refuseFailedPlugins(run);
  options.names = failedNames(run);
  if (options.names.empty()) refuseOnlyLimits(run);
  options.recorded = recordedProfile(record, run, options.names);
  options.recorded->limits = limitsOfFailed(run, options.names);
  if (options.plugins.empty()) options.plugins = pluginsToLoadAgain(run, isOwn(record, options), installation);
  if (options.phone.empty()) {
    options.phone = run.began.phone;
    if (bindingNamed(options.phone) && (options.realTime || options.hasSeed)) {
      throw CommandError(ExitCode::kUsage, "--seed and --realtime apply only to simulated phones, but that run used '" +
                                               run.began.phone + "'; choose another phone with --phone");
    }
  }
  if (!options.hasSeed) repeatSeeds(run, options);
  OrderedMap<std::string> tags = run.began.tags;
  for (const auto& [key, value] : options.tags) tags.set(key, value);
  options.tags = std::move(tags);
  // The record contains the values of the installed profile, which may have changed since or not have been used.
  const bool allRecorded = options.recorded->entries.size() == options.names.size();
  if (options.profile.empty() && allRecorded) options.withoutProfile = true;
  return options;
}

void tellUnrecorded(const Options& options, std::ostream& err) {
  const std::vector<ProfileEntry>& recorded = options.recorded->entries;
  for (const std::string& name : options.names) {
    const bool isRecorded =
        std::any_of(recorded.begin(), recorded.end(), [&name](const ProfileEntry& one) { return one.name == name; });
    if (isRecorded) continue;
    err << "quazor: " << printable(name)
        << ": that run ended before this diagnostic began, so the record has no parameters of it; it gets those of the "
           "profile, unless --set or --parameters gives others\n";
  }
}

}  // namespace quazor
