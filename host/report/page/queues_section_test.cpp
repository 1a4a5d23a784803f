#include "host/report/page/queues_section.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

TEST(QueuesSection, HasTheLongestWaitAndTheLongestRunOfEachQueue) {
  const std::vector<RecordedStream> queues = {
      {"<Slow>", {{1, 0, 5'000'000, 5'500'000}, {2, 4'000'000, 6'000'000, std::nullopt}}, 7, {}, TracedKind::kTasks},
      {"Quick", {{1, 0, 1'000'000, 3'000'000}, {1, 0, 3'000'000, 4'000'000}}, 0, {}, TracedKind::kTasks},
      {"Idle", {}, 0, {}, TracedKind::kTasks}};
  const std::string html = queuesSection(queues, 3);
  EXPECT_THAT(html, HasSubstr("4 tasks in 3 queues."));
  EXPECT_THAT(html, HasSubstr("was 5 ms, in the queue &lt;Slow&gt;."));
  const auto cells = [](const char* first, const char* rest) { return std::string(first) + "</th>" + rest; };
  EXPECT_THAT(html, HasSubstr(cells("Quick",
                                    "<td class=\"number\">2</td><td class=\"number\">0</td>"
                                    "<td class=\"number\">1</td><td class=\"number\">3 ms</td>"
                                    "<td class=\"number\">2 ms</td><td class=\"number\">0</td>")));
  EXPECT_THAT(html, HasSubstr(cells("&lt;Slow&gt;",
                                    "<td class=\"number\">2</td><td class=\"number\">7</td>"
                                    "<td class=\"number\">2</td><td class=\"number\">5 ms</td>"
                                    "<td class=\"number\">0.5 ms</td><td class=\"number\">1</td>")));
  EXPECT_THAT(html, Not(HasSubstr("<Slow>")));
}

TEST(QueuesSection, NamesNoQueueIfNoTaskWaited) {
  EXPECT_THAT(queuesSection({{"Quick", {{1, 5, 5, 9}}, 0, {}, TracedKind::kTasks}}, 3),
              HasSubstr("1 task in 1 queue. Every task began at the moment when it was posted.</p>"));
}

TEST(QueuesSection, IsEmptyWithoutTasks) {
  EXPECT_THAT(queuesSection({}, 3), IsEmpty());
  EXPECT_THAT(queuesSection({{"Idle", {}, 0, {}, TracedKind::kTasks}}, 3), IsEmpty());
}

}  // namespace
}  // namespace quazor
