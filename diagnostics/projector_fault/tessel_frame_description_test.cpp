#include "diagnostics/projector_fault/tessel_frame_description.h"

#include "contract/diagnostic_error.h"
#include "diagnostics/projector_fault/fixed_clock_for_tests.h"
#include "platform/capture_keys.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

using FrameRecord = QZTesselFrameDescription;

// The numbers of a record with their metadata keys and distinct values, in the order of the CSV line.
const struct NumberProperty {
  std::string_view key;
  FrameRecord::Number (FrameRecord::*get)() const;
  void (FrameRecord::*set)(const FrameRecord::Number&);
  int example;
  bool mandatory;
} kNumbers[] = {
    {"MetaDataProjectorMode", &FrameRecord::projectorMode, &FrameRecord::setProjectorMode, 101, true},
    {capture_key::InfraredLightSource, &FrameRecord::infraredLightSource, &FrameRecord::setInfraredLightSource, 102,
     true},
    {"MetaDataProjectorIndex", &FrameRecord::projectorIndex, &FrameRecord::setProjectorIndex, 103, true},
    {"MetaDataProjectorPowerLow", &FrameRecord::projectorPowerLow, &FrameRecord::setProjectorPowerLow, 104, true},
    {"MetaDataProjectorPowerHigh", &FrameRecord::projectorPowerHigh, &FrameRecord::setProjectorPowerHigh, 105, true},
    {"MetaDataProjectorPowerFlood", &FrameRecord::projectorPowerFlood, &FrameRecord::setProjectorPowerFlood, 106, true},
    {"MetaDataProjectorProbeMode", &FrameRecord::projectorProbeMode, &FrameRecord::setProjectorProbeMode, 107, true},
    {"MetaDataProjectorPowerProbeA", &FrameRecord::projectorPowerProbeA, &FrameRecord::setProjectorPowerProbeA, 108,
     true},
    {"MetaDataProjectorPowerProbeB", &FrameRecord::projectorPowerProbeB, &FrameRecord::setProjectorPowerProbeB, 109,
     true},
    {"MetaDataProjectorPulseWidth", &FrameRecord::projectorPulseWidth, &FrameRecord::setProjectorPulseWidth, 110, true},
    {capture_key::FloodActiveTemperature, &FrameRecord::floodActiveTemperature, &FrameRecord::setFloodActiveTemperature,
     111, false},
    {"NTCTemperatureIdle", &FrameRecord::NTCTemperatureIdle, &FrameRecord::setNTCTemperatureIdle, 112, true},
    {"NTCTemperatureStandby", &FrameRecord::NTCTemperatureStandby, &FrameRecord::setNTCTemperatureStandby, 113, true},
    {"NTCTemperatureActive", &FrameRecord::NTCTemperatureActive, &FrameRecord::setNTCTemperatureActive, 114, true},
    {"DIETemperatureIdle", &FrameRecord::DIETemperatureIdle, &FrameRecord::setDIETemperatureIdle, 115, true},
    {"DIETemperatureStandby", &FrameRecord::DIETemperatureStandby, &FrameRecord::setDIETemperatureStandby, 116, true},
    {"DIETemperatureActive", &FrameRecord::DIETemperatureActive, &FrameRecord::setDIETemperatureActive, 117, true},
    {"HardwareEvents", &FrameRecord::hardwareEvents, &FrameRecord::setHardwareEvents, 118, true},
};
static_assert(std::size(kNumbers) == 18);

// A value of every numeric kind, and one of every other kind.
Array valuesOfNumberKinds() {
  return {true, -3, std::numeric_limits<std::uint64_t>::max(), std::numeric_limits<std::int64_t>::min(), 36.6, 36.6F};
}
Array valuesOfOtherKinds() {
  return {"1",
          "",
          Array{1},
          Dictionary{{"a", 1}},
          Date(),
          Bytes{1},
          std::make_shared<FrameRecord>(FixedClock()),
          makeError("Domain", 1, "No number.")};
}

Dictionary fullMetadata() {
  Dictionary metadata;
  for (const NumberProperty& property : kNumbers) metadata.set(property.key, property.example);
  return metadata;
}

class TesselFrameDescription : public testing::Test {
 protected:
  std::shared_ptr<const FrameRecord> recordOf(const Dictionary& metadata) const {
    return FrameRecord::descriptionWithMonotonicCount(1, MediaTime{}, metadata, clock);
  }

  FixedClock clock;
};

TEST_F(TesselFrameDescription, StartsWithDefaults) {
  const FrameRecord record(clock);
  EXPECT_EQ(record.monotonicCount(), 0U);
  EXPECT_EQ(record.presentationTime().value, 0);
  EXPECT_EQ(record.presentationTime().timescale, 1);
  EXPECT_EQ(record.presentationTime().flags, MediaTime::kValid);
  EXPECT_EQ(record.presentationTime().epoch, 0);
  EXPECT_EQ(record.creationDate(), clock.date());
  for (const NumberProperty& property : kNumbers) {
    if (property.mandatory) {
      EXPECT_EQ((record.*property.get)(), Value(0)) << property.key;
    } else {
      EXPECT_EQ((record.*property.get)(), std::nullopt) << property.key;
    }
  }
}

TEST_F(TesselFrameDescription, IsMadeWithTheTimeAndTheNumbersOfItsFrame) {
  const MediaTime time{-7, 600, 0x80000001, 3};
  const auto record = FrameRecord::descriptionWithMonotonicCount(std::numeric_limits<std::uint64_t>::max(), time,
                                                                 fullMetadata(), clock);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->monotonicCount(), std::numeric_limits<std::uint64_t>::max());
  EXPECT_EQ(record->presentationTime(), time);
  EXPECT_EQ(record->creationDate(), clock.date());
  for (const NumberProperty& property : kNumbers) {
    EXPECT_EQ(((*record).*property.get)(), Value(property.example)) << property.key;
  }
}

TEST_F(TesselFrameDescription, IsDatedByTheClockWhenItIsMade) {
  const FrameRecord first(clock);
  const Date before = clock.date();
  clock.setDate(before + std::chrono::milliseconds(33));
  const auto second = recordOf(fullMetadata());
  ASSERT_NE(second, nullptr);
  EXPECT_EQ(first.creationDate(), before);
  EXPECT_EQ(second->creationDate(), before + std::chrono::milliseconds(33));
}

TEST_F(TesselFrameDescription, TakesTheInstalledClockUnlessHandedAnother) {
  const auto installed = std::make_shared<FixedClock>();
  installed->setDate(clock.date() + std::chrono::hours(24));
  const Platform before = installedPlatform();
  Platform platform;
  platform.clock = installed;
  installPlatform(platform);
  const Date made = FrameRecord().creationDate();
  const auto record = FrameRecord::descriptionWithMonotonicCount(1, MediaTime{}, fullMetadata());
  installPlatform(before);
  EXPECT_EQ(made, installed->date());
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->creationDate(), installed->date());
}

TEST_F(TesselFrameDescription, KeepsEveryNumberInTheKindThatItCameIn) {
  for (const NumberProperty& property : kNumbers) {
    for (const Value& value : valuesOfNumberKinds()) {
      SCOPED_TRACE(std::string(property.key) + " of kind " + std::to_string(static_cast<int>(value.kind())));
      Dictionary metadata = fullMetadata();
      metadata.set(property.key, value);
      const auto record = recordOf(metadata);
      ASSERT_NE(record, nullptr);
      EXPECT_EQ(((*record).*property.get)(), value);
    }
  }
}

TEST_F(TesselFrameDescription, IsNotMadeWithoutOneOfItsMandatoryNumbers) {
  for (const NumberProperty& property : kNumbers) {
    Dictionary metadata = fullMetadata();
    ASSERT_TRUE(metadata.erase(property.key));
    EXPECT_EQ(recordOf(metadata) == nullptr, property.mandatory) << property.key;
  }
  EXPECT_EQ(recordOf(Dictionary()), nullptr);
}

TEST_F(TesselFrameDescription, IsNotMadeOfAMandatoryValueThatIsNoNumber) {
  for (const NumberProperty& property : kNumbers) {
    for (const Value& value : valuesOfOtherKinds()) {
      Dictionary metadata = fullMetadata();
      metadata.set(property.key, value);
      EXPECT_EQ(recordOf(metadata) == nullptr, property.mandatory)
          << property.key << " of kind " << static_cast<int>(value.kind());
    }
  }
}

TEST_F(TesselFrameDescription, IsMadeWithoutAFloodTemperatureAndReadsOnBehindIt) {
  Dictionary metadata = fullMetadata();
  ASSERT_TRUE(metadata.erase(capture_key::FloodActiveTemperature));
  const auto record = recordOf(metadata);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->floodActiveTemperature(), std::nullopt);
  EXPECT_EQ(record->projectorPulseWidth(), Value(110));
  EXPECT_EQ(record->NTCTemperatureIdle(), Value(112));
  EXPECT_EQ(record->hardwareEvents(), Value(118));
}

TEST_F(TesselFrameDescription, IgnoresAFloodTemperatureThatIsNoNumber) {
  for (const Value& value : valuesOfOtherKinds()) {
    SCOPED_TRACE(static_cast<int>(value.kind()));
    Dictionary metadata = fullMetadata();
    metadata.set(capture_key::FloodActiveTemperature, value);
    const auto record = recordOf(metadata);
    ASSERT_NE(record, nullptr);
    EXPECT_EQ(record->floodActiveTemperature(), std::nullopt);
    EXPECT_EQ(record->NTCTemperatureIdle(), Value(112));
  }
}

TEST_F(TesselFrameDescription, TakesNoOtherSpellingForAKey) {
  Dictionary metadata = fullMetadata();
  ASSERT_TRUE(metadata.erase("NTCTemperatureIdle"));
  metadata.set("ntcTemperatureIdle", 1);
  metadata.set("MetaDataNTCTemperatureIdle", 1);
  EXPECT_EQ(recordOf(metadata), nullptr);
}

TEST_F(TesselFrameDescription, LeavesOtherMetadataAloneAndOutlivesIt) {
  Dictionary metadata = fullMetadata();
  metadata.set("ExposureTime", "no number");
  const auto record = recordOf(metadata);
  ASSERT_NE(record, nullptr);
  metadata.set("MetaDataProjectorMode", 999);
  EXPECT_EQ(record->projectorMode(), Value(101));
  const Dictionary atTheEnd = [] {
    Dictionary entries;
    for (auto property = std::rbegin(kNumbers); property != std::rend(kNumbers); ++property) {
      entries.set(property->key, property->example);
    }
    return entries;
  }();
  const auto backwards = recordOf(atTheEnd);
  ASSERT_NE(backwards, nullptr);
  EXPECT_EQ(backwards->csvRepresentation(), record->csvRepresentation());
}

TEST_F(TesselFrameDescription, SetsOneNumberAtATime) {
  for (const NumberProperty& property : kNumbers) {
    FrameRecord record = FrameRecord(clock);
    (record.*property.set)(Value(2.5));
    for (const NumberProperty& other : kNumbers) {
      SCOPED_TRACE(std::string(property.key) + " set, read " + std::string(other.key));
      const FrameRecord::Number untouched = other.mandatory ? FrameRecord::Number(0) : FrameRecord::Number();
      EXPECT_EQ((record.*other.get)(), &other == &property ? FrameRecord::Number(2.5) : untouched);
    }
    (record.*property.set)(std::nullopt);
    EXPECT_EQ((record.*property.get)(), std::nullopt) << property.key;
  }
}

TEST_F(TesselFrameDescription, KeepsTheKindOfEveryNumberAndNothingElse) {
  for (const Value& number : {Value(true), Value(-1), Value(1U), Value(0.1), Value(36.6F)}) {
    FrameRecord record(clock);
    record.setHardwareEvents(number);
    EXPECT_EQ(record.hardwareEvents(), number);
    record.setHardwareEvents(Value("no number"));
    EXPECT_EQ(record.hardwareEvents(), std::nullopt);
  }
}

TEST_F(TesselFrameDescription, SetsItsCountTimeAndDate) {
  FrameRecord record(clock);
  record.setMonotonicCount(42);
  EXPECT_EQ(record.monotonicCount(), 42U);
  const MediaTime time{90, 30, 5, 1};
  record.setPresentationTime(time);
  EXPECT_EQ(record.presentationTime(), time);
  record.setCreationDate(Date());
  EXPECT_EQ(record.creationDate(), Date());
}

TEST_F(TesselFrameDescription, DescribesItselfByCountAndLightSource) {
  const auto endOf = [](const FrameRecord& record) {
    const std::string text = record.description();
    const std::size_t at = text.find(" monotonic count: ");
    EXPECT_NE(at, std::string::npos) << text;
    EXPECT_GT(at, 0U) << "nothing tells which object it is: " << text;
    return at == std::string::npos ? text : text.substr(at);
  };
  FrameRecord record(clock);
  EXPECT_EQ(endOf(record), " monotonic count: 0 illuminated: 0");
  record.setMonotonicCount(7);
  record.setInfraredLightSource(Value(1));
  EXPECT_EQ(endOf(record), " monotonic count: 7 illuminated: 1");
  record.setMonotonicCount(std::numeric_limits<std::uint64_t>::max());
  record.setInfraredLightSource(Value(-2));
  EXPECT_EQ(endOf(record), " monotonic count: 18446744073709551615 illuminated: -2");
  record.setInfraredLightSource(Value(0.5));
  EXPECT_EQ(endOf(record), " monotonic count: 18446744073709551615 illuminated: 0.5");
  record.setInfraredLightSource(std::nullopt);
  EXPECT_EQ(endOf(record), " monotonic count: 18446744073709551615 illuminated: (null)");
}

TEST_F(TesselFrameDescription, HasACsvHeaderOfTwentyTitles) {
  EXPECT_EQ(FrameRecord::csvRepresentationHeader(),
            "Frame,Date,MediaTime(s),MetaDataProjectorMode,InfraredLightSource,MetaDataProjectorIndex,"
            "MetaDataProjectorPowerLow,MetaDataProjectorPowerHigh,MetaDataProjectorPowerFlood,"
            "MetaDataProjectorProbeMode,MetaDataProjectorPowerProbeA,MetaDataProjectorPowerProbeB,"
            "MetaDataProjectorPulseWidth,FloodActiveTemperature,NTCTemperatureIdle,NTCTemperatureStandby,"
            "NTCTemperatureActive,DIETemperatureIdle,DIETemperatureStandby,DIETemperatureActive\n");
}

TEST_F(TesselFrameDescription, HasACsvLineOfOneFieldMoreThanTheHeader) {
  const std::string header = FrameRecord::csvRepresentationHeader();
  const std::string line = FrameRecord(clock).csvRepresentation();
  EXPECT_EQ(std::count(header.begin(), header.end(), ',') + 1, 20);
  EXPECT_EQ(std::count(line.begin(), line.end(), ',') + 1, 21);
  EXPECT_EQ(std::count(header.begin(), header.end(), '\n'), 1);
  EXPECT_EQ(std::count(line.begin(), line.end(), '\n'), 1);
}

TEST_F(TesselFrameDescription, TellsItsDefaultsInTheCsvLine) {
  EXPECT_EQ(FrameRecord(clock).csvRepresentation(),
            "0,2026-11-21 01:08:00 +0000,0.000000,0,0,0,0,0,0,0,0,0,0,(null),0,0,0,0,0,0,0\n");
}

TEST_F(TesselFrameDescription, TellsItsFrameInTheCsvLine) {
  const auto record = FrameRecord::descriptionWithMonotonicCount(12, MediaTime{100, 30, 1, 0}, fullMetadata(), clock);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->csvRepresentation(),
            "12,2026-11-21 01:08:00 +0000,3.333333,101,102,103,104,105,106,107,108,109,110,111,112,113,114,115,116,117,"
            "118\n");
}

TEST_F(TesselFrameDescription, TellsNumbersInTheCsvLineByTheirDefaultTexts) {
  Dictionary metadata = fullMetadata();
  metadata.set("MetaDataProjectorMode", true);
  metadata.set(capture_key::InfraredLightSource, false);
  metadata.set("MetaDataProjectorIndex", -1);
  metadata.set("MetaDataProjectorPowerLow", std::numeric_limits<std::uint64_t>::max());
  metadata.set("MetaDataProjectorPowerHigh", 36.6);
  metadata.set("MetaDataProjectorPowerFlood", 36.6F);
  metadata.set("MetaDataProjectorProbeMode", 3.0);
  metadata.set(capture_key::FloodActiveTemperature, "hot");
  const auto record = FrameRecord::descriptionWithMonotonicCount(std::numeric_limits<std::uint64_t>::max(),
                                                                 MediaTime{-1, 4, 1, 0}, metadata, clock);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->csvRepresentation(),
            "18446744073709551615,2026-11-21 01:08:00 +0000,-0.250000,1,0,-1,18446744073709551615,36.6,36.6,3,108,109,"
            "110,(null),112,113,114,115,116,117,118\n");
}

TEST_F(TesselFrameDescription, TellsAbsentNumbersInTheCsvLineAsNull) {
  FrameRecord record(clock);
  record.setProjectorMode(std::nullopt);
  record.setFloodActiveTemperature(Value(21));
  record.setHardwareEvents(std::nullopt);
  EXPECT_EQ(record.csvRepresentation(),
            "0,2026-11-21 01:08:00 +0000,0.000000,(null),0,0,0,0,0,0,0,0,0,21,0,0,0,0,0,0,(null)\n");
}

TEST_F(TesselFrameDescription, TellsItsTimeInTheCsvLineInSecondsWithSixDigits) {
  const struct {
    const char* name;
    MediaTime time;
    const char* want;
  } rows[] = {
      {"a third of a second", {1, 3, 1, 0}, "0.333333"},
      {"rounded up", {2, 3, 1, 0}, "0.666667"},
      {"below a microsecond", {1, 10'000'000, 1, 0}, "0.000000"},
      {"before the stream's zero", {-1001, 1000, 1, 0}, "-1.001000"},
      {"the largest value", {std::numeric_limits<std::int64_t>::max(), 1, 1, 0}, "9223372036854775808.000000"},
      {"flags and epoch are left out", {5, 1, 0, 9}, "5.000000"},
  };
  for (const auto& row : rows) {
    FrameRecord record(clock);
    record.setPresentationTime(row.time);
    EXPECT_EQ(record.csvRepresentation(),
              std::string("0,2026-11-21 01:08:00 +0000,") + row.want + ",0,0,0,0,0,0,0,0,0,0,(null),0,0,0,0,0,0,0\n")
        << row.name;
  }
}

TEST_F(TesselFrameDescription, KnowsThatProjectionWasDisabledForSafetyByOneBit) {
  const struct {
    const char* name;
    FrameRecord::Number events;
    bool want;
  } rows[] = {
      {"the bit alone", Value(0x2000), true},
      {"the bit alone, unsigned", Value(0x2000U), true},
      {"all bits", Value(0xFFFF), true},
      {"the bit among those cut off", Value(0x12000), true},
      {"the bit of a wide integer", Value(std::uint64_t{0xFFFFFFFF'FFFF2000}), true},
      {"all bits but this one", Value(0xDFFF), false},
      {"none", Value(0), false},
      {"the bit below", Value(0x1000), false},
      {"the bit above", Value(0x4000), false},
      {"every bit below", Value(0x1FFF), false},
      {"only bits that are cut off", Value(0x10000), false},
      {"the bit sixteen places up", Value(0x20000000), false},
      {"minus one, all bits", Value(-1), true},
      {"a negative number with the bit", Value(-0x2000), true},
      {"a negative number without the bit", Value(-0x2001), false},
      {"a double", Value(8192.0), true},
      {"a double that is truncated onto the bit", Value(8192.9), true},
      {"a double that is truncated below the bit", Value(8191.9), false},
      {"a double beyond sixteen bits", Value(65536.0), true},
      {"a negative double", Value(-8192.0), false},
      {"not a number", Value(std::numeric_limits<double>::quiet_NaN()), false},
      {"a float", Value(8192.0F), true},
      {"a float below the bit", Value(4096.0F), false},
      {"a boolean", Value(true), false},
      {"absent", std::nullopt, false},
  };
  for (const auto& row : rows) {
    FrameRecord record(clock);
    record.setHardwareEvents(row.events);
    EXPECT_EQ(record.safetyDisabledProjection(), row.want) << row.name;
  }
}

TEST_F(TesselFrameDescription, LooksForTheSafetyBitInTheHardwareEventsOnly) {
  for (const NumberProperty& property : kNumbers) {
    FrameRecord record = FrameRecord(clock);
    (record.*property.set)(Value(0x2000));
    EXPECT_EQ(record.safetyDisabledProjection(), property.key == "HardwareEvents") << property.key;
  }
}

}  // namespace
}  // namespace quazor
