#include "backends/linux/probe/probe.h"

#include "backends/linux/binding/binding.h"
#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/hid/hidraw_for_tests.h"
#include "tests/support/fake_v4l2_api.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>
#include <nlohmann/json.hpp>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

namespace quazor {
namespace {

namespace fs = std::filesystem;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::UnorderedElementsAre;

class ProbeTest : public ::testing::Test {
 protected:
  ProbeTest()
      : folder_(fs::path(::testing::TempDir()) /
                ("quazor-probe-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()))) {
    fs::create_directories(folder_);
  }
  ~ProbeTest() override { fs::remove_all(folder_); }

  MachineProbe probe() {
    MachineProbe found = probeMachine({kernel_, kernel_->roots(), hid_, counters_, folder_});
    std::ofstream(folder_ / "binding.json") << found.binding;
    binding_ = readBinding(folder_ / "binding.json");
    return found;
  }
  // The lines of the probe, without the directory of the fake devices.
  std::vector<std::string> lines() {
    std::vector<std::string> lines = probe().lines;
    const std::string dev = kernel_->roots().dev.string();
    for (std::string& line : lines) {
      for (std::size_t at = line.find(dev); at != std::string::npos; at = line.find(dev)) {
        line.replace(at, dev.size(), "DEV");
      }
    }
    return lines;
  }
  void connector(const std::string& name, const std::string& status, const std::string& dpms) const {
    const fs::path directory = folder_ / "class/drm" / name;
    fs::create_directories(directory);
    std::ofstream(directory / "status") << status << '\n';
    std::ofstream(directory / "enabled") << "enabled\n";
    std::ofstream(directory / "dpms") << dpms << '\n';
  }

  const fs::path folder_;
  const std::shared_ptr<FakeV4l2Api> kernel_ = std::make_shared<FakeV4l2Api>();
  const std::shared_ptr<FakeCounters> counters_ = std::make_shared<FakeCounters>();
  HidrawRoots hid_{folder_ / "no sysfs", folder_};
  Binding binding_;  // the last suggestion
};

// Drivers cut names at the end of their field, also within a character.
TEST_F(ProbeTest, ATextThatIsCutWithinACharacterIsNotInTheBinding) {
  FakeNode camera = fakeCamera("fake:0");
  camera.card = "Kamera gr\xC3";
  kernel_->add(0, camera);
  probe();
  ASSERT_EQ(binding_.cameras.size(), 1U);
  EXPECT_EQ(binding_.cameras[0].node, (VideoNodeMatch{"fake", {}, "fake:0"}));
}

TEST_F(ProbeTest, TellsOfAMachineWithNothing) {
  EXPECT_THAT(lines(),
              ElementsAre("Cameras", HasSubstr("none: no driver offers a video node"), "HID devices",
                          "  none: this kernel has no hidraw (CONFIG_HIDRAW), or its module hid is not loaded",
                          "Displays", HasSubstr("none: no graphics driver"), "Counters",
                          "  /sys/fs/cgroup/{group}/{subgroup}/{name}/cpu.stat, key usage_usec: 0",
                          "  /sys/class/net/{subgroup}/statistics/{name}: 0",
                          "  /sys/bus/iio/devices/{subgroup}/in_{name}_raw: 0", "  /proc/vmstat, key {name}: 0",
                          "  tracepoints: 0", HasSubstr("require tracefs to be mounted")));
  EXPECT_EQ(binding_.title, "This machine");
  EXPECT_TRUE(binding_.cameras.empty() && binding_.groups.empty() && binding_.counterFiles.empty());
  EXPECT_FALSE(binding_.display);
}

TEST_F(ProbeTest, BindsFiveCamerasToTheFivePorts) {
  for (int i = 0; i < 6; ++i) kernel_->add(i, fakeCamera("fake:" + std::to_string(i)));
  const std::vector<std::string> told = lines();
  EXPECT_THAT(
      told, Contains("    suitable: FrontFacingInfraredCamera in the binding below; check which camera it really is"));
  EXPECT_THAT(told, Contains(HasSubstr("all ports are taken")));
  ASSERT_EQ(binding_.cameras.size(), 5U);
  EXPECT_EQ(binding_.cameras[0].port, "BackFacingCamera");
  EXPECT_EQ(binding_.cameras[0].node, (VideoNodeMatch{"fake", "fake camera", "fake:0", {}, {}}));
  EXPECT_EQ(binding_.cameras[4].port, "FrontFacingInfraredCamera");
  EXPECT_EQ(binding_.cameras[4].node.busInfo, "fake:4");
  ASSERT_EQ(binding_.groups.size(), 2U);
  EXPECT_THAT(binding_.groups[0].ports,
              ElementsAre("BackFacingCamera", "BackFacingTelephotoCamera", "BackFacingSuperWideCamera"));
  EXPECT_EQ(binding_.groups[0].master, "BackFacingCamera");
  EXPECT_THAT(binding_.groups[1].ports, ElementsAre("FrontFacingCamera", "FrontFacingInfraredCamera"));
}

TEST_F(ProbeTest, MakesNoGroupOfOneCamera) {
  kernel_->add(0, fakeCamera("fake:0"));
  probe();
  EXPECT_EQ(binding_.cameras.size(), 1U);
  EXPECT_TRUE(binding_.groups.empty());
}

TEST_F(ProbeTest, TellsWhatACameraOffers) {
  FakeNode node = fakeCamera("fake:0");
  node.controls = {{1, "Gain", 0, 10, 5}, {2, "Flash", 0, 1, 0}, {V4L2_CID_CONTRAST, "Contrast"}};
  node.controls[2].describeProblem = EPIPE;
  node.formats.push_back({V4L2_PIX_FMT_NV12, "other sizes", {{320, 180, {{1001, 30000}}}}});
  kernel_->add(0, node);
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains("    formats 0 to 1: YUYV GREY"));
  EXPECT_THAT(told, Contains("      640x360 at 5, 25, 30, 40 frames a second"));
  EXPECT_THAT(told, Contains("    format 2: NV12 (other sizes)"));
  EXPECT_THAT(told, Contains("      320x180 at 29.97 frames a second"));
  EXPECT_THAT(told, Contains("    controls: Gain, Flash"));
  EXPECT_THAT(told, Contains("    The driver does not describe the controls 0x00980901 (EPIPE); they cannot be used."));
}

TEST_F(ProbeTest, ChoosesTheLargestSizeAtTheUsualRate) {
  const struct {
    const char* what;
    std::vector<FakeSize> sizes;
    std::uint32_t width;
    bool isSlow;
  } kRows[] = {
      {"the larger of two", {{320, 180, {{1, 30}}}, {640, 360, {{1, 30}}}, {160, 90, {{1, 30}}}}, 640, false},
      {"30 rather than larger", {{320, 180, {{1, 30}}}, {640, 360, {{1, 25}}}}, 320, false},
      {"none at 30", {{320, 180, {{1, 25}}}, {640, 360, {{1, 60}}}}, 640, true},
      {"none too large", {{3840, 2160, {{1, 30}}}, {1280, 720, {{1, 30}}}}, 1280, false},
      {"rates that are not told", {{320, 180, {}}}, 320, true},
  };
  for (const auto& row : kRows) {
    FakeNode node = fakeCamera("fake:0");
    node.formats = {{node.formats[0].fourcc, "format", row.sizes}};
    kernel_->add(0, node);
    const std::vector<std::string> told = lines();
    ASSERT_EQ(binding_.cameras.size(), 1U) << row.what;
    EXPECT_EQ(binding_.cameras[0].width, row.width) << row.what;
    EXPECT_EQ(std::ranges::count_if(told, [](const auto& line) { return line.find("no size at 30") != line.npos; }),
              row.isSlow ? 1 : 0)
        << row.what;
  }
}

// A USB camera: every format has sizes and rates of its own.
FakeNode webcam(const std::string& bus) {
  FakeNode node = fakeCamera(bus);
  node.formats = {
      {fakeCode('M', 'J', 'P', 'G'), "Motion-JPEG", {{1920, 1080, {{333333, 10000000}}}, {640, 480, {{1, 30}}}}},
      {fakeCode('Y', 'U', 'Y', 'V'), "YUYV 4:2:2", {{1280, 720, {{1, 10}}}, {640, 480, {{1, 30}}}}},
      {fakeCode('N', 'V', '1', '2'), "Y/UV 4:2:0", {{640, 360, {{1, 30}}}}},
      {fakeCode('H', '2', '6', '4'), "H.264", {{1280, 720, {{1, 15}}}}}};
  return node;
}

TEST_F(ProbeTest, MapsTheFormatIndexesOfTheDiagnosticsThatACameraDoesNotHave) {
  for (int i = 0; i < 5; ++i) kernel_->add(i, webcam("fake:" + std::to_string(i)));
  const std::vector<std::string> told = lines();
  ASSERT_EQ(binding_.cameras.size(), 5U);
  const CameraBinding& back = binding_.cameras[0];
  EXPECT_EQ(back.width * 1000 + back.height, 640360U);
  EXPECT_THAT(back.formats,
              ElementsAre(FormatBinding{0, "NV12", 640, 360, {}}, FormatBinding{16, "NV12", 640, 360, {}}))
      << "the last format has no size at 30, and the first one not this size; the driver can be asked for other rates";
  EXPECT_THAT(told, Contains("    format index 16 of the diagnostics: NV12 of 640x360"));
  EXPECT_EQ(binding_.cameras[1].formats.at(1).index, 14U);
  EXPECT_EQ(binding_.cameras[2].formats.at(1).index, 9U);

  const CameraBinding& front = binding_.cameras[3];
  EXPECT_EQ(front.width * 1000 + front.height, 640480U) << "of format 1, which the front camera uses";
  EXPECT_THAT(front.formats, ElementsAre());
  const CameraBinding& infrared = binding_.cameras[4];
  EXPECT_EQ(infrared.width, 1920U);
  EXPECT_THAT(infrared.formats, ElementsAre());
}

TEST_F(ProbeTest, MapsOnlyToFormatsWhoseCodeCanBeWritten) {
  FakeNode node = fakeCamera("fake:0");
  const std::vector<FakeSize> sizes = node.formats[0].sizes;
  node.formats = {{fakeCode('Y', '1', '6', ' ') | 1U << 31, "big-endian", sizes}, {0x01020304, "unprintable", sizes}};
  kernel_->add(0, node);
  probe();
  ASSERT_EQ(binding_.cameras.size(), 1U);
  EXPECT_THAT(binding_.cameras[0].formats, ElementsAre(FormatBinding{16, "Y16 -BE", 640, 360, {}}));
}

TEST_F(ProbeTest, WritesTheIntervalOfADriverThatCannotBeAskedForARate) {
  FakeNode node = webcam("fake:0");
  node.hasIntervals = false;
  kernel_->add(0, node);
  probe();
  ASSERT_EQ(binding_.cameras.size(), 1U);
  EXPECT_THAT(binding_.cameras[0].formats, ElementsAre(FormatBinding{0, "NV12", 640, 360, FrameInterval{1, 30}},
                                                       FormatBinding{16, "NV12", 640, 360, FrameInterval{1, 30}}));
}

TEST_F(ProbeTest, TellsWhyACameraDoesNotFit) {
  FakeNode without = fakeCamera("fake:0");
  without.formats.clear();
  kernel_->add(0, without);
  kernel_->add(1, fakeCamera("fake:1"));
  kernel_->add(2, fakeCamera("fake:1"));
  FakeNode output = fakeCamera("fake:3");
  output.capabilities = V4L2_CAP_VIDEO_OUTPUT | V4L2_CAP_STREAMING;
  kernel_->add(3, output);
  FakeNode closed = fakeCamera("fake:4");
  closed.openProblem = EACCES;
  kernel_->add(4, closed);
  FakeNode busy = fakeCamera("fake:5");
  busy.openProblem = EBUSY;
  kernel_->add(5, busy);
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains(HasSubstr("its driver reports no format")));
  EXPECT_EQ(std::ranges::count_if(
                told, [](const auto& line) { return line.find("another camera has the same driver") != line.npos; }),
            2);
  EXPECT_THAT(told, Contains(HasSubstr("does not capture video to mapped buffers")));
  EXPECT_THAT(told, Contains(HasSubstr("DEV/video4 failed: Permission denied (EACCES)")));
  EXPECT_THAT(told, Contains(HasSubstr("(EBUSY)")));
  EXPECT_EQ(std::ranges::count_if(told, [](const auto& line) { return line.find("udev rule") != line.npos; }), 1);
  EXPECT_TRUE(binding_.cameras.empty());
}

TEST_F(ProbeTest, BindsNoCameraThatABindingCannotName) {
  FakeNode nameless = fakeCamera("");
  nameless.driver.clear();
  nameless.card.clear();
  kernel_->add(0, nameless);
  FakeNode absurd = fakeCamera("fake:1");
  absurd.formats = {{absurd.formats[0].fourcc, "format", {{0, 0, {{1, 30}}}, {70000, 1, {{1, 30}}}}}};
  kernel_->add(1, absurd);
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains(HasSubstr("reports nothing that a binding could use to identify it")));
  EXPECT_THAT(told, Contains(HasSubstr("reports no format, or no usable size")));
  EXPECT_TRUE(binding_.cameras.empty());
}

TEST_F(ProbeTest, TellsWhichCameraMetadataAreOf) {
  kernel_->add(0, fakeCamera("fake:0"));
  kernel_->add(10, fakeMetadata("fake:0"));
  kernel_->add(11, fakeMetadata("fake:1"));
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains(HasSubstr("metadata of DEV/video0, which is on the same bus")));
  EXPECT_THAT(told, Contains("    metadata, but no camera is on the same bus"));
  EXPECT_EQ(binding_.cameras.size(), 1U);
}

// Two streams of one USB device, each with its metadata, and one on another device.
FakeNode usbNode(FakeNode node, const std::string& device, std::optional<std::uint32_t> interface) {
  node.device = device;
  node.usbInterface = interface;
  return node;
}

TEST_F(ProbeTest, DistinguishesTheStreamsOfOneDevice) {
  kernel_->add(0, usbNode(fakeCamera("usb-1"), "usb1/1-1/1-1:1.0", 0));
  kernel_->add(1, usbNode(fakeMetadata("usb-1"), "usb1/1-1/1-1:1.0", 0));
  kernel_->add(2, usbNode(fakeCamera("usb-1"), "usb1/1-1/1-1:1.2", 10));
  kernel_->add(3, usbNode(fakeMetadata("usb-1"), "usb1/1-1/1-1:1.2", 10));
  kernel_->add(4, usbNode(fakeCamera("board"), "platform/left", std::nullopt));
  kernel_->add(5, usbNode(fakeCamera("board"), "platform/right", std::nullopt));
  const std::vector<std::string> told = lines();
  ASSERT_EQ(binding_.cameras.size(), 4U);
  EXPECT_EQ(binding_.cameras[0].node, (VideoNodeMatch{"fake", "fake camera", "usb-1", 0, {}}));
  EXPECT_EQ(binding_.cameras[1].node, (VideoNodeMatch{"fake", "fake camera", "usb-1", 10, {}}));
  EXPECT_EQ(binding_.cameras[2].node,
            (VideoNodeMatch{"fake", "fake camera", "board", {}, "/sys/devices/platform/left"}));
  EXPECT_THAT(told, Contains("  DEV/video2 (driver fake, card fake camera, bus usb-1, USB interface 10)"));
  EXPECT_THAT(told, Contains(HasSubstr("metadata of DEV/video0, which is on the same bus")));
  EXPECT_THAT(told, Contains(HasSubstr("metadata of DEV/video2, which is on the same bus")));
  EXPECT_THAT(told, Contains("    Both are of USB interface 10; add \"usbInterface\" to their nodes."));

  const std::vector<V4l2DeviceInfo> nodes = videoNodes(kernel_, kernel_->roots());
  for (const CameraBinding& camera : binding_.cameras) {
    DiagnosticErrorPtr error;
    EXPECT_TRUE(findVideoNode(nodes, VideoNodeKind::kCamera, camera.node, camera.port, &error)) << camera.port;
  }
  VideoNodeMatch metadata = binding_.cameras[1].node;
  EXPECT_EQ(findVideoNode(nodes, VideoNodeKind::kMetadata, metadata, "", nullptr)->path.filename(), "video3");
  metadata.usbInterface = 1;
  DiagnosticErrorPtr error;
  EXPECT_FALSE(findVideoNode(nodes, VideoNodeKind::kMetadata, metadata, "P", &error));
  EXPECT_THAT(error->localizedDescription(), HasSubstr("bus usb-1, USB interface 1; there are "));
}

TEST_F(ProbeTest, GivesMetadataToTheLastCameraBeforeIfTheDeviceTellsNothing) {
  kernel_->add(0, fakeCamera("fake:0"));
  kernel_->add(1, fakeMetadata("fake:0"));
  kernel_->add(2, fakeCamera("fake:0"));
  kernel_->add(3, fakeMetadata("fake:0"));
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains(HasSubstr("metadata of DEV/video0")));
  EXPECT_THAT(told, Contains(HasSubstr("metadata of DEV/video2")));
}

TEST_F(ProbeTest, TellsOfHidDevices) {
  HidrawTree tree;
  hid_ = tree.roots();
  EXPECT_THAT(lines(), Contains("  none: no HID device is connected, or its driver is not loaded"));
  tree.connect("hidraw0", sensorDescriptor());
  tree.connect("hidraw1", {0x06}, "Damaged");
  tree.connect("hidraw2", sensorDescriptor(0x25), "Forbidden");
  fs::remove(tree.path("hidraw2"));
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains("    usage page 0xFF00, usage 0x0024"));
  EXPECT_THAT(told, Contains("    input reports 0x76 (792 bytes)"));
  EXPECT_THAT(told, Contains("    feature reports 0xAB (2 bytes), 0xAC (2 bytes)"));
  EXPECT_THAT(told, Contains("  They need no binding: plug-ins find them by usage page and usage."));
  EXPECT_THAT(told, Contains(HasSubstr("hidraw1 (Damaged)")));
  EXPECT_THAT(told, Contains("    unsuitable: No such file or directory"));
  EXPECT_EQ(std::ranges::count_if(told, [](const auto& line) { return line.find("unsuitable") != line.npos; }), 2);
  EXPECT_THAT(told, Not(Contains(HasSubstr("udev rule")))) << "no rule brings the node back";
}

TEST_F(ProbeTest, NamesTheRuleForAHidDeviceThatThisUserMayNotOpen) {
  HidrawTree tree;
  hid_ = tree.roots();
  tree.connect("hidraw0", sensorDescriptor());
  tree.openToAll();
  fs::permissions(tree.path("hidraw0"), fs::perms::none);
  const uid_t user = ::geteuid();
  if (user == 0) {  // root may open everything
    ASSERT_EQ(::seteuid(65534), 0);
  }
  const std::vector<std::string> told = probeMachine({kernel_, kernel_->roots(), hid_, counters_, folder_}).lines;
  if (user == 0) {
    ASSERT_EQ(::seteuid(0), 0);
  }
  EXPECT_THAT(told, Contains("    unsuitable: Permission denied"));
  EXPECT_THAT(told, Contains("    docs/linux.md has a udev rule that assigns it to a group."));
}

TEST_F(ProbeTest, TakesTheFirstConnectedDisplay) {
  connector("card0-HDMI-A-1", "disconnected", "On");
  connector("card0-HDMI-A-2", "connected", "Off");
  connector("card1-DSI-1", "connected", "On");
  fs::create_directories(folder_ / "class/drm/card1-DP-1");
  EXPECT_THAT(lines(),
              testing::IsSupersetOf(
                  {"  HDMI-A-1 of card0: disconnected, enabled, power mode On: it is off",
                   "  HDMI-A-2 of card0: connected, enabled, power mode Off: it is off; the main display below",
                   "  DP-1 of card1: not told, not told, power mode not told: it is off",
                   "  DSI-1 of card1: connected, enabled, power mode On: it is on"}));
  ASSERT_TRUE(binding_.display);
  EXPECT_EQ(binding_.display->connector, "HDMI-A-2");
}

TEST_F(ProbeTest, BindsTheCountersThatThereAre) {
  counters_->files = {{"/sys/fs/cgroup/a/b/c/cpu.stat", "usage_usec 1\n"},
                      {"/sys/class/net/lo/statistics/rx_packets", "1\n"},
                      {"/sys/class/net/lo/statistics/tx_packets", "1\n"},
                      {"/sys/bus/iio/devices/iio:device0/in_count0_raw", "1\n"},
                      {"/sys/bus/iio/devices/iio:device0/in_voltage0_raw", "1\n"},
                      {"/proc/vmstat", "pgfault 1\nnr_free_pages 1\n"},
                      {"/sys/kernel/tracing/events/v4l2/v4l2_dqbuf/id", "7\n"},
                      {"/sys/kernel/tracing/events/v4l2/v4l2_qbuf/id", "8\n"}};
  EXPECT_THAT(lines(), testing::IsSupersetOf({"  /sys/class/net/{subgroup}/statistics/{name}: 2",
                                              "  /sys/bus/iio/devices/{subgroup}/in_{name}_raw: 1",
                                              "  /proc/vmstat, key {name}: 1", "  tracepoints: 2"}));
  ASSERT_EQ(binding_.counterFiles.size(), 4U);
  EXPECT_EQ(binding_.counterFiles[0].key, "usage_usec");
  EXPECT_EQ(binding_.counterFiles[1].group, "net");
  EXPECT_EQ(binding_.counterFiles[3].subgroup, "vmstat");
  ASSERT_EQ(binding_.tracepoints.size(), 1U);
  EXPECT_EQ(binding_.tracepoints[0].system, "v4l2");
  EXPECT_EQ(binding_.tracepoints[0].event, "v4l2_dqbuf");
}

TEST_F(ProbeTest, BindsNoTracepointThatIsNotThereOrMayNotBeCounted) {
  counters_->files = {{"/sys/kernel/tracing/events/v4l2/other/id", "7\n"}};
  EXPECT_THAT(lines(), testing::Not(Contains(HasSubstr("may not count them"))));
  EXPECT_TRUE(binding_.tracepoints.empty());
  counters_->files = {{"/sys/kernel/tracing/events/v4l2/v4l2_dqbuf/id", "7\n"}};
  counters_->tracepointFailures = {{{7, 0}, EACCES}};
  EXPECT_THAT(lines(),
              testing::IsSupersetOf(
                  {"    This user may not count them: perf_event_open on v4l2:v4l2_dqbuf failed: Permission denied "
                   "(EACCES)",
                   "    The capability CAP_PERFMON, or a sysctl kernel.perf_event_paranoid of 0 or -1, allows it."}));
  EXPECT_TRUE(binding_.tracepoints.empty());
  counters_->tracepointFailures = {{{7, 0}, EMFILE}};
  const std::vector<std::string> told = lines();
  EXPECT_THAT(told, Contains(HasSubstr("    They cannot be counted: perf_event_open on v4l2:v4l2_dqbuf failed: ")));
  EXPECT_THAT(told, Not(Contains(HasSubstr("CAP_PERFMON"))));
  counters_->failures = {{"/sys/kernel/tracing/events", EACCES}};
  EXPECT_THAT(lines(), Contains("  tracepoints: opendir on /sys/kernel/tracing/events failed: Permission denied "
                                "(EACCES)"));
}

TEST_F(ProbeTest, KeepsToTextWhereADeviceGivesNone) {
  FakeNode node = fakeCamera("fake:0");
  node.card = "\xff\x01";
  kernel_->add(0, node);
  probe();
  EXPECT_EQ(binding_.cameras.size(), 1U);
}

// The names of the diagnostics that the suggestion skips.
std::vector<std::string> absentIn(const std::string& binding) {
  const auto document = nlohmann::json::parse(binding);
  std::vector<std::string> names;
  for (const auto& [name, reason] : document.at("absent").items()) names.push_back(name);
  return names;
}

TEST_F(ProbeTest, SkipsTheDiagnosticsWhosePartsAreAbsent) {
  EXPECT_THAT(absentIn(probe().binding),
              UnorderedElementsAre("SingleCameraDiagnostic", "CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front",
                                   "TesselFaultDiagnostic", "TesselTelemonDiagnostic"));
  for (int i = 0; i < 2; ++i) kernel_->add(i, fakeCamera("fake:" + std::to_string(i)));
  EXPECT_THAT(absentIn(probe().binding), UnorderedElementsAre("CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front",
                                                              "TesselFaultDiagnostic", "TesselTelemonDiagnostic"));
  kernel_->add(2, fakeCamera("fake:2"));
  EXPECT_THAT(absentIn(probe().binding),
              UnorderedElementsAre("CameraSyncDiagnostic.Front", "TesselFaultDiagnostic", "TesselTelemonDiagnostic"));
  for (int i = 3; i < 5; ++i) kernel_->add(i, fakeCamera("fake:" + std::to_string(i)));
  EXPECT_THAT(absentIn(probe().binding), UnorderedElementsAre("TesselFaultDiagnostic", "TesselTelemonDiagnostic"));
}

TEST_F(ProbeTest, SaysWhenAPartIsMissingForWantOfPermission) {
  const auto reasons = [this] { return nlohmann::json::parse(probe().binding).at("absent"); };
  kernel_->add(0, fakeCamera("fake:0"));
  EXPECT_EQ(reasons().at("CameraSyncDiagnostic.Back"), "Fewer than three back cameras are bound.");
  FakeNode closed = fakeCamera("fake:1");
  closed.openProblem = EACCES;
  kernel_->add(1, closed);
  const nlohmann::json absent = reasons();
  EXPECT_EQ(
      absent.at("CameraSyncDiagnostic.Back"),
      "Fewer than three back cameras are bound. A camera could not be opened without permission: get it and probe "
      "again.");
  EXPECT_EQ(absent.at("TesselFaultDiagnostic"), "No camera with a projector is bound.");
}

TEST(ProbeOfTheRunningSystem, CanBeMade) {
  const MachineProbe found = probeMachine(sourcesOfRunningSystem());
  EXPECT_THAT(found.lines, testing::IsSupersetOf({"Cameras", "HID devices", "Displays", "Counters"}));
}

}  // namespace
}  // namespace quazor
