#include "backends/linux/capture/linux_group.h"

#include "backends/linux/capture/linux_capture_for_tests.h"

namespace quazor {
namespace {

using Fake = FakeCameras;
using namespace std::chrono_literals;

Array arrayOf(const CaptureStreams& streams) { return Array(streams.begin(), streams.end()); }

Dictionary slave() {
  return Dictionary{{text(capture_key::StreamingOutputsEnabled), true},
                    {text(capture_key::FrameSkippingEnabled), false},
                    {text(capture_key::TimeMachineEnabled), false},
                    {text(capture_key::MasterToSlaveFrameRateRatio), 1}};
}

Dictionary slaves(std::string_view port, Value configuration) {
  return Dictionary{{text(capture_key::SlaveConfigurationByPortType), Dictionary{{text(port), configuration}}}};
}

Dictionary configuration(const Fake& fake) {
  return Dictionary{{text(capture_key::ActiveSynchronizedStreamsGroups), Array{fake.group}}};
}

// Takes the three cameras of the back and makes them a session.
void synchronize(const Fake& fake) {
  for (std::size_t i = 0; i < 3; ++i) fake.prepare(i);
  ASSERT_EQ(fake.set(*fake.group, capture_key::ActiveStreams, arrayOf(fake.backStreams())), "done");
  ASSERT_EQ(fake.set(*fake.device, capture_key::MultiCamConfiguration, configuration(fake)), "done");
}

std::pair<std::int64_t, std::int64_t> status(const Fake& fake, std::string_view port) {
  const auto all = fake.device->valueForProperty(capture_key::MulticamSessionStatus, nullptr);
  const Value* const one = entryOf(pointerTo(all), port);
  return {toSigned(entryOf(one, capture_key::Offset)), toSigned(entryOf(one, capture_key::FrameCount))};
}

using Pair = std::pair<std::int64_t, std::int64_t>;

TEST(LinuxGroupTest, ALateStartIsAnOffsetInFramesFromTheMastersFirst) {
  Fake fake;
  synchronize(fake);
  ASSERT_EQ(fake.start(0), "done");
  ASSERT_EQ(fake.start(1), "done");
  fake.kernel->passTime(100ms);
  ASSERT_EQ(fake.start(2), "done");
  fake.kernel->passTime(990ms);
  EXPECT_EQ(status(fake, port_type::BackFacingCamera), Pair(0, 33));
  EXPECT_EQ(status(fake, port_type::BackFacingTelephotoCamera), Pair(0, 33));
  EXPECT_EQ(status(fake, port_type::BackFacingSuperWideCamera), Pair(3, 30));
}

TEST(LinuxGroupTest, ACameraThatCameBeforeTheMasterHasANegativeOffset) {
  Fake fake;
  synchronize(fake);
  ASSERT_EQ(fake.start(1), "done");
  fake.kernel->passTime(70ms);
  ASSERT_EQ(fake.start(0), "done");
  fake.kernel->passTime(990ms);
  EXPECT_EQ(status(fake, port_type::BackFacingTelephotoCamera).first, -2);
}

TEST(LinuxGroupTest, ACameraWithoutFramesHasRecordedNone) {
  Fake fake;
  fake.kernel->with(fake.nodes[1], [](FakeNode& node) { return node.delivers = false; });
  synchronize(fake);
  ASSERT_EQ(fake.start(0), "done");
  ASSERT_EQ(fake.start(1), "done");
  fake.kernel->passTime(990ms);
  EXPECT_EQ(status(fake, port_type::BackFacingTelephotoCamera), Pair(0, -1));
  EXPECT_EQ(status(fake, port_type::BackFacingSuperWideCamera), Pair(0, -1)) << "it was not even started";
}

TEST(LinuxGroupTest, TheStatusStaysAfterTheStopAndIsNewWithTheNextSession) {
  Fake fake;
  const auto read = [&] {
    return outcome(
        [&](auto* error) { return fake.device->valueForProperty(capture_key::MulticamSessionStatus, error); });
  };
  const std::string none =
      "7 There is no MulticamSessionStatus before a synchronised session has begun: set "
      "MultiCamConfiguration, then start the master.";
  EXPECT_EQ(read(), none);
  synchronize(fake);
  EXPECT_EQ(read(), none);
  ASSERT_EQ(fake.start(0), "done");
  fake.kernel->passTime(990ms);
  ASSERT_EQ(fake.stop(0), "done");
  EXPECT_EQ(status(fake, port_type::BackFacingCamera), Pair(0, 30));
  ASSERT_EQ(fake.set(*fake.device, capture_key::MultiCamConfiguration, configuration(fake)), "done");
  EXPECT_EQ(read(), none);
}

TEST(LinuxGroupTest, PropertiesReadBackAsTheyWereSet) {
  Fake fake;
  synchronize(fake);
  const Dictionary master = slaves(port_type::BackFacingTelephotoCamera, slave());
  EXPECT_EQ(fake.set(*fake.group, capture_key::MasterConfiguration, master), "done");
  EXPECT_EQ(fake.group->valueForProperty(capture_key::MasterConfiguration, nullptr), Value(master));
  EXPECT_EQ(fake.group->valueForProperty(capture_key::ActiveStreams, nullptr), Value(arrayOf(fake.backStreams())));
  EXPECT_EQ(fake.group->valueForProperty(capture_key::MasterConfigurationSupportedKeys, nullptr),
            Value(Array{capture_key::SlaveConfigurationByPortType}));
  EXPECT_EQ(fake.device->valueForProperty(capture_key::MultiCamConfiguration, nullptr), Value(configuration(fake)));
  EXPECT_EQ(outcome([&](auto* error) { return fake.group->valueForProperty("Depth", error); }),
            "10 " + fake.group->description() + " has no property Depth of that use.");
  EXPECT_EQ(fake.set(*fake.group, capture_key::SynchronizationMaster, fake.streams[1]),
            "10 " + fake.group->description() + " has no property SynchronizationMaster of that use.");
}

TEST(LinuxGroupTest, ActiveStreamsAreOfTheGroupUnderControlAndEachOnce) {
  Fake fake;
  const std::string name = fake.group->description();
  const auto set = [&](const Value& value) { return fake.set(*fake.group, capture_key::ActiveStreams, value); };
  EXPECT_EQ(set(1), "6 " + name + ": ActiveStreams takes an array of streams, not 1.");
  EXPECT_EQ(set(Array{5}), "6 " + name + ": ActiveStreams takes streams of the group, each once; 5 is not.");
  EXPECT_EQ(set(Array{fake.streams[3]}), "6 " + name +
                                             ": ActiveStreams takes streams of the group, each once; stream of "
                                             "FrontFacingInfraredCamera is not.");
  EXPECT_EQ(set(Array{fake.streams[0]}), "7 BackFacingCamera is not under control; request control of it first.");
  ASSERT_EQ(fake.take(0), "done");
  EXPECT_EQ(set(Array{fake.streams[0], fake.streams[0]}),
            "6 " + name + ": ActiveStreams takes streams of the group, each once; stream of BackFacingCamera is not.");
  EXPECT_EQ(set(Array{fake.streams[0]}), "done");
}

TEST(LinuxGroupTest, MasterConfigurationsThatDoNotFitAreRefused) {
  Fake fake;
  const std::string name = fake.group->description();
  const auto set = [&](const Value& value) { return fake.set(*fake.group, capture_key::MasterConfiguration, value); };
  EXPECT_EQ(set(slaves("", slave())), "7 " + name + " has no active streams; set ActiveStreams first.");
  synchronize(fake);
  EXPECT_EQ(set(1), "6 " + name +
                        ": MasterConfiguration takes a dictionary with the one entry SlaveConfigurationByPortType, "
                        "not 1.");
  EXPECT_EQ(set(slaves(port_type::BackFacingCamera, slave())),
            "6 " + name + ": BackFacingCamera is no port of a slave.");
  EXPECT_EQ(set(slaves(port_type::FrontFacingCamera, slave())),
            "6 " + name + ": FrontFacingCamera is no port of a slave.");
  const std::string tele = "6 " + name + ", BackFacingTelephotoCamera: ";
  EXPECT_EQ(set(slaves(port_type::BackFacingTelephotoCamera, 1)),
            tele + "a slave configuration takes a dictionary, not 1.");
  ASSERT_TRUE(fake.device->relinquishControlOfStreams(fake.backStreams(), nullptr));
  EXPECT_EQ(set(slaves(port_type::BackFacingTelephotoCamera, slave())),
            "7 BackFacingCamera is not under control; request control of it first.");
}

TEST(LinuxGroupTest, NothingIsConfiguredWhileACameraRuns) {
  Fake fake;
  synchronize(fake);
  ASSERT_EQ(fake.start(1), "done");
  EXPECT_EQ(fake.set(*fake.group, capture_key::ActiveStreams, Array{}),
            "7 " + fake.group->description() + ": ActiveStreams cannot be set while BackFacingTelephotoCamera runs.");
  EXPECT_EQ(fake.set(*fake.device, capture_key::MultiCamConfiguration, configuration(fake)),
            "7 MultiCamConfiguration cannot be set while BackFacingTelephotoCamera runs.");
}

TEST(LinuxGroupTest, MultiCamConfigurationsThatDoNotFitAreRefused) {
  Fake fake;
  const auto set = [&](const Value& value) {
    return fake.set(*fake.device, capture_key::MultiCamConfiguration, value);
  };
  const auto groups = [](Array array) {
    return Dictionary{{text(capture_key::ActiveSynchronizedStreamsGroups), std::move(array)}};
  };
  EXPECT_EQ(set(1),
            "6 MultiCamConfiguration takes a dictionary with the one entry ActiveSynchronizedStreamsGroups, an "
            "array.");
  EXPECT_EQ(set(groups({5})), "6 ActiveSynchronizedStreamsGroups takes groups of this device, each once; 5 is not.");
  EXPECT_EQ(set(groups({fake.group, fake.group})),
            "6 ActiveSynchronizedStreamsGroups takes groups of this device, each "
            "once; " +
                fake.group->description() + " is not.");
  EXPECT_EQ(set(groups({fake.group})),
            "7 The master BackFacingCamera is not active; set ActiveStreams of its group "
            "first.");
  synchronize(fake);
  ASSERT_TRUE(fake.device->relinquishControlOfStreams({fake.streams[1]}, nullptr));
  EXPECT_EQ(set(groups({fake.group})),
            "7 BackFacingTelephotoCamera is not under control; request control of it first.");
}

}  // namespace
}  // namespace quazor
