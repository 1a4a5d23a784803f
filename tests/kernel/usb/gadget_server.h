// GadgetServer: attaches gadgets to the kernel and serves them until a signal.
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "tests/kernel/usb/usb_gadget.h"
#include "tests/kernel/usb/usbip_connection.h"

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Thread: one.
class GadgetServer {
 public:
  explicit GadgetServer(std::filesystem::path controller) : controller_(std::move(controller)) {}

  // False, with errno, if the kernel does not take it.
  bool attach(std::shared_ptr<UsbGadget> gadget);
  // Until one of these signals, or until all gadgets are unplugged. False, with errno, if waiting fails.
  bool serve(const FileDescriptor& signals);
  // Unplugs all of them.
  void detachAll() { connections_.clear(); }

 private:
  const std::filesystem::path controller_;
  std::vector<std::unique_ptr<UsbipConnection>> connections_;
};

}  // namespace quazor
