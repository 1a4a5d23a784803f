#include "host/report/page/number_column.h"

#include "base/text/base64.h"

#include <algorithm>
#include <cstddef>
#include <vector>

namespace quazor {

namespace {

constexpr unsigned kBitsOfGroup = 7;

void add(std::string& bytes, std::int64_t number) {
  std::uint64_t rest = static_cast<std::uint64_t>(number) << 1U;
  if (number < 0) rest = ~rest;
  for (; rest >> kBitsOfGroup != 0; rest >>= kBitsOfGroup) bytes += static_cast<char>(rest | 0x80U);
  bytes += static_cast<char>(rest);
}

}  // namespace

std::string numberColumn(std::span<const std::int64_t> numbers) {
  std::vector<std::int64_t> differences;
  differences.reserve(numbers.size());
  for (std::size_t i = 1; i < numbers.size(); ++i) differences.push_back(numbers[i] - numbers[i - 1]);
  std::int64_t usual = 0;
  if (!differences.empty()) {
    const auto middle = differences.begin() + static_cast<std::ptrdiff_t>(differences.size() / 2);
    std::nth_element(differences.begin(), middle, differences.end());
    usual = *middle;
  }
  std::string bytes;
  add(bytes, usual);
  std::int64_t last = 0;
  for (const std::int64_t number : numbers) {
    add(bytes, number - last - usual);
    last = number;
  }
  return base64(bytes);
}

}  // namespace quazor
