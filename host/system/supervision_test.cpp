#include "host/system/supervision.h"

#include "host/system/child_for_tests.h"
#include "host/testing/test_signals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <ctime>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using std::chrono::steady_clock;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;

class SupervisionTest : public testing::Test {
 protected:
  SupervisionTest() {
    supervision_.takeLine = [this](std::string_view line) {
      lines_.emplace_back(line);
      if (line == "ready" || line == "looked") deadline_ = steady_clock::now() + 30ms;
      if (line == "interrupt") ::kill(::getpid(), SIGINT);
      return line != "garbage";
    };
    supervision_.takeOutput = [this](std::string_view line) { output_.emplace_back(line); };
    supervision_.deadline = [this] { return deadline_; };
    supervision_.isDone = [this] { return !lines_.empty() && lines_.back() == "done"; };
    supervision_.tick = [this] { ++ticks_; };
  }

  // Runs `body` in a child and returns "how, exit code or signal". The child's lines: "ready" shortens the deadline,
  // "interrupt" asks this process to end, "garbage" is not allowed, and "done" is the last.
  std::string run(const std::function<void(int connection)>& body) {
    const steady_clock::time_point begin = steady_clock::now();
    ChildProcess child(signals_, body, std::nullopt);
    const Supervised end = supervise(child, signals_, supervision_);
    took_ = steady_clock::now() - begin;
    constexpr const char* kHow[] = {"ended",           "deadline",   "interrupted",
                                    "connection lost", "guard lost", "line too long"};
    return std::string(kHow[static_cast<int>(end.how)]) + ", " + (end.end ? textOf(*end.end) : "alive");
  }

  const DefaultRequestsToEnd defaults_;
  WatchedSignals signals_;
  Supervision supervision_;
  steady_clock::time_point deadline_ = steady_clock::now() + 20s;
  std::vector<std::string> lines_;
  std::vector<std::string> output_;
  steady_clock::duration took_{};
  int ticks_ = 0;
};

TEST_F(SupervisionTest, TakesTheLinesOfTheConnection) {
  EXPECT_EQ(run([](int connection) { say(connection, "one\ntwo\n\nthree\nnot finished"); }), "ended, exit code 0");
  EXPECT_THAT(lines_, ElementsAre("one", "two", "", "three"));
  EXPECT_THAT(output_, IsEmpty());
  EXPECT_GT(ticks_, 0);
}

TEST_F(SupervisionTest, TakesALineThatComesInPieces) {
  EXPECT_EQ(run([](int connection) {
              for (const char* piece : {"o", "ne", "\nt", "wo\n"}) {
                say(connection, piece);
                ::usleep(2000);
              }
            }),
            "ended, exit code 0");
  EXPECT_THAT(lines_, ElementsAre("one", "two"));
}

TEST_F(SupervisionTest, LosesNoneOfManyLines) {
  constexpr int kLines = 100'000;
  EXPECT_EQ(run([](int connection) {
              for (int i = 0; i < kLines; ++i) say(connection, "line " + std::to_string(i) + "\n");
            }),
            "ended, exit code 0");
  ASSERT_EQ(lines_.size(), static_cast<std::size_t>(kLines));
  for (int i = 0; i < kLines; ++i) ASSERT_EQ(lines_[static_cast<std::size_t>(i)], "line " + std::to_string(i));
}

TEST_F(SupervisionTest, TakesALongLineOfTheConnectionWhole) {
  const std::string line(3'000'000, 'x');
  EXPECT_EQ(run([&line](int connection) { say(connection, line + "\nend\n"); }), "ended, exit code 0");
  ASSERT_EQ(lines_.size(), 2U);
  EXPECT_EQ(lines_[0], line);
}

TEST_F(SupervisionTest, TakesTheLinesOfBothOutputsAndALastOneWithoutEnd) {
  EXPECT_EQ(run([](int) {
              say(STDOUT_FILENO, "printed\n");
              say(STDERR_FILENO, "complained\n\n");
              say(STDOUT_FILENO, "not finished");
            }),
            "ended, exit code 0");
  EXPECT_THAT(output_, ElementsAre("printed", "complained", "", "not finished"));
  EXPECT_THAT(lines_, IsEmpty());
}

TEST_F(SupervisionTest, CutsALineOfOutputThatIsTooLong) {
  constexpr std::size_t kBytes = 1'000'000;
  EXPECT_EQ(run([](int) { say(STDOUT_FILENO, std::string(kBytes, 'x') + "\nend\n"); }), "ended, exit code 0");
  ASSERT_GT(output_.size(), 2U);
  EXPECT_EQ(output_.back(), "end");
  output_.pop_back();
  std::string all;
  for (const std::string& line : output_) {
    EXPECT_LE(line.size(), 2U << 16);
    all += line;
  }
  EXPECT_EQ(all, std::string(kBytes, 'x'));
}

TEST_F(SupervisionTest, TellsExitCodesAndSignals) {
  EXPECT_EQ(run([](int) { ::_exit(7); }), "ended, exit code 7");
  EXPECT_EQ(run([](int) { ::raise(SIGKILL); }), "ended, signal 9 (SIGKILL)");
  EXPECT_EQ(run([](int) { ::raise(SIGTERM); }), "ended, signal 15 (SIGTERM)");
}

TEST_F(SupervisionTest, EndsAChildAtItsDeadline) {
  EXPECT_EQ(run([](int connection) {
              say(connection, "ready\n");
              hang();
            }),
            "deadline, signal 15 (SIGTERM)");
  EXPECT_GE(took_, 30ms);
  EXPECT_LT(took_, 10s);
}

TEST_F(SupervisionTest, EndsABusyChildAtItsDeadline) {
  deadline_ = steady_clock::now() + 30ms;
  EXPECT_EQ(run([](int) {
              const timespec never{INT32_MAX, 0};
              timespec now{};
              while (::clock_gettime(CLOCK_MONOTONIC, &now) == 0 && now.tv_sec < never.tv_sec) {
              }
            }),
            "deadline, signal 15 (SIGTERM)");
}

TEST_F(SupervisionTest, KillsAChildThatDoesNotEndWhenItIsAsked) {
  EXPECT_EQ(run([](int connection) {
              ::signal(SIGTERM, SIG_IGN);
              say(connection, "ready\n");
              hang();
            }),
            "deadline, signal 9 (SIGKILL)");
  EXPECT_GE(took_, 500ms);
}

TEST_F(SupervisionTest, EndsAChildThatHasStoppedItself) {
  EXPECT_EQ(run([](int connection) {
              say(connection, "ready\n");
              ::raise(SIGSTOP);
              hang();
            }),
            "deadline, signal 15 (SIGTERM)");
}

TEST_F(SupervisionTest, TakesWhatAChildSaysWhileItEnds) {
  EXPECT_EQ(run([](int connection) {
              sigset_t set;
              sigemptyset(&set);
              sigaddset(&set, SIGTERM);
              sigprocmask(SIG_BLOCK, &set, nullptr);
              say(connection, "ready\n");
              int signal = 0;
              sigwait(&set, &signal);
              say(connection, "last words\n");
              say(STDOUT_FILENO, "and more");
              ::_exit(5);
            }),
            "deadline, exit code 5");
  EXPECT_THAT(lines_, ElementsAre("ready", "last words"));
  EXPECT_THAT(output_, ElementsAre("and more"));
}

TEST_F(SupervisionTest, AsksForTheDeadlineAgainAfterWhateverTheChildSays) {
  const auto take = supervision_.takeLine;
  supervision_.takeLine = [this, take](std::string_view line) {
    deadline_ = steady_clock::now();
    return take(line);
  };
  EXPECT_EQ(run([](int connection) {
              say(connection, "one\n");
              hang();
            }),
            "deadline, signal 15 (SIGTERM)");
  EXPECT_LT(took_, 10s);
}

TEST_F(SupervisionTest, LetsAChildEndByItselfWhenItHasSaidAll) {
  EXPECT_EQ(run([](int connection) {
              say(connection, "done\n");
              ::usleep(20'000);
              ::_exit(4);
            }),
            "ended, exit code 4");
}

TEST_F(SupervisionTest, KillsAChildThatHasSaidAllAndGoesOn) {
  EXPECT_EQ(run([](int connection) {
              ::signal(SIGTERM, SIG_IGN);
              say(connection, "done\n");
              hang();
            }),
            "ended, signal 9 (SIGKILL)");
  EXPECT_GE(took_, 500ms);
}

TEST_F(SupervisionTest, EndsAChildThatHasClosedItsConnection) {
  EXPECT_EQ(run([](int connection) {
              say(connection, "one\n");
              ::close(connection);
              hang();
            }),
            "connection lost, signal 9 (SIGKILL)");
  EXPECT_THAT(lines_, ElementsAre("one"));
}

TEST_F(SupervisionTest, ForgivesAClosedConnectionToAChildThatEnds) {
  EXPECT_EQ(run([](int connection) {
              ::close(connection);
              ::usleep(20'000);
              ::_exit(6);
            }),
            "ended, exit code 6");
}

TEST_F(SupervisionTest, EndsAChildThatWritesWhatIsNoLineOfItAndTakesNoMoreOfIt) {
  EXPECT_EQ(run([](int connection) {
              say(connection, "one\ngarbage\ntwo\n");
              hang();
            }),
            "connection lost, signal 15 (SIGTERM)");
  EXPECT_THAT(lines_, ElementsAre("one", "garbage"));
}

TEST_F(SupervisionTest, EndsAChildThatWritesALineWithoutEndAndTakesNoMoreOfIt) {
  EXPECT_EQ(kMaxLine, std::size_t{64} * 1024 * 1024);
  EXPECT_EQ(run([](int connection) {
              say(connection, "one\n");
              const std::string piece(1 << 16, 'x');
              for (std::size_t i = 0; i <= kMaxLine; i += piece.size()) say(connection, piece);
              hang();
            }),
            "line too long, signal 15 (SIGTERM)");
  EXPECT_THAT(lines_, ElementsAre("one"));
}

TEST_F(SupervisionTest, TellsOfALineWithoutEndOfAChildThatHasEnded) {
  // On a busy machine the signal is sometimes in time, so the child gets several attempts to end before it.
  std::string end;
  for (int i = 0; i < 20 && end != "line too long, exit code 0"; ++i) {
    end = run([](int connection) { say(connection, std::string(kMaxLine + 1, 'x')); });
    EXPECT_THAT(end, StartsWith("line too long, "));
  }
  EXPECT_EQ(end, "line too long, exit code 0");
  EXPECT_THAT(lines_, IsEmpty());
}

TEST_F(SupervisionTest, TakesTheLongestLineOfTheConnection) {
  EXPECT_EQ(run([](int connection) { say(connection, std::string(kMaxLine, 'x') + "\n"); }), "ended, exit code 0");
  ASSERT_EQ(lines_.size(), 1U);
  EXPECT_EQ(lines_[0].size(), kMaxLine);
}

TEST_F(SupervisionTest, EndsTheChildWhenThisProcessIsAskedToEnd) {
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  EXPECT_EQ(run([](int) { hang(); }), "interrupted, signal 15 (SIGTERM)");
  EXPECT_EQ(signals_.requestsToEnd(), 1);
  EXPECT_EQ(run([](int) { hang(); }), "interrupted, signal 15 (SIGTERM)") << "of a later child, too";
}

TEST_F(SupervisionTest, LetsAnInterruptedChildFinishIfItMay) {
  int asked = 0;
  supervision_.mayFinish = [&asked] { return ++asked > 0; };
  EXPECT_EQ(run([](int connection) {
              say(connection, "interrupt\n");
              ::usleep(20'000);
              say(connection, "finished\n");
            }),
            "interrupted, exit code 0");
  EXPECT_EQ(asked, 1);
  EXPECT_THAT(lines_, ElementsAre("interrupt", "finished"));
}

TEST_F(SupervisionTest, EndsAnInterruptedChildAtItsNewDeadline) {
  supervision_.mayFinish = [this] {
    deadline_ = steady_clock::now() + 30ms;
    return true;
  };
  EXPECT_EQ(run([](int connection) {
              say(connection, "interrupt\n");
              hang();
            }),
            "interrupted, signal 15 (SIGTERM)");
  EXPECT_GE(took_, 30ms);
}

TEST_F(SupervisionTest, KillsAChildThatMayFinishWhenItIsAskedAgain) {
  supervision_.mayFinish = [] { return ::kill(::getpid(), SIGTERM) == 0; };
  EXPECT_EQ(run([](int connection) {
              say(connection, "interrupt\n");
              hang();
            }),
            "interrupted, signal 9 (SIGKILL)");
}

TEST_F(SupervisionTest, WaitsForAnInterruptedChildToEndByItself) {
  EXPECT_EQ(run([](int connection) {
              ::signal(SIGTERM, SIG_IGN);
              say(connection, "interrupt\n");
              hang();
            }),
            "interrupted, signal 9 (SIGKILL)");
  EXPECT_GE(took_, 500ms);
}

TEST_F(SupervisionTest, LosesNoTimeWhenItIsAskedAgain) {
  steady_clock::time_point asked;
  supervision_.takeLine = [&asked](std::string_view /*line*/) {
    asked = steady_clock::now();
    // Pending signals of the same kind are merged.
    return ::kill(::getpid(), SIGINT) == 0 && ::kill(::getpid(), SIGTERM) == 0;
  };
  // Polling would always take half a second; a busy machine only sometimes does.
  for (int attempt = 0; attempt < 20; ++attempt) {
    ASSERT_EQ(run([](int connection) {
                ::signal(SIGTERM, SIG_IGN);
                say(connection, "ready\n");
                hang();
              }),
              "interrupted, signal 9 (SIGKILL)");
    if (steady_clock::now() - asked < 500ms) return;
  }
  FAIL() << "it waited every time";
}

TEST_F(SupervisionTest, DoesNotWaitForWhatTheChildLeavesBehind) {
  EXPECT_EQ(run([](int) {
              if (::fork() == 0) hang();
            }),
            "ended, exit code 0");
  EXPECT_LT(took_, 10s);
}

TEST_F(SupervisionTest, ReapsOrphansOfTheChildWhileItRuns) {
  EXPECT_EQ(run([](int connection) {
              int ends[2];
              if (::pipe(ends) != 0) ::_exit(1);
              constexpr int kOrphans = 20;
              for (int i = 0; i < kOrphans; ++i) {
                const pid_t parent = ::fork();
                if (parent == 0) {
                  const pid_t orphan = ::fork();
                  if (orphan == 0) ::usleep(1000);
                  if (orphan > 0 && ::write(ends[1], &orphan, sizeof orphan) != sizeof orphan) ::_exit(1);
                  ::_exit(0);
                }
                ::waitpid(parent, nullptr, 0);
              }
              // A zombie can still be sent a signal.
              for (int i = 0; i < kOrphans; ++i) {
                pid_t orphan = 0;
                if (::read(ends[0], &orphan, sizeof orphan) != sizeof orphan) ::_exit(1);
                while (::kill(orphan, 0) == 0) ::usleep(1000);
              }
              say(connection, "all are reaped\n");
            }),
            "ended, exit code 0");
  EXPECT_THAT(lines_, ElementsAre("all are reaped"));
}

TEST_F(SupervisionTest, EndsAChildThatHasLostItsGuard) {
  EXPECT_EQ(run([](int connection) {
              say(connection, "one\n");
              ::kill(::getppid(), SIGKILL);
              hang();
            }),
            "guard lost, signal 9 (SIGKILL)");
  EXPECT_THAT(lines_, ElementsAre("one"));
}

TEST_F(SupervisionTest, NeedsNoTick) {
  supervision_.tick = nullptr;
  EXPECT_EQ(run([](int connection) { say(connection, "one\n"); }), "ended, exit code 0");
  EXPECT_THAT(lines_, ElementsAre("one"));
}

}  // namespace
}  // namespace quazor
