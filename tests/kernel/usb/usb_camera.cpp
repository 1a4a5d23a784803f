// Makes USB cameras out of the kernel's virtual USB controller, and tells at the end what they did, in a line of JSON:
//   {"cameras": [{"functions": [{"streams": 1, "frames": 90}], "unplugged": false}]}
// Ends when all cameras are unplugged, or on SIGTERM or SIGINT. The exit code is 0, or 1 after a message on standard
// error.
#include "tests/kernel/ending_signals.h"
#include "tests/kernel/usb/gadget_server.h"
#include "tests/kernel/usb/uvc_camera.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iostream>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

struct Options {
  std::string controller = "/sys/devices/platform/vhci_hcd.0";
  int cameras = 1;
  int functions = 1;
  std::vector<std::string> formats;
  std::vector<std::string> stalls;
  int lateBy = 0;
  UvcCameraConfig config;

  UvcCameraConfig ofCamera(int number) const;
};

UvcCameraConfig Options::ofCamera(int number) const {
  UvcCameraConfig camera = config;
  camera.serial = std::to_string(number + 1);
  camera.functions = static_cast<std::uint8_t>(functions);
  camera.faults.lateBy = std::chrono::milliseconds(lateBy);
  for (const std::string& stall : stalls) {
    const std::size_t colon = stall.find(':');
    camera.faults.stalls.emplace(stall.substr(0, colon), stall.substr(colon + 1));
  }
  std::erase_if(camera.formats, [this](const UvcFormat& one) {
    return !formats.empty() && std::ranges::find(formats, one.code) == formats.end();
  });
  return camera;
}

// The problem of a text "CONTROL:REQUEST"; empty if it has none.
std::string problemOfStall(const std::string& text) {
  const std::size_t colon = text.find(':');
  const bool isKnown = colon != std::string::npos && isUvcControlRequest(text.substr(0, colon), text.substr(colon + 1));
  return isKnown ? "" : "\"" + text + "\" is no control and request, such as contrast:GET_DEF";
}

int failed(const std::string& what) {
  std::cerr << "usb_camera: " << what << ": " << std::strerror(errno) << '\n';
  return 1;
}

int run(const Options& options) {
  const FileDescriptor signals = endingSignals();
  GadgetServer server(options.controller);
  std::vector<std::shared_ptr<UvcCamera>> cameras;
  for (int i = 0; i < options.cameras; ++i) {
    cameras.push_back(std::make_shared<UvcCamera>(options.ofCamera(i)));
    if (!server.attach(cameras.back())) return failed("attaching a camera");
  }
  if (!server.serve(signals)) return failed("waiting");
  server.detachAll();
  std::cout << "{\"cameras\": [";
  for (const auto& one : cameras) std::cout << (one == cameras.front() ? "" : ", ") << one->activity();
  std::cout << "]}" << std::endl;
  return 0;
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  using quazor::UvcMoment;
  quazor::Options options;
  quazor::UvcCameraConfig& config = options.config;
  quazor::UvcFaults& faults = config.faults;
  CLI::App command("Makes USB cameras out of the kernel's virtual USB controller, and tells what they did.");
  command.add_option("--controller", options.controller, "The controller's folder");
  command.add_option("--cameras", options.cameras, "How many devices, all alike")->check(CLI::Range(1, 8));
  command.add_option("--functions", options.functions, "Cameras in each device")->check(CLI::Range(1, 4));
  command.add_option("--name", config.name, "What the devices call themselves");
  command.add_flag("--bulk", config.isBulk, "Send pictures in bulk transfers instead of isochronous ones");
  command.add_option("--formats", options.formats, "Only these formats")
      ->check(CLI::IsMember({"YUYV", "MJPG", "NV12", "GREY"}));
  command.add_option("--stall", options.stalls, "CONTROL:REQUEST that is refused")->check(quazor::problemOfStall);
  command.add_option("--damage-every", faults.damagedEvery, "Mark every Nth frame as damaged");
  command.add_option("--short-every", faults.shortEvery, "Send half of every Nth frame");
  command.add_option("--late-every", faults.lateEvery, "Send every Nth frame late");
  command.add_option("--late-by", options.lateBy, "By so many milliseconds")->check(CLI::Range(0, 1000));
  command.add_option("--mute-after", faults.muteAfter, "After so many frames, send no more");
  command.add_option("--unplug-after", faults.unpluggedAfter, "After so many frames, unplug the device");
  const std::map<std::string, UvcMoment> moments{
      {"commit", UvcMoment::kCommit}, {"start", UvcMoment::kStart}, {"stop", UvcMoment::kStop}};
  command
      .add_option("--unplug-at", faults.unpluggedAt, "When the stream is set up, starts or stops, unplug the device")
      ->transform(CLI::CheckedTransformer(moments));
  CLI11_PARSE(command, argc, argv);
  return quazor::run(options);
}
