#include "host/run/child_connection.h"

#include "base/text/input_error.h"
#include "host/testing/test_signals.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <functional>
#include <optional>
#include <string>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// What a process with that body writes to its connection.
std::string written(const std::function<void(const ConnectionWriter& connection)>& body) {
  const DefaultRequestsToEnd defaults;
  WatchedSignals signals;
  SharedCounter lost;
  ChildProcess child(
      signals, [&](int descriptor) { body(ConnectionWriter(descriptor, "secret", lost)); }, std::nullopt);
  std::string text;
  Supervision supervision;
  supervision.takeLine = [&text](std::string_view line) {
    text += std::string(line) + "\n";
    return true;
  };
  supervision.takeOutput = [](std::string_view /*line*/) {};
  supervision.deadline = [end = std::chrono::steady_clock::now() + std::chrono::minutes(1)] { return end; };
  supervision.isDone = [] { return false; };
  EXPECT_TRUE(endedWell(supervise(child, signals, supervision)));
  return text;
}

TEST(ConnectionWriter, BeginsEveryLineWithTheToken) {
  EXPECT_EQ(written([](const ConnectionWriter& connection) {
              connection.say({{"a", 1}});
              connection.say({{"b", "two\nlines \xFF"}});
            }),
            "secret{\"a\":1}\nsecret{\"b\":\"two\\nlines \xEF\xBF\xBD\"}\n");
}

TEST(ConnectionWriter, SaysNothingInACopyOfTheProcess) {
  EXPECT_EQ(written([](const ConnectionWriter& connection) {
              const pid_t copy = ::fork();
              connection.say({{"copy", copy == 0}});
              ::waitpid(copy, nullptr, 0);
            }),
            "secret{\"copy\":false}\n");
}

// Whatever is put in the place of the connection, its owner learns of it, and a write to it ends nobody by a signal.
TEST(ConnectionWriter, EndsTheProcessWhenTheConnectionIsOverwritten) {
  const DefaultRequestsToEnd defaults;
  WatchedSignals signals;
  SharedCounter lost;
  const auto body = [&lost](int descriptor) {
    const ConnectionWriter connection(descriptor, "secret", lost);
    const int other = ::open("/dev/null", O_WRONLY);
    ::dup2(other, descriptor);
    connection.say({{"a", 1}});
  };
  ChildProcess child(signals, body, std::nullopt);
  Supervision supervision;
  supervision.takeLine = [](std::string_view /*line*/) { return true; };
  supervision.takeOutput = [](std::string_view /*line*/) {};
  supervision.deadline = [end = std::chrono::steady_clock::now() + std::chrono::minutes(1)] { return end; };
  supervision.isDone = [] { return false; };
  Supervised end = supervise(child, signals, supervision);
  end.lostConnection = lost.get() != 0;
  EXPECT_EQ(errorOf(end, "the run", {})->localizedDescription(),
            "the run closed or overwrote its process's connection to quazor");
}

TEST(DocumentIn, TakesOnlyLinesWithTheToken) {
  EXPECT_EQ(documentIn("secret{\"a\":1}", "secret"), Json({{"a", 1}}));
  for (const char* line : {"{\"a\":1}", "secre{\"a\":1}", "Secret{\"a\":1}", " secret{\"a\":1}", "", "secret",
                           "secret{", "secretsecret{\"a\":1}", "secret{\"a\":1,\"a\":2}"}) {
    EXPECT_THROW(documentIn(line, "secret"), InputError) << line;
  }
}

TEST(EndedWell, IsTrueOnlyOfAnEndByItself) {
  struct Row {
    const char* name;
    Supervised supervised;
    bool well;
  };
  const Row rows[] = {
      {"exit code 0", {SupervisionEnd::kEnded, ProcessEnd{false, 0}}, true},
      {"exit code 1", {SupervisionEnd::kEnded, ProcessEnd{false, 1}}, false},
      {"a signal", {SupervisionEnd::kEnded, ProcessEnd{true, 9}}, false},
      {"no signal at all", {SupervisionEnd::kEnded, ProcessEnd{true, 0}}, false},
      {"a deadline", {SupervisionEnd::kDeadline, ProcessEnd{false, 0}}, false},
      {"an interrupt", {SupervisionEnd::kInterrupted, ProcessEnd{false, 0}}, false},
      {"a lost connection", {SupervisionEnd::kConnectionLost, ProcessEnd{false, 0}}, false},
      {"a process that lives", {SupervisionEnd::kEnded, std::nullopt}, false},
  };
  for (const Row& row : rows) EXPECT_EQ(endedWell(row.supervised), row.well) << row.name;
}

}  // namespace
}  // namespace quazor
