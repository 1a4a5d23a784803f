// Writes the inputs with which the fuzzers begin: one folder per fuzzer, with files that the project ships and with
// what the program itself writes.
//
// Usage: fuzz_seeds DATA_FOLDER FOLDER
#include "host/plugin/diagnostic_registry.h"
#include "host/record/record_file.h"
#include "host/record/run_event_json.h"
#include "host/testing/test_events.h"
#include "host/testing/test_values.h"

#include <elf.h>

#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

namespace fs = std::filesystem;

// Writes the seeds of one fuzzer.
class Seeds {
 public:
  Seeds(const fs::path& folder, const std::string& fuzzer) : folder_(folder / fuzzer) {
    fs::create_directories(folder_);
  }

  void add(const std::string& name, std::string_view content) const {
    std::ofstream file(folder_ / name, std::ios::binary);
    file << content;
    if (!file.flush())
      throw fs::filesystem_error("cannot write", folder_ / name, std::make_error_code(std::errc::io_error));
  }

  // Adds all JSON files below `source` except schemas.
  void addFiles(const fs::path& source) const {
    std::size_t count = 0;
    for (const auto& entry : fs::recursive_directory_iterator(source)) {
      const fs::path& file = entry.path();
      if (file.extension() != ".json" || file.stem().extension() == ".schema") continue;
      const std::string name = std::to_string(count++) + "-" + file.filename().string();
      fs::copy_file(file, folder_ / name, fs::copy_options::overwrite_existing);
    }
  }

 private:
  fs::path folder_;
};

template <std::size_t N>
std::string_view bytes(const char (&text)[N]) {
  return {text, N - 1};
}

std::string recordText(const std::vector<RunEvent>& events) {
  std::string text;
  for (std::size_t i = 0; i < events.size(); ++i) text += recordLine(events[i], i);
  return text;
}

std::string lineOf(const nlohmann::ordered_json& json) {
  return json.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace) + "\n";
}

// Events of a diagnostic with arbitrary data of every kind.
std::vector<RunEvent> randomDiagnostic(std::uint64_t seed) {
  RandomValues random(seed);
  std::vector<RunEvent> events = wholeDiagnostic("Random", random.number());
  for (int i = 0; i < 4; ++i) {
    events.insert(events.end() - 1, {MeasurementsAdded{{{random.text(), random.measurement()}}},
                                     AuxiliaryDataAdded{random.text(), random.value(4)},
                                     ResultsReported{{random.result(), random.result()}}});
  }
  events.insert(events.end() - 1, Failed{Stage::kAnalyze, random.error(3)});
  return events;
}

void writeRecords(const fs::path& folder) {
  const Seeds records(folder, "record");
  const std::string whole = recordText(wholeRun());
  records.add("whole", whole);
  records.add("cut_off", std::string_view(whole).substr(0, whole.size() - 9));
  std::vector<RunEvent> traced = wholeRun();
  std::get<RunStarted>(traced.front()).traced = true;
  std::get<RunStarted>(traced.front()).tracesTasks = true;
  traced.insert(traced.begin() + 3, {FramesTraced{"front", 1, {{0, 5, 10, 20}, {1, 4, 11, std::nullopt}}, 0},
                                     FramesTraced{"back", 2, {{0, -5, 10, 20}}, 7},
                                     FramesTraced{"front", 2, {{2, 15, 20, 30}, {4, 16, 21, 31}}, 0},
                                     FramesTraced{"Work", 1, {{1, 5, 10, 20}}, 1, TracedKind::kTasks}});
  records.add("traced", recordText(traced));
  std::vector<RunEvent> interrupted = wholeRun();
  interrupted.back() = RunEnded{"Broken", momentAt(99)};
  records.add("interrupted", recordText(interrupted));
  for (std::uint64_t seed = 1; seed <= 8; ++seed) {
    std::vector<RunEvent> events = randomDiagnostic(seed);
    events.insert(events.begin(), runOf({"Random"}));
    records.add("random_" + std::to_string(seed), recordText(events));
  }
}

void writeConnections(const fs::path& folder) {
  const Seeds connections(folder, "connection");
  for (std::uint64_t seed = 0; seed <= 8; ++seed) {
    const std::vector<RunEvent> events = seed == 0 ? wholeDiagnostic("Good", 90) : randomDiagnostic(seed);
    std::string text;
    for (std::size_t i = 1; i < events.size(); ++i) text += lineOf(eventJson(events[i]));
    connections.add(std::to_string(seed), text);
  }
}

void writeScans(const fs::path& folder) {
  QZLab lab;
  lab.addExperimentWithName("SyncExperiment", nullptr);
  lab.addAnalysisWithName("SyncAnalysis", nullptr);
  lab.addDiagnosticWithName("Sync.Back", "A summary.", "SyncExperiment", "SyncAnalysis");
  lab.addExperimentWithName("Images", nullptr);
  std::string registrations;
  for (const QZLab::Registration& one : lab.registrations()) registrations += lineOf(registrationJson(one));
  DiagnosticDescription described;
  described.experiment = QZDescription("What it measures.");
  described.experiment.addParameter(QZNumberParameter("How long.", true), "duration");
  described.analysis.addParameter(QZNumberParameter("How many.", false), "frameCount");
  DiagnosticDescription failed;
  failed.error = errorWithMessage("Domain", 7, "No description.", nullptr);
  failed.isAsked = false;
  const Seeds scans(folder, "scan");
  scans.add("two", registrations + lineOf(descriptionJson(described)) + lineOf(descriptionJson(failed)));
  scans.add("one", lineOf(registrationJson(lab.registrations().back())) + lineOf(descriptionJson(failed)));
}

void writeCommandLines(const fs::path& folder) {
  const Seeds lines(folder, "command_line");
  lines.add("run", "run\nA\n[b]*\n--set\nduration=10\n--output\njunit:r.xml\n--output\nr.txt\n--deadline\nrun=3\n");
  lines.add("all", "run\n--all\n--phone\nlinux:board\n--record\nr\n--memory\nnone\n--log-level\ndebug\n--system-log\n");
  lines.add("failed", "run\n--only\nfailed\n--of\nr\n--in-process\n--format=json\n--plugin\na\n--profile\nnone\n");
  lines.add("experiment", "experiment\n--all\n--seed\n7\n--realtime\n--phone=p.json\n--parameters\np\n--memory=1\n");
  lines.add("analyze", "analyze\nr\n--set\nanalysis.frameCount=60\n--record\ns\n");
  lines.add("verify", "verify\na\nb\nc\n");
  lines.add("diff", "diff\na\nb\n");
  lines.add("selftest", "selftest\n--seeds\n5\nhealthy\n");
  lines.add("explain", "explain\nDomain:206\n--format\njson\n");
  lines.add("help", "describe\n--help\n");
}

void writeSettings(const fs::path& folder) {
  const Seeds settings(folder, "settings");
  settings.add("one", "duration=3");
  settings.add("parts", "experiment.frameCount=-90 analysis.frameCount=1e2\tduration=18446744073709551615");
}

// The headers of a shared object with three segments, and their bytes.
void writeSharedObjects(const fs::path& folder) {
  Elf64_Ehdr header{};
  // The identification and the machine are those of this program; other files are refused at once.
  std::ifstream program("/proc/self/exe", std::ios::binary);
  Elf64_Ehdr own{};
  program.read(reinterpret_cast<char*>(&own), sizeof own);
  std::memcpy(header.e_ident, own.e_ident, sizeof header.e_ident);
  header.e_machine = own.e_machine;
  header.e_type = ET_DYN;
  header.e_phoff = sizeof header;
  header.e_phentsize = sizeof(Elf64_Phdr);
  header.e_phnum = 3;
  std::string file(sizeof header + 3 * sizeof(Elf64_Phdr) + 64, '\0');
  std::memcpy(file.data(), &header, sizeof header);
  for (std::size_t i = 0; i < 3; ++i) {
    Elf64_Phdr segment{};
    segment.p_type = i < 2 ? PT_LOAD : PT_DYNAMIC;
    segment.p_offset = i == 0 ? 0 : sizeof header + 3 * sizeof(Elf64_Phdr);
    segment.p_filesz = i == 0 ? segment.p_offset : 64;
    std::memcpy(file.data() + sizeof header + i * sizeof segment, &segment, sizeof segment);
  }
  const Seeds objects(folder, "shared_object");
  objects.add("whole", file);
  objects.add("truncated", std::string_view(file).substr(0, file.size() - 1));
  objects.add("headers", std::string_view(file).substr(0, sizeof header));
}

void writeDevices(const fs::path& folder) {
  const Seeds descriptors(folder, "hid_descriptor");
  // An image sensor with report IDs; two collections with a range, a push and a long item.
  descriptors.add("sensor", bytes("\006\0\377\011\044\241\1\025\0\046\377\0\165\010\205\166\011\166\226\027\003\201\2"
                                  "\205\253\011\253\225\1\261\2\300"));
  descriptors.add("two", bytes("\5\1\031\2\244\241\1\165\1\225\3\201\2\264\300\376\1\020\0\013\044\0\0\377\241\1\300"));
  const Seeds reports(folder, "sensor_report");
  // A stream that receives two images and an error; a run for one image; a run for nine that ends with an error.
  reports.add("stream", bytes("\0\6\3\1\0\0\0\7\3\5\4\0\4abcd\5"));
  reports.add("one_image", bytes("\1\1\1\0\5\3\1\0\0\0"));
  reports.add("error", bytes("\1\11\1\1\5\3\1\0\0\0\0"));
  // Answers of drivers that are true, with some bytes of metadata, and some that are not; a camera with formats of the
  // binding, and one behind links, both with controls that are given by their numbers.
  const Seeds drivers(folder, "camera_driver");
  drivers.add("true", bytes("\0\0\0\10\0\0\0\4\2\4\0\4\1\0\1\0\1\0\0\0\0\3\2\4\1\5"));
  drivers.add("damaged", std::string(100, '\0') + std::string(bytes("\xe0\4\0\3\1\2\3\xc1\xf1\0\0\1\x7f")));
  drivers.add("formats", bytes("\0\x80\x80\10\0\0\0\4\2\4\0\4\1\0\0\2\0\7\2\1\1\0\36\0\0\0\1\31\0\x80\x80"));
  drivers.add("board", bytes("\3\x80\x80\10\0\0\0\4\2\4\0\4\1\0\0\2\0\x0a\x80\1"));
  // A sensor that is opened, scheduled and sends four reports and an error; a keyboard that is unplugged.
  const Seeds traffic(folder, "hidraw");
  const std::string sensor(
      bytes("\006\0\377\011\044\241\1\025\0\046\377\0\165\010\205\166\011\166\226\027\003\201\2"
            "\205\253\011\253\225\1\261\2\300"));
  const std::string steps(bytes("\0\x49\14\0\0\0\0\4abcd\0\0\0\0\0\0\0\0\0\0\0\0\10\5\0\10"));
  traffic.add("sensor", std::string(bytes("\45\0")) + sensor + std::string(bytes("\6Sensor")) + steps);
  traffic.add("unplugged", bytes("\15\0\5\1\11\6\241\1\165\10\225\2\201\2\300\0\0\x49\14\3\0\1\0\6\0\5\1\10"));
  // A board of one sensor, and its own; a topology whose links the binding names.
  const Seeds topologies(folder, "media_topology");
  topologies.add("own", bytes("\1\3"));
  topologies.add("sensor", bytes("\0\0\3\0\0\0\0\1\3\0\2\4\3\1\0\2\1\3\2\4\1\0\0\1\1\1\0\2\0\2\1\0\1\1\2\3"));
  topologies.add("links",
                 bytes("\0\x80\3\0\0\0\0\1\3\0\2\4\3\1\0\2\1\3\2\4\1\0\0\1\1\1\0\2\0\2\1\0\1\1\2\3\2\0\0\0\1\1"));
  const Seeds machines(folder, "device_probe");
  machines.add("cameras", bytes("\2\2\1\1\1"));
  machines.add("all", bytes("\25\22\0\0\0\0\0\0\0\0\0\0\0\0\0\3Cam\7\5\1\11\60\241\1\300\2ab"));
}

void writeAll(const fs::path& data, const fs::path& folder) {
  writeDevices(folder);
  writeRecords(folder);
  writeConnections(folder);
  writeScans(folder);
  writeCommandLines(folder);
  writeSettings(folder);
  writeSharedObjects(folder);
  Seeds(folder, "binding").addFiles(data / "bindings");
  Seeds(folder, "explanations").addFiles(data / "explanations");
  Seeds(folder, "profile").addFiles(data / "profiles");
  Seeds(folder, "scenario").addFiles(data / "scenarios");
  const Seeds numbers(folder, "number");
  numbers.add("double", "-1.5e3");
  numbers.add("unsigned", "18446744073709551615");
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fputs("usage: fuzz_seeds DATA_FOLDER FOLDER\n", stderr);
    return 64;
  }
  try {
    quazor::writeAll(argv[1], argv[2]);
  } catch (const std::exception& problem) {
    std::fprintf(stderr, "fuzz_seeds: %s\n", problem.what());
    return 1;
  }
  return 0;
}
