// TeeLog: sends log lines to several backends.
#pragma once

#include "contract/log_channel.h"

#include <memory>
#include <string_view>
#include <vector>

namespace quazor {

// Passes each line to all of its backends, in order. Has the thread rules of its backends.
// Thread: any.
class TeeLog final : public LogBackend {
 public:
  // No pointer may be null.
  explicit TeeLog(std::vector<std::shared_ptr<LogBackend>> backends);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  const std::vector<std::shared_ptr<LogBackend>> backends_;
};

}  // namespace quazor
