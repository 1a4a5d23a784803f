#include "host/command/explanations.h"

#include "base/json/json_cursor.h"
#include "base/text/control_characters.h"
#include "base/text/input_error.h"
#include "base/text/name_list.h"
#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/parameter_range.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <map>
#include <optional>
#include <system_error>
#include <utility>

namespace quazor {

namespace {

constexpr std::uint64_t kSchema = 1;
constexpr std::array<std::string_view, 4> kKinds{"diagnostic", "experiment", "analysis", "result"};

[[noreturn]] void refuse(const std::string& file, const std::string& what) {
  throw InputError("the explanations in '" + file + "' cannot be used: " + what);
}

std::string lineOf(const JsonCursor& cursor) {
  std::string text = cursor.text();
  if (text.front() == ' ' || text.back() == ' ' || hasControlCharacter(text)) {
    cursor.fail("the text must be one line without leading or trailing spaces.");
  }
  return text;
}

std::string optionalLine(const JsonCursor& object, std::string_view key) {
  const std::optional<JsonCursor> entry = object.find(key);
  return entry ? lineOf(*entry) : std::string();
}

std::vector<std::string> linesOf(const JsonCursor& array) {
  std::vector<std::string> lines;
  for (const JsonCursor& element : array.elements()) {
    lines.push_back(lineOf(element));
    if (std::find(lines.begin(), lines.end() - 1, lines.back()) != lines.end() - 1)
      element.fail("this entry is a duplicate.");
  }
  if (lines.empty()) array.fail("at least one entry is required.");
  return lines;
}

std::vector<std::string> optionalLines(const JsonCursor& object, std::string_view key) {
  const std::optional<JsonCursor> entry = object.find(key);
  return entry ? linesOf(*entry) : std::vector<std::string>();
}

// The members that explanations of errors and of names share.
Explanation explanationOf(const JsonCursor& object) {
  Explanation explanation;
  explanation.title = lineOf(object.at("title"));
  explanation.meaning = lineOf(object.at("meaning"));
  explanation.causes = linesOf(object.at("causes"));
  explanation.next = linesOf(object.at("next"));
  return explanation;
}

ExplainedMessage messageOf(const JsonCursor& object) {
  object.allowKeys({"text", "from", "meaning"});
  return {lineOf(object.at("text")), linesOf(object.at("from")), optionalLine(object, "meaning")};
}

Explanation errorOf(const JsonCursor& object, const std::string& domain) {
  object.allowKeys({"code", "symbols", "title", "meaning", "messages", "causes", "next"});
  Explanation explanation = explanationOf(object);
  explanation.domain = domain;
  explanation.code = object.at("code").integer();
  explanation.symbols = optionalLines(object, "symbols");
  if (const std::optional<JsonCursor> messages = object.find("messages")) {
    for (const JsonCursor& message : messages->elements()) explanation.messages.push_back(messageOf(message));
  }
  return explanation;
}

std::vector<ExplainedParameter> parametersOf(const JsonCursor& object, const std::string& kind) {
  std::vector<ExplainedParameter> parameters;
  const std::optional<JsonCursor> entries = object.find("parameters");
  if (!entries) return parameters;
  if (kind != "experiment" && kind != "analysis") entries->fail("only an experiment or analysis can have this key.");
  for (const auto& [name, range] : entries->entries()) parameters.push_back({name, rangeFrom(range), range.path()});
  return parameters;
}

Explanation namedOf(const JsonCursor& object) {
  object.allowKeys({"names", "kind", "from", "title", "meaning", "failing", "causes", "next", "parameters"});
  Explanation explanation = explanationOf(object);
  explanation.names = linesOf(object.at("names"));
  explanation.kind = object.at("kind").oneOf(kKinds, "a kind");
  if (explanation.kind == "result") {
    explanation.from = linesOf(object.at("from"));
  } else if (const std::optional<JsonCursor> from = object.find("from")) {
    from->fail("only a result can have this key.");
  }
  explanation.failing = optionalLine(object, "failing");
  explanation.parameters = parametersOf(object, explanation.kind);
  return explanation;
}

std::vector<Explanation> explanationsOf(const JsonCursor& document) {
  document.allowKeys({"$schema", "schema", "domain", "errors", "names"});
  document.at("schema").integer(kSchema, kSchema);
  std::vector<Explanation> explanations;
  const std::optional<JsonCursor> names = document.find("names");
  if (names) {
    if (document.find("domain") || document.find("errors"))
      document.fail("a file contains either errors or names, not both.");
    for (const JsonCursor& entry : names->elements()) explanations.push_back(namedOf(entry));
  } else {
    const std::string domain = lineOf(document.at("domain"));
    for (const JsonCursor& entry : document.at("errors").elements()) explanations.push_back(errorOf(entry, domain));
  }
  return explanations;
}

std::vector<std::string> keysOf(const Explanation& explanation) {
  if (explanation.isError()) return {keyOf(explanation.domain, explanation.code)};
  return explanation.names;
}

std::vector<std::filesystem::path> filesIn(const std::vector<std::filesystem::path>& directories) {
  std::map<std::filesystem::path, std::filesystem::path> files;  // from the name
  for (const std::filesystem::path& directory : directories) {
    std::error_code problem;
    for (const auto& entry : std::filesystem::directory_iterator(directory, problem)) {
      const std::filesystem::path& file = entry.path();
      if (file.extension() == ".json" && file.stem().extension() != ".schema") files.emplace(file.filename(), file);
    }
    if (problem) refuse(directory.string(), problem.message() + ".");
  }
  std::vector<std::filesystem::path> sorted;
  sorted.reserve(files.size());
  for (const auto& [name, file] : files) sorted.push_back(file);
  return sorted;
}

bool holds(const std::vector<std::string>& texts, const std::string& text) {
  return std::ranges::find(texts, text) != texts.end();
}

// The explanations of those files whose text `isWanted`.
std::vector<Explanation> explanationsIn(const std::vector<std::filesystem::path>& files,
                                        const std::function<bool(const std::string& text)>& isWanted) {
  std::vector<Explanation> all;
  std::map<std::string, std::string> seen;  // from each explained error or name to its file
  for (const std::filesystem::path& file : files) {
    const std::string text = JsonDocument::textOf(file);
    if (!isWanted(text)) continue;
    for (Explanation& one : parseExplanations(file.string(), text)) {
      for (const std::string& key : keysOf(one)) {
        const auto [earlier, isNew] = seen.emplace(key, file.string());
        if (!isNew) refuse(file.string(), "'" + key + "' is already explained in '" + earlier->second + "'.");
      }
      all.push_back(std::move(one));
    }
  }
  return all;
}

// False if the document cannot have the key "parameters", whichever way it is written.
bool mayHaveParameters(const std::string& text) {
  return text.find("\"parameters\"") != std::string::npos || text.find("\\u") != std::string::npos;
}

// Adds the explained ranges of one part of the diagnostic, if it is the explained one.
void addRanges(const Explanation& explanation, Part part, DescribedDiagnostic& diagnostic) {
  const Diagnostic& names = diagnostic.diagnostic;
  const bool isExperiment = part == Part::kExperiment;
  if (explanation.kind != nameOf(part) || (!isExperiment && names.experimentOnly)) return;
  const std::string& name = isExperiment ? names.experimentName : names.analysisName;
  if (!holds(explanation.names, name)) return;
  for (const ExplainedParameter& one : explanation.parameters) {
    const QZNumberParameter* const declared = diagnostic.parameters(part).find(one.name);
    if (declared == nullptr) {
      std::vector<std::string_view> known;
      for (const auto& [declaredName, ignored] : diagnostic.parameters(part)) known.push_back(declaredName);
      explanation.document->fail(one.path, name + " has no such parameter" + suggestion(one.name, known), one.path);
    }
    if (declared->required() && one.range.defaultValue()) {
      explanation.document->fail(one.path, "the parameter is required and can have no default.", one.path);
    }
    if (diagnostic.ranges(part).find(one.name) == nullptr) diagnostic.ranges(part).set(one.name, one.range);
  }
}

std::optional<std::int64_t> integerOf(std::string_view text) {
  std::int64_t number = 0;
  const auto [end, problem] = std::from_chars(text.data(), text.data() + text.size(), number);
  return problem == std::errc() && end == text.data() + text.size() ? std::optional(number) : std::nullopt;
}

// Explanations are read where they are installed, not in a project.
constexpr std::string_view kOwnPlugin =
    "if it is of your own plug-in, install that first: 'cmake --install build' in its project";

struct ErrorKey {
  std::string domain;
  std::int64_t code;
};

std::optional<ErrorKey> errorKeyOf(const std::string& asked) {
  const std::size_t colon = asked.rfind(':');
  if (colon == std::string::npos) return std::nullopt;
  const std::optional<std::int64_t> code = integerOf(std::string_view(asked).substr(colon + 1));
  return code ? std::optional(ErrorKey{asked.substr(0, colon), *code}) : std::nullopt;
}

template <class Fits>
std::vector<const Explanation*> thoseThat(const std::vector<Explanation>& explanations, const Fits& fits) {
  std::vector<const Explanation*> found;
  for (const Explanation& one : explanations) {
    if (fits(one)) found.push_back(&one);
  }
  return found;
}

// A domain's name without the suffix that all domains share.
std::string stemOf(const std::string& domain) {
  constexpr std::string_view kEnding = "ErrorDomain";
  return domain.ends_with(kEnding) ? domain.substr(0, domain.size() - kEnding.size()) : domain;
}

std::string nearestDomain(const std::vector<Explanation>& explanations, const std::string& domain) {
  std::string nearest;
  std::vector<std::string> stems;
  for (const Explanation& one : explanations) {
    if (one.isError()) stems.push_back(stemOf(one.domain));
  }
  const std::optional<std::string> stem = nearestName(stemOf(domain), stems);
  for (const Explanation& one : explanations) {
    if (stem && one.isError() && stemOf(one.domain) == *stem) nearest = one.domain;
  }
  return nearest;
}

[[noreturn]] void refuseKey(const std::vector<Explanation>& explanations, const ErrorKey& key) {
  std::vector<std::string> codes;
  for (const Explanation& one : explanations) {
    if (one.isError() && one.domain == key.domain) codes.push_back(std::to_string(one.code));
  }
  if (!codes.empty()) {
    throw CommandError(ExitCode::kUsage, formatMessage("no explanation of code %@ in '%@'; the explained codes are %@",
                                                       key.code, key.domain, listText(codes)));
  }
  const std::string nearest = nearestDomain(explanations, key.domain);
  throw CommandError(
      ExitCode::kUsage,
      formatMessage("no explanation of the error domain '%@'; %@", key.domain,
                    nearest.empty()
                        ? "if the report shows it after 'caused by', look up the error on the line above; " +
                              std::string(kOwnPlugin)
                        : "did you mean '" + nearest + "'?"));
}

// True if the text has the word between others.
bool hasWord(const std::string& text, const std::string& word) {
  const auto isInWord = [&text](std::size_t at) {
    const auto unit = at < text.size() ? static_cast<unsigned char>(text[at]) : '\0';
    return unit == '_' || unit > 0x7F || std::isalnum(unit) != 0;
  };
  for (std::size_t at = text.find(word); at != std::string::npos; at = text.find(word, at + 1)) {
    if (!(at > 0 && isInWord(at - 1)) && !isInWord(at + word.size())) return true;
  }
  return false;
}

// The first explanation that mentions what has none itself, such as the limit of a result.
const Explanation* findMention(const std::vector<Explanation>& explanations, const std::string& asked) {
  constexpr std::size_t kMinLength = 4;  // shorter words are everywhere
  if (asked.size() < kMinLength) return nullptr;
  const auto found = std::ranges::find_if(explanations, [&asked](const Explanation& one) {
    return hasWord(one.failing, asked) || hasWord(one.meaning, asked) || hasWord(one.title, asked);
  });
  return found == explanations.end() ? nullptr : &*found;
}

[[noreturn]] void refuseName(const std::vector<Explanation>& explanations, const std::string& asked) {
  std::vector<std::string> names;
  std::vector<std::string> known;
  for (const Explanation& one : explanations) {
    names.insert(names.end(), one.names.begin(), one.names.end());
    known.insert(known.end(), one.names.begin(), one.names.end());
    known.insert(known.end(), one.symbols.begin(), one.symbols.end());
    if (one.isError()) known.push_back(one.domain);
  }
  std::string nearest = didYouMean(asked, known);
  if (nearest.empty()) nearest = didYouMeanOrPattern(asked, names);  // such as the camera of a result
  const Explanation* const mention = nearest.empty() ? findMention(explanations, asked) : nullptr;
  if (mention != nullptr) nearest = "; that of '" + keysOf(*mention).front() + "' mentions it";
  throw CommandError(ExitCode::kUsage, formatMessage("no explanation of '%@'%@", asked,
                                                     nearest.empty() ? "; 'quazor explain' lists all explanations; " +
                                                                           std::string(kOwnPlugin)
                                                                     : nearest));
}

}  // namespace

std::string keyOf(std::string_view domain, std::int64_t code) { return formatMessage("%@:%@", domain, code); }

std::vector<Explanation> parseExplanations(const std::string& file, std::string_view text) {
  const auto document = std::make_shared<const JsonDocument>(std::string(text), file);
  std::vector<Explanation> explanations = explanationsOf(JsonCursor(*document));
  for (Explanation& one : explanations) one.document = document;
  return explanations;
}

std::vector<std::filesystem::path> explanationFiles(const std::vector<std::filesystem::path>& directories) {
  std::vector<std::filesystem::path> existing = directories;
  std::erase_if(existing, [](const std::filesystem::path& one) {
    std::error_code ignored;
    return !std::filesystem::is_directory(one, ignored);
  });
  return filesIn(existing);
}

std::vector<Explanation> readExplanations(const std::vector<std::filesystem::path>& directories) {
  std::vector<Explanation> all = explanationsIn(filesIn(directories), [](const std::string&) { return true; });
  if (all.empty()) refuse(directories.back().string(), "the directory contains none.");
  return all;
}

std::vector<Explanation> explanationsIfReadable(const std::vector<std::filesystem::path>& directories) {
  try {
    return readExplanations(directories);
  } catch (const InputError&) {
    return {};
  }
}

std::vector<std::string> explainedResults(const std::vector<Explanation>& explanations, const std::string& diagnostic) {
  std::vector<std::string> results;
  for (const Explanation& one : explanations) {
    if (holds(one.from, diagnostic)) results.insert(results.end(), one.names.begin(), one.names.end());
  }
  return results;
}

void addExplainedRanges(const std::vector<std::filesystem::path>& directories,
                        std::vector<DescribedDiagnostic>& diagnostics) {
  const std::vector<Explanation> explanations = explanationsIn(explanationFiles(directories), mayHaveParameters);
  for (DescribedDiagnostic& diagnostic : diagnostics) {
    if (!diagnostic.description.isAsked || diagnostic.description.error != nullptr) continue;
    for (const Part part : kParts) {
      for (const Explanation& one : explanations) addRanges(one, part, diagnostic);
    }
  }
}

std::vector<const Explanation*> findExplanations(const std::vector<Explanation>& explanations,
                                                 const std::string& asked) {
  std::vector<const Explanation*> found;
  if (const std::optional<ErrorKey> key = errorKeyOf(asked)) {
    found = thoseThat(explanations, [&](const Explanation& one) {
      return one.isError() && one.domain == key->domain && one.code == key->code;
    });
    if (found.empty()) refuseKey(explanations, *key);
    return found;
  }
  if (const std::optional<std::int64_t> code = integerOf(asked)) {
    found = thoseThat(explanations, [&](const Explanation& one) { return one.isError() && one.code == *code; });
    if (found.empty()) throw CommandError(ExitCode::kUsage, "no error domain has an explanation of code " + asked);
    return found;
  }
  found = thoseThat(explanations, [&](const Explanation& one) {
    return (one.isError() && one.domain == asked) || holds(one.symbols, asked) || holds(one.names, asked);
  });
  if (found.empty() && isPattern(asked)) {
    found = thoseThat(explanations, [&](const Explanation& one) {
      return std::ranges::any_of(one.names, [&](const std::string& name) { return matchesName(asked, name); });
    });
  }
  if (found.empty()) refuseName(explanations, asked);
  return found;
}

std::function<const Explanation*(const std::string& topic)> explanationFinder(
    std::vector<std::filesystem::path> directories) {
  return [directories = std::move(directories), all = std::make_shared<std::optional<std::vector<Explanation>>>()](
             const std::string& topic) -> const Explanation* {
    if (!*all) *all = explanationsIfReadable(directories);
    const auto found = std::ranges::find_if(**all, [&topic](const Explanation& one) {
      return one.isError() ? keyOf(one.domain, one.code) == topic : holds(one.names, topic);
    });
    return found == (*all)->end() ? nullptr : &*found;
  };
}

std::function<bool(const std::string& topic)> explainedTopics(std::vector<std::filesystem::path> directories) {
  return
      [find = explanationFinder(std::move(directories))](const std::string& topic) { return find(topic) != nullptr; };
}

}  // namespace quazor
