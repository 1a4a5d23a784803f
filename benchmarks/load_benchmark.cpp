// Loading the plug-in, compared with loading an empty shared object.
//
//   load_benchmark PLUG-IN EMPTY-SHARED-OBJECT [options of Google Benchmark]
//
// Each sample is taken in a separate process, forked from this one, which never loads either: everything that dlopen
// does once (mapping, relocation, initialisers, registration) happens each time. libquazor is already loaded, as in a
// host. The child measures the time and sends it through a pipe.
#include "contract/log_channel.h"

#include <benchmark/benchmark.h>

#include <dlfcn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cstdio>
#include <optional>
#include <string>

namespace {

// Runs in the child: loads the file and sends the duration in seconds, or nothing if it cannot be loaded.
void measureInChild(const std::string& path, int answer) {
  const auto before = std::chrono::steady_clock::now();
  void* const handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - before;
  if (handle == nullptr) {
    std::fprintf(stderr, "%s\n", dlerror());
    _exit(1);
  }
  const double seconds = taken.count();
  _exit(write(answer, &seconds, sizeof seconds) == sizeof seconds ? 0 : 1);
}

std::optional<double> secondsToLoad(const std::string& path) {
  std::array<int, 2> ends{};
  if (pipe(ends.data()) != 0) return std::nullopt;
  const pid_t child = fork();
  if (child == 0) measureInChild(path, ends[1]);
  close(ends[1]);
  double seconds = 0;
  const bool answered = child > 0 && read(ends[0], &seconds, sizeof seconds) == sizeof seconds;
  close(ends[0]);
  if (child > 0) waitpid(child, nullptr, 0);
  return answered ? std::optional(seconds) : std::nullopt;
}

void load(benchmark::State& state, const std::string& path) {
  for (auto _ : state) {
    const std::optional<double> seconds = secondsToLoad(path);
    if (!seconds) {
      state.SkipWithError("the file could not be loaded");
      break;
    }
    state.SetIterationTime(*seconds);
  }
}

}  // namespace

int main(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  if (argc != 3) {
    std::fprintf(stderr, "usage: load_benchmark PLUG-IN EMPTY-SHARED-OBJECT\n");
    return 2;
  }
  quazor::sharedLog();  // links libquazor, so that it is already loaded
  const auto add = [](const char* name, const std::string& path) {
    benchmark::RegisterBenchmark(name, load, path)->Iterations(100)->UseManualTime()->Unit(benchmark::kMicrosecond);
  };
  add("load/plug-in", argv[1]);
  add("load/empty shared object", argv[2]);
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
