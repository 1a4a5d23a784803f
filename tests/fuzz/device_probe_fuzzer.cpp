// A machine whose devices report arbitrary texts, numbers and descriptors in sysfs, and whose drivers answer nonsense:
// the probe ends with lines and with a binding that is accepted.
#include "backends/linux/binding/binding.h"
#include "backends/linux/counters/counter_system_for_tests.h"
#include "backends/linux/probe/probe.h"
#include "tests/fuzz/byte_input.h"
#include "tests/fuzz/fuzzing.h"
#include "tests/fuzz/hostile_kernel.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

namespace quazor {
namespace {

namespace fs = std::filesystem;

void write(const fs::path& file, const std::string& content) {
  fs::create_directories(file.parent_path());
  std::ofstream(file, std::ios::binary) << content;
}

// A text of the driver, which a structure of the kernel cuts at 32 bytes.
std::string textFrom(ByteInput& input, const char* usual) {
  const std::uint8_t choice = input.byte();
  return choice < 0x80 ? usual : input.text(choice % 33U);
}

// What the kernel shows of a USB camera, with its metadata node.
void addCamera(HostileKernel& kernel, int number, ByteInput& input) {
  const std::uint8_t choice = input.byte();
  FakeNode camera = (choice & 1) != 0 ? fakeMultiplanarCamera("usb-fake") : fakeCamera("usb-fake");
  camera.driver = textFrom(input, "uvcvideo");
  camera.card = textFrom(input, "USB Camera");
  camera.bus = textFrom(input, "usb-fake");
  camera.device = "usb/1-" + std::to_string((choice & 2) != 0 ? number : 0);
  camera.usbInterface = choice & 3U;
  if ((choice & 4) != 0) camera.formats.clear();
  for (FakeFormat& format : camera.formats) {
    if (input.byte() % 2 == 1) format.fourcc = input.word();
    for (FakeSize& size : format.sizes) {
      if (input.byte() % 4 != 3) continue;
      size.width = input.word();
      for (FrameInterval& interval : size.intervals) interval = {input.word(), input.byte()};
    }
  }
  camera.controls = {{V4L2_CID_BRIGHTNESS, textFrom(input, "Brightness")}};
  const fs::path& sysfs = kernel.roots().sysfs;
  kernel.add(2 * number + 1, fakeMetadata(camera.bus));
  const fs::path folder = sysfs / "devices" / camera.device;
  kernel.add(2 * number, std::move(camera));
  if ((choice & 8) != 0) write(folder / "bInterfaceNumber", input.text(input.byte() % 8U));
  if ((choice & 16) != 0) {
    write(sysfs / "class" / "video4linux" / ("video" + std::to_string(2 * number)) / "name",
          input.text(input.byte() % 64U));
  }
}

void addSensor(const HidrawRoots& roots, int number, ByteInput& input) {
  const std::string node = "hidraw" + std::to_string(number);
  const fs::path device = roots.sysfs / "devices" / ("0003:1209:0001.000" + std::to_string(number));
  write(device / "report_descriptor", input.text(input.byte()));
  write(device / "uevent", "DRIVER=hid-generic\nHID_NAME=" + input.text(input.byte()) + "\n");
  fs::create_directories(roots.sysfs / "class" / "hidraw" / node);
  fs::create_directory_symlink(device, roots.sysfs / "class" / "hidraw" / node / "device");
  write(roots.devices / node, "");
}

void addConnector(const fs::path& sysfs, int number, ByteInput& input) {
  std::string name = "card0-DP-" + std::to_string(number) + input.text(input.byte() % 16U);
  std::ranges::replace(name, '/', '.');
  std::ranges::replace(name, '\0', '.');
  write(sysfs / "class" / "drm" / name / "status", input.byte() % 2 == 0 ? "connected\n" : input.text(input.byte()));
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  ByteInput input(data, size);
  const auto kernel = std::make_shared<HostileKernel>(input);
  const HidrawRoots hid{kernel->roots().sysfs, kernel->roots().dev};
  const std::uint8_t devices = input.byte();
  for (int i = 0; i < devices % 4; ++i) addCamera(*kernel, i, input);
  for (int i = 0; i < devices / 4 % 4; ++i) addSensor(hid, i, input);
  for (int i = 0; i < devices / 16 % 4; ++i) addConnector(kernel->roots().sysfs, i, input);
  const MachineProbe found =
      probeMachine({kernel, kernel->roots(), hid, std::make_shared<FakeCounters>(), kernel->roots().sysfs});
  require(!found.lines.empty(), "a probe has lines");
  require(kernel->calls() < 1'000'000, "a driver cannot keep the program busy");
  static const MemoryFile file("binding.json");
  file.write(reinterpret_cast<const std::uint8_t*>(found.binding.data()), found.binding.size());
  try {
    readBinding(file.path());
  } catch (const InputError& problem) {
    require(false, problem.what());  // what the probe writes is accepted
  }
  return 0;
}
