#include "tests/kernel/usb/gadget_server.h"

#include "tests/kernel/ending_signals.h"
#include "tests/kernel/usb/vhci_port.h"

#include <poll.h>

#include <algorithm>
#include <optional>
#include <utility>

namespace quazor {

bool GadgetServer::attach(std::shared_ptr<UsbGadget> gadget) {
  FileDescriptor socket = attachToPort(controller_);
  if (!socket) return false;
  connections_.push_back(std::make_unique<UsbipConnection>(std::move(socket), std::move(gadget)));
  return true;
}

bool GadgetServer::serve(const FileDescriptor& signals) {
  constexpr UsbGadget::Time kIdle = std::chrono::seconds(3600);
  while (!connections_.empty()) {
    std::vector<pollfd> asked{{signals.get(), POLLIN, 0}};
    UsbGadget::Time nearest = monotonicNow() + kIdle;
    for (const auto& one : connections_) {
      asked.push_back({one->descriptor(), POLLIN, 0});
      nearest = std::min(nearest, one->due().value_or(nearest));
    }
    const timespec left = timeUntil(nearest);
    if (::ppoll(asked.data(), asked.size(), &left, nullptr) < 0) return false;
    if (asked.front().revents != 0) break;
    for (std::size_t i = connections_.size(); i-- > 0;) {
      UsbipConnection& one = *connections_[i];
      const bool goesOn = (asked[i + 1].revents == 0 || one.receive(monotonicNow())) && one.serve(monotonicNow());
      if (!goesOn) connections_.erase(connections_.begin() + static_cast<std::ptrdiff_t>(i));
    }
  }
  return true;
}

}  // namespace quazor
