#include "backends/log/tee_log.h"

#include <utility>

namespace quazor {

TeeLog::TeeLog(std::vector<std::shared_ptr<LogBackend>> backends) : backends_(std::move(backends)) {}

void TeeLog::write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) {
  for (const std::shared_ptr<LogBackend>& backend : backends_) backend->write(level, subsystem, category, text);
}

}  // namespace quazor
