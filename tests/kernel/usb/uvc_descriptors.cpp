#include "tests/kernel/usb/uvc_descriptors.h"

#include "tests/kernel/usb/byte_order.h"
#include "tests/kernel/usb/uvc_constants.h"
#include "tests/kernel/usb/uvc_controls.h"

#include <array>
#include <stdexcept>
#include <string_view>

namespace quazor {
namespace {

constexpr std::uint16_t kProduct = 0x0002;

// An uncompressed format is named by its code and the rest of a GUID that all of them share.
struct Uncompressed {
  std::string_view code;
  std::string_view name;  // in the GUID
  std::uint8_t bitsPerPixel;
};
constexpr std::array kUncompressed{Uncompressed{"YUYV", "YUY2", 16}, Uncompressed{"NV12", "NV12", 12},
                                   Uncompressed{"GREY", "Y8  ", 8}};
constexpr std::array<std::uint8_t, 12> kGuidRest{0, 0, 0x10, 0, 0x80, 0, 0, 0xAA, 0, 0x38, 0x9B, 0x71};

const Uncompressed& uncompressed(const UvcFormat& format) {
  for (const Uncompressed& one : kUncompressed) {
    if (one.code == format.code) return one;
  }
  throw std::invalid_argument("there is no format " + format.code);
}

void addInterface(Bytes& to, std::uint8_t number, std::uint8_t alternate, std::uint8_t endpoints,
                  std::uint8_t subclass) {
  addDescriptor(to, {usb::kInterface, number, alternate, endpoints, uvc::kVideo, subclass, 0, 0});
}

void addControlInterface(Bytes& to, std::size_t function) {
  addInterface(to, controlInterfaceOf(function), 0, 0, uvc::kVideoControl);
  Bytes units;
  Bytes camera{uvc::kInterfaceDescriptor, uvc::kInputTerminal, uvc::kCameraTerminal};
  addLittle(camera, uvc::kCamera, 2);
  addZeros(camera, 8);  // no other terminal, no name, no zoom
  camera.push_back(3);
  addLittle(camera, UvcControls::bitsOf(uvc::kCameraTerminal), 3);
  addDescriptor(units, camera);
  Bytes processing{uvc::kInterfaceDescriptor, uvc::kProcessingUnit, uvc::kProcessing, uvc::kCameraTerminal, 0, 0, 2};
  addLittle(processing, UvcControls::bitsOf(uvc::kProcessing), 2);
  append(processing, Bytes{0, 0});  // no name, no analog video standard
  addDescriptor(units, processing);
  Bytes stream{uvc::kInterfaceDescriptor, uvc::kOutputTerminal, uvc::kStreamTerminal};
  addLittle(stream, uvc::kUsbStream, 2);
  append(stream, Bytes{0, uvc::kProcessing, 0});
  addDescriptor(units, stream);

  constexpr std::size_t kControlHeaderBytes = 13;
  Bytes header{uvc::kInterfaceDescriptor, uvc::kControlHeader};
  addLittle(header, uvc::kVersion, 2);
  addLittle(header, kControlHeaderBytes + units.size(), 2);
  addLittle(header, uvc::kClock, 4);
  append(header, Bytes{1, streamingInterfaceOf(function)});
  addDescriptor(to, header);
  append(to, units);
}

void addFrame(Bytes& to, const UvcFormat& format, const UvcFrame& frame, std::size_t index) {
  const std::uint8_t subtype = format.isCompressed() ? uvc::kMjpegFrame : uvc::kUncompressedFrame;
  const std::uint32_t bytes = pictureBytes(format, frame);
  Bytes contents{uvc::kInterfaceDescriptor, subtype, static_cast<std::uint8_t>(index + 1), 0};
  addLittle(contents, frame.width, 2);
  addLittle(contents, frame.height, 2);
  for (const std::uint32_t rate : {frame.rates.back(), frame.rates.front()}) {
    addLittle(contents, std::uint64_t{bytes} * 8 * rate, 4);
  }
  addLittle(contents, bytes, 4);
  addLittle(contents, intervalOfRate(frame.rates.front()), 4);
  contents.push_back(static_cast<std::uint8_t>(frame.rates.size()));
  for (const std::uint32_t rate : frame.rates) addLittle(contents, intervalOfRate(rate), 4);
  addDescriptor(to, contents);
}

void addFormat(Bytes& to, const UvcFormat& format, std::size_t index) {
  const auto number = static_cast<std::uint8_t>(index + 1);
  const auto frames = static_cast<std::uint8_t>(format.frames.size());
  Bytes contents;
  if (format.isCompressed()) {
    contents = {uvc::kInterfaceDescriptor, uvc::kMjpegFormat, number, frames, 1};  // samples have a fixed size
  } else {
    const Uncompressed& known = uncompressed(format);
    contents = {uvc::kInterfaceDescriptor, uvc::kUncompressedFormat, number, frames};
    for (const char one : known.name) contents.push_back(static_cast<std::uint8_t>(one));
    append(contents, kGuidRest);
    contents.push_back(known.bitsPerPixel);
  }
  append(contents, Bytes{1, 0, 0, 0, 0});  // the first frame is the default; no ratio, not interlaced, no protection
  addDescriptor(to, contents);
  for (std::size_t i = 0; i < format.frames.size(); ++i) addFrame(to, format, format.frames[i], i);
  addDescriptor(to, {uvc::kInterfaceDescriptor, uvc::kColors, 1, 1, 4});  // as of sRGB
}

void addEndpoint(Bytes& to, std::uint8_t address, std::uint8_t attributes, std::uint32_t size, std::uint8_t interval) {
  Bytes contents{usb::kEndpoint, address, attributes};
  addLittle(contents, size, 2);
  contents.push_back(interval);
  addDescriptor(to, contents);
}

// The size of an isochronous packet as descriptors write it: more than 1024 bytes are sent at two or three times.
std::uint32_t packetField(std::uint32_t size) {
  constexpr std::uint32_t kLargest = 1024;
  return size <= kLargest ? size : kLargest | (size / kLargest - 1) << 11;
}

void addStreamingInterface(Bytes& to, const UvcCameraConfig& config, std::size_t function) {
  constexpr std::uint8_t kBulk = 2;
  constexpr std::uint8_t kIsochronous = 5;  // asynchronous
  const std::uint8_t number = streamingInterfaceOf(function);
  const std::uint8_t endpoint = endpointOf(function);
  addInterface(to, number, 0, config.isBulk ? 1 : 0, uvc::kVideoStreaming);
  Bytes formats;
  for (std::size_t i = 0; i < config.formats.size(); ++i) addFormat(formats, config.formats[i], i);
  const std::size_t length = 13 + config.formats.size();
  Bytes header{uvc::kInterfaceDescriptor, uvc::kInputHeader, static_cast<std::uint8_t>(config.formats.size())};
  addLittle(header, length + formats.size(), 2);
  append(header, Bytes{endpoint, 0, uvc::kStreamTerminal, 0, 0, 0, 1});
  header.insert(header.end(), config.formats.size(), 0);  // no controls of a format
  addDescriptor(to, header);
  append(to, formats);
  if (config.isBulk) return addEndpoint(to, endpoint, kBulk, uvc::kBulkPacket, 0);
  std::uint8_t alternate = 0;
  for (const std::uint32_t size : uvc::kPacketSizes) {
    addInterface(to, number, ++alternate, 1, uvc::kVideoStreaming);
    addEndpoint(to, endpoint, kIsochronous, packetField(size), 1);
  }
}

}  // namespace

std::vector<UvcFormat> defaultUvcFormats() {
  return {{"YUYV", {{320, 240, {30, 15}}, {160, 120, {30, 15, 5}}, {640, 480, {10}}}},
          {"MJPG", {{640, 480, {30, 15}}, {320, 240, {30}}}},
          {"NV12", {{320, 240, {30, 15}}}},
          {"GREY", {{160, 120, {30, 5}}, {320, 240, {30}}}}};
}

std::uint32_t pictureBytes(const UvcFormat& format, const UvcFrame& frame) {
  const std::uint32_t pixels = std::uint32_t{frame.width} * frame.height;
  return format.isCompressed() ? pixels / 20 : pixels * uncompressed(format).bitsPerPixel / 8;
}

std::uint32_t intervalOfRate(std::uint32_t rate) { return 10'000'000 / rate; }

UsbDescriptors uvcDescriptors(const UvcCameraConfig& config) {
  Bytes interfaces;
  for (std::size_t function = 0; function < config.functions; ++function) {
    addDescriptor(interfaces, {usb::kInterfaceAssociation, controlInterfaceOf(function), 2, uvc::kVideo,
                               uvc::kVideoCollection, 0, 0});
    addControlInterface(interfaces, function);
    addStreamingInterface(interfaces, config, function);
  }
  return {deviceDescriptor(kProduct, true),
          configurationDescriptor(static_cast<std::uint8_t>(2 * config.functions), interfaces),
          {"Rig", config.name, config.serial}};
}

}  // namespace quazor
