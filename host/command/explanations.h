// Explanations: what an error, a diagnostic, an experiment or a result means, and what to do about it.
// docs/explanations.md describes the files they are read from.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// One of the messages that an error comes with.
struct ExplainedMessage {
  std::string text;               // "..." marks the variable parts
  std::vector<std::string> from;  // the diagnostics and experiments that give it
  std::string meaning;            // empty where the message says it all
};

// One explanation. An error has a domain and a code, everything else has names.
struct Explanation {
  std::string domain;                // empty unless it explains an error
  std::int64_t code = 0;             // of an error
  std::vector<std::string> symbols;  // of an error: its code's names in the source
  std::vector<ExplainedMessage> messages;

  std::vector<std::string> names;
  std::string kind;               // of what has names: "diagnostic", "experiment", "analysis" or "result"
  std::vector<std::string> from;  // of a result: the diagnostics and experiments that have it

  std::string title;  // one line
  std::string meaning;
  std::string failing;              // what a failing result says; empty of an error
  std::vector<std::string> causes;  // the likely ones first
  std::vector<std::string> next;    // steps, in their order

  bool isError() const { return !domain.empty(); }
};

// "DOMAIN:CODE", by which an error is asked for.
std::string keyOf(std::string_view domain, std::int64_t code);

// What is in one file. Throws InputError with one sentence that names the file and the place when the text is not
// exactly of the form that is known.
std::vector<Explanation> parseExplanations(const std::string& file, std::string_view text);

// What is in a directory's files NAME.json but NAME.schema.json, in the order of the files' names. Throws
// InputError for what cannot be read, for a directory without explanations, and for two explanations of one thing.
std::vector<Explanation> readExplanations(const std::filesystem::path& directory);

// The explanations that `asked` stands for, in their order: DOMAIN:CODE, a code that one or several domains have, a
// domain, a name or a pattern of names (*, ?, [...]), or a code's name in the source. Throws a CommandError (kUsage),
// with the nearest name that there is, when it stands for none.
std::vector<const Explanation*> findExplanations(const std::vector<Explanation>& explanations,
                                                 const std::string& asked);

}  // namespace quazor
