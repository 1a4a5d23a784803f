// Explanations: the meaning of an error, a diagnostic, an experiment or a result, and how to proceed.
// docs/explanations.md describes the file format.
#pragma once

#include "base/json/json_document.h"
#include "contract/parameter_range.h"
#include "host/plugin/parameters.h"
#include "host/report/page/advice.h"

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// A message of an error.
struct ExplainedMessage {
  std::string text;               // "..." marks the variable parts
  std::vector<std::string> from;  // the diagnostics and experiments that report it
  std::string meaning;            // empty if the message needs no explanation
};

// What a parameter of an experiment or analysis accepts.
struct ExplainedParameter {
  std::string name;
  QZParameterRange range;
  std::string path;  // in the document, for mistakes that are found later
};

// One explanation. An error has a domain and a code, everything else has names.
// Thread: one at a time; any number may read while none changes it.
struct Explanation : Advice {
  std::string domain;                // empty unless this explains an error
  std::int64_t code = 0;             // of an error
  std::vector<std::string> symbols;  // of an error: its code's names in the source
  std::vector<ExplainedMessage> messages;

  std::vector<std::string> names;
  std::string kind;               // without a domain: "diagnostic", "experiment", "analysis" or "result"
  std::vector<std::string> from;  // of a result: the diagnostics and experiments that report it

  std::vector<ExplainedParameter> parameters;  // of an experiment or analysis
  std::shared_ptr<const JsonDocument> document;

  bool isError() const { return !domain.empty(); }
};

// "DOMAIN:CODE", the form in which a user asks for an error.
std::string keyOf(std::string_view domain, std::int64_t code);

// Parses one file. Throws InputError with a sentence that names the file and the place if the text does not have the
// documented form.
std::vector<Explanation> parseExplanations(const std::string& file, std::string_view text);

// All NAME.json files of the directories except NAME.schema.json, in the order of their names. A file hides those of
// the same name in later directories. Directories that do not exist have none. Throws InputError if one cannot be read.
std::vector<std::filesystem::path> explanationFiles(const std::vector<std::filesystem::path>& directories);

// Reads these files. Throws InputError if a directory does not exist, a file cannot be read, there are no explanations,
// or two explain the same thing.
std::vector<Explanation> readExplanations(const std::vector<std::filesystem::path>& directories);

// The same, but nothing if they cannot be read.
std::vector<Explanation> explanationsIfReadable(const std::vector<std::filesystem::path>& directories);

// Gives the described parameters for which the plug-in gives no range that of the explanations, if there is one. Reads
// only files that contain parameters, so that a mistake in another does not stop a run; nothing if there are none.
// Throws InputError like readExplanations(), or if an explanation names a parameter that the experiment or analysis
// does not have, or a default for a required one.
void addExplainedRanges(const std::vector<std::filesystem::path>& directories,
                        std::vector<DescribedDiagnostic>& diagnostics);

// The explanations that `asked` selects, in their order. `asked` is DOMAIN:CODE, a code, a domain, a name, a pattern of
// names (*, ?, [...]) or the name of a code in the source. Throws a CommandError (kUsage), which suggests the nearest
// name, if it selects none.
std::vector<const Explanation*> findExplanations(const std::vector<Explanation>& explanations,
                                                 const std::string& asked);

// The names that the explanations list as results of the diagnostic, those of measurements and auxiliary data included.
std::vector<std::string> explainedResults(const std::vector<Explanation>& explanations, const std::string& diagnostic);

// A function that finds the explanation of an error, as DOMAIN:CODE, or of a name in the directories, which are read at
// the first call; null if there is none, or if they cannot be read. What it returns is valid as long as the function or
// a copy of it. Thread: one at a time.
std::function<const Explanation*(const std::string& topic)> explanationFinder(
    std::vector<std::filesystem::path> directories);

// A function that tells whether an error, as DOMAIN:CODE, or a name has an explanation in the directories. They
// are read at the first call; if they cannot be read, nothing has an explanation. Thread: one at a time.
std::function<bool(const std::string& topic)> explainedTopics(std::vector<std::filesystem::path> directories);

}  // namespace quazor
