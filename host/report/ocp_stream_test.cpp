#include "host/report/ocp_stream.h"

#include <gtest/gtest.h>

#include <chrono>
#include <iterator>
#include <sstream>

namespace quazor {
namespace {

using namespace std::chrono_literals;

constexpr Date kStreamBegin{};

std::vector<LogLine> logOf(std::initializer_list<std::pair<std::chrono::nanoseconds, const char*>> lines) {
  std::vector<LogLine> log;
  for (const auto& [time, text] : lines) log.push_back({{}, LogLevel::kDefault, text, kStreamBegin + time});
  return log;
}

TEST(OcpStream, NumbersAndDatesItsLines) {
  std::string out = "before\n";
  const std::vector<LogLine> noLog;
  OcpStream stream(out, noLog, kStreamBegin);
  stream.addToRun("testRunStart", {{"name", "N"}}, kStreamBegin);
  stream.addToStep("s", "testStepEnd", {{"status", "SKIP"}}, kStreamBegin + 1500ms);
  stream.end("COMPLETE", "PASS", kStreamBegin + 2s);
  EXPECT_EQ(stream.last(), kStreamBegin + 2s);
  EXPECT_EQ(out, R"(before
{"schemaVersion":{"major":2,"minor":0},"sequenceNumber":0,"timestamp":"1970-01-01T00:00:00.000000000Z"}
{"testRunArtifact":{"testRunStart":{"name":"N"}},"sequenceNumber":1,"timestamp":"1970-01-01T00:00:00.000000000Z"}
{"testStepArtifact":{"testStepId":"s","testStepEnd":{"status":"SKIP"}},"sequenceNumber":2,"timestamp":"1970-01-01T00:00:01.500000000Z"}
{"testRunArtifact":{"testRunEnd":{"status":"COMPLETE","result":"PASS"}},"sequenceNumber":3,"timestamp":"1970-01-01T00:00:02.000000000Z"}
)");
}

// The texts of log lines and the keys of artifacts, in the order of the output.
std::vector<std::string> orderOf(const std::string& out) {
  std::vector<std::string> order;
  std::istringstream lines(out);
  for (std::string line; std::getline(lines, line);) {
    const auto json = nlohmann::ordered_json::parse(line);
    if (json.contains("schemaVersion")) continue;
    const auto& artifact = json.contains("testRunArtifact") ? json["testRunArtifact"] : json["testStepArtifact"];
    order.push_back(artifact.contains("log") ? std::string(artifact["log"]["message"])
                                             : std::prev(artifact.end()).key());
  }
  return order;
}

TEST(OcpStream, PutsLogLinesBeforeWhatIsLater) {
  const std::vector<LogLine> log = logOf({{-1s, "early"}, {1s, "first"}, {2s, "same"}, {3s, "second"}, {9s, "late"}});
  std::string out;
  OcpStream stream(out, log, kStreamBegin);
  stream.addToRun("testRunStart", {}, kStreamBegin);
  stream.addToStep("s", "testStepStart", {}, kStreamBegin + 2s);
  stream.addToRun("error", {}, kStreamBegin + 4s);
  stream.end("ERROR", "NOT_APPLICABLE", kStreamBegin + 5s);
  EXPECT_EQ(orderOf(out), (std::vector<std::string>{"testRunStart", "early", "first", "testStepStart", "same", "second",
                                                    "error", "late", "testRunEnd"}));
}

TEST(OcpStream, NeverGoesBackInTime) {
  const std::vector<LogLine> log = logOf({{3s, "b"}, {1s, "a"}});
  std::string out;
  OcpStream stream(out, log, kStreamBegin + 2s);
  stream.addToRun("testRunStart", {}, kStreamBegin + 1s);
  stream.addToRun("error", {}, kStreamBegin + 4s);
  stream.end("ERROR", "NOT_APPLICABLE", kStreamBegin);
  std::vector<std::string> seconds;
  for (std::size_t at = out.find("00:00:"); at != std::string::npos; at = out.find("00:00:", at + 1)) {
    seconds.push_back(out.substr(at + 6, 2));
  }
  EXPECT_EQ(seconds, (std::vector<std::string>{"02", "02", "03", "03", "04", "04"}));
  EXPECT_EQ(stream.last(), kStreamBegin + 4s);
}

TEST(OcpStream, TellsHowSevereALogLineIs) {
  const std::vector<LogLine> log = {{{}, LogLevel::kError, "e", kStreamBegin},
                                    {{}, LogLevel::kDefault, "i", kStreamBegin},
                                    {{}, LogLevel::kDebug, "d", kStreamBegin}};
  std::string out;
  OcpStream(out, log, kStreamBegin).end("COMPLETE", "PASS", kStreamBegin);
  for (const char* line :
       {R"({"log":{"severity":"ERROR","message":"e"}})", R"({"log":{"severity":"INFO","message":"i"}})",
        R"({"log":{"severity":"DEBUG","message":"d"}})"}) {
    EXPECT_NE(out.find(line), std::string::npos) << line;
  }
}

TEST(OcpStream, ReplacesWhatIsNotUtf8) {
  const std::vector<LogLine> log = logOf({{0s, "\xE2\x82 \xFF\n"}});
  std::string out;
  OcpStream(out, log, kStreamBegin).end("COMPLETE", "PASS", kStreamBegin);
  EXPECT_NE(out.find("\"\xEF\xBF\xBD \xEF\xBF\xBD\\n\""), std::string::npos) << out;
}

}  // namespace
}  // namespace quazor
