#include "backends/linux/binding/binding_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <string_view>

#ifndef QUAZOR_BINDING_FOLDER
#error "the build names the folder of the bindings"
#endif

namespace quazor {
namespace {

namespace fs = std::filesystem;
using ::testing::ElementsAre;
using ::testing::Field;

std::string withMetadata(const std::string& entries) { return withCamera("\"metadata\": {" + entries + "}"); }
std::string withField(const std::string& entries) {
  return withMetadata(R"("node": {"card": "m"}, "fields": {"K": {)" + entries + "}}");
}
std::string withProjector(const std::string& entries) { return withCamera("\"projector\": {" + entries + "}"); }
std::string withGroup(const std::string& entries) {
  return withCamera("\"buffers\": 4}}, \"groups\": {\"g\": {" + entries);
}
std::string withFiles(const std::string& entries) { return with("\"counterFiles\": [{" + entries + "}]"); }
// An entry for this path. The group and subgroup are fixed, so only the name is missing.
std::string withPath(const std::string& path, const std::string& entries = "\"name\": \"n\"") {
  return withFiles("\"path\": \"" + path + "\", \"group\": \"g\", \"subgroup\": \"s\", " + entries);
}

TEST_F(BindingTest, ReadsAllThereIsToSay) {
  const Binding binding = read(R"({
    "$schema": "binding.schema.json", "title": "Everything", "description": "d",
    "cameras": {
      "FrontFacingInfraredCamera": {
        "description": "d",
        "node": {"driver": "dr", "card": "ca", "busInfo": "bu"},
        "size": {"width": 640, "height": 360},
        "formats": {"16": {"format": "MJPG", "size": {"width": 1280, "height": 720},
                           "interval": {"numerator": 1001, "denominator": 30000}},
                    "0": {"format": "Y16"}, "4294967295": {"format": "Y16 -BE"}},
        "buffers": 32,
        "controls": {"B": -5, "A": true},
        "metadata": {
          "constants": {"I": 1, "D": 0.5, "S": "s", "B": true},
          "node": {"card": "meta"},
          "fields": {"F": {"offset": 3, "bytes": 8, "shift": 0, "mask": 18446744073709551615}, "G": {"offset": 0}, "H": {"offset": 4, "bytes": 8, "shift": 63, "mask": 1}},
          "controls": {"K": "Gain"}
        },
        "projector": {"on": {"L": 1}, "off": {"L": 0, "M": 0}, "modeControl": "m", "patternControl": "p",
                      "currentControl": "c"},
        "errorCounters": {"X": {"file": "/sys/x"}, "Y": {"control": "E"}}
      },
      "BackFacingCamera": {"node": {"card": "ca"}, "size": {"width": 1, "height": 65536}}
    },
    "groups": {"z": {"description": "d", "cameras": ["FrontFacingInfraredCamera", "BackFacingCamera"],
                     "master": "BackFacingCamera"}},
    "counterFiles": [{"description": "d", "path": "/a/{group}/x{subgroup}y/{name}-*"},
                     {"path": "/proc/f", "group": "g", "subgroup": "s", "key": "{name}"},
                     {"path": "/proc/f", "group": "g", "subgroup": "s", "name": "n", "key": "k"}],
    "tracepoints": [{"system": "v4l2", "event": "*"},
                    {"description": "d", "system": "a", "event": "b", "group": "g", "subgroup": "s", "name": "n"}],
    "display": {"description": "d", "connector": "DSI-1"}
  })");
  EXPECT_EQ(binding.title, "Everything");

  ASSERT_EQ(binding.cameras.size(), 2U);
  const CameraBinding& camera = binding.cameras[0];
  EXPECT_EQ(camera.port, "FrontFacingInfraredCamera");
  EXPECT_EQ(camera.node, (VideoNodeMatch{"dr", "ca", "bu", {}, {}}));
  EXPECT_EQ(camera.width, 640U);
  EXPECT_EQ(camera.height, 360U);
  EXPECT_THAT(camera.formats, ElementsAre(FormatBinding{16, "MJPG", 1280, 720, FrameInterval{1001, 30000}},
                                          FormatBinding{0, "Y16 ", 640, 360, std::nullopt},
                                          FormatBinding{4294967295, "Y16 -BE", 640, 360, std::nullopt}));
  EXPECT_EQ(camera.buffers, 32U);
  ASSERT_EQ(camera.controls.size(), 2U);
  EXPECT_EQ(camera.controls[0].control, "B");
  EXPECT_EQ(camera.controls[0].value, -5);
  EXPECT_EQ(camera.controls[1].control, "A");
  EXPECT_EQ(camera.controls[1].value, 1);

  const Dictionary constants{{"I", std::int64_t{1}}, {"D", 0.5}, {"S", "s"}, {"B", true}};
  EXPECT_EQ(camera.metadata.constants, constants);
  EXPECT_EQ(camera.metadata.node, (VideoNodeMatch{{}, "meta", {}, {}, {}}));
  ASSERT_EQ(camera.metadata.fields.size(), 3U);
  EXPECT_EQ(camera.metadata.fields[0].key, "F");
  EXPECT_EQ(camera.metadata.fields[0].offset, 3U);
  EXPECT_EQ(camera.metadata.fields[0].bytes, 8U);
  EXPECT_EQ(camera.metadata.fields[0].shift, 0U);
  EXPECT_EQ(camera.metadata.fields[0].mask, ~std::uint64_t{0});
  EXPECT_EQ(camera.metadata.fields[1].bytes, 1U);
  EXPECT_EQ(camera.metadata.fields[1].mask, std::nullopt);
  EXPECT_EQ(camera.metadata.fields[2].shift, 63U);
  EXPECT_EQ(camera.metadata.fields[2].mask, 1U);
  ASSERT_EQ(camera.metadata.controls.size(), 1U);
  EXPECT_EQ(camera.metadata.controls[0].key, "K");
  EXPECT_EQ(camera.metadata.controls[0].control, "Gain");

  ASSERT_TRUE(camera.projector);
  EXPECT_THAT(camera.projector->on, ElementsAre(Field(&ControlSetting::control, "L")));
  EXPECT_THAT(camera.projector->off,
              ElementsAre(Field(&ControlSetting::control, "L"), Field(&ControlSetting::control, "M")));
  EXPECT_EQ(camera.projector->modeControl, "m");
  EXPECT_EQ(camera.projector->patternControl, "p");
  EXPECT_EQ(camera.projector->currentControl, "c");
  ASSERT_EQ(camera.errorCounters.size(), 2U);
  EXPECT_EQ(camera.errorCounters[0].name, "X");
  EXPECT_EQ(camera.errorCounters[0].file, "/sys/x");
  EXPECT_EQ(camera.errorCounters[0].control, std::nullopt);
  EXPECT_EQ(camera.errorCounters[1].file, std::nullopt);
  EXPECT_EQ(camera.errorCounters[1].control, "E");

  const CameraBinding& second = binding.cameras[1];
  EXPECT_EQ(second.buffers, 4U);
  EXPECT_FALSE(second.projector);
  EXPECT_FALSE(second.metadata.node);
  ASSERT_EQ(binding.groups.size(), 1U);
  EXPECT_THAT(binding.groups[0].ports, ElementsAre("FrontFacingInfraredCamera", "BackFacingCamera"));
  EXPECT_EQ(binding.groups[0].master, "BackFacingCamera");

  ASSERT_EQ(binding.counterFiles.size(), 3U);
  EXPECT_EQ(binding.counterFiles[0].path, "/a/{group}/x{subgroup}y/{name}-*");
  EXPECT_EQ(binding.counterFiles[0].key, std::nullopt);
  EXPECT_EQ(binding.counterFiles[1].group, "g");
  EXPECT_EQ(binding.counterFiles[1].subgroup, "s");
  EXPECT_EQ(binding.counterFiles[1].name, std::nullopt);
  EXPECT_EQ(binding.counterFiles[1].key, "{name}");
  EXPECT_EQ(binding.counterFiles[2].name, "n");
  EXPECT_EQ(binding.counterFiles[2].key, "k");
  ASSERT_EQ(binding.tracepoints.size(), 2U);
  EXPECT_EQ(binding.tracepoints[0].system, "v4l2");
  EXPECT_EQ(binding.tracepoints[0].event, "*");
  EXPECT_EQ(binding.tracepoints[0].group, std::nullopt);
  EXPECT_EQ(binding.tracepoints[1].group, "g");
  EXPECT_EQ(binding.tracepoints[1].subgroup, "s");
  EXPECT_EQ(binding.tracepoints[1].name, "n");
  ASSERT_TRUE(binding.display);
  EXPECT_EQ(binding.display->connector, "DSI-1");
}

TEST_F(BindingTest, ATitleIsEnough) {
  const Binding binding = read(R"({"title": "t"})");
  EXPECT_THAT(binding.cameras, testing::IsEmpty());
  EXPECT_FALSE(binding.display);
}

TEST_F(BindingTest, RefusesWhatCamerasCannotBe) {
  const std::string camera = "F:3: cameras.BackFacingCamera";
  const Refused kRows[] = {
      {"no port", with(R"("cameras": {"BackFacingCamra": {}})"),
       "F:2: cameras.BackFacingCamra: \"BackFacingCamra\" is not a port; did you mean \"BackFacingCamera\"?"},
      {"no node", with(R"("cameras": {"BackFacingCamera": {"size": {"width": 1, "height": 1}}})"),
       "F:2: cameras.BackFacingCamera: the key \"node\" is missing."},
      {"a node that is anything", with(R"("cameras": {"BackFacingCamera": {"node": {}}})"),
       "F:2: cameras.BackFacingCamera.node: give at least one of \"driver\", \"card\", \"busInfo\", \"path\" and "
       "\"name\"; "
       "'quazor phone probe' shows them."},
      {"no size", with(R"("cameras": {"BackFacingCamera": {"node": {"card": "c"}}})"),
       "F:2: cameras.BackFacingCamera: the key \"size\" is missing."},
      {"the same port twice", withCamera("\"buffers\": 2}, \"BackFacingCamera\": {"),
       "F:3: cameras: the key \"BackFacingCamera\" is duplicated; remove one."},
      {"the same node twice",
       withCamera(R"("buffers": 2}, "FrontFacingCamera": {"node": {"card": "c"}, "size": {"width": 4, "height": 2})"),
       "F:3: cameras.FrontFacingCamera.node: this is the node of \"BackFacingCamera\"; every camera needs its own "
       "node. Distinguish them, for example by busInfo or usbInterface."},
      {"one buffer", withCamera("\"buffers\": 1"), camera + ".buffers: must be an integer from 2 to 32, not 1."},
      {"33 buffers", withCamera("\"buffers\": 33"), camera + ".buffers: must be an integer from 2 to 32, not 33."},
      {"a width of 0",
       with(R"("cameras": {"BackFacingCamera": {"node": {"card": "c"}, "size": {"width": 0, "height": 2}}})"),
       "F:2: cameras.BackFacingCamera.size.width: must be an integer from 1 to 65536, not 0."},
      {"an unknown key", withCamera("\n\"bufers\": 4"),
       "F:4: cameras.BackFacingCamera: unknown key \"bufers\"; did you mean \"buffers\"?"},
      {"a control's name that is too long", withCamera("\"controls\": {\"" + std::string(32, 'x') + "\": 1}"),
       camera + ".controls." + std::string(32, 'x') + ": \"" + std::string(32, 'x') +
           "\" is not a valid control name; names have at most 31 characters."},
      {"a control's value that is no integer", withCamera("\"controls\": {\"Gain\": 1.5}"),
       camera + ".controls.Gain: must be a signed 64-bit integer, not 1.5."},
      {"a counter from nowhere", withCamera("\"errorCounters\": {\"E\": {}}"),
       camera + ".errorCounters.E: give either \"file\" or \"control\" as the source of the count."},
      {"a counter from two places", withCamera("\"errorCounters\": {\"E\": {\"file\": \"/a\", \"control\": \"b\"}}"),
       camera + ".errorCounters.E: give either \"file\" or \"control\" as the source of the count."},
      {"a control without a name", withCamera("\"controls\": {\"\": 1}"),
       camera + ".controls: an entry has an empty name."},
      {"a counter without a name", withCamera("\"errorCounters\": {\"\": {\"control\": \"b\"}}"),
       camera + ".errorCounters: an entry has an empty name."},
      {"a counter in a file by a way back", withCamera("\"errorCounters\": {\"E\": {\"file\": \"/a/../b\"}}"),
       camera + ".errorCounters.E.file: must be a path without \"//\", \".\", \"..\" or a trailing \"/\"."},
      {"a description that is no text", withCamera("\"description\": 5"),
       camera + ".description: must be a non-empty string, not 5."},
      {"a driver that none can have",
       with(R"("cameras": {"BackFacingCamera": {"node": {"driver": "0123456789abcdef"}}})"),
       "F:2: cameras.BackFacingCamera.node.driver: a driver reports at most 15 characters here, and this has 16; "
       "'quazor phone probe' shows the reported text."},
      {"a card that none can have",
       with(R"("cameras": {"BackFacingCamera": {"node": {"card": ")" + std::string(32, 'x') + R"("}}})"),
       "F:2: cameras.BackFacingCamera.node.card: a driver reports at most 31 characters here, and this has 32; 'quazor "
       "phone probe' shows the reported text."},
      {"a bus that none can have",
       with(R"("cameras": {"BackFacingCamera": {"node": {"busInfo": ")" + std::string(32, 'x') + R"("}}})"),
       "F:2: cameras.BackFacingCamera.node.busInfo: a driver reports at most 31 characters here, and this has 32; "
       "'quazor phone probe' shows the reported text."},
      {"a counter in a relative file", withCamera("\"errorCounters\": {\"E\": {\"file\": \"a\"}}"),
       camera + ".errorCounters.E.file: must be an absolute path, such as \"/sys/...\"."},
  };
  for (const Refused& row : kRows) EXPECT_EQ(problemOf(row.text), row.problem) << row.what;
}

TEST_F(BindingTest, RefusesMetadataThatCannotBe) {
  const std::string metadata = "F:3: cameras.BackFacingCamera.metadata";
  const Refused kRows[] = {
      {"fields of no node", withMetadata(R"("fields": {"K": {"offset": 0}})"),
       metadata + ".fields: \"fields\" requires a metadata \"node\"."},
      {"a node without fields", withMetadata(R"("node": {"card": "m"})"),
       metadata + ".node: a metadata \"node\" requires \"fields\"; add them or remove the node."},
      {"a node with no fields", withMetadata(R"("node": {"card": "m"}, "fields": {})"),
       metadata + ".node: a metadata \"node\" requires \"fields\"; add them or remove the node."},
      {"a constant that is a list", withMetadata(R"("constants": {"K": []})"),
       metadata + ".constants.K: must be a number, a string, true or false, not an array."},
      {"an offset that is too large", withField("\"offset\": 16777216"),
       metadata + ".fields.K.offset: must be an integer from 0 to 16777215, not 16777216."},
      {"three bytes", withField("\"offset\": 1, \"bytes\": 3"), metadata + ".fields.K.bytes: must be 1, 2, 4 or 8."},
      {"nine bytes", withField("\"offset\": 1, \"bytes\": 9"),
       metadata + ".fields.K.bytes: must be an integer from 1 to 8, not 9."},
      {"everything shifted out", withField("\"offset\": 1, \"bytes\": 2, \"shift\": 16"),
       metadata + ".fields.K.shift: must be an integer from 0 to 15, not 16."},
      {"everything masked out", withField("\"offset\": 1, \"mask\": 0"),
       metadata + ".fields.K.mask: must be an integer from 1 to 255, not 0."},
      {"a mask of bits that the number does not have",
       withField(R"("offset": 1, "bytes": 2, "shift": 4, "mask": 4096)"),
       metadata + ".fields.K.mask: must be an integer from 1 to 4095, not 4096."},
      {"a constant without a name", withMetadata(R"("constants": {"": 1})"),
       metadata + ".constants: an entry has an empty name."},
      {"a field without a name", withMetadata(R"("node": {"card": "m"}, "fields": {"": {"offset": 0}})"),
       metadata + ".fields: an entry has an empty name."},
      {"a control's key without a name", withMetadata(R"("controls": {"": "Gain"})"),
       metadata + ".controls: an entry has an empty name."},
      {"a projector that is never off", withProjector("\"on\": {\"L\": 1}"),
       "F:3: cameras.BackFacingCamera.projector: the key \"off\" is missing."},
      {"nothing to put it out by", withProjector("\"off\": {}"),
       "F:3: cameras.BackFacingCamera.projector.off: name the controls that switch the projector off."},
      {"a control that stays on", withProjector("\"on\": {\"L\": 1, \"M\": 1}, \"off\": {\"L\": 0}"),
       "F:3: cameras.BackFacingCamera.projector.on.M: \"off\" must also set this control, to switch the projector off "
       "again."},
  };
  for (const Refused& row : kRows) EXPECT_EQ(problemOf(row.text), row.problem) << row.what;
}

TEST_F(BindingTest, RefusesGroupsThatCannotBe) {
  const Refused kRows[] = {
      {"a camera that is not there", withGroup(R"("cameras": ["FrontFacingCamera"], "master": "FrontFacingCamera")"),
       "F:3: groups.g.cameras[0]: \"FrontFacingCamera\" is not a camera of this binding; did you "
       "mean \"BackFacingCamera\"?"},
      {"no camera", withGroup(R"("cameras": [], "master": "BackFacingCamera")"),
       "F:3: groups.g.cameras: a group needs at least one camera."},
      {"a camera twice",
       withGroup(R"("cameras": ["BackFacingCamera", "BackFacingCamera"], "master": "BackFacingCamera")"),
       "F:3: groups.g.cameras[1]: the camera is listed twice; remove one."},
      {"another master", withGroup(R"("cameras": ["BackFacingCamera"], "master": "FrontFacingCamera")"),
       "F:3: groups.g.master: \"FrontFacingCamera\" is not a camera of the group; did you mean \"BackFacingCamera\"?"},
      {"a description that is no text", withGroup("\"description\": []"),
       "F:3: groups.g.description: must be a non-empty string, not an array."},
      {"an unknown key, which is told before any value", withGroup(R"("description": [], "masters": 1)"),
       "F:3: groups.g: unknown key \"masters\"; did you mean \"master\"?"},
      {"no master", withGroup(R"("cameras": ["BackFacingCamera"])"), "F:3: groups.g: the key \"master\" is missing."},
  };
  for (const Refused& row : kRows) EXPECT_EQ(problemOf(row.text), row.problem) << row.what;
}

TEST_F(BindingTest, RefusesCountersThatCannotBe) {
  const std::string files = "F:2: counterFiles[0]";
  const std::string shape = files + ".path: must be a path without \"//\", \".\", \"..\" or a trailing \"/\".";
  const Refused kRows[] = {
      {"a relative path", withPath("a"), files + ".path: must be an absolute path, such as \"/sys/...\"."},
      {"nothing between slashes", withPath("/a//b"), shape},
      {"a slash at the end", withPath("/a/"), shape},
      {"the folder itself", withPath("/a/./b"), shape},
      {"the folder above", withPath("/a/../b"), shape},
      {"a path that is too long", withPath("/" + std::string(4095, 'a')),
       files + ".path: is longer than the maximum length of a path, 4095 bytes."},
      {"a path that ends within", withPath("/a\\u0000b"),
       files + ".path: a path cannot contain the character \\u0000."},
      {"a placeholder outside of the path", withFiles(R"("path": "/a/{name}", "group": "x{name}", "subgroup": "s")"),
       files + ".group: placeholders are allowed only in the path; give the group as it is."},
      {"a description that is no text", withPath("/a", R"("name": "n", "description": 1)"),
       files + ".description: must be a non-empty string, not 1."},
      {"the same files twice", with(R"("counterFiles": [{"path": "/a", "group": "g", "subgroup": "s", "name": "n"},
                                {"path": "/a", "group": "g", "subgroup": "s", "name": "m"},
                                {"path": "/a", "group": "g", "subgroup": "s", "name": "m", "description": "d"}])"),
       "F:4: counterFiles[2]: this is the same as entry 1 of the list; remove one."},
      {"the same tracepoint twice", with(R"("tracepoints": [{"system": "a", "event": "b"},
                                                            {"system": "a", "event": "b"}])"),
       "F:3: tracepoints[1]: this is the same as entry 0 of the list; remove one."},
      {"a tracepoint's description that is no text", with(R"("tracepoints": [{"description": {}}])"),
       "F:2: tracepoints[0].description: must be a non-empty string, not an object."},
      {"a display's description that is no text", with(R"("display": {"description": 1, "connector": "DSI-1"})"),
       "F:2: display.description: must be a non-empty string, not 1."},
      {"an unknown placeholder", withPath("/{nmae}", "\"key\": \"k\""),
       files + ".path: \"/{nmae}\" contains the unknown placeholder \"{nmae}\"; expected one of \"{group}\", "
               "\"{subgroup}\" and "
               "\"{name}\"."},
      {"a placeholder twice", withPath("/{name}/{name}"),
       files + ".path: \"/{name}/{name}\" contains the placeholder \"{name}\" twice; remove one."},
      {"half a brace", withPath("/{name"), files + ".path: \"/{name\" contains an unmatched brace."},
      {"the other half", withPath("/name}"), files + ".path: \"/name}\" contains an unmatched brace."},
      {"two that touch", withPath("/{name}*"),
       files + ".path: \"/{name}*\" needs text between two placeholders or *, so that they can be told apart."},
      {"no name", withPath("/a", "\"key\": \"k\""),
       files + ": the channels have no name; give \"name\", or \"{name}\" in the path."},
      {"a name said twice", withPath("/{name}"),
       files + ".name: the placeholder \"{name}\" already gives it; remove one of them."},
      {"a name said by the key too", withPath("/a", R"("name": "n", "key": "{name}")"),
       files + ".name: the placeholder \"{name}\" already gives it; remove one of them."},
      {"a name said by path and key", withPath("/{name}", "\"key\": \"{name}\""),
       files + ".key: the path already contains \"{name}\"; remove one."},
      {"a key of two words", withPath("/a", R"("name": "n", "key": "a b")"),
       files + ".key: must be a key in the file, or \"{name}\" for one channel per key."},
      {"a number that goes down", withPath("/proc/vmstat", R"("name": "n", "key": "nr_free_pages")"),
       files + ".path: this number is not a counter: it is a current amount, so it can decrease."},
      {"a tracepoint without event", with(R"("tracepoints": [{"system": "a"}])"),
       "F:2: tracepoints[0]: the key \"event\" is missing."},
      {"a tracepoint's system that leads back", with(R"("tracepoints": [{"system": "..", "event": "a"}])"),
       "F:2: tracepoints[0].system: must be the name of a folder in the events of tracefs, not a path."},
      {"a tracepoint's event that is a path", with(R"("tracepoints": [{"system": "a", "event": "b/../c"}])"),
       "F:2: tracepoints[0].event: must be the name of a folder in the events of tracefs, not a path."},
      {"a placeholder in a tracepoint", with(R"("tracepoints": [{"system": "{group}", "event": "a"}])"),
       "F:2: tracepoints[0].system: only * is allowed here, not a placeholder."},
      {"one name for many", with(R"("tracepoints": [{"system": "a", "event": "b*", "name": "n"}])"),
       "F:2: tracepoints[0].name: several events would have the same name; remove it to use the name of each event."},
      {"one name for many systems", with(R"("tracepoints": [{"system": "*", "event": "b", "name": "n"}])"),
       "F:2: tracepoints[0].name: several events would have the same name; remove it to use the name of each event."},
      {"a connector with its card", with(R"("display": {"connector": "card0-DSI-1"})"),
       "F:2: display.connector: must be the name of the connector without its card, such as \"HDMI-A-1\"."},
      {"a connector that is a path", with(R"("display": {"connector": "a/b"})"),
       "F:2: display.connector: must be the name of the connector without its card, such as \"HDMI-A-1\"."},
  };
  for (const Refused& row : kRows) EXPECT_EQ(problemOf(row.text), row.problem) << row.what;
}

TEST_F(BindingTest, ReadsFaultsOfWhatItBinds) {
  const Binding binding = read(R"({"title": "t",
    "cameras": {"BackFacingCamera": {"node": {"card": "c"}, "size": {"width": 1, "height": 1}}},
    "groups": {"back": {"cameras": ["BackFacingCamera"], "master": "BackFacingCamera"}},
    "faults": [
      {"operation": "CaptureStream.start", "object": "BackFacingCamera", "occurrence": 2, "action": "hang"},
      {"operation": "SynchronizedStreamsGroup.streams", "object": "back", "action": "nothing"},
      {"operation": "HidDevice.setFeatureReportWithID", "object": "Any Sensor", "property": "0xAB", "action": "fail"},
      {"operation": "RegistryService.registryProperty", "property": "Power", "action": "delay", "seconds": 0.5}]})");
  ASSERT_EQ(binding.faults.size(), 4U);
  EXPECT_EQ(binding.faults[0],
            (Fault{"CaptureStream.start", "BackFacingCamera", std::nullopt, 2, FaultAction::kHang, std::nullopt, 0}));
  EXPECT_EQ(binding.faults[1].object, "back");
  EXPECT_EQ(binding.faults[2].object, "Any Sensor");
  EXPECT_EQ(binding.faults[3].seconds, 0.5);
}

TEST_F(BindingTest, RefusesFaultsThatCannotBe) {
  const std::string camera =
      R"("cameras": {"BackFacingCamera": {"node": {"card": "c"}, "size": {"width": 1, "height": 1}}}, "faults": )";
  const Refused kRows[] = {
      {"no list", with("\"faults\": {}"), "F:2: faults: must be an array, not an object."},
      {"a camera that is not bound",
       with(camera + R"([{"operation": "CaptureStream.start", "object": "FrontFacingCamera", "action": "fail"}])"),
       "F:2: faults[0].object: \"FrontFacingCamera\" is not an object of CaptureStream.start; did you mean "
       "\"BackFacingCamera\"?"},
      {"a group where there is none",
       with(R"("faults": [{"operation": "SynchronizedStreamsGroup.streams", "object": "back", "action": "fail"}])"),
       "F:2: faults[0].object: SynchronizedStreamsGroup.streams has no object; remove this key."},
      {"a group without a name", with(camera + R"([], "groups": {"": {"cameras": [], "master": "m"}})"),
       "F:2: groups: an entry has an empty name."},
  };
  for (const Refused& row : kRows) EXPECT_EQ(problemOf(row.text), row.problem) << row.what;
}

TEST_F(BindingTest, RefusesWhatIsNoBinding) {
  const Refused kRows[] = {
      {"no JSON", "{\n]", "F:2: not valid JSON: "},
      {"no object", "[]", "F:1: the document: must be an object, not an array."},
      {"no title", "{}", "F:1: the document: the key \"title\" is missing."},
      {"an empty title", "{\n\"title\": \"\"}", "F:2: title: must be a non-empty string, not \"\"."},
      {"a description that is no text", with("\"description\": 1"),
       "F:2: description: must be a non-empty string, not 1."},
      {"a schema that is no text", with("\"$schema\": 1"), "F:2: $schema: must be a non-empty string, not 1."},
      {"an unknown key", with("\"camera\": {}"),
       "F:2: the document: unknown key \"camera\"; did you mean \"cameras\"?"},
  };
  for (const Refused& row : kRows) EXPECT_THAT(problemOf(row.text), ::testing::StartsWith(row.problem)) << row.what;
  EXPECT_THAT([] { readBinding("nowhere.json"); },
              ::testing::ThrowsMessage<InputError>("nowhere.json: the file does not exist."));
}

TEST(Bindings, ThatAreInstalledCanBeRead) {
  std::size_t count = 0;
  for (const auto& entry : fs::directory_iterator(QUAZOR_BINDING_FOLDER)) {
    if (entry.path().extension() != ".json" || entry.path().filename() == "binding.schema.json") continue;
    EXPECT_NO_THROW(readBinding(entry.path())) << entry.path();
    ++count;
  }
  EXPECT_EQ(count, 6U);
}

}  // namespace
}  // namespace quazor
