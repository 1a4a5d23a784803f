#include "host/cli/choice_options.h"

#include "host/run/deadlines.h"

#include <CLI/CLI.hpp>

namespace quazor {

void addChoiceOptions(CLI::App& command, ChoiceTexts& texts, const std::string& what) {
  command.add_option("--except", texts.except, "Leave out the " + what + " with this name or pattern; repeatable")
      ->allow_extra_args(false)
      ->type_name("PATTERN");
  command
      .add_option("--settle", texts.settle,
                  "Wait this long between two " + what +
                      ". A simulated phone waits in its own time, which costs none, unless --realtime is given")
      ->type_name("SECONDS");
}

Choice choiceOf(const ChoiceTexts& texts) {
  Choice choice;
  choice.except = texts.except;
  if (!texts.settle.empty()) choice.settle = parseSettle(texts.settle);
  return choice;
}

}  // namespace quazor
