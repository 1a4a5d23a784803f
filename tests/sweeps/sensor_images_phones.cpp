#include "tests/sweeps/sensor_images_phones.h"

#include "tests/support/shipped_scenario.h"

#include <chrono>
#include <optional>
#include <utility>

namespace quazor {

using namespace std::chrono_literals;
using sensor_oracle::Receiver;

namespace {

// A display sensor.
HidDeviceConfig sensor() {
  HidDeviceConfig sensor;
  sensor.name = "display-sensor";
  sensor.usagePage = 0xFF00;
  sensor.usage = 0x24;
  sensor.featureReports = {{0xAB, {0, 1}, 1}, {0xAC, {0, 1}, 1}};
  sensor.rate = 20;
  sensor.images = {1,
                   static_cast<std::int32_t>(sensor_oracle::kAmplitude),
                   static_cast<std::int32_t>(sensor_oracle::kOffsetI),
                   static_cast<std::int32_t>(sensor_oracle::kOffsetQ),
                   sensor_oracle::kPhaseStep,
                   sensor_oracle::kPhaseStepPerImage,
                   std::stof(sensor_oracle::kCelsius)};
  return sensor;
}

Scenario phone() {
  Scenario scenario;
  scenario.title = "A phone whose display sensor can be tried";
  scenario.hidDevices = {sensor()};
  scenario.display.properties = published(true);
  return scenario;
}

// A copy of the phone with a change.
template <class Change>
Scenario phoneWith(Change&& change) {
  Scenario scenario = phone();
  change(scenario, scenario.hidDevices.front());
  return scenario;
}

Scenario atRate(double rate) {
  return phoneWith([rate](Scenario&, HidDeviceConfig& sensor) { sensor.rate = rate; });
}
HidReportShape shapeOf(std::uint8_t id, std::optional<std::uint64_t> length = {}) { return {id, length, {}}; }
HidReportShape errorShape() {
  return {{}, {}, FaultError{"SensorErrorDomain", -536870174, "The sensor does not answer."}};
}
Scenario withErrorAt(std::uint64_t number, double rate = 20) {
  return phoneWith([number, rate](Scenario&, HidDeviceConfig& sensor) {
    sensor.rate = rate;
    sensor.single[number] = errorShape();
  });
}
Scenario removedAfter(std::uint64_t number) {
  return phoneWith([number](Scenario&, HidDeviceConfig& sensor) { sensor.removedAfter = number; });
}
Scenario withoutSensor() {
  return phoneWith([](Scenario& scenario, HidDeviceConfig&) { scenario.hidDevices.clear(); });
}
Scenario ofUsage(std::uint16_t page, std::uint16_t usage) {
  return phoneWith([page, usage](Scenario&, HidDeviceConfig& sensor) {
    sensor.usagePage = page;
    sensor.usage = usage;
  });
}
Scenario withAnother(std::uint16_t page, std::uint16_t usage) {
  return phoneWith([page, usage](Scenario& scenario, HidDeviceConfig& first) {
    HidDeviceConfig other = first;
    other.name = "other-sensor";
    other.usagePage = page;
    other.usage = usage;
    scenario.hidDevices.push_back(std::move(other));
  });
}

}  // namespace

Dictionary published(const Value& power) {
  return {{"DSPLY Debug Info", Dictionary{{"DSPLY power info", Dictionary{{"DSPLY power info panel", power}}}}}};
}

Scenario withReports(std::uint64_t count) {
  return phoneWith([count](Scenario&, HidDeviceConfig& sensor) { sensor.reportCount = count; });
}

Scenario withDisplay(const Dictionary& properties) {
  return phoneWith([&properties](Scenario& scenario, HidDeviceConfig&) { scenario.display.properties = properties; });
}

const std::vector<Sweep>& sensorSweeps() {
  static const std::vector<Sweep> kSweeps = {
      {"OneImage", true, phone(), {.images = 1}},
      {"TwoImages", true, phone()},
      {"FiveImagesOfTheHealthyPhone", true, shippedScenario("healthy"), {.images = 5, .timeout = 2}},
      {"NoImageWanted", true, phone(), {.images = 0}},
      {"AsManyImagesAsThereAre", true, withReports(2)},
      {"TooFewImages", false, withReports(1)},
      {"NoReports", false, withReports(0)},
      {"SlowSensor", false, atRate(3), {.images = 3}, "", true},
      {"LastImageAtTheEndOfTheTime", false, phone(), {.images = 20}, "", true},
      {"NoTime", false, phone(), {.timeout = 0}},
      {"EndlessTime", true, withReports(2), {.timeout = kEndlessSeconds}},
      {"EndlessWait", false, withReports(1), {.timeout = kEndlessSeconds}},
      {"FrameIDsThatWrap", true,
       phoneWith([](Scenario&, HidDeviceConfig& sensor) { sensor.images.firstFrameID = 0xFFFFFFFF; })},
      {"OtherReportsBetween", true, phoneWith([](Scenario&, HidDeviceConfig& sensor) {
         sensor.single = {{0, shapeOf(0x75)},
                          {1, shapeOf(0x76, 791)},
                          {3, shapeOf(0x77, 4)},
                          {4, shapeOf(0x76, 1)},
                          {5, shapeOf(0x76, 793)}};
       })},
      {"OtherReportsOnly",
       false,
       phoneWith([](Scenario&, HidDeviceConfig& sensor) {
         sensor.rate = 5;
         sensor.every = shapeOf(0x77);
       }),
       {},
       "",
       true},
      {"ErrorAtOnce", false, withErrorAt(0)},
      {"ErrorInMidStream", false, withErrorAt(2), {.images = 3}},
      {"ErrorBehindTheLastImage", true, withErrorAt(2)},
      {"ErrorAtTheEndOfTheTime", false, withErrorAt(1, 2), {}, "", true},
      {"Removed", false, removedAfter(1)},
      {"RemovedAtOnce", false, removedAfter(0)},
      {"NoSensor", false, withoutSensor()},
      {"OtherUsage", false, ofUsage(0xFF00, 0x25)},
      {"OtherUsagePage", false, ofUsage(0xFF01, 0x24)},
      {"TwoSensors", false, withAnother(0xFF00, 0x24)},
      {"AnotherDevice", true, withAnother(0x0C, 1)},
      {"PowerModeRefused", false, phoneWith([](Scenario&, HidDeviceConfig& sensor) {
         sensor.featureReports[0] = {0xAB, {0, 2}, 2};
       })},
      {"StreamingModeRefused", false, phoneWith([](Scenario&, HidDeviceConfig& sensor) {
         sensor.featureReports[1] = {0xAD, {}, 1};
       })},
      {"NoDisplay", false, phoneWith([](Scenario& scenario, HidDeviceConfig&) { scenario.display.present = false; })},
      {"NoRegistryEntry", false,
       phoneWith([](Scenario& scenario, HidDeviceConfig&) { scenario.display.registryService = false; })},
      {"PowerUnknown", false, withDisplay({{"DSPLY Debug Info", Dictionary()}}), {}, kNoPowerState},
      {"PropertyMissing", false, withDisplay({}), {}, kNoPowerState},
      {"DisplayOff", false, withDisplay(published(false)), {}, kNotPowered},
      {"SharedLoop", true, phone(), {.others = {.source = 0ns}}},
      {"BusyLoop", true, phone(), {.others = {.source = 160ms}}},
      {"ErrorInABusyLoop", false, withErrorAt(2), {.others = {.source = 210ms}}},
      {"LoopBusyBeyondTheTime", false, phone(), {.others = {.source = 1010ms}}},
      {"LoopStopped", true, phone(), {.images = 5, .others = {.stop = 125ms}}},
      {"LoopStoppedBeforeTheFirstImage", true, phone(), {.others = {.stop = 25ms}}},
      {"Stream",
       true,
       phoneWith([](Scenario&, HidDeviceConfig& sensor) {
         sensor.rate = 6;
         sensor.single[1] = shapeOf(0x75);
       }),
       {.receiver = Receiver::kListens},
       "",
       true},
      {"StreamWithoutTime", true, phone(), {.timeout = 0, .receiver = Receiver::kListens}},
      {"StreamThatFails", true, withErrorAt(1), {.receiver = Receiver::kListens}},
      {"StreamWithoutDelegate", true, withErrorAt(1), {.receiver = Receiver::kNone}},
      {"StreamClosedByItsDelegate", true, atRate(6), {.receiver = Receiver::kCloses}},
      {"StreamClosedByItsDelegateInABusyLoop",
       true,
       phone(),
       {.receiver = Receiver::kCloses, .others = {.source = 160ms}}},
      {"StreamOfNoSensor", false, withoutSensor(), {.receiver = Receiver::kListens}},
  };
  return kSweeps;
}

}  // namespace quazor
