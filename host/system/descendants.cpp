#include "host/system/descendants.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>
#include <thread>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

// The time limit of a cleanup process.
constexpr SteadyClock::duration kMaxTidying = 1s;

// A child that no list shows may have come in the meantime, but not so many times.
constexpr int kMaxBlindRounds = 20;

bool hasChild() {
  siginfo_t info{};
  return ::waitid(P_ALL, 0, &info, WEXITED | WNOHANG | WNOWAIT) == 0;
}

// The name of a process; nothing if it has ended.
std::string nameOfProcess(pid_t process) {
  std::ifstream file("/proc/" + std::to_string(process) + "/comm");
  std::string name;
  std::getline(file, name);
  return name;
}

}  // namespace

std::optional<std::vector<pid_t>> childrenOfThreads() {
  std::vector<pid_t> children;
  std::error_code error;
  for (const auto& thread : std::filesystem::directory_iterator("/proc/self/task", error)) {
    std::ifstream file(thread.path() / "children");  // proc(5)
    if (!file) return std::nullopt;
    for (pid_t one = 0; file >> one;) children.push_back(one);
  }
  if (error) return std::nullopt;
  return children;
}

std::vector<pid_t> childrenByParent() {
  std::vector<pid_t> children;
  const pid_t self = ::getpid();
  std::error_code error;
  for (const auto& entry : std::filesystem::directory_iterator("/proc", error)) {
    const std::string name = entry.path().filename();
    if (name.find_first_not_of("0123456789") != std::string::npos) continue;
    std::ifstream file(entry.path() / "stat");  // proc(5): field 4 is the parent
    std::string line;
    std::getline(file, line);
    const std::size_t afterName = line.rfind(')');  // the name may contain any character
    int parent = 0;
    if (afterName == std::string::npos || std::sscanf(line.c_str() + afterName, ") %*c %d", &parent) != 1) continue;
    if (parent == self) children.push_back(static_cast<pid_t>(std::stol(name)));
  }
  return children;
}

std::vector<pid_t> childrenOfThisProcess() {
  if (!hasChild()) return {};
  // The lists may miss the child of a thread that ends meanwhile. An empty one does, as there is a child.
  const std::optional<std::vector<pid_t>> children = childrenOfThreads();
  return children && !children->empty() ? *children : childrenByParent();
}

bool endChildren(const std::vector<pid_t>& others, IsCleanupProcess isCleanupProcess) {
  const SteadyClock::time_point begin = SteadyClock::now();
  int blindRounds = 0;
  for (;;) {
    bool isLeft = false;
    const std::vector<pid_t> children = childrenOfThisProcess();
    for (const pid_t one : children) {
      if (std::find(others.begin(), others.end(), one) != others.end()) continue;
      const bool isRestoring = isCleanupProcess != nullptr && isCleanupProcess(nameOfProcess(one));
      if (!isRestoring || SteadyClock::now() >= begin + kMaxTidying) ::kill(one, SIGKILL);
      if (::waitpid(one, nullptr, WNOHANG) == 0) isLeft = true;
    }
    // A killed process can leave its own children to this one, so the loop ends only when no child is left.
    if (!isLeft && (others.empty() ? !hasChild() : childrenOfThisProcess().size() <= others.size())) return true;
    // Where no file may be opened, /proc shows no child, though there is one.
    if (children.empty() && ++blindRounds == kMaxBlindRounds) return false;
    if (SteadyClock::now() >= begin + kMaxEnding) return false;
    std::this_thread::sleep_for(1ms);
  }
}

}  // namespace quazor
