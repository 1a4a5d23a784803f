// Diagnostics that use descriptors they do not own.
#include "tests/misbehaving/misbehaviour.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <string>
#include <string_view>

namespace quazor::misbehaving {

namespace {

constexpr int kMaxDescriptors = 1024;
constexpr int kFirstAfterStreams = 3;  // after the standard streams
constexpr std::size_t kFlood = 100'000'000;

void writeAll(int descriptor, std::string_view text) {
  while (!text.empty()) {
    const ssize_t written = ::write(descriptor, text.data(), text.size());
    if (written < 0) return;
    text.remove_prefix(static_cast<std::size_t>(written));
  }
}

void closeFrom(int first) { ::syscall(SYS_close_range, first, ~0U, 0); }

void writeToAll(int first, std::string_view text) {
  for (int descriptor = first; descriptor < kMaxDescriptors; ++descriptor) writeAll(descriptor, text);
}

// All the events that would follow if the diagnostic passed.
constexpr std::string_view kPass =
    R"({"event":"stageEnded","stage":"run","nanoseconds":1,"date":"2026-11-21T01:08:00.000000000Z"}
{"event":"stageBegan","stage":"analyze","date":"2026-11-21T01:08:00.000000000Z"}
{"event":"stageEnded","stage":"analyze","nanoseconds":1,"date":"2026-11-21T01:08:00.000000000Z"}
{"event":"found","results":[{"name":"Forged","measurement":[1.0,"events"]}]}
{"event":"diagnosticCompleted"}
)";

void forgeStagesForEver() {
  for (;;) {
    writeToAll(kFirstAfterStreams,
               "{\"event\":\"stageBegan\",\"stage\":\"run\",\"date\":\"2026-11-21T01:08:00.000000000Z\"}\n");
    ::usleep(1000);
  }
}

// Writes all bytes, with and without a line end.
void writeGarbageToOutput() {
  std::string bytes;
  for (int i = 0; i < 256; ++i) bytes += static_cast<char>(i);
  writeAll(STDOUT_FILENO, bytes);
  writeAll(STDERR_FILENO, "\xFF\xFE\nhalf a line");
}

void floodOutput(std::string_view line) {
  std::string lines;
  while (lines.size() < kFlood / 100) lines += line;
  for (int i = 0; i < 100; ++i) writeAll(STDOUT_FILENO, lines);
}

}  // namespace

void addDescriptors() {
  addDiagnostic("CloseEverything", {.inRun = [] { closeFrom(0); }});
  addDiagnostic("CloseConnection", {.inRun = [] { closeFrom(kFirstAfterStreams); }});
  addDiagnostic("CloseConnectionAndHang", {.inRun = [] {
                  closeFrom(kFirstAfterStreams);
                  sleepForEver();
                }});
  addDiagnostic("GarbageEverywhere", {.inRun = [] { writeToAll(0, "\xFF garbage {\n"); }});
  addDiagnostic("HalfALineEverywhere", {.inRun = [] { writeToAll(kFirstAfterStreams, "{\"event\":"); }});
  addDiagnostic("ForeignEventEverywhere", {.inRun = [] {
                  writeToAll(kFirstAfterStreams, "{\"event\":\"runEnded\",\"date\":\"2026-11-21T01:08:00.000000Z\"}\n");
                }});
  addDiagnostic("ForgedPass", {.inRun = [] {
                  writeToAll(kFirstAfterStreams, kPass);
                  ::_exit(0);
                }});
  addDiagnostic("ForgedStages", {.inRun = forgeStagesForEver});
  addDiagnostic("GarbageToOutput", {.inRun = writeGarbageToOutput});
  addDiagnostic("FloodOfLines", {.inRun = [] { floodOutput("as many lines as this are of no use to anybody\n"); }});
  addDiagnostic("FloodWithoutLines", {.inRun = [] { floodOutput("0123456789"); }});
}

}  // namespace quazor::misbehaving
