#include "backends/linux/binding/binding_counters.h"

#include "backends/linux/binding/gauges.h"
#include "backends/linux/binding/name_pattern.h"
#include "base/text/input_error.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr std::string_view kNameAsKey = "{name}";
constexpr std::size_t kMaxPathLength = 4095;  // PATH_MAX of linux/limits.h without the null

struct Part {
  std::string_view key;
  std::string_view placeholder;
  std::optional<std::string> CounterFilesBinding::*text;
};

constexpr std::array<Part, 3> kParts{{{"group", "{group}", &CounterFilesBinding::group},
                                      {"subgroup", "{subgroup}", &CounterFilesBinding::subgroup},
                                      {"name", "{name}", &CounterFilesBinding::name}}};

NamePattern patternIn(const JsonCursor& cursor) {
  const std::string text = cursor.text();
  try {
    return NamePattern::parse(text);
  } catch (const InputError& problem) {
    cursor.fail(inQuotes(text) + " " + problem.what());
  }
}

// A folder name in which only * is a wildcard.
std::string readEventPattern(const JsonCursor& cursor, bool* isLiteral) {
  std::string text = cursor.text();
  if (text == "." || text == ".." || text.find_first_of(std::string_view("/\0", 2)) != std::string::npos) {
    cursor.fail("must be the name of a folder in the events of tracefs, not a path.");
  }
  const NamePattern pattern = patternIn(cursor);
  *isLiteral = pattern.isLiteral();
  for (const Part& part : kParts) {
    if (pattern.hasPlaceholder(part.key)) cursor.fail("only * is allowed here, not a placeholder.");
  }
  return text;
}

std::optional<std::string> findText(const JsonCursor& cursor, std::string_view key) {
  const std::optional<JsonCursor> found = cursor.find(key);
  return found ? std::optional(found->text()) : std::nullopt;
}

// The group, subgroup or name of a channel, if the binding contains it.
std::optional<std::string> findPart(const JsonCursor& cursor, std::string_view key) {
  std::optional<std::string> text = findText(cursor, key);
  for (const Part& part : kParts) {
    if (!text || text->find(part.placeholder) == std::string::npos) continue;
    cursor.at(key).fail("placeholders are allowed only in the path; give the " + std::string(key) + " as it is.");
  }
  return text;
}

CounterFilesBinding readCounterFiles(const JsonCursor& cursor) {
  cursor.allowKeys({"description", "path", "group", "subgroup", "name", "key"});
  static_cast<void>(findText(cursor, "description"));
  CounterFilesBinding files;
  const JsonCursor pathCursor = cursor.at("path");
  files.path = readPathText(pathCursor);
  const NamePattern path = patternIn(pathCursor);
  files.key = findText(cursor, "key");
  const bool keyIsName = files.key == kNameAsKey;
  if (files.key && !keyIsName && files.key->find_first_of(" \t\n{}") != std::string::npos) {
    cursor.at("key").fail("must be a key in the file, or \"{name}\" for one channel per key.");
  }
  for (const Part& part : kParts) {
    const bool inPath = path.hasPlaceholder(part.key);
    const bool inKey = keyIsName && part.key == "name";
    const std::string placeholder = inQuotes(part.placeholder);
    files.*(part.text) = findPart(cursor, part.key);
    if (inPath && inKey) cursor.at("key").fail("the path already contains \"{name}\"; remove one.");
    if ((inPath || inKey) && files.*(part.text)) {
      cursor.at(part.key).fail("the placeholder " + placeholder + " already gives it; remove one of them.");
    }
    if (!inPath && !inKey && !(files.*(part.text))) {
      cursor.fail("the channels have no " + std::string(part.key) + "; give \"" + std::string(part.key) + "\", or " +
                  placeholder + " in the path.");
    }
  }
  const std::string_view key = files.key && !keyIsName ? std::string_view(*files.key) : std::string_view();
  const std::string_view gauge = gaugeReason(files.path, key);
  if (path.isLiteral() && !keyIsName && !gauge.empty()) {
    pathCursor.fail("this number is not a counter: " + std::string(gauge) + ", so it can decrease.");
  }
  return files;
}

TracepointBinding readTracepoints(const JsonCursor& cursor) {
  cursor.allowKeys({"description", "system", "event", "group", "subgroup", "name"});
  static_cast<void>(findText(cursor, "description"));
  TracepointBinding tracepoints;
  bool oneSystem = false;
  bool oneEvent = false;
  tracepoints.system = readEventPattern(cursor.at("system"), &oneSystem);
  tracepoints.event = readEventPattern(cursor.at("event"), &oneEvent);
  tracepoints.group = findText(cursor, "group");
  tracepoints.subgroup = findText(cursor, "subgroup");
  tracepoints.name = findText(cursor, "name");
  if (tracepoints.name && !(oneSystem && oneEvent)) {
    cursor.at("name").fail("several events would have the same name; remove it to use the name of each event.");
  }
  return tracepoints;
}

// All members, for comparison.
auto allOf(const CounterFilesBinding& one) { return std::tie(one.path, one.key, one.group, one.subgroup, one.name); }
auto allOf(const TracepointBinding& one) { return std::tie(one.system, one.event, one.group, one.subgroup, one.name); }

template <class Entry>
std::vector<Entry> readAll(const JsonCursor& cursor, Entry (*read)(const JsonCursor&)) {
  std::vector<Entry> entries;
  for (const JsonCursor& element : cursor.elements()) {
    Entry entry = read(element);
    const auto isSame = [&entry](const Entry& other) { return allOf(other) == allOf(entry); };
    if (const auto same = std::ranges::find_if(entries, isSame); same != entries.end()) {
      element.fail("this is the same as entry " + std::to_string(same - entries.begin()) + " of the list; remove one.");
    }
    entries.push_back(std::move(entry));
  }
  return entries;
}

}  // namespace

std::vector<CounterFilesBinding> readAllCounterFiles(const JsonCursor& cursor) {
  return readAll(cursor, readCounterFiles);
}

std::vector<TracepointBinding> readAllTracepoints(const JsonCursor& cursor) { return readAll(cursor, readTracepoints); }

std::string readPathText(const JsonCursor& cursor) {
  std::string path = cursor.text();
  if (!path.starts_with('/')) cursor.fail("must be an absolute path, such as \"/sys/...\".");
  if (path.size() > kMaxPathLength) {
    cursor.fail("is longer than the maximum length of a path, " + std::to_string(kMaxPathLength) + " bytes.");
  }
  if (path.find('\0') != std::string::npos) cursor.fail("a path cannot contain the character \\u0000.");
  for (std::size_t begin = 1; begin <= path.size();) {
    const std::size_t end = std::min(path.find('/', begin), path.size());
    const std::string component = path.substr(begin, end - begin);
    if (component.empty() || component == "." || component == "..") {
      cursor.fail("must be a path without \"//\", \".\", \"..\" or a trailing \"/\".");
    }
    begin = end + 1;
  }
  return path;
}

}  // namespace quazor
