#include "base/json/json_line.h"

#include "base/json/json_limits.h"
#include "base/text/input_error.h"

#include <algorithm>
#include <string>
#include <vector>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// Follows the parser to refuse what it would accept: it has no limit of depth, and of two equal keys it takes the last.
class LineGuard {
 public:
  void take(Json::parse_event_t event, const Json& parsed) {
    switch (event) {
      case Json::parse_event_t::object_start:
      case Json::parse_event_t::array_start: open(); break;
      case Json::parse_event_t::object_end:
      case Json::parse_event_t::array_end: --levels_; break;
      case Json::parse_event_t::key: addKey(parsed.get_ref<const std::string&>()); break;
      case Json::parse_event_t::value: break;
    }
  }

 private:
  void open() {
    if (levels_ == kMaxLineLevels) {
      throw InputError("the line is nested more than " + std::to_string(kMaxLineLevels) + " levels deep");
    }
    if (keys_.size() == levels_) keys_.emplace_back();
    keys_[levels_++].clear();
  }

  void addKey(const std::string& key) {
    std::vector<std::string>& keys = keys_[levels_ - 1];
    if (std::find(keys.begin(), keys.end(), key) != keys.end()) {
      throw InputError("the key " + Json(key).dump(-1, ' ', false, Json::error_handler_t::replace) + " is duplicated");
    }
    if (keys.size() == kMaxLineKeys) {
      throw InputError("an object has more than " + std::to_string(kMaxLineKeys) + " keys");
    }
    keys.push_back(key);
  }

  std::size_t levels_ = 0;
  std::vector<std::vector<std::string>> keys_;  // of the open containers, the outermost first; reused
};

}  // namespace

Json parseJsonLine(std::string_view line) {
  if (line.size() > kMaxLine) {
    throw InputError("the line is longer than " + std::to_string(kMaxLine >> 20U) + " MiB");
  }
  LineGuard guard;
  try {
    return Json::parse(line.begin(), line.end(), [&guard](int /*depth*/, Json::parse_event_t event, Json& parsed) {
      guard.take(event, parsed);
      return true;
    });
  } catch (const Json::exception&) {
    throw InputError("not valid JSON");
  }
}

}  // namespace quazor
