#include "host/report/page/frames_section.h"

#include "contract/message_format.h"
#include "host/report/page/html.h"
#include "host/report/page/number_column.h"
#include "host/report/page/plot.h"
#include "host/text/table.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <optional>
#include <span>
#include <string_view>

namespace quazor {

namespace {

constexpr double kPerMillisecond = 1e6;  // nanoseconds
constexpr std::string_view kMasterMark =
    " <-- sync master";  // after the camera's name in the log of a group of cameras
constexpr double kPerSecond = 1e9;
constexpr double kLeastSpan = 0.1;  // milliseconds: a plot shows frames that are late, not the steps of a clock

// Minimum, median and maximum.
struct Spread {
  double least = 0;
  double median = 0;
  double greatest = 0;
};

std::optional<Spread> spreadOf(std::vector<double> values) {
  if (values.empty()) return std::nullopt;
  const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
  std::nth_element(values.begin(), middle, values.end());
  const double median = *middle;
  const auto [least, greatest] = std::minmax_element(values.begin(), values.end());
  return Spread{*least, median, *greatest};
}

std::string millisecondsText(double value) { return roundedText(std::round(value * 1e4) / 1e4); }

std::string spreadText(const std::optional<Spread>& spread) {
  if (!spread) return "\xE2\x80\x93";
  if (spread->least == spread->greatest) return millisecondsText(spread->median);
  return millisecondsText(spread->median) + " (" + millisecondsText(spread->least) + " to " +
         millisecondsText(spread->greatest) + ")";
}

// A place in a stream where frame numbers are missing.
struct Gap {
  std::size_t after = 0;  // index of the frame before it
  std::uint64_t missing = 0;
};

// What is said of a stream. Times are in milliseconds.
struct StreamFacts {
  std::vector<PlotPoint> intervals;
  std::vector<Gap> gaps;
  std::uint64_t missing = 0;
  std::vector<std::int64_t> backwards;  // capture times that are before that of the frame before, in nanoseconds
  std::vector<PlotPoint> offsets;
  std::optional<Spread> interval;
  std::optional<Spread> latency;
  std::optional<Spread> held;
  std::optional<Spread> offset;
};

std::vector<double> valuesOf(const std::vector<PlotPoint>& points) {
  std::vector<double> values;
  values.reserve(points.size());
  for (const PlotPoint& point : points) values.push_back(point.y);
  return values;
}

// A device may tell capture times that go back: points are shown in the order of time.
void sortByTime(std::vector<PlotPoint>& points) {
  std::stable_sort(points.begin(), points.end(),
                   [](const PlotPoint& one, const PlotPoint& other) { return one.x < other.x; });
}

double secondsOf(std::int64_t time) { return static_cast<double>(time) / kPerSecond; }
double millisecondsBetween(std::int64_t begin, std::int64_t end) {
  return static_cast<double>(end - begin) / kPerMillisecond;
}

std::vector<std::int64_t> capturesOf(const RecordedStream& stream) {
  std::vector<std::int64_t> times;
  times.reserve(stream.frames.size());
  for (const TracedFrame& frame : stream.frames) times.push_back(frame.captured);
  return times;
}

// From the nearest of `times`, which are ascending, to `time`.
std::int64_t offsetAgainst(const std::vector<std::int64_t>& times, std::int64_t time) {
  const auto after = std::lower_bound(times.begin(), times.end(), time);
  if (after == times.begin()) return time - *after;
  const auto before = after - 1;
  const bool isAfterNearer = after != times.end() && *after - time < time - *before;
  return time - (isAfterNearer ? *after : *before);
}

// Of each frame of the stream, in nanoseconds.
std::vector<std::int64_t> offsetsOf(const RecordedStream& stream, const RecordedStream& reference) {
  std::vector<std::int64_t> times = capturesOf(reference);
  std::sort(times.begin(), times.end());
  std::vector<std::int64_t> offsets = capturesOf(stream);
  for (std::int64_t& time : offsets) time = offsetAgainst(times, time);
  return offsets;
}

StreamFacts factsOf(const RecordedStream& stream, const RecordedStream& reference) {
  StreamFacts facts;
  std::vector<double> latencies;
  std::vector<double> held;
  for (std::size_t i = 0; i < stream.frames.size(); ++i) {
    const TracedFrame& frame = stream.frames[i];
    latencies.push_back(millisecondsBetween(frame.captured, frame.delivered));
    if (frame.returned) held.push_back(millisecondsBetween(frame.delivered, *frame.returned));
    if (i == 0) continue;
    const TracedFrame& before = stream.frames[i - 1];
    facts.intervals.push_back({secondsOf(frame.captured), millisecondsBetween(before.captured, frame.captured)});
    if (frame.captured < before.captured) facts.backwards.push_back(frame.captured);
    const std::int64_t difference = frame.number - before.number;
    const std::uint64_t step = stream.stepAt(i);
    if (difference <= 0 || static_cast<std::uint64_t>(difference) <= step) continue;
    facts.gaps.push_back({i - 1, static_cast<std::uint64_t>(difference) - step});
    facts.missing += facts.gaps.back().missing;
  }
  if (&stream != &reference) {
    const std::vector<std::int64_t> offsets = offsetsOf(stream, reference);
    for (std::size_t i = 0; i < offsets.size(); ++i) {
      facts.offsets.push_back({secondsOf(stream.frames[i].captured), millisecondsBetween(0, offsets[i])});
    }
  }
  facts.interval = spreadOf(valuesOf(facts.intervals));
  facts.latency = spreadOf(latencies);
  facts.held = spreadOf(held);
  facts.offset = spreadOf(valuesOf(facts.offsets));
  sortByTime(facts.intervals);
  sortByTime(facts.offsets);
  return facts;
}

std::string gapSentence(const RecordedStream& stream, const StreamFacts& facts) {
  if (facts.gaps.empty()) return " No frame number is missing.";
  const Gap& first = facts.gaps.front();
  const TracedFrame& before = stream.frames[first.after];
  return formatMessage(" %@ %@ missing, at %@, the first after frame %@ at %@ s.",
                       countText(facts.missing, "frame number"), facts.missing == 1 ? "is" : "are",
                       countText(facts.gaps.size(), "place"), before.number, roundedText(secondsOf(before.captured)));
}

std::string sentenceOf(const RecordedStream& stream, const StreamFacts& facts, const RecordedStream& reference) {
  std::string text = countText(stream.frames.size(), "frame");
  if (facts.interval) {
    text +=
        formatMessage(", captured from %@ s to %@ s, at a median interval of %@ ms",
                      roundedText(secondsOf(stream.frames.front().captured)),
                      roundedText(secondsOf(stream.frames.back().captured)), millisecondsText(facts.interval->median));
  }
  text += "." + gapSentence(stream, facts);
  if (facts.offset) {
    text +=
        formatMessage(" Against the nearest frame of %@, they were captured %@ ms to %@ ms later, in the median %@ ms.",
                      reference.name, millisecondsText(facts.offset->least), millisecondsText(facts.offset->greatest),
                      millisecondsText(facts.offset->median));
  }
  if (!facts.backwards.empty()) {
    text += formatMessage(" %@ before that of the frame before.",
                          facts.backwards.size() == 1 ? "1 capture time is"
                                                      : std::to_string(facts.backwards.size()) + " capture times are");
  }
  const std::uint64_t step = stream.frames.empty() ? 1 : stream.stepAt(stream.frames.size() - 1);
  if (step > 1) text += formatMessage(" In the end, 1 of %@ frames was recorded.", step);
  if (stream.lost > 0) text += formatMessage(" %@ could not be recorded.", countText(stream.lost, "frame"));
  return text;
}

bool hasManyFramesIn(const RecordedStream& stream) { return stream.frames.size() > kMaxPlotPoints; }

// Numbers for the script. A template shows nothing and runs nothing.
std::string columnOf(const char* name, std::span<const std::int64_t> numbers) {
  return element("template class=\"" + std::string(name) + "\"", numberColumn(numbers));
}

std::string plotsOf(const RecordedStream& stream, const StreamFacts& facts, const RecordedStream& reference,
                    bool isZoomed) {
  std::string html;
  std::vector<std::int64_t> marked = facts.backwards;
  for (const Gap& gap : facts.gaps) marked.push_back(stream.frames[gap.after + 1].captured);
  std::sort(marked.begin(), marked.end());
  std::vector<double> marks;
  marks.reserve(marked.size());
  for (const std::int64_t time : marked) marks.push_back(secondsOf(time));
  if (isZoomed) html += columnOf("captured", capturesOf(stream)) + columnOf("marks", marked);
  const auto add = [&html, isZoomed](const std::string& caption, const std::string& svg, const std::string& column) {
    if (svg.empty()) return;
    html += element(isZoomed ? "figure class=\"zoom\"" : "figure", element("figcaption", caption) + svg + column);
  };
  if (facts.interval) {
    const bool isMarked = !marks.empty();
    add(isMarked ? "Interval between frames, in ms; gaps are marked" : "Interval between frames, in ms",
        plotSvg({"Interval between the frames of " + stream.name,
                 "ms",
                 facts.intervals,
                 std::move(marks),
                 facts.interval->median,
                 {},
                 kLeastSpan}),
        {});
  }
  if (facts.offset) {
    add("Offset against " + htmlName(reference.name) + ", the stream that began first, in ms",
        plotSvg({"Offset of " + stream.name + " against " + reference.name,
                 "ms",
                 facts.offsets,
                 {},
                 facts.offset->median,
                 {},
                 kLeastSpan}),
        isZoomed ? columnOf("offsets", offsetsOf(stream, reference)) : std::string());
  }
  return isZoomed ? element("div class=\"stream\"", html) : html;
}

std::string rowOf(const RecordedStream& stream, const StreamFacts& facts) {
  return element("tr", element("th scope=\"row\"", htmlName(stream.name)) +
                           element("td class=\"number\"", std::to_string(stream.frames.size())) +
                           element("td class=\"number\"", std::to_string(facts.missing)) +
                           element("td class=\"number\"", std::to_string(stream.lost)) +
                           element("td", spreadText(facts.interval)) + element("td", spreadText(facts.offset)) +
                           element("td", spreadText(facts.latency)) + element("td", spreadText(facts.held)));
}

}  // namespace

bool hasManyFrames(const std::vector<RecordedStream>& streams) { return std::ranges::any_of(streams, hasManyFramesIn); }

std::string framesSection(const std::vector<RecordedStream>& streams, int level, ManyFrames many) {
  const RecordedStream* reference = nullptr;
  for (const RecordedStream& stream : streams) {
    if (stream.frames.empty()) continue;
    if (reference == nullptr || stream.frames.front().captured < reference->frames.front().captured) {
      reference = &stream;
    }
  }
  if (reference == nullptr) return {};
  std::string rows;
  std::string details;
  for (const RecordedStream& stream : streams) {
    const StreamFacts facts = factsOf(stream, *reference);
    rows += rowOf(stream, facts);
    details += heading(level + 1, "Stream " + htmlName(stream.name)) + wholeName(stream.name) +
               element("p", htmlText(sentenceOf(stream, facts, *reference)));
    details += plotsOf(stream, facts, *reference, many == ManyFrames::kZoomed && hasManyFramesIn(stream));
  }
  if (many == ManyFrames::kNoLibrary && hasManyFrames(streams)) {
    details +=
        element("p class=\"soft\"",
                "A plot shows the minimum and the maximum of each of its columns. It can be zoomed in a page that "
                "is written where dygraphs is installed (Debian's package libjs-dygraphs).");
  }
  const bool isOne = streams.size() == 1;
  return heading(level, "Frames") +
         "<table><caption>Frames by stream; times in ms: median (minimum to maximum)</caption><thead><tr>"
         "<th scope=\"col\">Stream</th><th scope=\"col\">Frames</th><th scope=\"col\">Missing</th>"
         "<th scope=\"col\">Not recorded</th><th scope=\"col\">Interval</th><th scope=\"col\">Offset" +
         (isOne ? std::string() : " against " + htmlName(reference->name)) +
         "</th><th scope=\"col\">Capture to delivery</th><th scope=\"col\">Delivery to "
         "return</th></tr></thead><tbody>" +
         rows + "</tbody></table>\n" + details;
}

std::string camerasParagraph(const DiagnosticRecord& record, const std::vector<RecordedStream>& streams) {
  std::string names;
  for (const RecordedStream& stream : streams) {
    if (!stream.frames.empty()) names += (names.empty() ? "" : ", ") + stream.name;
  }
  std::string text;
  if (!names.empty()) text += "Frames from: " + names + ". ";
  for (const LogLine& line : record.log) {
    const std::size_t end = line.text.find(kMasterMark);
    if (end == std::string::npos) continue;
    text += "Master, which offsets between cameras refer to: " + line.text.substr(0, end) + ". ";
    break;
  }
  return text.empty() ? text : element("p class=\"soft\"", htmlText(text.substr(0, text.size() - 1)));
}

std::string comparedIntervals(const RecordedStream& before, const RecordedStream& after) {
  const StreamFacts facts[] = {factsOf(before, before), factsOf(after, after)};
  std::string rows;
  std::string sentence;
  for (std::size_t i = 0; i < std::size(facts); ++i) {
    const RecordedStream& stream = i == 0 ? before : after;
    const std::string name = i == 0 ? "First" : "Second";
    rows += element("tr", element("th scope=\"row\"", name) +
                              element("td class=\"number\"", std::to_string(stream.frames.size())) +
                              element("td class=\"number\"", std::to_string(facts[i].missing)) +
                              element("td", spreadText(facts[i].interval)));
    sentence += name + ": " + countText(stream.frames.size(), "frame") + "." + gapSentence(stream, facts[i]) + " ";
  }
  const double median = facts[0].interval ? facts[0].interval->median : 0;
  const std::string svg = plotSvg({"Intervals between the frames of " + before.name + " in both runs",
                                   "ms",
                                   facts[0].intervals,
                                   {},
                                   median,
                                   facts[1].intervals,
                                   kLeastSpan});
  return element("p", htmlText(sentence)) +
         "<table><caption>Frames of both runs; interval in ms: median (minimum to maximum)</caption><thead><tr>"
         "<th scope=\"col\">Run</th><th scope=\"col\">Frames</th><th scope=\"col\">Missing</th>"
         "<th scope=\"col\">Interval</th></tr></thead>" +
         element("tbody", rows) + "</table>" +
         (svg.empty() ? svg
                      : element("figure", element("figcaption",
                                                  "Interval between frames, in ms: <span class=\"first\">"
                                                  "first run</span>, <span class=\"second\">second run</span>") +
                                              svg));
}

}  // namespace quazor
