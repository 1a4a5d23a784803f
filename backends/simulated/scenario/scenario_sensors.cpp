#include "backends/simulated/scenario/scenario_sensors.h"

#include "backends/faults/fault_reader.h"
#include "backends/faults/hid_report_name.h"
#include "backends/simulated/scenario/scenario_parts.h"

#include <cstdint>
#include <limits>
#include <optional>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

constexpr std::uint64_t kMaxReports = 1'000'000'000;
constexpr std::uint64_t kMaxReportLength = 16384;
constexpr double kMaxRate = 1000;
constexpr double kMaxAngle = 360;
constexpr double kHottest = 1000;
constexpr std::uint64_t kHighest16 = std::numeric_limits<std::uint16_t>::max();
constexpr std::uint64_t kHighest8 = std::numeric_limits<std::uint8_t>::max();

std::uint8_t readByte(const JsonCursor& cursor) { return static_cast<std::uint8_t>(cursor.integer(0, kHighest8)); }

std::uint8_t readReportID(const std::string& text, const JsonCursor& cursor) {
  if (const std::optional<std::uint8_t> id = hidReportNamed(text)) return *id;
  cursor.fail(inQuotes(text) + " is not a report ID; write it with two digits, like \"0x0A\".");
}

std::int32_t readSigned32(const JsonCursor& cursor) {
  if (!std::in_range<std::int32_t>(cursor.integer())) cursor.failType("a signed 32-bit integer");
  return static_cast<std::int32_t>(cursor.integer());
}

HidFeatureReport readFeatureReport(const std::string& id, const JsonCursor& cursor) {
  cursor.allowKeys({"accepts", "streamsAt"});
  HidFeatureReport report;
  report.id = readReportID(id, cursor);
  if (const auto accepts = cursor.find("accepts")) {
    for (const JsonCursor& value : accepts->elements()) {
      if (!report.accepts.insert(readByte(value)).second) value.fail("the value is listed twice; remove one.");
    }
    if (report.accepts.empty()) accepts->fail("a feature report must accept at least one value.");
  }
  if (const auto value = cursor.find("streamsAt")) {
    report.streamsAt = readByte(*value);
    if (!report.accepts.empty() && !report.accepts.contains(*report.streamsAt)) {
      value->fail("must be one of the values that the report accepts.");
    }
  }
  return report;
}

void readShape(const JsonCursor& cursor, HidReportShape& shape) {
  if (const auto id = cursor.find("reportID")) shape.reportID = readReportID(id->text(), *id);
  if (const auto length = cursor.find("length")) shape.length = length->integer(1, kMaxReportLength);
}

HidReportShape readSingle(const JsonCursor& cursor) {
  cursor.allowKeys({"reportID", "length", "error"});
  HidReportShape shape;
  readShape(cursor, shape);
  if (const auto error = cursor.find("error")) {
    if (shape.reportID || shape.length)
      error->fail("an error replaces the report, so it cannot have \"reportID\" or \"length\".");
    shape.error = readFaultError(*error);
  }
  return shape;
}

void readInputReports(const JsonCursor& cursor, HidDeviceConfig& device) {
  cursor.allowKeys({"rate", "count", "removedAfter", "reportID", "length", "single"});
  if (const auto rate = cursor.find("rate")) device.rate = rate->positiveNumber(kMaxRate);
  if (const auto count = cursor.find("count")) device.reportCount = count->integer(0, kMaxReports);
  if (const auto removed = cursor.find("removedAfter")) {
    if (device.reportCount) removed->fail("\"removedAfter\" already ends the reports; remove \"count\".");
    device.removedAfter = removed->integer(0, kMaxReports);
  }
  readShape(cursor, device.every);
  if (const auto single = cursor.find("single")) {
    for (const auto& [number, shape] : single->entries()) {
      device.single[readNumberKey(number, "a report", kMaxReports, shape)] = readSingle(shape);
    }
  }
}

HidImages readImages(const JsonCursor& cursor) {
  cursor.allowKeys(
      {"firstFrameID", "amplitude", "offsetI", "offsetQ", "phaseStep", "phaseStepPerImage", "temperature"});
  HidImages images;
  if (const auto first = cursor.find("firstFrameID")) {
    images.firstFrameID = static_cast<std::uint32_t>(first->integer(0, std::numeric_limits<std::uint32_t>::max()));
  }
  if (const auto amplitude = cursor.find("amplitude")) images.amplitude = readSigned32(*amplitude);
  if (const auto offset = cursor.find("offsetI")) images.offsetI = readSigned32(*offset);
  if (const auto offset = cursor.find("offsetQ")) images.offsetQ = readSigned32(*offset);
  if (const auto step = cursor.find("phaseStep")) images.phaseStep = step->number(-kMaxAngle, kMaxAngle);
  if (const auto step = cursor.find("phaseStepPerImage")) {
    images.phaseStepPerImage = step->number(-kMaxAngle, kMaxAngle);
  }
  if (const auto temperature = cursor.find("temperature")) {
    images.temperature = static_cast<float>(temperature->number(-kHottest, kHottest));
  }
  return images;
}

Value readValue(const JsonCursor& cursor) {
  if (cursor.isObject()) {
    Dictionary dictionary;
    for (const auto& [key, value] : cursor.entries()) dictionary.set(key, readValue(value));
    return Value(std::move(dictionary));
  }
  if (!cursor.isArray()) return cursor.scalar();
  Array array;
  for (const JsonCursor& element : cursor.elements()) array.push_back(readValue(element));
  return Value(std::move(array));
}

}  // namespace

HidDeviceConfig readHidDevice(const std::string& name, const JsonCursor& cursor) {
  cursor.allowKeys({"usagePage", "usage", "featureReports", "reports", "images"});
  HidDeviceConfig device;
  device.name = name;
  device.usagePage = static_cast<std::uint16_t>(cursor.at("usagePage").integer(0, kHighest16));
  device.usage = static_cast<std::uint16_t>(cursor.at("usage").integer(0, kHighest16));
  if (const auto reports = cursor.find("featureReports")) {
    for (const auto& [id, report] : reports->entries()) device.featureReports.push_back(readFeatureReport(id, report));
  }
  if (const auto reports = cursor.find("reports")) readInputReports(*reports, device);
  if (const auto images = cursor.find("images")) device.images = readImages(*images);
  return device;
}

DisplayConfig readDisplay(const JsonCursor& cursor) {
  cursor.allowKeys({"present", "registryService", "properties"});
  DisplayConfig display;
  if (const auto present = cursor.find("present")) display.present = present->boolean();
  if (const auto service = cursor.find("registryService")) display.registryService = service->boolean();
  if (const auto properties = cursor.find("properties")) {
    for (const auto& [name, value] : properties->entries()) display.properties.set(name, readValue(value));
  }
  return display;
}

}  // namespace quazor
