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

// How an event of a kind is written, and what the refusals of a reader call it.
struct Names {
  const char* event;
  const char* stream;
  const char* number;
  const char* captured;
  const char* delivered;
  const char* returned;
  const char* rows;
  const char* negative;
  const char* goesBack;
};

constexpr Names kOfFrames{"frames",
                          "stream",
                          "number",
                          "captured",
                          "delivered",
                          "returned",
                          "frames",
                          "a frame's number is negative",
                          "the frame was delivered before the one before it"};
constexpr Names kOfTasks{"tasks",
                         "queue",
                         "thread",
                         "posted",
                         "begun",
                         "ended",
                         "tasks",
                         "a thread's number is negative",
                         "the task began before the one before it"};

const Names& namesOf(TracedKind kind) { return kind == TracedKind::kFrames ? kOfFrames : kOfTasks; }

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
  // `first` is the column with the expected size.
  Column(const Json& columns, const char* name, const char* first, std::size_t size)
      : name_(name), entries_(arrayAt(columns, name)) {
    if (entries_.size() != size) {
      throw InputError(
          formatMessage("the column \"%@\" has %@ entries, but \"%@\" has %@", name_, entries_.size(), first, size));
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

void refuseOtherColumns(const Json& columns, const Names& names) {
  if (!columns.is_object()) throw InputError("\"columns\" is not an object");
  for (const auto& [name, column] : columns.items()) {
    if (name != names.number && name != names.captured && name != names.delivered && name != names.returned) {
      throw InputError("unknown column '" + name + "'");
    }
  }
}

std::vector<TracedFrame> rowsOf(const Json& columns, const Names& names) {
  refuseOtherColumns(columns, names);
  const std::size_t size = arrayAt(columns, names.number).size();
  if (size > kMaxTracedFrames) {
    throw InputError(
        formatMessage("\"columns\" has %@ %@, but at most %@ are told at once", size, names.rows, kMaxTracedFrames));
  }
  Column number(columns, names.number, names.number, size);
  Column captured(columns, names.captured, names.number, size);
  Column delivered(columns, names.delivered, names.number, size);
  Column returned(columns, names.returned, names.number, size);
  std::vector<TracedFrame> rows;
  rows.reserve(size);
  for (std::size_t i = 0; i < size; ++i) {
    const TracedFrame row{number.valueAt(i), captured.valueAt(i), delivered.valueAt(i), returned.at(i)};
    if (row.number < 0) number.refuse(i, names.negative);
    if (i > 0 && row.delivered < rows.back().delivered) delivered.refuse(i, names.goesBack);
    rows.push_back(row);
  }
  return rows;
}

}  // namespace

Json framesJson(const FramesTraced& event) {
  using Row = const TracedFrame&;
  using Entry = std::optional<std::int64_t>;
  const Names& names = namesOf(event.kind);
  Json json = {{"event", names.event}, {names.stream, losslessText(event.stream)}, {"step", event.step}};
  json["columns"] = {{names.number, columnJson(event.frames, [](Row one) { return Entry(one.number); })},
                     {names.captured, columnJson(event.frames, [](Row one) { return Entry(one.captured); })},
                     {names.delivered, columnJson(event.frames, [](Row one) { return Entry(one.delivered); })},
                     {names.returned, columnJson(event.frames, [](Row one) { return one.returned; })}};
  if (event.lost > 0) json["lost"] = event.lost;
  return json;
}

FramesTraced framesFrom(const Json& json, TracedKind kind) {
  const Names& names = namesOf(kind);
  FramesTraced event{textAt(json, names.stream), get<std::uint64_t>(json, "step"), {}, 0, kind};
  if (!std::has_single_bit(event.step)) {
    throw InputError(formatMessage("\"step\" is %@, but must be 1 or another power of two", event.step));
  }
  event.frames = rowsOf(memberOf(json, "columns"), names);
  event.lost = countAt(json, "lost");
  return event;
}

}  // namespace quazor
