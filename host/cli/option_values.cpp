#include "host/cli/option_values.h"

#include "base/text/control_characters.h"
#include "base/text/input_error.h"
#include "base/text/utf8.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <cstdlib>
#include <sstream>
#include <string_view>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kMaxTag = 256;
// Default memory limit of a plug-in process: more than any diagnostic needs, less than a bench machine has.
constexpr std::uint64_t kMebibyte = std::uint64_t{1024} * 1024;
constexpr std::uint64_t kDefaultMebibytes = 4096;
// The largest limits on a diagnostic's log, other than none. A larger number is more likely a mistake.
constexpr std::uint64_t kMaxLogLines = 1'000'000'000;
constexpr std::uint64_t kMaxLogMebibytes = 1'048'576;
constexpr std::uint64_t kMaxTracedFramesPerStep = 1'000'000'000;

void addTags(const std::string& source, const std::vector<std::string>& texts, OrderedMap<std::string>& tags) {
  OrderedMap<std::string> added;
  for (const std::string& text : texts) {
    const auto refuse = [&source, &text](const std::string& why) {
      throw CommandError(ExitCode::kUsage, formatMessage("%@ '%@': %@", source, text, why));
    };
    const std::size_t equals = text.find('=');
    if (equals == std::string::npos) refuse("expected KEY=VALUE");
    const std::string key = text.substr(0, equals);
    const std::string value = text.substr(equals + 1);
    if (key.empty()) refuse("the key is empty");
    if (value.empty()) refuse("the value is empty");
    if (text.size() > kMaxTag) refuse("a tag has at most " + std::to_string(kMaxTag) + " bytes");
    if (hasControlCharacter(text)) refuse("a tag has no control characters");
    if (findInvalidUtf8(text)) refuse("the text is not valid UTF-8");
    if (added.contains(key)) refuse("the key is set twice");
    added.set(key, value);
  }
  for (const auto& [key, value] : added) tags.set(key, value);
}

}  // namespace

std::uint64_t parseWhole(const char* option, const std::string& text, std::uint64_t least, std::uint64_t most) {
  std::uint64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size() || number < least || number > most) {
    throw CommandError(ExitCode::kUsage, std::string(option) + " '" + text + "': expected an integer from " +
                                             std::to_string(least) + " to " + std::to_string(most));
  }
  return number;
}

std::optional<std::uint64_t> memoryOf(const std::string& text) {
  if (text == "none") return std::nullopt;
  if (!text.empty()) return parseWhole("--memory", text, 1, UINT64_MAX / kMebibyte) * kMebibyte;
#if defined(QUAZOR_ADDRESS_SANITIZER) || defined(QUAZOR_THREAD_SANITIZER)
  return std::nullopt;  // sanitizers reserve a larger address space than any limit
#else
  return kDefaultMebibytes * kMebibyte;
#endif
}

LogLimit logLimitOf(const std::string& text) {
  LogLimit limit;
  if (text.empty()) return limit;
  if (text == "none") return LogLimit::none();
  const std::size_t comma = text.find(',');
  limit.lines = parseWhole("--log-limit: LINES", text.substr(0, comma), 1, kMaxLogLines);
  if (comma == std::string::npos) return limit;
  limit.bytes = parseWhole("--log-limit: MEBIBYTES", text.substr(comma + 1), 1, kMaxLogMebibytes) * kMebibyte;
  return limit;
}

TraceSetting traceOf(const std::string& text) {
  constexpr std::string_view kFrames = "frames=";
  TraceSetting setting{text != "off", TraceSetting::kDefaultFrames};
  setting.tasks = text == "queues";
  if (text == "off" || text == "frames" || text == "queues") return setting;
  if (!text.starts_with(kFrames)) {
    throw CommandError(ExitCode::kUsage,
                       "--trace '" + text + "': expected off, frames, frames=N, frames=all or queues");
  }
  const std::string number = text.substr(kFrames.size());
  setting.framesPerStep = number == "all" ? 0 : parseWhole("--trace: N", number, 1, kMaxTracedFramesPerStep);
  return setting;
}

std::optional<LogLevel> logLevelOf(const std::string& text) {
  if (text == "error") return LogLevel::kError;
  if (text == "default") return LogLevel::kDefault;
  if (text == "debug") return LogLevel::kDebug;
  return std::nullopt;
}

std::vector<UserLimit> limitsOfCommandLine(const std::vector<std::string>& texts) {
  std::vector<UserLimit> limits;
  for (const std::string& text : texts) {
    try {
      UserLimit limit = parseUserLimit(text);
      limit.source = "command line";
      const auto same = std::find(limits.begin(), limits.end(), limit);
      if (same != limits.end()) {
        const std::string& first = texts[static_cast<std::size_t>(same - limits.begin())];
        throw InputError("this limit is given twice, the first time as '" + first + "'");
      }
      limits.push_back(std::move(limit));
    } catch (const InputError& problem) {
      throw CommandError(ExitCode::kUsage, "--limit '" + text + "': " + problem.what());
    }
  }
  return limits;
}

OrderedMap<std::string> tagsOf(const std::vector<std::string>& texts, bool withEnvironment) {
  const char* const variable = withEnvironment ? std::getenv(kTagsVariable) : nullptr;
  std::istringstream words(variable == nullptr ? "" : variable);
  std::vector<std::string> ofEnvironment;
  for (std::string word; words >> word;) ofEnvironment.push_back(word);
  OrderedMap<std::string> tags;
  addTags(kTagsVariable, ofEnvironment, tags);
  addTags("--tag", texts, tags);
  return tags;
}

}  // namespace quazor
