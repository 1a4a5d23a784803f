// A disabled log line, compared with a call of an empty function with the same arguments.
#include "contract/diagnostic_error.h"
#include "contract/log_channel.h"

#include <benchmark/benchmark.h>

#include <cstdint>
#include <string>

namespace quazor {
namespace {

// Takes the same arguments and does nothing.
template <class... Arguments>
void nothing(const char*, const Arguments&...) {}

struct Line {
  std::string port = "PortTypeBack";
  std::uint64_t index = 16;
  DiagnosticErrorPtr error = makeError("QZErrorDomain", 5, "The parameter is out of its range.");
};

// Both loops make the compiler assume that the arguments have changed, so that it cannot hoist the call.
void emptyCall(benchmark::State& state) {
  Line line;
  for (auto _ : state) {
    benchmark::DoNotOptimize(&line);
    benchmark::ClobberMemory();
    nothing("Failed to set the format index to %@ on %@! %@", line.index, line.port, line.error);
  }
}

void disabledLine(benchmark::State& state) {
  Line line;
  for (auto _ : state) {
    benchmark::DoNotOptimize(&line);
    benchmark::ClobberMemory();
    logError("Failed to set the format index to %@ on %@! %@", line.index, line.port, line.error);
  }
}

BENCHMARK(emptyCall)->Name("log/empty call");
BENCHMARK(disabledLine)->Name("log/disabled line");

}  // namespace
}  // namespace quazor

BENCHMARK_MAIN();
