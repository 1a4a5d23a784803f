#include "backends/linux/hid/hid_report_descriptor.h"

#include "base/text/input_error.h"

#include <cstddef>
#include <optional>
#include <utility>

namespace quazor {
namespace {

// 6.2.2.2 and 6.2.2.3: the first byte of an item contains its tag, type and size.
constexpr std::uint8_t kLongItem = 0xFE;
constexpr std::uint8_t kTagAndType = 0xFC;
constexpr std::uint8_t kSize = 0x03;

// The tags and types of the relevant short items.
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

constexpr std::size_t kMaxDepth = 64;  // of nested collections and of pushes

// 6.2.2.7: persists until it is changed.
struct GlobalState {
  std::uint16_t usagePage = 0;
  std::uint32_t reportSize = 0;  // of one field, in bits
  std::uint32_t reportCount = 0;
  std::uint8_t reportID = 0;
};

// 6.2.2.8: applies only to the next main item.
struct LocalUsage {
  std::uint16_t usage = 0;
  std::optional<std::uint16_t> page;  // of a usage that includes one
};

using Bits = std::map<std::uint8_t, std::uint64_t>;

class Parser {
 public:
  explicit Parser(std::span<const std::uint8_t> bytes) : bytes_(bytes) {}

  HidReportDescriptor parse() {
    while (at_ < bytes_.size()) {
      begin_ = at_;
      parseItem();
    }
    begin_ = at_;
    if (depth_ != 0) refuse("a collection does not end");
    result_.inputReports = bytesOf(input_);
    result_.featureReports = bytesOf(feature_);
    return std::move(result_);
  }

 private:
  [[noreturn]] void refuse(const std::string& what) const {
    throw InputError(what + ", at byte " + std::to_string(begin_));
  }

  void parseItem() {
    const std::uint8_t prefix = bytes_[at_++];
    if (prefix == kLongItem) {
      skipLongItem();
      return;
    }
    const std::size_t size = (prefix & kSize) == 3 ? 4 : prefix & kSize;
    if (bytes_.size() - at_ < size) refuse("an item is cut off");
    std::uint32_t data = 0;
    for (std::size_t i = 0; i < size; ++i) data |= static_cast<std::uint32_t>(bytes_[at_ + i]) << (8 * i);
    at_ += size;
    take(prefix & kTagAndType, data, size);
  }

  // The standard defines no long items.
  void skipLongItem() {
    const std::size_t size = at_ < bytes_.size() ? std::size_t{2} + bytes_[at_] : 1;
    if (bytes_.size() - at_ < size) refuse("an item is cut off");
    at_ += size;
  }

  // Other items affect neither usages nor lengths.
  void take(std::uint8_t item, std::uint32_t data, std::size_t size) {
    switch (item) {
      case kInput: addField(input_); break;
      case kFeature: addField(feature_); break;
      case kOutput: endMainItem(); break;
      case kCollection: beginCollection(); break;
      case kEndCollection: endCollection(); break;
      case kUsagePage: global_.usagePage = static_cast<std::uint16_t>(data); break;
      case kReportSize: global_.reportSize = data; break;
      case kReportCount: global_.reportCount = data; break;
      case kReportID: setReportID(data); break;
      case kPush: push(); break;
      case kPop: pop(); break;
      case kUsageItem:
      case kUsageMinimum: setUsage(data, size); break;
      default: break;
    }
  }

  void setReportID(std::uint32_t data) {
    if (data == 0 || data > 0xFF) refuse("a report ID is not from 1 to 255");
    global_.reportID = static_cast<std::uint8_t>(data);
    result_.numbered = true;
  }

  void push() {
    if (pushed_.size() >= kMaxDepth) refuse("more is pushed than fits");
    pushed_.push_back(global_);
  }

  void pop() {
    if (pushed_.empty()) refuse("more is popped than was pushed");
    global_ = pushed_.back();
    pushed_.pop_back();
  }

  // Only the first usage of a main item counts. Four bytes include its page; otherwise the page in effect at the main
  // item applies.
  void setUsage(std::uint32_t data, std::size_t size) {
    if (local_) return;
    local_ = LocalUsage{static_cast<std::uint16_t>(data), std::nullopt};
    if (size == 4) local_->page = static_cast<std::uint16_t>(data >> 16U);
  }

  void endMainItem() { local_.reset(); }

  void beginCollection() {
    if (depth_ >= kMaxDepth) refuse("collections are nested too deeply");
    if (depth_ == 0) {
      result_.topLevel.push_back(local_ ? HidUsage{local_->page.value_or(global_.usagePage), local_->usage}
                                        : HidUsage{});
    }
    ++depth_;
    endMainItem();
  }

  void endCollection() {
    if (depth_ == 0) refuse("a collection ends that did not begin");
    --depth_;
    endMainItem();
  }

  void addField(Bits& reports) {
    std::uint64_t& bits = reports[global_.reportID];
    bits += static_cast<std::uint64_t>(global_.reportSize) * global_.reportCount;
    if (bits > std::uint64_t{8} * HidReportDescriptor::kMaxReport) refuse("a report is too long");
    endMainItem();
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
  std::size_t begin_ = 0;  // offset of the item
  GlobalState global_;
  std::vector<GlobalState> pushed_;
  std::optional<LocalUsage> local_;
  std::size_t depth_ = 0;
  Bits input_;
  Bits feature_;
  HidReportDescriptor result_;
};

}  // namespace

HidReportDescriptor parseHidReportDescriptor(std::span<const std::uint8_t> bytes) { return Parser(bytes).parse(); }

}  // namespace quazor
