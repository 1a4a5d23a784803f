#include "host/report/page/queues_section.h"

#include "contract/message_format.h"
#include "host/report/page/html.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <set>

namespace quazor {

namespace {

struct QueueFacts {
  std::set<std::int64_t> threads;
  std::int64_t longestWait = 0;
  std::optional<std::int64_t> longestRun;
  std::size_t unended = 0;
};

QueueFacts factsOf(const RecordedStream& queue) {
  QueueFacts facts;
  for (const TracedFrame& task : queue.frames) {
    facts.threads.insert(task.number);
    facts.longestWait = std::max(facts.longestWait, task.delivered - task.captured);
    if (task.returned) {
      facts.longestRun = std::max(facts.longestRun.value_or(0), *task.returned - task.delivered);
    } else {
      ++facts.unended;
    }
  }
  return facts;
}

std::string milliseconds(std::int64_t nanoseconds) {
  return roundedText(static_cast<double>(nanoseconds) / 1e6) + " ms";
}

std::string columnHeads() {
  std::string heads;
  for (const char* const head : {"Tasks", "Not recorded", "Threads", "Longest wait", "Longest run", "Not ended"}) {
    heads += element("th scope=\"col\" class=\"number\"", head);
  }
  return heads;
}

std::string cell(const std::string& text) { return element("td class=\"number\"", text); }

std::string rowOf(const RecordedStream& queue, const QueueFacts& facts) {
  return element("tr", element("th scope=\"row\"", htmlName(queue.name)) + cell(std::to_string(queue.frames.size())) +
                           cell(std::to_string(queue.lost)) + cell(std::to_string(facts.threads.size())) +
                           cell(milliseconds(facts.longestWait)) +
                           cell(facts.longestRun ? milliseconds(*facts.longestRun) : "") +
                           cell(std::to_string(facts.unended)));
}

}  // namespace

std::string queuesSection(const std::vector<RecordedStream>& queues, int level) {
  std::string rows;
  std::size_t tasks = 0;
  std::int64_t longest = -1;
  std::string slowest;
  for (const RecordedStream& queue : queues) {
    const QueueFacts facts = factsOf(queue);
    tasks += queue.frames.size();
    rows += rowOf(queue, facts);
    if (queue.frames.empty() || facts.longestWait <= longest) continue;
    longest = facts.longestWait;
    slowest = queue.name;
  }
  if (tasks == 0) return {};
  const std::string waited =
      longest == 0 ? "Every task began at the moment when it was posted."
                   : formatMessage("The longest wait of a task between posting and beginning was %@, in the queue %@.",
                                   milliseconds(longest), slowest);
  return heading(level, "Tasks of queues") +
         element("p", htmlText(formatMessage("%@ in %@. %@", countText(tasks, "task"),
                                             countText(queues.size(), "queue"), waited))) +
         "<table><caption>Tasks by queue</caption><thead><tr><th scope=\"col\">Queue</th>" + columnHeads() +
         "</tr></thead><tbody>" + rows + "</tbody></table>\n";
}

}  // namespace quazor
