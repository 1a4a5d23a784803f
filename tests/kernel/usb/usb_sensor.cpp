// Makes display sensors out of the kernel's virtual USB controller, and tells at the end what they did, in a line of
// JSON like that of uhid_sensor. Ends when all are removed, or on SIGTERM or SIGINT. The exit code is 0, or 1 after a
// message on standard error.
#include "tests/kernel/ending_signals.h"
#include "tests/kernel/sensor_options.h"
#include "tests/kernel/usb/gadget_server.h"
#include "tests/kernel/usb/hid_gadget.h"

#include <CLI/CLI.hpp>

#include <cerrno>
#include <cstring>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

struct Options {
  std::string controller = "/sys/devices/platform/vhci_hcd.0";
  int devices = 1;
  SensorOptions sensor;
};

int failed(const std::string& what) {
  std::cerr << "usb_sensor: " << what << ": " << std::strerror(errno) << '\n';
  return 1;
}

int run(const Options& options) {
  const FileDescriptor signals = endingSignals();
  GadgetServer server(options.controller);
  std::vector<std::shared_ptr<HidGadget>> devices;
  for (int i = 0; i < options.devices; ++i) {
    devices.push_back(std::make_shared<HidGadget>(options.sensor.complete(), std::to_string(i + 1)));
    if (!server.attach(devices.back())) return failed("attaching a sensor");
  }
  if (!server.serve(signals)) return failed("waiting");
  server.detachAll();
  std::cout << "{\"devices\": [";
  for (const auto& one : devices) std::cout << (one == devices.front() ? "" : ", ") << one->sensor().activity();
  std::cout << "]}" << std::endl;
  return 0;
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  quazor::Options options;
  CLI::App command("Makes display sensors out of the kernel's virtual USB controller, and tells what they did.");
  command.add_option("--controller", options.controller, "The controller's folder");
  command.add_option("--devices", options.devices, "How many, all alike")->check(CLI::Range(1, 8));
  quazor::addSensorOptions(command, options.sensor);
  CLI11_PARSE(command, argc, argv);
  return quazor::run(options);
}
