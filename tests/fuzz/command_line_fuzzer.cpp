// Arbitrary arguments, one a line: parsing gives options that they contain, or prints why not.
#include "contract/results.h"
#include "host/cli/command_line.h"
#include "tests/fuzz/fuzzing.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <optional>
#include <random>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t maxSize);

namespace quazor {
namespace {

using Texts = std::vector<std::string>;

// The text is an argument, or the value in one of the form --OPTION=VALUE. Options that are not given are empty.
bool isGiven(const std::string& text, const Texts& arguments) {
  return text.empty() || std::ranges::any_of(arguments, [&](const std::string& one) {
           return one == text || (one.starts_with("--") && one.substr(one.find('=') + 1) == text);
         });
}

void requireGiven(const Texts& texts, const Texts& arguments) {
  for (const std::string& text : texts) require(isGiven(text, arguments), "a value is one of the arguments");
}

Texts textsOf(const std::vector<std::filesystem::path>& files) {
  Texts texts;
  for (const std::filesystem::path& file : files) {
    require(!file.empty(), "a file has a name");
    texts.push_back(file.string());
  }
  return texts;
}

void requireOptions(const Options& options, const Texts& arguments) {
  require(isGiven(std::string(kCommandNames[static_cast<std::size_t>(options.command)]), arguments),
          "the command is one of the arguments");
  requireGiven(options.names, arguments);
  requireGiven(textsOf(options.plugins), arguments);
  requireGiven(textsOf(options.parameterFiles), arguments);
  requireGiven(textsOf(options.records), arguments);
  for (const auto* const file : {&options.record, &options.failedOf, &options.profile, &options.phone}) {
    require(isGiven(file->string(), arguments), "a file is one of the arguments");
  }
  for (const ParameterOverride& one : options.settings) {
    require(isGiven(one.text, arguments), "a setting is one of the arguments");
    require(!one.name.empty() && std::isfinite(toDouble(&one.value)), "a setting has a name and a number");
    require(one.place == OverridePlace::kCommandLine, "a setting knows its place");
  }
  for (const OutputRequest& output : options.report.outputs) require(!output.file.empty(), "an output has a file");
  for (const DeadlineSetting& one : options.deadlines) require(one.time.count() > 0, "a deadline is a time");
  require(options.seeds >= 1 && options.seeds <= 1'000'000, "there are some seeds");
  require(!options.memory || *options.memory >= 1024 * 1024, "a limit of memory is in mebibytes");
  if (options.command == Command::kRun || options.command == Command::kExperiment) {
    const int ways = (options.names.empty() ? 0 : 1) + (options.all ? 1 : 0) + (options.onlyFailed ? 1 : 0);
    require(ways == 1, "diagnostics are selected in one way");
  }
}

// Lines without characters that steer a terminal.
void requirePrintable(std::string_view text) {
  for (const char character : text) {
    require(character == '\n' || (static_cast<unsigned char>(character) >= 0x20 && character != 0x7f),
            "what is printed is printable");
  }
}

// Every option and command, and values for them.
const Texts& vocabulary() {
  static const Texts words = [] {
    Texts all = {"--help",
                 "--version",
                 "--",
                 "-",
                 "=",
                 "all",
                 "none",
                 "text",
                 "json",
                 "csv",
                 "ocp",
                 "junit",
                 "junit:a",
                 "probe",
                 "bash",
                 "zsh",
                 "failed",
                 "debug",
                 "linux:a",
                 "a=1",
                 "run=5",
                 "experiment.duration=3",
                 "[a]",
                 "[a,b]",
                 "['a']",
                 "\x01",
                 "{a}",
                 "%%",
                 "a b",
                 "\"a\"",
                 "18446744073709551616",
                 "-1",
                 "1e400",
                 "*"};
    for (const std::string_view command : kCommandNames) {
      all.emplace_back(command);
      for (const OptionSummary& option : optionsOfCommand(std::string(command))) {
        if (std::ranges::find(all, option.name) == all.end()) all.push_back(option.name);
      }
    }
    return all;
  }();
  return words;
}

class ArgumentsMutation {
 public:
  ArgumentsMutation(Texts arguments, unsigned seed) : arguments_(std::move(arguments)), random_(seed) {}

  Texts mutated() {
    if (arguments_.empty()) arguments_.emplace_back(kCommandNames[below(std::size(kCommandNames))]);
    for (std::size_t i = below(3) + 1; i > 0 && !arguments_.empty(); --i) change(below(arguments_.size()));
    return arguments_;
  }

 private:
  std::size_t below(std::size_t bound) { return random_() % bound; }
  const std::string& word() { return vocabulary()[below(vocabulary().size())]; }

  void change(std::size_t at) {
    const auto place = arguments_.begin() + static_cast<std::ptrdiff_t>(at);
    switch (below(7)) {
      case 0: arguments_.erase(place); break;
      case 1: std::swap(arguments_[at], arguments_[below(arguments_.size())]); break;
      case 2: arguments_[at] = word(); break;
      case 3: arguments_[at] += (below(2) == 0 ? "=" : "") + word(); break;
      case 4: changeBytes(arguments_[at]); break;
      default: arguments_.insert(place + 1, word()); break;
    }
  }
  static void changeBytes(std::string& text) {
    std::uint8_t bytes[64];
    const std::size_t size = std::min(text.size(), sizeof bytes);
    std::memcpy(bytes, text.data(), size);
    text = asText(bytes, LLVMFuzzerMutate(bytes, size, sizeof bytes));
  }

  Texts arguments_;
  std::mt19937 random_;
};

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  const Texts arguments = linesOf(asText(data, size));
  std::ostringstream out;
  std::ostringstream err;
  ExitCode code = ExitCode::kInternal;
  const std::optional<Options> options = parseCommandLine(arguments, out, err, &code);
  requirePrintable(out.str());
  requirePrintable(err.str());
  require(err.str().find("\\x01") == std::string::npos || asText(data, size).find('\x01') != std::string_view::npos,
          "a refusal quotes what was given");
  if (options) {
    require(code == ExitCode::kAllPassed && out.str().empty() && err.str().empty(), "accepting prints nothing");
    requireOptions(*options, arguments);
  } else if (code == ExitCode::kAllPassed) {
    require(!out.str().empty() && err.str().empty(), "an answer is printed");
  } else {
    require(code == ExitCode::kUsage && out.str().empty() && !err.str().empty(), "a refusal is printed as an error");
  }
  return 0;
}

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size, std::size_t maxSize,
                                               unsigned seed) {
  using namespace quazor;
  std::string text;
  for (const std::string& one : ArgumentsMutation(linesOf(asText(data, size)), seed).mutated()) text += one + "\n";
  if (text.empty() || text.size() > maxSize) return LLVMFuzzerMutate(data, size, maxSize);
  std::memcpy(data, text.data(), text.size());
  return text.size();
}
