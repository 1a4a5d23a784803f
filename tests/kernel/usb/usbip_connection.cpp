#include "tests/kernel/usb/usbip_connection.h"

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <utility>

namespace quazor {

UsbipConnection::UsbipConnection(FileDescriptor socket, std::shared_ptr<UsbGadget> gadget)
    : socket_(std::move(socket)), gadget_(std::move(gadget)) {}

bool UsbipConnection::receive(Time now) {
  std::array<std::uint8_t, 65536> room{};
  const ssize_t size = ::recv(socket_.get(), room.data(), room.size(), MSG_DONTWAIT);
  if (size < 0) return errno == EAGAIN || errno == EINTR;
  if (size == 0) return false;
  reader_.feed({room.data(), static_cast<std::size_t>(size)});
  while (const std::optional<UsbipCommand> command = reader_.next()) {
    if (!handle(*command, now)) return false;
  }
  return !reader_.isBroken();
}

bool UsbipConnection::handle(const UsbipCommand& command, Time now) {
  if (const auto* const unlink = std::get_if<UsbipUnlink>(&command)) return answerUnlink(*unlink, now);
  const auto& submit = std::get<UsbipSubmit>(command);
  if ((submit.endpoint & 0x0F) == 0) return answerControl(submit, now);
  if (!submit.isToHost()) return send(replyTo(submit, -EPIPE, {}));
  waiting_[submit.endpoint].push_back(submit);
  return true;
}

bool UsbipConnection::answerControl(const UsbipSubmit& submit, Time now) {
  ControlAnswer answer = gadget_->control(submit.setup, submit.data, now);
  if (gadget_->isUnplugged()) return false;
  if (answer.outcome == ControlOutcome::kNone) {
    waiting_[submit.endpoint].push_back(submit);
    return true;
  }
  answer.data.resize(std::min<std::size_t>(answer.data.size(), submit.length));
  return send(replyTo(submit, answer.outcome == ControlOutcome::kStall ? -EPIPE : 0, {std::move(answer.data), {}}));
}

bool UsbipConnection::answerUnlink(const UsbipUnlink& unlink, Time now) {
  bool isRemoved = false;
  for (auto& [endpoint, transfers] : waiting_) {
    const auto isMeant = [&](const UsbipSubmit& one) { return one.sequence == unlink.unlinked; };
    if (std::erase_if(transfers, isMeant) == 0) continue;
    isRemoved = true;
    if (transfers.empty()) gadget_->cancel(endpoint, now);
  }
  return send(replyTo(unlink, isRemoved ? -ECONNRESET : 0));
}

bool UsbipConnection::serve(Time now) {
  for (auto& [endpoint, transfers] : waiting_) {
    while ((endpoint & 0x0F) != 0 && !transfers.empty()) {
      const std::optional<TransferData> given = gadget_->transfer(transfers.front(), now);
      if (gadget_->isUnplugged()) return false;
      if (!given) break;
      if (!send(replyTo(transfers.front(), 0, *given))) return false;
      transfers.pop_front();
    }
  }
  return !gadget_->isUnplugged();
}

std::optional<UsbipConnection::Time> UsbipConnection::due() const {
  std::optional<Time> nearest;
  for (const auto& [endpoint, transfers] : waiting_) {
    if ((endpoint & 0x0F) == 0 || transfers.empty()) continue;
    const std::optional<Time> next = gadget_->due(endpoint);
    if (next && (!nearest || *next < *nearest)) nearest = next;
  }
  return nearest;
}

bool UsbipConnection::send(const Bytes& reply) {
  for (std::size_t sent = 0; sent < reply.size();) {
    const ssize_t size = ::send(socket_.get(), reply.data() + sent, reply.size() - sent, MSG_NOSIGNAL);
    if (size < 0 && errno != EINTR) return false;
    sent += static_cast<std::size_t>(std::max<ssize_t>(size, 0));
  }
  return true;
}

}  // namespace quazor
