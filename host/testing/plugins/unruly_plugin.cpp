// A plug-in for tests of the host: diagnostics that do not go by the rules, each in its own way.
#include "contract/log_channel.h"
#include "host/testing/plugins/fake_diagnostic.h"
#include "platform/concurrency.h"
#include "platform/platform.h"

#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor::fake {

namespace {

// The descriptor of the connection in quazor's child processes.
constexpr int kConnection = 250;

void tell(std::string_view text) {
  if (::write(kConnection, text.data(), text.size()) < 0) ::_exit(99);
}

// All the events that would follow if the diagnostic passed.
constexpr std::string_view kPass =
    R"({"event":"stageEnded","stage":"run","nanoseconds":1,"date":"2026-11-21T01:08:00.000000000Z"}
{"event":"stageBegan","stage":"analyze","date":"2026-11-21T01:08:00.000000000Z"}
{"event":"stageEnded","stage":"analyze","nanoseconds":1,"date":"2026-11-21T01:08:00.000000000Z"}
{"event":"found","results":[{"name":"R","measurement":[1.0,"frames"]}]}
{"event":"diagnosticCompleted"}
)";

// The grandparent of this process: its parent is the process that guards it.
pid_t pidOfHost() {
  std::ifstream stat("/proc/" + std::to_string(::getppid()) + "/stat");  // proc(5): PID (NAME) STATE PARENT
  std::string word;
  for (int i = 0; i < 4; ++i) stat >> word;
  return std::stoi(word);
}

// Interrupts quazor when it is destroyed.
class LateInterrupt {
 public:
  LateInterrupt() = default;
  LateInterrupt(const LateInterrupt&) = delete;
  LateInterrupt& operator=(const LateInterrupt&) = delete;
  ~LateInterrupt() { ::kill(pidOfHost(), SIGINT); }
};

// Interrupts quazor when the phone, which must have virtual time, is destroyed, after the results were sent.
void interruptWithThePhone() {
  const auto late = std::make_shared<LateInterrupt>();
  // The queue lives as long as the task, which the phone keeps.
  const auto queue = installedPlatform().concurrency->makeSerialQueue("Late", QualityOfService::kDefault);
  queue->asyncAfter(std::chrono::hours(1), [late, queue] {});
}

// Misbehaves according to the parameter "way".
void goWrong(int way) {
  switch (way) {
    case 1: std::abort();
    case 2: ::_exit(3);
    case 3:
      for (;;) ::pause();
    case 4: ::close(kConnection); break;
    case 5: tell("garbage\n"); break;
    case 6:
      tell("{\"event\":\"diagnosticEnded\",\"verdict\":\"pass\",\"date\":\"2026-11-21T01:08:00.000000000Z\"}\n");
      break;
    case 7: std::printf("printed\ntwice"); break;
    case 8:
      for (int i = 0; i < 10'003; ++i) std::printf("%d\n", i);
      break;
    case 9: tell("{\"event\":\"failed\",\"error\":{\"domain\":\"D\",\"code\":1,\"userInfo\":[]}}\n"); break;
    case 10: tell(kPass); ::_exit(0);
    case 11: static_cast<void>(std::vector<char>(std::size_t{4} << 30)); break;
    case 12: interruptWithThePhone(); break;
    case 13:
      for (int i = 0; i < 300; ++i) {
        logError("again");
        ::usleep(10'000);
      }
      break;
    case 14:
      for (int i = 0; i < 100; ++i) std::printf("%s\n", std::string(60'000, 'x').c_str());
      break;
    case 15:
      for (;;) tell(std::string(1'000'000, 'x'));
    case 16:
      ::kill(pidOfHost(), SIGINT);
      ::usleep(300'000);
      break;
    case 17:
      ::kill(pidOfHost(), SIGINT);
      for (;;) ::pause();
    case 18: ::_exit(113);  // any exit code is the plug-in's own
    default: break;
  }
  std::fflush(stdout);
}

class UnrulyExperiment final : public FakeExperiment {
 public:
  QZDescription experimentDescription() const override {
    QZDescription description("Goes its own way.");
    description.addParameter(QZNumberParameter("Which way.", true), "way");
    return description;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override {
    way_ = toInt32(parameters.find("way"));
    return FakeExperiment::setupWithParameters(parameters, host, error);
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    std::unique_ptr<QZExperimentResult> result = FakeExperiment::run(error);
    goWrong(way_);
    return result;
  }

 private:
  int way_ = 0;
};

[[gnu::constructor]] void registerUnruly() { registerDiagnostic<UnrulyExperiment>("Unruly", "Goes its own way."); }

}  // namespace

}  // namespace quazor::fake
