#include "host/cli/choice_options.h"

#include "base/text/utf8.h"
#include "host/cli/option_values.h"
#include "host/error/exit_code.h"
#include "host/run/deadlines.h"

#include <CLI/CLI.hpp>

#include <cstddef>
#include <cstdint>

namespace quazor {

namespace {

constexpr std::uint64_t kMaxTrials = 1000;

SkipRule parseSkip(const std::string& text) {
  const auto refuse = [&text](const std::string& why) {
    throw CommandError(ExitCode::kUsage, "--skip '" + text + "': " + why);
  };
  const std::size_t equals = text.find('=');
  if (equals == std::string::npos) refuse("expected PATTERN=REASON");
  SkipRule rule{text.substr(0, equals), {SkipKind::kNotAllowed, text.substr(equals + 1)}};
  if (rule.pattern.empty()) refuse("the pattern is empty");
  if (rule.skip.reason.empty()) refuse("the reason is empty");
  if (findInvalidUtf8(text)) refuse("the text is not valid UTF-8");
  return rule;
}

}  // namespace

void addChoiceOptions(CLI::App& command, ChoiceTexts& texts, const std::string& what) {
  command.add_option("--except", texts.except, "Leave out the " + what + " with this name or pattern; repeatable")
      ->allow_extra_args(false)
      ->type_name("PATTERN");
  command
      .add_option("--skip", texts.skips,
                  "Skip the " + what + " with this name or pattern, and report this reason; repeatable")
      ->allow_extra_args(false)
      ->type_name("PATTERN=REASON");
  command.add_flag("--allow-skips", texts.allowSkips,
                   "Exit with 0 if some of the " + what + " were skipped and the others passed");
  command
      .add_option("--stop-on", texts.stopOn,
                  "Stop after the first error (error), or after the first failure or error (fail); the remaining " +
                      what + " are skipped")
      ->type_name("fail|error")
      ->check(CLI::IsMember({"fail", "error"}).description(""));
  command
      .add_option("--settle", texts.settle,
                  "Wait this long between two " + what +
                      ". A simulated phone waits in its own time, which costs none, unless --realtime is given")
      ->type_name("SECONDS");
  command
      .add_option("--attempts", texts.attempts,
                  "Run one of the " + what +
                      " that ends in an error again, until it has no error or this many attempts are made; a failure "
                      "is final")
      ->type_name("N");
  command.add_flag("--accept-flaky", texts.acceptFlaky,
                   "With --attempts: exit with 0 if some of the " + what + " passed only after an error");
  command
      .add_option("--repeat", texts.repetitions,
                  "Run all selected " + what +
                      " this many times, one round after the other, and show what did not pass and what varied")
      ->type_name("N");
}

void addLogLimit(CLI::App& command, std::string& text) {
  command
      .add_option("--log-limit", text,
                  "Keep at most this many log lines of each diagnostic, and this much of their text; the number of "
                  "lines left out is logged at its end. Default 1000000,64")
      ->type_name("LINES[,MEBIBYTES]|none");
}

void addHeartbeat(CLI::App& command, std::string& text) {
  command
      .add_option(
          "--heartbeat", text,
          "How often a run says on standard error that it goes on, unless that is a terminal, and in its record; "
          "0 for never. Default 30")
      ->type_name("SECONDS");
}

void addTrace(CLI::App& command, std::string& text) {
  command
      .add_option("--trace", text,
                  "Which frames of the phone's streams the record has: none (off), or those of each diagnostic "
                  "(frames). After N frames, default 100000, every second one, after N more every fourth and so on; "
                  "with frames=all every one. queues: the tasks of the plug-in's queues, too. Default frames")
      ->type_name("off|frames[=N|=all]|queues");
}

Choice choiceOf(const ChoiceTexts& texts) {
  Choice choice;
  choice.except = texts.except;
  if (!texts.settle.empty()) choice.settle = parseTime("--settle", texts.settle);
  for (const std::string& text : texts.skips) choice.skips.push_back(parseSkip(text));
  if (!texts.stopOn.empty()) choice.stopOn = texts.stopOn == "fail" ? StopOn::kFail : StopOn::kError;
  choice.allowSkips = texts.allowSkips;
  if (!texts.attempts.empty()) choice.attempts = parseWhole("--attempts", texts.attempts, 1, kMaxTrials);
  if (!texts.repetitions.empty()) choice.repetitions = parseWhole("--repeat", texts.repetitions, 1, kMaxTrials);
  choice.acceptFlaky = texts.acceptFlaky;
  if (texts.acceptFlaky && texts.attempts.empty()) {
    throw CommandError(ExitCode::kUsage,
                       "--accept-flaky requires --attempts: without a second attempt nothing passes after an error");
  }
  return choice;
}

}  // namespace quazor
