#include "host/record/frames_json.h"

#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/record/json_members.h"

#include <bit>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

using Json = nlohmann::ordered_json;

namespace {

constexpr const char* kNumber = "number";
constexpr const char* kCaptured = "captured";
constexpr const char* kDelivered = "delivered";
constexpr const char* kReturned = "returned";

Json columnJson(const std::vector<TracedFrame>& frames, std::optional<std::int64_t> (*valueOf)(const TracedFrame&)) {
  Json column = Json::array();
  std::int64_t last = 0;
  for (const TracedFrame& frame : frames) {
    const std::optional<std::int64_t> value = valueOf(frame);
    column.push_back(value ? Json(*value - last) : Json());
    last = value.value_or(last);
  }
  return column;
}

// A column that is being read.
// Thread: one at a time.
class Column {
 public:
  Column(const Json& columns, const char* name, std::size_t size) : name_(name), entries_(arrayAt(columns, name)) {
    if (entries_.size() != size) {
      throw InputError(
          formatMessage("the column \"%@\" has %@ entries, but \"%@\" has %@", name_, entries_.size(), kNumber, size));
    }
  }

  // The value in that place; nothing if it is null. Called for one place after the other.
  std::optional<std::int64_t> at(std::size_t place) {
    const Json& entry = entries_[place];
    if (entry.is_null()) return std::nullopt;
    if (!isInteger<std::int64_t>(entry)) refuse(place, "expected an integer");
    std::int64_t sum = 0;
    const bool isTooLarge = __builtin_add_overflow(last_, entry.get<std::int64_t>(), &sum);
    if (isTooLarge || sum > kMaxTraced || sum < -kMaxTraced) refuse(place, "the sum is out of range");
    last_ = sum;
    return sum;
  }

  std::int64_t valueAt(std::size_t place) {
    const std::optional<std::int64_t> value = at(place);
    if (!value) refuse(place, "expected an integer");
    return *value;
  }

  [[noreturn]] void refuse(std::size_t place, std::string_view why) const {
    throw InputError(formatMessage("the column \"%@\", entry %@: %@", name_, place + 1, why));
  }

 private:
  const char* const name_;
  const Json& entries_;
  std::int64_t last_ = 0;
};

void refuseOtherColumns(const Json& columns) {
  if (!columns.is_object()) throw InputError("\"columns\" is not an object");
  for (const auto& [name, column] : columns.items()) {
    if (name != kNumber && name != kCaptured && name != kDelivered && name != kReturned) {
      throw InputError("unknown column '" + name + "'");
    }
  }
}

std::vector<TracedFrame> rowsOf(const Json& columns) {
  refuseOtherColumns(columns);
  const std::size_t size = arrayAt(columns, kNumber).size();
  if (size > kMaxTracedFrames) {
    throw InputError(
        formatMessage("\"columns\" has %@ frames, but at most %@ are told at once", size, kMaxTracedFrames));
  }
  Column number(columns, kNumber, size);
  Column captured(columns, kCaptured, size);
  Column delivered(columns, kDelivered, size);
  Column returned(columns, kReturned, size);
  std::vector<TracedFrame> frames;
  frames.reserve(size);
  for (std::size_t i = 0; i < size; ++i) {
    const TracedFrame frame{number.valueAt(i), captured.valueAt(i), delivered.valueAt(i), returned.at(i)};
    if (frame.number < 0) number.refuse(i, "a frame's number is negative");
    if (i > 0 && frame.delivered < frames.back().delivered) {
      delivered.refuse(i, "the frame was delivered before the one before it");
    }
    frames.push_back(frame);
  }
  return frames;
}

}  // namespace

Json framesJson(const FramesTraced& event) {
  using Frame = const TracedFrame&;
  using Entry = std::optional<std::int64_t>;
  Json json = {{"event", "frames"}, {"stream", losslessText(event.stream)}, {"step", event.step}};
  json["columns"] = {{kNumber, columnJson(event.frames, [](Frame one) { return Entry(one.number); })},
                     {kCaptured, columnJson(event.frames, [](Frame one) { return Entry(one.captured); })},
                     {kDelivered, columnJson(event.frames, [](Frame one) { return Entry(one.delivered); })},
                     {kReturned, columnJson(event.frames, [](Frame one) { return one.returned; })}};
  if (event.lost > 0) json["lost"] = event.lost;
  return json;
}

FramesTraced framesFrom(const Json& json) {
  FramesTraced event{textAt(json, "stream"), get<std::uint64_t>(json, "step"), {}, 0};
  if (!std::has_single_bit(event.step)) {
    throw InputError(formatMessage("\"step\" is %@, but must be 1 or another power of two", event.step));
  }
  event.frames = rowsOf(memberOf(json, "columns"));
  event.lost = countAt(json, "lost");
  return event;
}

}  // namespace quazor
