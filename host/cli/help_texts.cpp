#include "host/cli/help_texts.h"

#include "base/text/nearest_name.h"
#include "host/cli/command_line.h"
#include "host/error/exit_code.h"

#include <algorithm>
#include <cstddef>
#include <iterator>

namespace quazor {

namespace {

// The width of a short example and two spaces, so that explanations form a column.
constexpr std::size_t kColumn = 48;

struct Example {
  std::string_view line;
  std::string_view meaning{};
};

constexpr Example kExamples[] = {
    {"quazor list", "list the installed diagnostics and experiments"},
    {"quazor describe 'CameraSync*'", "what these diagnostics do, and their parameters"},
    {"quazor run --all", "run every diagnostic on the healthy simulated phone"},
    {"quazor run --all --except 'Tessel*'", "run every diagnostic except these"},
    {"quazor run CameraSyncDiagnostic.Back --set duration=10", "run one, with a parameter that 'describe' shows"},
    {"quazor run --all --phone my_phone.json --format json --output report.json", "on a simulated phone of your own"},
    {"quazor phone list 'camera_sync/*'", "the simulated phones of that name"},
    {"quazor phone probe", "find this machine's devices and print a starter binding"},
    {"quazor run --all --phone linux:board.json", "run on this machine's own cameras, sensors and counters"},
    {"quazor run --all --limit '*.Total >= 90'", "also judge by a limit of your own"},
    {"quazor run --all --profile strict", "also judge each camera by its frames and its start"},
    {"quazor run --all --record records/ --tag serial=C02X --output junit:report.xml", "for a CI server"},
    {"quazor run --all --repeat 100", "run everything 100 times and show what varied"},
    {"quazor run --only failed", "rerun the diagnostics that did not pass last time"},
    {"quazor experiment CameraSyncExperiment.Back", "measure without judging"},
    {"quazor verify run.jsonl", "check that the recorded verdicts follow from the data"},
    {"quazor analyze run.jsonl --set analysis.frameCount=60", "judge the recorded measurements again"},
    {"quazor diff before.jsonl after.jsonl", "show what differs between two records"},
    {"quazor report run.jsonl --output report.html", "a page of a run for people"},
    {"quazor report run.jsonl --format trace --output run.trace.json", "a time line for a viewer of traces"},
    {"quazor records import records/", "take records into the store, where questions are quick"},
    {"quazor records yield --since 2026-11-16 --station S3", "how many phones passed at their first run"},
    {"quazor records failures", "what fails most"},
    {"quazor records capability --result '*.Jitter'", "Cpk and Ppk, or why there is none"},
    {"quazor explain QZCapturePlugInErrorDomain:206", "what an error means, and what to do next"},
    {"quazor doctor", "check the installation"},
    {"quazor doctor --plugin build/my_plugin.so", "judge a plug-in as a reviewer would"},
    {"quazor selftest", "check that the diagnostics detect simulated faults"},
    {"quazor new my_plugin", "make the project of a plug-in of your own"},
    {"quazor completion bash > ~/.local/share/bash-completion/completions/quazor"},
};

struct ExitCodeHelp {
  int code;
  std::string_view meaning;
  std::string_view commands;  // separated by spaces; empty: all
};

constexpr ExitCodeHelp kExitCodes[] = {
    {0, "all diagnostics passed, or all experiments returned a result", "run experiment analyze"},
    {0, "no problem was found", "verify diff doctor selftest"},
    {0, "done", "list describe report records explain phone completion new"},
    {1, "a result was outside its limits", "run analyze"},
    {1, "a problem was found", "verify diff selftest"},
    {1, "a record was refused because something in it is wrong, or the store is wrong", "records"},
    {2, "a diagnostic or experiment ended in an error, or was skipped without --allow-skips", "run experiment"},
    {2, "a diagnostic or experiment ended in an error", "analyze describe"},
    {3, "the record has no end of a run; one that was interrupted and ended has one", "verify"},
    {3, "all passed, but the recorded run was interrupted or did not end", "analyze"},
    {64, "the command line is invalid", {}},
    {66, "a plug-in, scenario, binding, profile or record cannot be read or loaded",
     "list describe run experiment verify analyze diff report explain doctor selftest phone new"},
    {66, "a record or the store cannot be read, or the store is of a later quazor", "records"},
    {70, "quazor itself failed", {}},
    {73, "a report or record cannot be written, or the record exists already", {}},
    {130, "interrupted", "list describe run experiment verify analyze records doctor selftest"},
};

bool hasWord(std::string_view words, std::string_view word) {
  for (std::size_t begin = 0; begin < words.size();) {
    const std::size_t end = std::min(words.find(' ', begin), words.size());
    if (words.substr(begin, end - begin) == word) return true;
    begin = end + 1;
  }
  return false;
}

std::string exampleText(const Example& example) {
  std::string text = "  " + std::string(example.line);
  if (!example.meaning.empty()) {
    text.append(text.size() < kColumn + 2 ? kColumn + 2 - text.size() : 2, ' ');
    text += example.meaning;
  }
  return text + "\n";
}

std::string codeText(int code, std::string_view meaning) {
  std::string text = "  " + std::to_string(code);
  text.append(7 - text.size(), ' ');
  text += meaning;
  return text + "\n";
}

std::string footerOf(const std::string& examples, const std::string& codes) {
  std::string footer = (examples.empty() ? "" : "Examples:\n" + examples + "\n") + "Exit codes:\n" + codes;
  footer.pop_back();  // the help adds a line end
  return footer;
}

}  // namespace

std::string helpFooter() {
  std::string examples;
  for (const Example& one : kExamples) examples += exampleText(one);
  std::string codes;
  const auto add = [&codes](int code, std::string_view meaning) { codes += codeText(code, meaning); };
  add(0, "all diagnostics passed, or all experiments returned a result");
  add(1, "a result was outside its limits, or verify, diff or selftest found a problem");
  for (const ExitCodeHelp& one : kExitCodes) {
    if (one.code < 2 || one.commands.starts_with("analyze") || one.commands == "records") continue;  // told with run
    add(one.code,
        one.code == 3 ? "the run of the record did not end, or, for analyze, it was interrupted" : one.meaning);
  }
  return "Without --phone, the phone is a simulated, healthy one.\n"
         "The manual page is quazor(1); share/doc/quazor/index.md in the installation lists the documents.\n\n" +
         footerOf(examples, codes);
}

std::string helpFooter(std::string_view command) {
  const std::string word = "quazor " + std::string(command);
  std::string examples;
  for (const Example& one : kExamples) {
    if (one.line == word || one.line.starts_with(word + " ")) examples += exampleText(one);
  }
  std::string codes;
  for (const ExitCodeHelp& one : kExitCodes) {
    if (one.commands.empty() || hasWord(one.commands, command)) codes += codeText(one.code, one.meaning);
  }
  return footerOf(examples, codes);
}

void refuseUnknownCommand(const std::vector<std::string>& arguments) {
  if (arguments.empty() || arguments.front().starts_with('-')) return;
  const std::string& word = arguments.front();
  const std::vector<std::string> commands(std::begin(kCommandNames), std::end(kCommandNames));
  if (std::find(commands.begin(), commands.end(), word) != commands.end()) return;
  throw CommandError(ExitCode::kUsage, "unknown command '" + word + "'" + didYouMeanOf(word, "the commands", commands));
}

std::vector<std::string> withHelpAsOption(const std::vector<std::string>& arguments) {
  if (arguments.empty() || arguments.front() != kHelpWord) return arguments;
  if (arguments.size() > 2) {
    throw CommandError(ExitCode::kUsage, "'quazor help' takes the name of one command, as in 'quazor help run'");
  }
  if (arguments.size() < 2 || arguments.back() == "--help" || arguments.back() == "-h") return {"--help"};
  return {arguments.back(), "--help"};
}

std::string helpCommandFor(const std::vector<std::string>& arguments) {
  const std::string& first = arguments.front();
  const bool isCommand =
      std::find(std::begin(kCommandNames), std::end(kCommandNames), first) != std::end(kCommandNames);
  return "quazor " + (isCommand ? first + " " : "") + "--help";
}

}  // namespace quazor
