#include "backends/simulated/scenario/scenario_frames.h"

#include "backends/simulated/scenario/scenario_parts.h"
#include "platform/clock.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>

namespace quazor {
namespace {

constexpr std::uint64_t kMaxCount = 1'000'000'000;
constexpr std::uint64_t kMaxQueues = 64;
constexpr double kLatest = 1e9;
constexpr double kMaxStampChange = 86'400;  // seconds
constexpr std::uint64_t kAnyCount = std::numeric_limits<std::uint64_t>::max();

FrameAttachment readAttachment(const JsonCursor& cursor) {
  constexpr std::array<std::string_view, 4> kWords{"dictionary", "missing", "text", "number"};
  constexpr std::array kKinds{FrameAttachment::kDictionary, FrameAttachment::kMissing, FrameAttachment::kText,
                              FrameAttachment::kNumber};
  const std::string word = cursor.oneOf(kWords, "a kind of attachment");
  return kKinds[static_cast<std::size_t>(std::ranges::find(kWords, word) - kWords.begin())];
}

void readMetadata(const JsonCursor& cursor, FrameMetadata& metadata) {
  if (const auto attachment = cursor.find("attachment")) metadata.attachment = readAttachment(*attachment);
  if (const auto overrides = cursor.find("metadata")) {
    for (const auto& [key, value] : overrides->entries()) metadata.overrides.set(key, value.scalar());
  }
  if (const auto without = cursor.find("without")) {
    for (const JsonCursor& key : without->elements()) metadata.without.push_back(key.text());
  }
}

std::chrono::nanoseconds readTime(const JsonCursor& cursor) {
  return nanosecondsFromSeconds(cursor.positiveNumber(kLatest));
}

TimeStampChange readTimeStampChange(const JsonCursor& cursor) {
  cursor.allowKeys({"at", "every", "by", "valid"});
  TimeStampChange change;
  change.at = cursor.at("at").integer(0, kMaxCount);
  if (const auto every = cursor.find("every")) change.every = every->integer(1, kMaxCount);
  if (const auto by = cursor.find("by"))
    change.by = nanosecondsFromSeconds(by->number(-kMaxStampChange, kMaxStampChange));
  if (const auto valid = cursor.find("valid")) change.isValid = valid->boolean();
  return change;
}

ReportChannelConfig readChannel(const JsonCursor& cursor) {
  ReportChannelConfig channel;
  const auto readCount = [&channel](const JsonCursor& count) {
    if (count.isString()) {
      constexpr std::array<std::string_view, 1> kWords{"none"};
      count.oneOf(kWords, "a count");
      channel.count.reset();
    } else {
      channel.count = count.integer(0, kAnyCount);
    }
  };
  if (!cursor.isObject()) {
    readCount(cursor);
    return channel;
  }
  cursor.allowKeys({"count", "growth", "growthAt"});
  if (const auto count = cursor.find("count")) readCount(*count);
  if (const auto growth = cursor.find("growth")) channel.growth = growth->integer(0, kMaxCount);
  if (const auto steps = cursor.find("growthAt")) {
    for (const JsonCursor& step : steps->elements()) {
      step.allowKeys({"at", "by"});
      channel.steps.push_back({readTime(step.at("at")), step.at("by").integer(0, kAnyCount)});
    }
  }
  return channel;
}

}  // namespace

Projector readProjector(const JsonCursor& cursor) {
  cursor.allowKeys({"attachment", "metadata", "without", "frames"});
  Projector projector;
  readMetadata(cursor, projector.metadata);
  if (const auto frames = cursor.find("frames")) {
    for (const auto& [number, frame] : frames->entries()) {
      frame.allowKeys({"attachment", "metadata", "without"});
      readMetadata(frame, projector.frames[readNumberKey(number, "a frame", kMaxCount, frame)]);
    }
  }
  return projector;
}

DeliveryConfig readDelivery(const JsonCursor& cursor) {
  cursor.allowKeys({"bursts", "timeStamps", "events", "framesAfterStop", "queues", "stopWaitsForHandlers"});
  DeliveryConfig delivery;
  if (const auto bursts = cursor.find("bursts")) {
    for (const JsonCursor& burst : bursts->elements()) {
      burst.allowKeys({"at", "count"});
      delivery.bursts.push_back({burst.at("at").integer(0, kMaxCount), burst.at("count").integer(1, kMaxCount)});
    }
  }
  if (const auto changes = cursor.find("timeStamps")) {
    for (const JsonCursor& change : changes->elements()) delivery.timeStamps.push_back(readTimeStampChange(change));
  }
  if (const auto events = cursor.find("events")) {
    for (const JsonCursor& event : events->elements()) {
      event.allowKeys({"at", "number"});
      const JsonCursor number = event.at("number");
      if (!std::in_range<std::int32_t>(number.integer())) number.failType("a signed 32-bit integer");
      delivery.events.push_back({readTime(event.at("at")), static_cast<std::int32_t>(number.integer())});
    }
  }
  if (const auto late = cursor.find("framesAfterStop")) delivery.framesAfterStop = late->integer(0, kMaxCount);
  if (const auto queues = cursor.find("queues")) delivery.queues = queues->integer(1, kMaxQueues);
  if (const auto waits = cursor.find("stopWaitsForHandlers")) delivery.stopWaitsForHandlers = waits->boolean();
  return delivery;
}

Dictionary readErrorCounterGrowth(const JsonCursor& cursor) {
  Dictionary growth;
  for (const auto& [name, perSecond] : cursor.entries()) growth.set(name, perSecond.integer(0, kMaxCount));
  return growth;
}

std::vector<ReportChannelConfig> readReports(const JsonCursor& cursor) {
  std::vector<ReportChannelConfig> channels;
  for (const auto& [group, subGroups] : cursor.entries()) {
    for (const auto& [subGroup, names] : subGroups.entries()) {
      for (const auto& [name, entry] : names.entries()) {
        ReportChannelConfig channel = readChannel(entry);
        channel.group = group;
        channel.subGroup = subGroup;
        channel.name = name;
        channels.push_back(std::move(channel));
      }
    }
  }
  return channels;
}

}  // namespace quazor
