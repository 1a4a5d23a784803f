#include "host/cli/option_values.h"

#include "base/text/input_error.h"
#include "base/text/utf8.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <sstream>

namespace quazor {

namespace {

constexpr std::size_t kMaxTag = 256;

bool isControl(char unit) {
  const auto byte = static_cast<unsigned char>(unit);
  return byte < 0x20 || byte == 0x7F;
}

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
    if (std::any_of(text.begin(), text.end(), isControl)) refuse("a tag has no control characters");
    if (findInvalidUtf8(text)) refuse("the text is not valid UTF-8");
    if (added.contains(key)) refuse("the key is set twice");
    added.set(key, value);
  }
  for (const auto& [key, value] : added) tags.set(key, value);
}

}  // namespace

UserLimit limitOfCommandLine(const std::string& text) {
  try {
    UserLimit limit = parseUserLimit(text);
    limit.source = "command line";
    return limit;
  } catch (const InputError& problem) {
    throw CommandError(ExitCode::kUsage, "--limit '" + text + "': " + problem.what());
  }
}

OrderedMap<std::string> tagsOf(const std::vector<std::string>& texts) {
  const char* const variable = std::getenv(kTagsVariable);
  std::istringstream words(variable == nullptr ? "" : variable);
  std::vector<std::string> ofEnvironment;
  for (std::string word; words >> word;) ofEnvironment.push_back(word);
  OrderedMap<std::string> tags;
  addTags(kTagsVariable, ofEnvironment, tags);
  addTags("--tag", texts, tags);
  return tags;
}

}  // namespace quazor
