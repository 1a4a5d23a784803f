#include "backends/linux/hid/hid_report_descriptor.h"

#include <cstddef>
#include <utility>

namespace quazor {
namespace {

// 6.2.2.2 and 6.2.2.3: the first byte of an item is its tag, its type and its size.
constexpr std::uint8_t kLongItem = 0xFE;
constexpr std::uint8_t kTagAndType = 0xFC;
constexpr std::uint8_t kSize = 0x03;

// The tag and the type of the short items that matter here.
enum Item : std::uint8_t {
  kInput = 0x80,
  kOutput = 0x90,
  kCollection = 0xA0,
  kFeature = 0xB0,
  kEndCollection = 0xC0,
  kUsagePage = 0x04,
  kReportSize = 0x74,
  kReportID = 0x84,
  kReportCount = 0x94,
  kPush = 0xA4,
  kPop = 0xB4,
  kUsageItem = 0x08,
  kUsageMinimum = 0x18
};

constexpr std::size_t kMaxDepth = 64;  // of collections, and of pushes

// 6.2.2.7: what holds until it is said anew.
struct GlobalState {
  std::uint16_t usagePage = 0;
  std::uint32_t reportSize = 0;  // of one field, in bits
  std::uint32_t reportCount = 0;
  std::uint8_t reportID = 0;
};

// 6.2.2.8: what holds for the next main item only.
struct LocalUsage {
  std::uint16_t usage = 0;
  std::optional<std::uint16_t> page;  // of a usage that has its own
};

using Bits = std::map<std::uint8_t, std::uint64_t>;

class Parser {
 public:
  explicit Parser(std::span<const std::uint8_t> bytes) : bytes_(bytes) {}

  bool parse() {
    while (at_ < bytes_.size()) {
      begin_ = at_;
      if (!parseItem()) return false;
    }
    begin_ = at_;
    return depth_ == 0 || damaged("a collection does not end");
  }

  std::string takeProblem() { return std::move(problem_); }

  HidReportDescriptor takeResult() {
    result_.inputReports = bytesOf(input_);
    result_.featureReports = bytesOf(feature_);
    return std::move(result_);
  }

 private:
  bool damaged(const std::string& what) {
    problem_ = what + ", at byte " + std::to_string(begin_);
    return false;
  }

  bool parseItem() {
    const std::uint8_t prefix = bytes_[at_++];
    if (prefix == kLongItem) return skipLongItem();
    const std::size_t size = (prefix & kSize) == 3 ? 4 : prefix & kSize;
    if (bytes_.size() - at_ < size) return damaged("an item is cut off");
    std::uint32_t data = 0;
    for (std::size_t i = 0; i < size; ++i) data |= static_cast<std::uint32_t>(bytes_[at_ + i]) << (8 * i);
    at_ += size;
    return take(prefix & kTagAndType, data, size);
  }

  // No long item is defined.
  bool skipLongItem() {
    const std::size_t size = at_ < bytes_.size() ? std::size_t{2} + bytes_[at_] : 1;
    if (bytes_.size() - at_ < size) return damaged("an item is cut off");
    at_ += size;
    return true;
  }

  // All that is not listed changes neither usages nor lengths.
  bool take(std::uint8_t item, std::uint32_t data, std::size_t size) {
    switch (item) {
      case kInput: return addField(input_);
      case kFeature: return addField(feature_);
      case kOutput: return endMainItem();
      case kCollection: return beginCollection();
      case kEndCollection: return endCollection();
      case kUsagePage: global_.usagePage = static_cast<std::uint16_t>(data); return true;
      case kReportSize: global_.reportSize = data; return true;
      case kReportCount: global_.reportCount = data; return true;
      case kReportID: return setReportID(data);
      case kPush: return push();
      case kPop: return pop();
      case kUsageItem:
      case kUsageMinimum: return setUsage(data, size);
      default: return true;
    }
  }

  bool setReportID(std::uint32_t data) {
    if (data == 0 || data > 0xFF) return damaged("a report ID is not from 1 to 255");
    global_.reportID = static_cast<std::uint8_t>(data);
    result_.numbered = true;
    return true;
  }

  bool push() {
    if (pushed_.size() >= kMaxDepth) return damaged("more is pushed than fits");
    pushed_.push_back(global_);
    return true;
  }

  bool pop() {
    if (pushed_.empty()) return damaged("more is popped than was pushed");
    global_ = pushed_.back();
    pushed_.pop_back();
    return true;
  }

  // The first usage of a main item is the one that counts. In four bytes it has its page, else the page is the one that
  // holds at the main item.
  bool setUsage(std::uint32_t data, std::size_t size) {
    if (local_) return true;
    local_ = LocalUsage{static_cast<std::uint16_t>(data), std::nullopt};
    if (size == 4) local_->page = static_cast<std::uint16_t>(data >> 16U);
    return true;
  }

  bool endMainItem() {
    local_.reset();
    return true;
  }

  bool beginCollection() {
    if (depth_ >= kMaxDepth) return damaged("collections are nested too deeply");
    if (depth_ == 0) {
      result_.topLevel.push_back(local_ ? HidUsage{local_->page.value_or(global_.usagePage), local_->usage}
                                        : HidUsage{});
    }
    ++depth_;
    return endMainItem();
  }

  bool endCollection() {
    if (depth_ == 0) return damaged("a collection ends that did not begin");
    --depth_;
    return endMainItem();
  }

  bool addField(Bits& reports) {
    std::uint64_t& bits = reports[global_.reportID];
    bits += static_cast<std::uint64_t>(global_.reportSize) * global_.reportCount;
    if (bits > std::uint64_t{8} * HidReportDescriptor::kMaxReport) return damaged("a report is too long");
    return endMainItem();
  }

  std::map<std::uint8_t, std::uint32_t> bytesOf(const Bits& reports) const {
    std::map<std::uint8_t, std::uint32_t> lengths;
    for (const auto& [id, bits] : reports) {
      lengths[id] = static_cast<std::uint32_t>((bits + 7) / 8) + (result_.numbered ? 1 : 0);
    }
    return lengths;
  }

  const std::span<const std::uint8_t> bytes_;
  std::size_t at_ = 0;
  std::size_t begin_ = 0;  // of the item
  GlobalState global_;
  std::vector<GlobalState> pushed_;
  std::optional<LocalUsage> local_;
  std::size_t depth_ = 0;
  Bits input_;
  Bits feature_;
  HidReportDescriptor result_;
  std::string problem_;
};

}  // namespace

std::optional<HidReportDescriptor> parseHidReportDescriptor(std::span<const std::uint8_t> bytes, std::string* problem) {
  Parser parser(bytes);
  if (parser.parse()) return parser.takeResult();
  *problem = parser.takeProblem();
  return std::nullopt;
}

}  // namespace quazor
