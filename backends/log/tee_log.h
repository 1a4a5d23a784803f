// TeeLog: one log line for several back-ends.
#pragma once

#include "contract/log_channel.h"

#include <memory>
#include <string_view>
#include <vector>

namespace quazor {

// Hands every line to each of its back-ends, in their order. Any thread, as far as they allow it.
// Thread: any.
class TeeLog final : public LogBackend {
 public:
  // None of them may be null.
  explicit TeeLog(std::vector<std::shared_ptr<LogBackend>> backends);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  const std::vector<std::shared_ptr<LogBackend>> backends_;
};

}  // namespace quazor
