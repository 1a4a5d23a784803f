// The processes below this one, and how to end them.
#pragma once

#include <chrono>
#include <optional>
#include <string_view>
#include <vector>

#include <sys/types.h>

namespace quazor {

// The name of a process (proc(5), /proc/PID/comm) that restores the hardware after a child, and is given time for it.
using IsCleanupProcess = bool (*)(std::string_view name);

// How long endChildren() tries: a process that is blocked in the kernel does not end.
inline constexpr std::chrono::seconds kMaxEnding{5};

// The children of this process, including those that have ended and are not reaped. Takes no time if there are none.
std::vector<pid_t> childrenOfThisProcess();

// Two ways to find them, for the function above. The kernel's lists of each thread's children take the time of the
// children only; nothing if the kernel has none (CONFIG_PROC_CHILDREN), or if a thread ended meanwhile. The parents in
// /proc take the time of all processes of the machine.
std::optional<std::vector<pid_t>> childrenOfThreads();
std::vector<pid_t> childrenByParent();

// Kills and reaps all children of this process except `others`, and then those that it inherits from them as their
// subreaper. Cleanup processes have one second before they are killed. Returns false if some are left, or if it may not
// see them.
bool endChildren(const std::vector<pid_t>& others, IsCleanupProcess isCleanupProcess);

}  // namespace quazor
