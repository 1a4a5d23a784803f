// The exact arguments of the experiment's calls to the capture service, including types and objects.
#include "diagnostics/camera_sync/camera_sync_for_tests.h"

namespace quazor {
namespace {

using CameraSyncExperimentCalls = ScriptedCameraSyncTest;

// Checks the configuration of a slave; the ratio may be a signed or unsigned integer.
void expectSlaveConfiguration(const Value* configuration, const std::string& whose) {
  SCOPED_TRACE(whose);
  ASSERT_NE(configuration, nullptr);
  ASSERT_NE(configuration->dictionary(), nullptr);
  EXPECT_EQ(defaultText(*configuration),
            "{StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; "
            "MasterToSlaveFrameRateRatio = 1}");
  EXPECT_EQ(*entryOf(configuration, capture_key::StreamingOutputsEnabled), Value(true));
  EXPECT_EQ(*entryOf(configuration, capture_key::FrameSkippingEnabled), Value(false));
  EXPECT_EQ(*entryOf(configuration, capture_key::TimeMachineEnabled), Value(false));
  const Value::Kind ratio = entryOf(configuration, capture_key::MasterToSlaveFrameRateRatio)->kind();
  EXPECT_TRUE(ratio == Value::Kind::kSigned || ratio == Value::Kind::kUnsigned);
}

TEST_F(CameraSyncExperimentCalls, HandsStreamsAndGroupsOverAsThemselves) {
  (void)run({kWidePort, kTelePort, kSuperPort});
  EXPECT_EQ(*group->properties.find(capture_key::ActiveStreams), Value(Array{wide, tele, super}));
  EXPECT_EQ(*device->properties.find(capture_key::MultiCamConfiguration),
            Value(Dictionary{{std::string(capture_key::ActiveSynchronizedStreamsGroups), Array{group}}}));
}

TEST_F(CameraSyncExperimentCalls, HandsOutOneMasterConfigurationOfAllSlaves) {
  (void)run({kWidePort, kTelePort, kSuperPort});
  const Value* configuration = group->properties.find(capture_key::MasterConfiguration);
  ASSERT_NE(configuration, nullptr);
  ASSERT_NE(configuration->dictionary(), nullptr);
  EXPECT_EQ(configuration->dictionary()->size(), 1U);
  const Value* slaves = entryOf(configuration, capture_key::SlaveConfigurationByPortType);
  ASSERT_NE(slaves, nullptr);
  ASSERT_NE(slaves->dictionary(), nullptr);
  EXPECT_EQ(slaves->dictionary()->size(), 2U);
  expectSlaveConfiguration(entryOf(slaves, kTelePort), "tele");
  expectSlaveConfiguration(entryOf(slaves, kSuperPort), "super");
  for (const auto& stream : {wide, tele, super}) {
    EXPECT_FALSE(stream->properties.contains(capture_key::SynchronizedStreamsSlaveConfiguration));
    EXPECT_EQ(*stream->properties.find(capture_key::MultipleOutputSupportEnabled), Value(true));
  }
}

TEST_F(CameraSyncExperimentCalls, HandsEverySlaveItsConfigurationWhereTheMasterTakesNone) {
  group->properties.set(capture_key::MasterConfigurationSupportedKeys, Array());
  (void)run({kWidePort, kTelePort, kSuperPort});
  EXPECT_FALSE(group->properties.contains(capture_key::MasterConfiguration));
  EXPECT_FALSE(wide->properties.contains(capture_key::SynchronizedStreamsSlaveConfiguration));
  expectSlaveConfiguration(tele->properties.find(capture_key::SynchronizedStreamsSlaveConfiguration), "tele");
  expectSlaveConfiguration(super->properties.find(capture_key::SynchronizedStreamsSlaveConfiguration), "super");
}

TEST_F(CameraSyncExperimentCalls, LooksForTheMasterConfigurationAmongAListOfKeys) {
  const Value key(capture_key::SlaveConfigurationByPortType);
  const struct {
    const char* name;
    std::optional<Value> keys;
    bool supported;
  } rows[] = {
      {"the key alone", Array{key}, true},
      {"among others", Array{"Other", 7, key, "More"}, true},
      {"other keys", Array{"Other", "SlaveConfigurationByPortTypes"}, false},
      {"the other way's key", Array{Value(capture_key::SynchronizedStreamsSlaveConfiguration)}, false},
      {"no keys", Array(), false},
      {"nothing", std::nullopt, false},
      {"the key itself, not in a list", key, false},
      {"a number", 1, false},
  };
  for (const auto& row : rows) {
    group->properties.erase(capture_key::MasterConfigurationSupportedKeys);
    if (row.keys) group->properties.set(capture_key::MasterConfigurationSupportedKeys, *row.keys);
    const std::string text = between(run({kWidePort, kTelePort}), "log default", "wide set FormatIndex");
    const std::string configuration =
        "{StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; "
        "MasterToSlaveFrameRateRatio = 1}";
    EXPECT_EQ(text, row.supported ? "log default: Device supports SlaveConfigurationByPortType\n"
                                    "group set MasterConfiguration = {SlaveConfigurationByPortType = "
                                    "{BackFacingTelephotoCamera = " +
                                        configuration + "}}\n"
                                  : "log default: Device does not support SlaveConfigurationByPortType, using "
                                    "SynchronizedStreamsSlaveConfiguration instead.\n"
                                    "wide get PortType\ntele get PortType\n"
                                    "tele set SynchronizedStreamsSlaveConfiguration = " +
                                        configuration + "\n")
        << row.name;
  }
}

TEST_F(CameraSyncExperimentCalls, ASlaveThatRefusesMultipleOutputsGetsNoConfigurationAndTheRunGoesOn) {
  tele->refused.insert(std::string(capture_key::MultipleOutputSupportEnabled));
  const std::string text = run({kWidePort, kTelePort, kSuperPort});
  EXPECT_EQ(between(text, "wide set MultipleOutput", "group get MasterConfigurationSupportedKeys"),
            "wide set MultipleOutputSupportEnabled = 1\n"
            "tele set MultipleOutputSupportEnabled = 1 -> failed\n"
            "log error: Failed to configure BackFacingTelephotoCamera for multiple output support! (null)\n"
            "super set MultipleOutputSupportEnabled = 1\n");
  const Value* slaves =
      entryOf(group->properties.find(capture_key::MasterConfiguration), capture_key::SlaveConfigurationByPortType);
  ASSERT_NE(slaves, nullptr);
  ASSERT_NE(slaves->dictionary(), nullptr);
  EXPECT_EQ(slaves->dictionary()->size(), 1U);
  EXPECT_TRUE(slaves->dictionary()->contains(kSuperPort));
  EXPECT_NE(text.find("returned a result\n"), std::string::npos);
}

TEST_F(CameraSyncExperimentCalls, AMasterThatRefusesMultipleOutputsChangesNothingElse) {
  const std::string healthy = run({kWidePort, kTelePort});
  wide->refused.insert(std::string(capture_key::MultipleOutputSupportEnabled));
  std::string refused = run({kWidePort, kTelePort});
  const std::string extra =
      " -> failed\nlog error: Failed to configure BackFacingCamera for multiple output support! "
      "(null)";
  const std::size_t at = refused.find(extra);
  ASSERT_NE(at, std::string::npos) << refused;
  EXPECT_EQ(refused.erase(at, extra.size()), healthy);
}

TEST_F(CameraSyncExperimentCalls, FormatsAndFrameRatesArePassedOnAsTheyAre) {
  QZCameraSyncExperiment experiment({kWidePort, kTelePort}, {16U, 14.0}, 29.97F, platform());
  ASSERT_NE(experiment.run(nullptr), nullptr);
  EXPECT_EQ(*wide->properties.find(capture_key::FormatIndex), Value(16U));
  EXPECT_EQ(*tele->properties.find(capture_key::FormatIndex), Value(14.0));
  for (const auto& stream : {wide, tele}) {
    EXPECT_EQ(*stream->properties.find(capture_key::MinimumFrameRate), Value(29.97F));
    EXPECT_EQ(*stream->properties.find(capture_key::MaximumFrameRate), Value(29.97F));
  }
}

TEST_F(CameraSyncExperimentCalls, AFormatIndexThatIsMissingIsARefusedOne) {
  const struct {
    const char* name;
    Array formatIndexes;
    std::string configuration;  // the expected configuration of the earlier streams
    std::string port;
  } rows[] = {
      {"the last one",
       {16},
       "wide set FormatIndex = 16\nwide set MinimumFrameRate = 30\n"
       "wide set MaximumFrameRate = 30\n",
       kTelePort},
      {"all", {}, "", kWidePort},
  };
  for (const auto& row : rows) {
    const std::string text = run({kWidePort, kTelePort}, row.formatIndexes);
    const std::string configured = "MasterToSlaveFrameRateRatio = 1}}}\n";
    EXPECT_EQ(from(text, configured),
              configured + row.configuration + "log error: Failed to set the format index to (null) on " + row.port +
                  "! (null)\ndevice relinquish control (wide, tele)\n"
                  "returned nothing\n"
                  "error QZCapturePlugInErrorDomain code 209: Failed to set format index to (null)\n")
        << row.name;
  }
}

TEST_F(CameraSyncExperimentCalls, FormatIndexesBeyondThePortsAreIgnored) {
  const std::string exact = run({kWidePort, kTelePort}, {16, 14});
  EXPECT_NE(exact.find("returned a result\n"), std::string::npos);
  EXPECT_EQ(run({kWidePort, kTelePort}, {16, 14, 9, 99}), exact);
}

TEST_F(CameraSyncExperimentCalls, StreamsAreTakenInTheOrderOfThePorts) {
  device->groups = {makeGroup("shuffled", {super, wide, tele})};
  static_cast<void>(device->groups.front()->setValue(wide, capture_key::SynchronizationMaster, nullptr));
  const std::string text = run({kWidePort, kTelePort, kSuperPort});
  EXPECT_EQ(between(text, "shuffled get streams", "shuffled set ActiveStreams"),
            "shuffled get streams\n"
            "super get PortType\nwide get PortType\n"
            "super get PortType\nwide get PortType\ntele get PortType\n"
            "super get PortType\n"
            "device request control (wide, tele, super)\n");
}

TEST_F(CameraSyncExperimentCalls, TheFirstGroupThatHasEveryPortIsChosen) {
  const auto broken = makeGroup("broken", {});
  broken->members.reset();
  const auto front = makeStream("front", "FrontFacingCamera");
  const auto odd = makeStream("odd", 16);  // its port type is not a string
  device->groups = {broken,
                    makeGroup("empty", {}),
                    makeGroup("small", {wide}),
                    makeGroup("strangers", {front, odd}),
                    makeGroup("half", {wide, front}),
                    makeGroup("right", {wide, tele}),
                    group};
  EXPECT_EQ(between(run({kWidePort, kTelePort}), "broken get streams", "right get SynchronizationMaster"),
            "broken get streams -> failed\n"
            "empty get streams\n"
            "small get streams\n"
            "strangers get streams\n"
            "front get PortType\nodd get PortType\n"
            "front get PortType\nodd get PortType\n"
            "half get streams\n"
            "wide get PortType\n"
            "wide get PortType\nfront get PortType\n"
            "right get streams\n"
            "wide get PortType\n"
            "wide get PortType\ntele get PortType\n"
            "device request control (wide, tele)\n"
            "right set ActiveStreams = (wide, tele)\n");
}

TEST_F(CameraSyncExperimentCalls, ADeviceWithoutGroupsHasNoAppropriateOne) {
  device->groups.clear();
  EXPECT_EQ(from(run({kWidePort, kTelePort}), "device get groups"),
            "device get groups\n"
            "log error: Failed to find appropriate group for ports (BackFacingCamera, BackFacingTelephotoCamera)!\n" +
                std::string(kNotSynchronized));
}

TEST_F(CameraSyncExperimentCalls, WithoutPortsNoStreamCanBeTheMaster) {
  EXPECT_EQ(from(run({}, {}), "device get groups"),
            "device get groups\n"
            "group get streams\n"
            "device request control ()\n"
            "group set ActiveStreams = ()\n"
            "group get SynchronizationMaster\n"
            "log error: The sync master port must be provided first!\n" +
                std::string(kNotSynchronized));
}

TEST_F(CameraSyncExperimentCalls, ARunWithTheLogOffIsTheSame) {
  const std::string logged = run({kWidePort, kTelePort});
  sharedLog().setBackend(nullptr, LogLevel::kDebug);
  EXPECT_EQ(from(run({kWidePort, kTelePort}), "returned"), from(logged, "returned"));
}

}  // namespace
}  // namespace quazor
