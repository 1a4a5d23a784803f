// formatMessage compared with libfmt, on log lines of the diagnostics.
#include "contract/diagnostic_error.h"
#include "contract/message_format.h"

#include <benchmark/benchmark.h>
#include <fmt/compile.h>
#include <fmt/format.h>

#include <cstdint>
#include <cstdio>
#include <iterator>
#include <string>
#include <vector>

// Formats an error like "%@".
template <>
struct fmt::formatter<quazor::DiagnosticErrorPtr> {
  constexpr auto parse(format_parse_context& context) { return context.begin(); }
  template <class Context>
  auto format(const quazor::DiagnosticErrorPtr& error, Context& context) const {
    return format_to(context.out(), FMT_COMPILE("{} code {}: {}"), error->domain(), error->code(),
                     error->localizedDescription());
  }
};

namespace quazor {
namespace {

// Opaque to the compiler.
struct Arguments {
  std::uint64_t frame = 4711;
  std::int64_t index = 16;
  int event = 7;
  double seconds = 1234.567891;
  double offset = 0.033333333333333333;
  std::string port = "PortTypeBackSuperWide";
  std::string key = "SlaveConfigurationByPortType";
  DiagnosticErrorPtr error = makeError("QZCapturePlugInErrorDomain", 209, "Failed to set format index to 16");
};

template <class Format>
void measure(benchmark::State& state, Format format) {
  Arguments arguments;
  for (auto _ : state) {
    benchmark::DoNotOptimize(&arguments);
    benchmark::ClobberMemory();
    std::string message = format(arguments);
    benchmark::DoNotOptimize(message.data());
  }
}

// Checks that the three implementations format a line equally.
template <class Ours, class Libfmt, class Compiled>
bool registerLine(const std::string& name, Ours ours, Libfmt libfmt, Compiled compiled) {
  const Arguments arguments;
  const std::string text = ours(arguments);
  if (text != libfmt(arguments) || text != compiled(arguments)) {
    std::fprintf(stderr, "%s: the texts differ: \"%s\" and \"%s\"\n", name.c_str(), text.c_str(),
                 libfmt(arguments).c_str());
    return false;
  }
  const auto add = [&name](const char* form, auto format) {
    benchmark::RegisterBenchmark(("message/" + name + "/" + form).c_str(),
                                 [format](benchmark::State& state) { measure(state, format); });
  };
  add("quazor", ours);
  add("fmt::format", libfmt);
  add("FMT_COMPILE", compiled);
  return true;
}

// A log line: its name, its format for us and for libfmt, and its arguments.
#define QUAZOR_LINE(name, ours, theirs, ...)                                     \
  registerLine(                                                                  \
      name, [](const Arguments& a) { return formatMessage(ours, __VA_ARGS__); }, \
      [](const Arguments& a) { return fmt::format(theirs, __VA_ARGS__); },       \
      [](const Arguments& a) { return fmt::format(FMT_COMPILE(theirs), __VA_ARGS__); })

bool registerLines() {
  bool equal = QUAZOR_LINE("received frame", "Received frame %@.", "Received frame {}.", a.frame);
  equal &= QUAZOR_LINE("event", "Processing event %d at %lf.", "Processing event {} at {:f}.", a.event, a.seconds);
  equal &= QUAZOR_LINE("format index", "Failed to set the format index to %@ on %@! %@",
                       "Failed to set the format index to {} on {}! {}", a.index, a.port, a.error);
  equal &= QUAZOR_LINE("device supports", "Device supports %@", "Device supports {}", a.key);
  equal &= QUAZOR_LINE("session status", "%@%@\n  Offset: %@\n  Frames: %@\n", "{}{}\n  Offset: {}\n  Frames: {}\n",
                       a.port, " <-- sync master", a.offset, a.frame);
  return equal;
}

#undef QUAZOR_LINE

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  if (!quazor::registerLines()) return 1;
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
