// A plug-in for tests of the host: what it does depends on the words in the environment variable MOODY_NAME, in capital
// letters. Without any it registers the experiment MOODY_NAME.
#include "contract/lab.h"
#include "host/testing/plugins/fake_diagnostic.h"

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>

namespace quazor::fake {

namespace {

// No std::string, which the initializer below could come before.
constexpr const char* kName = MOODY_NAME;

bool is(const char* mood) {
  std::string variable = kName;
  std::ranges::transform(variable, variable.begin(), [](unsigned char letter) { return std::toupper(letter); });
  const char* const moods = std::getenv(variable.c_str());
  return moods != nullptr && std::string(moods).find(mood) != std::string::npos;
}

// From now on, the end of the process by itself is a crash: SIGSYS (seccomp(2)).
void dieInsteadOfExiting() {
  sock_filter instructions[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_exit_group, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_KILL_PROCESS),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog program{static_cast<unsigned short>(std::size(instructions)), instructions};
  if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) std::abort();
  if (::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) != 0) std::abort();
}

void abortSoon() {
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
  std::abort();
}

class MoodyExperiment final : public FakeExperiment {
 public:
  QZDescription experimentDescription() const override {
    if (is("described to death")) dieInsteadOfExiting();
    return FakeExperiment::experimentDescription();
  }
};

[[gnu::constructor]] void registerMoody() {
  if (is("slow")) std::this_thread::sleep_for(std::chrono::seconds(2));
  if (is("hanging")) std::this_thread::sleep_for(std::chrono::hours(1));
  if (is("aborting")) std::abort();
  if (is("ticking")) std::thread(abortSoon).detach();
  if (is("wandering") && ::chdir("/") != 0) std::abort();
  if (is("mortal")) dieInsteadOfExiting();
  if (is("mute")) return;
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName(is("renamed") ? std::string(kName) + "Renamed" : std::string(kName),
                            [] { return std::make_shared<MoodyExperiment>(); });
  if (is("combining")) {  // with the experiment of the plug-in Moody
    lab.addAnalysisWithName(std::string(kName) + "Analysis", [] { return std::make_shared<FakeAnalysis>(); });
    lab.addDiagnosticWithName("Both", "Needs two plug-ins.", "Moody", std::string(kName) + "Analysis");
  }
}

}  // namespace

}  // namespace quazor::fake
