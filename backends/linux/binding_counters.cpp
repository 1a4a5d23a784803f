#include "backends/linux/binding_counters.h"

#include "backends/linux/gauges.h"
#include "backends/linux/name_pattern.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {
namespace {

constexpr std::string_view kNameAsKey = "{name}";

struct Part {
  std::string_view key;
  std::optional<std::string> CounterFilesBinding::*text;
};

constexpr std::array<Part, 3> kParts{{{"group", &CounterFilesBinding::group},
                                      {"subgroup", &CounterFilesBinding::subgroup},
                                      {"name", &CounterFilesBinding::name}}};

NamePattern patternIn(const JsonCursor& cursor) {
  std::string problem;
  std::optional<NamePattern> pattern = NamePattern::parse(cursor.text(), &problem);
  if (!pattern) cursor.fail(inQuotes(cursor.text()) + " " + problem);
  return *pattern;
}

// A pattern with nothing in it but * .
std::string readEventPattern(const JsonCursor& cursor, bool* isLiteral) {
  const NamePattern pattern = patternIn(cursor);
  *isLiteral = pattern.isLiteral();
  for (const Part& part : kParts) {
    if (pattern.hasPlaceholder(part.key)) cursor.fail("only * stands for any text here, not a placeholder.");
  }
  return cursor.text();
}

std::optional<std::string> findText(const JsonCursor& cursor, std::string_view key) {
  const std::optional<JsonCursor> found = cursor.find(key);
  return found ? std::optional(found->text()) : std::nullopt;
}

// Checks every component, as each is a pattern of its own, and the path as a whole, in which a placeholder stands once.
NamePattern readPath(const JsonCursor& cursor) {
  const std::string path = cursor.text();
  if (!path.starts_with('/')) cursor.fail("must be an absolute path, as \"/sys/...\".");
  for (std::size_t begin = 1; begin <= path.size();) {
    const std::size_t end = std::min(path.find('/', begin), path.size());
    const std::string component = path.substr(begin, end - begin);
    if (component.empty() || component == "." || component == "..") {
      cursor.fail("must be a path without \"//\", \".\", \"..\" and a \"/\" at its end.");
    }
    begin = end + 1;
  }
  return patternIn(cursor);
}

}  // namespace

CounterFilesBinding readCounterFiles(const JsonCursor& cursor) {
  cursor.allowKeys({"description", "path", "group", "subgroup", "name", "key"});
  CounterFilesBinding files;
  const JsonCursor pathCursor = cursor.at("path");
  const NamePattern path = readPath(pathCursor);
  files.path = pathCursor.text();
  files.key = findText(cursor, "key");
  const bool keyIsName = files.key == kNameAsKey;
  if (files.key && !keyIsName && files.key->find_first_of(" \t\n{}") != std::string::npos) {
    cursor.at("key").fail("must be one key of the file's lines, or \"{name}\" for a channel of each.");
  }
  for (const Part& part : kParts) {
    const bool inPath = path.hasPlaceholder(part.key);
    const bool inKey = keyIsName && part.key == "name";
    const std::string placeholder = "\"{" + std::string(part.key) + "}\"";
    files.*(part.text) = findText(cursor, part.key);
    if (inPath && inKey) cursor.at("key").fail("\"{name}\" stands in the path already; leave one.");
    if ((inPath || inKey) && files.*(part.text)) {
      cursor.at(part.key).fail("the placeholder " + placeholder + " says it already; leave one of the two.");
    }
    if (!inPath && !inKey && !(files.*(part.text))) {
      cursor.fail("nothing says the channels' " + std::string(part.key) + "; give \"" + std::string(part.key) +
                  "\", or " + placeholder + " in the path.");
    }
  }
  const std::string_view key = files.key && !keyIsName ? std::string_view(*files.key) : std::string_view();
  const std::string_view gauge = gaugeReason(files.path, key);
  if (path.isLiteral() && !keyIsName && !gauge.empty()) {
    pathCursor.fail("this number is no counter: " + std::string(gauge) + ", so it goes down too.");
  }
  return files;
}

TracepointBinding readTracepoints(const JsonCursor& cursor) {
  cursor.allowKeys({"description", "system", "event", "group", "subgroup", "name"});
  TracepointBinding tracepoints;
  bool oneSystem = false;
  bool oneEvent = false;
  tracepoints.system = readEventPattern(cursor.at("system"), &oneSystem);
  tracepoints.event = readEventPattern(cursor.at("event"), &oneEvent);
  tracepoints.group = findText(cursor, "group");
  tracepoints.subgroup = findText(cursor, "subgroup");
  tracepoints.name = findText(cursor, "name");
  if (tracepoints.name && !(oneSystem && oneEvent)) {
    cursor.at("name").fail("several events would have this one name; leave it out, and each has its own.");
  }
  return tracepoints;
}

}  // namespace quazor
