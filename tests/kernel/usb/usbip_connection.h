// UsbipConnection: a gadget at a host's end of the protocol.
#pragma once

#include "backends/linux/system/file_descriptor.h"
#include "tests/kernel/usb/usb_gadget.h"
#include "tests/kernel/usb/usbip_protocol.h"

#include <deque>
#include <map>
#include <memory>
#include <optional>

namespace quazor {

// Passes a host's transfers on to a gadget and returns its answers. The gadget is unplugged by destroying this.
//
// Thread: one.
class UsbipConnection {
 public:
  using Time = UsbGadget::Time;

  // Takes a connected stream socket.
  UsbipConnection(FileDescriptor socket, std::shared_ptr<UsbGadget> gadget);

  int descriptor() const { return socket_.get(); }
  // Handles what the host has sent. False if the host has closed the connection or is to be left.
  bool receive(Time now);
  // Answers the transfers that are due. False as above.
  bool serve(Time now);
  // When serve() must be called next; nothing: after the next receive().
  std::optional<Time> due() const;

 private:
  bool handle(const UsbipCommand& command, Time now);
  bool answerControl(const UsbipSubmit& submit, Time now);
  bool answerUnlink(const UsbipUnlink& unlink, Time now);
  bool send(const Bytes& reply);

  FileDescriptor socket_;
  const std::shared_ptr<UsbGadget> gadget_;
  UsbipReader reader_;
  std::map<std::uint8_t, std::deque<UsbipSubmit>> waiting_;  // by endpoint, the oldest first
};

}  // namespace quazor
