// ByteInput: the fuzzer's input as a sequence of small numbers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace quazor {

// Numbers from the input; zeros after its end. Thread: one at a time.
class ByteInput {
 public:
  ByteInput(const std::uint8_t* data, std::size_t size) : at_(data), end_(data + size) {}

  bool empty() const { return at_ == end_; }
  std::uint8_t byte() { return empty() ? std::uint8_t{0} : *at_++; }
  std::size_t number() {
    const std::size_t low = byte();
    return low | static_cast<std::size_t>(byte()) << 8;
  }
  std::uint32_t word() {
    const std::size_t low = number();
    return static_cast<std::uint32_t>(low | number() << 16);
  }
  // That many bytes, or those that are left.
  std::vector<std::uint8_t> bytes(std::size_t count) {
    std::vector<std::uint8_t> taken;
    for (; count > 0 && !empty(); --count) taken.push_back(byte());
    return taken;
  }
  std::string text(std::size_t length) {
    const std::vector<std::uint8_t> taken = bytes(length);
    return {taken.begin(), taken.end()};
  }

 private:
  const std::uint8_t* at_;
  const std::uint8_t* end_;
};

}  // namespace quazor
