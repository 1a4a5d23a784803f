// Fake HID devices for the tests of this folder: files replace sysfs, connected sockets replace hidraw nodes.
#pragma once

#include "backends/linux/hid/hidraw_calls.h"
#include "backends/linux/hid/hidraw_nodes.h"
#include "contract/value.h"

#include <gtest/gtest.h>

#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// Input report 0x76 of `length` bytes with its ID, feature reports 0xAB and 0xAC of two bytes, in vendor page 0xFF00.
inline Bytes sensorDescriptor(std::uint16_t page, std::uint8_t usage, std::uint16_t length = 792) {
  const auto fields = static_cast<std::uint16_t>(length - 1);
  const auto low = [](std::uint16_t number) { return static_cast<std::uint8_t>(number); };
  const auto high = [](std::uint16_t number) { return static_cast<std::uint8_t>(number >> 8); };
  return {0x06, low(page), high(page), 0x09, usage, 0xA1,        0x01,         0x15, 0x00, 0x26, 0xFF, 0x00, 0x75, 0x08,
          0x85, 0x76,      0x09,       0x76, 0x96,  low(fields), high(fields), 0x81, 0x02, 0x85, 0xAB, 0x09, 0xAB, 0x95,
          0x01, 0xB1,      0x02,       0x85, 0xAC,  0x09,        0xAC,         0x95, 0x01, 0xB1, 0x02, 0xC0};
}
inline Bytes sensorDescriptor(std::uint8_t usage = 0x24) { return sensorDescriptor(0xFF00, usage); }

// Two input bytes without an ID, and a feature report of one byte.
inline Bytes unnumberedDescriptor() {
  return {0x06, 0x00, 0xFF, 0x09, 0x30, 0xA1, 0x01, 0x75, 0x08, 0x95, 0x02, 0x81, 0x02, 0x95, 0x01, 0xB1, 0x02, 0xC0};
}

// Directory trees that replace sysfs and /dev, removed at the end of this object's lifetime.
class HidrawTree {
 public:
  HidrawTree() {
    std::string name = ::testing::TempDir() + "quazor-hidraw-XXXXXX";
    EXPECT_NE(::mkdtemp(name.data()), nullptr);
    folder_ = name;
    std::filesystem::create_directories(roots().sysfs / "class" / "hidraw");
    std::filesystem::create_directories(roots().devices);
  }
  HidrawTree(const HidrawTree&) = delete;
  HidrawTree& operator=(const HidrawTree&) = delete;
  ~HidrawTree() { std::filesystem::remove_all(folder_); }

  // Lets every user look for the nodes, not only the owner of this process.
  void openToAll() const { std::filesystem::permissions(folder_, std::filesystem::perms(0755)); }

  HidrawRoots roots() const { return {folder_ / "sys", folder_ / "dev"}; }
  std::filesystem::path path(const std::string& node) const { return roots().devices / node; }
  std::filesystem::path classEntry(const std::string& node) const { return roots().sysfs / "class" / "hidraw" / node; }

  // Connects a device as that node. `instance` distinguishes repeated connections.
  void connect(const std::string& node, const Bytes& descriptor, const std::string& name = "Test Sensor",
               int instance = 1) {
    const std::filesystem::path device =
        roots().sysfs / "devices" / ("0003:1209:0001." + node + std::to_string(instance));
    std::filesystem::create_directories(device);
    std::ofstream(device / "report_descriptor", std::ios::binary)
        .write(reinterpret_cast<const char*>(descriptor.data()), static_cast<std::streamsize>(descriptor.size()));
    std::ofstream(device / "uevent") << "DRIVER=hid-generic\nHID_ID=0003:00001209:00000001\nHID_NAME=" << name << "\n";
    std::filesystem::create_directories(classEntry(node));
    std::filesystem::create_directory_symlink(device, classEntry(node) / "device");
    std::ofstream(path(node)).flush();
  }
  void disconnect(const std::string& node) {
    std::filesystem::remove_all(classEntry(node));
    std::filesystem::remove(path(node));
  }

 private:
  std::filesystem::path folder_;
};

// Two connected sockets that preserve message boundaries, like a hidraw node.
inline std::pair<FileDescriptor, FileDescriptor> connectedSockets() {
  std::array<int, 2> ends{-1, -1};
  EXPECT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends.data()), 0);
  return {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
}

inline void sendReport(const FileDescriptor& device, const Bytes& report) {
  EXPECT_EQ(::send(device.get(), report.data(), report.size(), MSG_NOSIGNAL), static_cast<ssize_t>(report.size()));
}

// Returns one end of connected sockets and keeps the other, which represents the device.
class FakeHidrawCalls final : public HidrawCalls {
 public:
  FileDescriptor open(const std::filesystem::path& path) override {
    opened.push_back(path.filename());
    if (onOpen) onOpen();
    if (openError != 0) {
      errno = openError;
      return {};
    }
    auto [near, far] = connectedSockets();
    device = std::move(far);
    return std::move(near);
  }
  long read(int descriptor, std::span<std::uint8_t> room) override {
    if (readErrors.empty()) return ::read(descriptor, room.data(), room.size());
    errno = readErrors.front();
    readErrors.erase(readErrors.begin());
    if (errno != 0) return -1;
    errno = EAGAIN;  // of an earlier call: the end of a file is no error and leaves it
    return 0;
  }
  int setFeature(int descriptor, std::span<const std::uint8_t> report) override {
    EXPECT_GE(descriptor, 0);
    features.emplace_back(report.begin(), report.end());
    time += featureTime;
    if (featureInterruptions > 0) {
      --featureInterruptions;
      errno = EINTR;
      return -1;
    }
    errno = featureError;
    return featureError == 0 ? static_cast<int>(report.size()) : -1;
  }
  std::chrono::nanoseconds now() override { return time; }

  int openError = 0;
  std::function<void()> onOpen;
  std::vector<int> readErrors;  // of the next reads; 0 for the end of the file
  int featureInterruptions = 0;
  int featureError = 0;
  std::chrono::nanoseconds featureTime{0};
  std::chrono::nanoseconds time{0};
  std::vector<std::string> opened;
  std::vector<Bytes> features;
  FileDescriptor device;  // the device's end of the last opened connection
};

}  // namespace quazor
