// The experiment with capture services that return values no healthy phone returns.
#include "diagnostics/camera_sync/camera_sync_for_tests.h"

#include <cstdint>
#include <limits>

namespace quazor {
namespace {

using CameraSyncExperimentEdges = ScriptedCameraSyncTest;

// The log line for the wide camera's session entry if that camera is the master.
std::string reportLine(std::string_view offset, std::string_view frames, std::string_view total) {
  return formatMessage(
      "log default: BackFacingCamera <-- sync master\n  Offset: %@\n  Frames: %@\n  Total: %@\n"
      "  ErrorCounters: {Count = 0}\n\n",
      offset, frames, total);
}

TEST_F(CameraSyncExperimentEdges, ReadsTheNumbersOfAStatusEntryByTheRulesOfValues) {
  constexpr std::uint64_t kTwoTo63 = std::uint64_t{1} << 63U;
  constexpr std::uint64_t kAllOnes = std::numeric_limits<std::uint64_t>::max();
  const struct {
    const char* name;
    Value entry;
    std::string report;
    std::string_view offset;  // as measured, in frames
    std::string_view frames;
  } rows[] = {
      {"signed", statusEntry(3, 57), reportLine("3", "57", "60"), "3", "57"},
      {"unsigned", statusEntry(3U, 57U), reportLine("3", "57", "60"), "3", "57"},
      {"no frame at all is not negative", statusEntry(0, 0), reportLine("0", "0", "0"), "0", "0"},
      {"fractions are cut off in the total", statusEntry(1.75, 57.5), reportLine("1.75", "57.5", "58"), "1.75", "57.5"},
      {"minus a half is no negative integer", statusEntry(0, -0.5), reportLine("0", "-0.5", "0"), "0", "-0.5"},
      {"the highest signed integer", statusEntry(0U, kTwoTo63 - 1),
       reportLine("0", "9223372036854775807", "9223372036854775807"), "0", "9223372036854775808"},
      {"a total beyond 64 bits wraps", statusEntry(kAllOnes, 2), reportLine("18446744073709551615", "2", "1"),
       "18446744073709551616", "2"},
      {"a negative offset wraps in the total alone", statusEntry(-3, 1), reportLine("-3", "1", "18446744073709551614"),
       "-3", "1"},
      {"no numbers", Dictionary(), reportLine("(null)", "(null)", "0"), "0", "0"},
      {"no offset", Dictionary{{"FrameCount", 57}}, reportLine("(null)", "57", "57"), "0", "57"},
      {"no frame count", Dictionary{{"Offset", 3}}, reportLine("3", "(null)", "3"), "3", "0"},
      {"strings are no numbers", statusEntry("3", "57"), reportLine("0", "0", "0"), "0", "0"},
  };
  for (const auto& row : rows) {
    setStatus(kWidePort, row.entry);
    EXPECT_EQ(
        from(run({kWidePort}), "log default: BackFacingCamera"),
        row.report + "wide stop\ndevice relinquish control (wide)\nreturned a result\nerror untouched\n" +
            formatMessage("BackWide.FrameOffset = %@ frames\nBackWide.Frames = %@ frames\n", row.offset, row.frames) +
            "ErrorCounters = {BackWide = {Count = 0}}\n")
        << row.name;
  }
}

TEST_F(CameraSyncExperimentEdges, ANegativeFrameCountCountsAsZeroAndEndsTheRunWithoutAnError) {
  const struct {
    const char* name;
    Value frames;
  } rows[] = {
      {"minus one", -1},
      {"minus one as a double", -1.0},
      {"the lowest signed integer", std::numeric_limits<std::int64_t>::min()},
      {"below all integers", -1e300},
      {"unsigned 2^63 is negative when read as signed", std::uint64_t{1} << 63U},
      {"the highest unsigned integer is minus one", std::numeric_limits<std::uint64_t>::max()},
  };
  for (const auto& row : rows) {
    setStatus(kWidePort, statusEntry(4, row.frames));
    EXPECT_EQ(from(run({kWidePort}), "log error"), "log error: BackFacingCamera did not record any frames!\n" +
                                                       reportLine("4", "0", "4") +
                                                       "wide stop\ndevice relinquish control (wide)\n"
                                                       "returned nothing\nerror emptied\n")
        << row.name;
  }
}

TEST_F(CameraSyncExperimentEdges, TakesAStatusEntryThatIsNoDictionaryForMissing) {
  for (const Value& entry : {Value(60), Value("60"), Value(Array{0, 60}), Value(true)}) {
    setStatus(kTelePort, entry);
    EXPECT_EQ(from(run({kWidePort, kTelePort}), "log error"),
              "log error: No status available for port BackFacingTelephotoCamera\n"
              "tele stop\nwide stop\ndevice relinquish control (wide, tele)\n"
              "returned nothing\n"
              "error QZCapturePlugInErrorDomain code 215: Status for port BackFacingTelephotoCamera not available!\n")
        << defaultText(entry);
  }
}

TEST_F(CameraSyncExperimentEdges, TakesASessionStatusThatIsNoDictionaryForOneWithoutPorts) {
  device->properties.set(capture_key::MulticamSessionStatus, "running");
  EXPECT_EQ(from(run({kWidePort}), "log error"),
            "log error: No status available for port BackFacingCamera\n"
            "wide stop\ndevice relinquish control (wide)\n"
            "returned nothing\n"
            "error QZCapturePlugInErrorDomain code 215: Status for port BackFacingCamera not available!\n");
}

TEST_F(CameraSyncExperimentEdges, AHardFailureAfterACameraWithoutFramesIsTheOneThatIsTold) {
  setStatus(kWidePort, statusEntry(0, -1));
  tele->properties.erase(capture_key::ErrorCounters);
  const std::string text = run({kWidePort, kTelePort, kSuperPort});
  EXPECT_EQ(from(text, "tele get ErrorCounters"),
            "tele get ErrorCounters -> failed\n"
            "log error: Failed to get error counters of steam at BackFacingTelephotoCamera port! (null)\n"
            "super stop\ntele stop\nwide stop\ndevice relinquish control (wide, tele, super)\n"
            "returned nothing\n"
            "error QZCapturePlugInErrorDomain code 210: No error counters for port BackFacingTelephotoCamera!\n");
}

TEST_F(CameraSyncExperimentEdges, ReportsTheCamerasBehindOneWithoutFramesToo) {
  setStatus(kWidePort, statusEntry(0, -1));
  const std::string text = run({kWidePort, kTelePort});
  EXPECT_EQ(from(text, "log error"),
            "log error: BackFacingCamera did not record any frames!\n" + reportLine("0", "0", "0") +
                "tele get ErrorCounters\n"
                "log default: BackFacingTelephotoCamera\n  Offset: 1\n  Frames: 59\n  Total: 60\n"
                "  ErrorCounters: {Count = 0}\n\n"
                "tele stop\nwide stop\ndevice relinquish control (wide, tele)\n"
                "returned nothing\nerror emptied\n");
}

TEST_F(CameraSyncExperimentEdges, PassesErrorCountersOnUnread) {
  wide->properties.set(capture_key::ErrorCounters, "many");
  tele->properties.set(capture_key::ErrorCounters, Array{1, "two"});
  const std::string text = run({kWidePort, kTelePort});
  EXPECT_NE(text.find("\n  ErrorCounters: many\n"), std::string::npos) << text;
  EXPECT_EQ(from(text, "ErrorCounters = "), "ErrorCounters = {BackWide = many; BackTele = (1, two)}\n");
}

TEST_F(CameraSyncExperimentEdges, FindsTheMasterByIdentity) {
  const auto twin = makeStream("wide", kWidePort);
  const struct {
    const char* name;
    std::optional<Value> master;
  } rows[] = {
      {"none", std::nullopt},
      {"no object", "wide"},
      {"a number", 0},
      {"an object that is no stream", group},
      {"a stream that reads alike", twin},
      {"a stream that was not asked for", super},
      {"the stream of the second port", tele},
  };
  for (const auto& row : rows) {
    group->properties.erase(capture_key::SynchronizationMaster);
    if (row.master) group->properties.set(capture_key::SynchronizationMaster, *row.master);
    EXPECT_EQ(from(run({kWidePort, kTelePort}), "log "),
              "log error: The sync master port must be provided first!\n" + std::string(kNotSynchronized))
        << row.name;
  }
}

TEST_F(CameraSyncExperimentEdges, TakesTheFirstOfTwoStreamsWithOnePort) {
  const auto secondTele = makeStream("second-tele", kTelePort);
  device->groups = {makeGroup("twins", {wide, tele, secondTele})};
  const std::string text = run({kWidePort, kTelePort});
  EXPECT_NE(text.find("device request control (wide, tele)\n"), std::string::npos) << text;
  EXPECT_EQ(text.find("second-tele"), std::string::npos) << text;
}

TEST_F(CameraSyncExperimentEdges, APortThatIsAskedForTwiceIsConfiguredWhereverItStands) {
  group->properties.set(capture_key::MasterConfigurationSupportedKeys, Array());
  const std::string text = run({kWidePort, kTelePort, kTelePort});
  EXPECT_NE(text.find("device request control (wide, tele, tele)\n"), std::string::npos) << text;
  const std::string configuration =
      "tele set SynchronizedStreamsSlaveConfiguration = {StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; "
      "TimeMachineEnabled = 0; MasterToSlaveFrameRateRatio = 1}\n";
  // One log entry, although the port occurs twice: the streams are scanned once.
  EXPECT_EQ(between(text, "log default: Device does not support", "wide set FormatIndex"),
            "log default: Device does not support SlaveConfigurationByPortType, using "
            "SynchronizedStreamsSlaveConfiguration instead.\n"
            "wide get PortType\n"
            "tele get PortType\n" +
                configuration + "tele get PortType\n" + configuration);
  EXPECT_EQ(from(text, "returned"),
            "returned a result\nerror untouched\n"
            "BackWide.FrameOffset = 0 frames\nBackWide.Frames = 60 frames\n"
            "BackTele.FrameOffset = 1 frames\nBackTele.Frames = 59 frames\n"
            "ErrorCounters = {BackWide = {Count = 0}; BackTele = {Count = 0}}\n");
}

TEST_F(CameraSyncExperimentEdges, LeavesAPortWithoutACameraNameOutOfTheResultAlone) {
  const auto side = makeStream("side", kSidePort);
  device->groups = {makeGroup("odd", {wide, side, tele})};
  const std::string text = run({kWidePort, kSidePort, kTelePort});
  EXPECT_NE(text.find("log default: SideFacingCamera\n  Offset: 3\n  Frames: 57\n"), std::string::npos) << text;
  EXPECT_EQ(from(text, "returned"),
            "returned a result\nerror untouched\n"
            "BackWide.FrameOffset = 0 frames\nBackWide.Frames = 60 frames\n"
            "BackTele.FrameOffset = 1 frames\nBackTele.Frames = 59 frames\n"
            "ErrorCounters = {BackWide = {Count = 0}; BackTele = {Count = 0}}\n");
}

}  // namespace
}  // namespace quazor
