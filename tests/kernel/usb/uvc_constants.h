// The numbers of the USB Video Class 1.1, and those that the rig's cameras use.
#pragma once

#include <cstdint>

namespace quazor::uvc {

inline constexpr std::uint16_t kVersion = 0x0110;
inline constexpr std::uint32_t kClock = 48'000'000;  // ticks a second of the camera's clock

// The class of interfaces, and its subclasses.
inline constexpr std::uint8_t kVideo = 0x0E;
inline constexpr std::uint8_t kVideoControl = 1;
inline constexpr std::uint8_t kVideoStreaming = 2;
inline constexpr std::uint8_t kVideoCollection = 3;

// Types of class descriptors.
inline constexpr std::uint8_t kInterfaceDescriptor = 0x24;
// Subtypes of control interfaces.
inline constexpr std::uint8_t kControlHeader = 1;
inline constexpr std::uint8_t kInputTerminal = 2;
inline constexpr std::uint8_t kOutputTerminal = 3;
inline constexpr std::uint8_t kProcessingUnit = 5;
// Subtypes of streaming interfaces.
inline constexpr std::uint8_t kInputHeader = 1;
inline constexpr std::uint8_t kUncompressedFormat = 4;
inline constexpr std::uint8_t kUncompressedFrame = 5;
inline constexpr std::uint8_t kMjpegFormat = 6;
inline constexpr std::uint8_t kMjpegFrame = 7;
inline constexpr std::uint8_t kColors = 13;
// Types of terminals.
inline constexpr std::uint16_t kCamera = 0x0201;
inline constexpr std::uint16_t kUsbStream = 0x0101;

// The entities of each function.
inline constexpr std::uint8_t kCameraTerminal = 1;
inline constexpr std::uint8_t kProcessing = 2;
inline constexpr std::uint8_t kStreamTerminal = 3;

// Requests of the class.
inline constexpr std::uint8_t kSetCur = 0x01;
inline constexpr std::uint8_t kGetCur = 0x81;
inline constexpr std::uint8_t kGetMin = 0x82;
inline constexpr std::uint8_t kGetMax = 0x83;
inline constexpr std::uint8_t kGetRes = 0x84;
inline constexpr std::uint8_t kGetLen = 0x85;
inline constexpr std::uint8_t kGetInfo = 0x86;
inline constexpr std::uint8_t kGetDef = 0x87;

// Why the last control request stalled: the control 2 of the interface itself.
inline constexpr std::uint8_t kErrorCodeControl = 2;
inline constexpr std::uint8_t kNoError = 0;
inline constexpr std::uint8_t kOutOfRange = 4;
inline constexpr std::uint8_t kInvalidUnit = 5;
inline constexpr std::uint8_t kInvalidControl = 6;
inline constexpr std::uint8_t kInvalidRequest = 7;

// Controls of streaming interfaces, and the length of their value.
inline constexpr std::uint8_t kProbeControl = 1;
inline constexpr std::uint8_t kCommitControl = 2;
inline constexpr std::uint16_t kProbeBytes = 34;

// The values of requests for them.
inline constexpr std::uint16_t kProbeValue = kProbeControl << 8;
inline constexpr std::uint16_t kCommitValue = kCommitControl << 8;

// Bits of a payload's header.
inline constexpr std::uint8_t kFrameId = 0x01;
inline constexpr std::uint8_t kEndOfFrame = 0x02;
inline constexpr std::uint8_t kHasPts = 0x04;
inline constexpr std::uint8_t kHasScr = 0x08;
inline constexpr std::uint8_t kError = 0x40;
inline constexpr std::uint8_t kEndOfHeader = 0x80;
inline constexpr std::uint32_t kHeaderBytes = 12;

// Isochronous packets at high speed: alternate setting N has the size N - 1, in 1024 bytes and less.
inline constexpr std::uint32_t kPacketSizes[] = {512, 1024, 2048, 3072};
// The largest payload of a bulk camera: a host asks for so many bytes at once.
inline constexpr std::uint32_t kBulkPayload = 16384;
inline constexpr std::uint16_t kBulkPacket = 512;

}  // namespace quazor::uvc
