#include "backends/linux/counters/counter_channels.h"

#include "backends/linux/binding/gauges.h"
#include "backends/linux/binding/name_pattern.h"
#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <functional>
#include <system_error>
#include <unordered_set>
#include <utility>

namespace quazor {
namespace {

constexpr std::string_view kNameAsKey = "{name}";
constexpr int kMaxProcessors = 65536;

// Includes a link to itself.
bool isNotThere(int number) { return number == ENOENT || number == ENOTDIR || number == ENODEV || number == ELOOP; }

// Finds the files that match a path of patterns.
class Walk {
 public:
  // Called for each match, with the texts that the placeholders matched. Returns false to stop.
  using OnFound = std::function<bool(const std::string& file, const ChannelNames& names)>;

  Walk(CounterSystem& system, std::string_view path, OnFound found) : system_(system), found_(std::move(found)) {
    for (std::size_t begin = 1; begin <= path.size();) {
      const std::size_t end = std::min(path.find('/', begin), path.size());
      components_.emplace_back(path.substr(begin, end - begin));
      patterns_.push_back(NamePattern::parse(components_.back()));  // checked by the reader of the binding
      begin = end + 1;
    }
  }

  // False if a directory cannot be read or the callback stopped the search.
  bool run(DiagnosticErrorPtr* error) {
    error_ = error;
    return below("", 0, {});
  }

 private:
  bool below(const std::string& directory, std::size_t depth, const ChannelNames& names) {
    const bool isLast = depth + 1 == components_.size();
    if (!patterns_[depth].isLiteral()) return listed(directory, depth, names);
    const std::string path = directory + "/" + components_[depth];
    if (!isLast) return below(path, depth + 1, names);
    const int failure = system_.find(path);
    if (failure == 0) return found_(path, names);
    return isNotThere(failure) || refuse("stat", path, failure);
  }

  bool listed(const std::string& directory, std::size_t depth, const ChannelNames& names) {
    const std::string path = directory.empty() ? "/" : directory;
    std::vector<DirectoryEntry> entries;
    if (const int failure = system_.list(path, &entries); failure != 0) {
      return isNotThere(failure) || refuse("opendir", path, failure);
    }
    std::ranges::sort(entries, {}, &DirectoryEntry::name);
    const bool isLast = depth + 1 == components_.size();
    for (const DirectoryEntry& entry : entries) {
      ChannelNames here;
      if (!patterns_[depth].match(entry.name, &here)) continue;
      const std::string found = directory + "/" + entry.name;
      if (!isLast) {
        if (entry.kind != EntryKind::kFile && !below(found, depth + 1, merged(names, std::move(here)))) return false;
        continue;
      }
      const int failure = entry.kind == EntryKind::kOther ? system_.find(found) : 0;
      if (failure != 0 && !isNotThere(failure)) return refuse("stat", found, failure);
      if (failure != 0 || entry.kind == EntryKind::kDirectory) continue;
      if (!found_(found, merged(names, std::move(here)))) return false;
    }
    return true;
  }

  static ChannelNames merged(const ChannelNames& above, ChannelNames here) {
    if (above.group) here.group = above.group;
    if (above.subgroup) here.subgroup = above.subgroup;
    if (above.name) here.name = above.name;
    return here;
  }

  bool refuse(std::string_view call, const std::string& path, int number) {
    failSystemCall(error_, call, path, number);
    return false;
  }

  CounterSystem& system_;
  const OnFound found_;
  std::vector<std::string> components_;
  std::vector<NamePattern> patterns_;
  DiagnosticErrorPtr* error_ = nullptr;
};

class Enumeration {
 public:
  Enumeration(CounterSystem& system, DiagnosticErrorPtr* error) : system_(system), error_(error) {}

  bool add(const CounterFilesBinding& files) {
    const auto found = [&](const std::string& file, const ChannelNames& names) {
      const ReportChannelDescription description{names.group ? *names.group : files.group.value_or(""),
                                                 names.subgroup ? *names.subgroup : files.subgroup.value_or(""),
                                                 names.name ? *names.name : files.name.value_or("")};
      if (files.key == kNameAsKey) return addLines(description, file);
      addFile(description, file, files.key.value_or(""));
      return true;
    };
    return Walk(system_, files.path, found).run(error_);
  }

  bool add(const TracepointBinding& tracepoints) {
    for (const std::string_view place : kTracingPlaces) {
      const std::string events = std::string(place) + "/events";
      std::vector<DirectoryEntry> ignored;
      if (isNotThere(system_.list(events, &ignored))) continue;  // tracefs is not mounted there
      const auto found = [&](const std::string& file, const ChannelNames& /*names*/) {
        return addTracepoint(tracepoints, file, std::string_view(file).substr(events.size() + 1));
      };
      return Walk(system_, events + "/" + tracepoints.system + "/" + tracepoints.event + "/id", found).run(error_);
    }
    return true;
  }

  std::vector<CounterChannel> take() { return std::move(channels_); }

 private:
  void addFile(const ReportChannelDescription& description, const std::string& file, const std::string& key) {
    if (gaugeReason(file, key).empty()) channels_.push_back({description, file, key, std::nullopt});
  }

  bool addLines(ReportChannelDescription description, const std::string& file) {
    std::string content;
    if (const int failure = system_.read(file, &content); failure != 0) {
      return !isNoAccess(failure) || refuse(file, failure);
    }
    std::string_view text = content;
    std::unordered_set<std::string_view> keys;
    while (const std::optional<KeyedLine> line = takeKeyedLine(&text)) {
      if (!keys.insert(line->key).second || !line->count) continue;  // of equal keys the first line counts
      description.name = line->key;
      addFile(description, file, description.name);
    }
    return true;
  }

  bool refuse(const std::string& file, int failure) {
    failSystemCall(error_, "open", file, failure);
    return false;
  }

  // `path` is SYSTEM/EVENT/id. Returns false and an error if reading it is not permitted.
  bool addTracepoint(const TracepointBinding& tracepoints, const std::string& file, std::string_view path) {
    std::string content;
    const int failure = system_.read(file, &content);
    if (isNoAccess(failure)) return refuse(file, failure);
    const std::optional<std::uint64_t> id = failure == 0 ? countIn(content) : std::nullopt;
    if (!id) return true;  // it was removed in the meantime
    const std::string system(path.substr(0, path.find('/')));
    const std::string event(path.substr(system.size() + 1, path.rfind('/') - system.size() - 1));
    channels_.push_back({{tracepoints.group.value_or("tracepoints"), tracepoints.subgroup.value_or(system),
                          tracepoints.name.value_or(event)},
                         system + ":" + event,
                         {},
                         id});
    return true;
  }

  CounterSystem& system_;
  DiagnosticErrorPtr* const error_;
  std::vector<CounterChannel> channels_;
};

}  // namespace

std::optional<std::vector<CounterChannel>> counterChannels(const Binding& binding, CounterSystem& system,
                                                           DiagnosticErrorPtr* error) {
  Enumeration enumeration(system, error);
  for (const CounterFilesBinding& files : binding.counterFiles) {
    if (!enumeration.add(files)) return std::nullopt;
  }
  for (const TracepointBinding& tracepoints : binding.tracepoints) {
    if (!enumeration.add(tracepoints)) return std::nullopt;
  }
  return enumeration.take();
}

std::optional<std::uint64_t> countIn(std::string_view text) {
  constexpr std::string_view kSpace = " \t\n";
  text.remove_prefix(std::min(text.find_first_not_of(kSpace), text.size()));
  text = text.substr(0, text.find_last_not_of(kSpace) + 1);
  std::uint64_t count = 0;
  const auto [end, failure] = std::from_chars(text.data(), text.data() + text.size(), count);
  const bool isWhole = failure == std::errc() && end == text.data() + text.size();
  return isWhole ? std::optional(count) : std::nullopt;
}

std::optional<KeyedLine> takeKeyedLine(std::string_view* text) {
  while (!text->empty()) {
    const std::string_view line = text->substr(0, text->find('\n'));
    text->remove_prefix(std::min(line.size() + 1, text->size()));
    const std::size_t keyEnd = line.find_first_of(" \t");
    if (keyEnd != 0 && keyEnd != std::string_view::npos)
      return KeyedLine{line.substr(0, keyEnd), countIn(line.substr(keyEnd))};
  }
  return std::nullopt;
}

std::vector<int> processorsIn(std::string_view list) {
  std::vector<int> processors;
  const char* at = list.data();
  const char* const end = list.data() + list.size();
  for (int first = 0; at != end;) {
    const auto [afterFirst, failure] = std::from_chars(at, end, first);
    if (failure != std::errc() || first < 0) break;
    int last = first;
    at = afterFirst;
    if (at != end && *at == '-') at = std::from_chars(at + 1, end, last).ptr;
    for (int one = first; one <= std::min(last, kMaxProcessors); ++one) processors.push_back(one);
    if (at != end) ++at;  // skips the comma
  }
  return processors;
}

}  // namespace quazor
