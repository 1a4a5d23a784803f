#include "backends/log/system_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <syslog.h>

#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using ::testing::Pair;

class SystemLogTest : public ::testing::Test {
 protected:
  // Returns the text of the only line, without its category.
  std::string written(const std::string& text) {
    lines_.clear();
    log_.write(LogLevel::kError, "s", "c", text);
    EXPECT_EQ(lines_.size(), 1U);
    EXPECT_EQ(lines_.at(0).second.substr(0, 3), "c: ");
    return lines_.at(0).second.substr(3);
  }

  std::vector<std::pair<int, std::string>> lines_;
  SystemLog log_{[this](int priority, const std::string& line) { lines_.emplace_back(priority, line); }};
};

TEST_F(SystemLogTest, LinesHaveTheirPriorityAndCategory) {
  log_.write(LogLevel::kError, "s", "quazor", "100%s");
  log_.write(LogLevel::kDefault, "s", "quazor", "two\nlines");
  log_.write(LogLevel::kDebug, "s", "other", "");
  EXPECT_THAT(lines_, testing::ElementsAre(Pair(LOG_ERR, "quazor: 100%s"), Pair(LOG_NOTICE, "quazor: two\nlines"),
                                           Pair(LOG_DEBUG, "other: ")));
}

TEST_F(SystemLogTest, AVeryLongTextIsCutBetweenCharacters) {
  const std::string fits(SystemLog::kMaxTextLength, 'a');
  EXPECT_EQ(written(fits), fits);
  const std::string nearly(SystemLog::kMaxTextLength - 1, 'a');
  EXPECT_EQ(written(nearly + "\u20AC and more"), nearly) << "three bytes, the first of which would fit";
  EXPECT_EQ(written(std::string(SystemLog::kMaxTextLength + 10, '\x80')),
            std::string(SystemLog::kMaxTextLength - 3, '\x80'))
      << "bytes that are no text are kept too";
}

}  // namespace
}  // namespace quazor
