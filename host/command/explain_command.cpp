#include "host/command/explain_command.h"

#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/command/explanations.h"
#include "host/plugin/parameter_range.h"
#include "host/record/value_json.h"
#include "host/text/table.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string_view>

namespace quazor {

namespace {

using Json = nlohmann::ordered_json;
using Explanations = std::vector<const Explanation*>;

constexpr int kDocumentSchema = 1;

void printNames(std::ostream& out, const Explanation& one) {
  for (const std::string& name : one.names) printWrapped(out, name, "", "");
}

void printHeading(std::ostream& out, const Explanation& one) {
  printNames(out, one);
  if (!one.isError()) return;
  const std::string symbols = one.symbols.empty() ? "" : " (" + listText(one.symbols) + ")";
  printWrapped(out, formatMessage("%@ code %@%@", one.domain, one.code, symbols), "", "");
}

void printMessages(std::ostream& out, const Explanation& one) {
  if (one.messages.empty()) return;
  out << "\n  Messages\n";
  for (const ExplainedMessage& message : one.messages) {
    printWrapped(out, "\"" + message.text + "\"", "    ", "    ");
    printWrapped(out, "from " + listText(message.from), "      ", "      ");
    if (!message.meaning.empty()) printWrapped(out, message.meaning, "      ", "      ");
  }
}

void printParameters(std::ostream& out, const Explanation& one) {
  if (one.parameters.empty()) return;
  out << "\n  Parameters\n";
  for (const ExplainedParameter& parameter : one.parameters) {
    const std::optional<double>& usual = parameter.range.defaultValue();
    printWrapped(out,
                 formatMessage("%@: %@%@", parameter.name, rangeText(parameter.range),
                               usual ? formatMessage(", default %@", *usual) : std::string()),
                 "    ", "      ");
  }
}

bool canEndIn(const std::vector<std::string>& names, const Explanation& error) {
  return std::ranges::any_of(error.messages, [&](const ExplainedMessage& message) {
    return std::ranges::find_first_of(message.from, names) != message.from.end();
  });
}

// Prints the errors that the diagnostic or experiment can end with.
void printErrors(std::ostream& out, const Explanation& one, const std::vector<Explanation>& all) {
  std::string_view heading = "\n  Possible errors\n";
  for (const Explanation& error : all) {
    if (!canEndIn(one.names, error)) continue;
    out << heading;
    printWrapped(out, keyOf(error.domain, error.code), "    ", "");
    printWrapped(out, error.title, "      ", "      ");
    heading = "";
  }
}

void printExplanation(std::ostream& out, const Explanation& one, const std::vector<Explanation>& all) {
  printHeading(out, one);
  printWrapped(out, one.title, "  ", "  ");
  out << '\n';
  printWrapped(out, one.meaning, "  ", "  ");
  if (!one.from.empty()) {
    out << "\n  Result of\n";
    printWrapped(out, listText(one.from), "    ", "    ");
  }
  printMessages(out, one);
  printParameters(out, one);
  if (!one.failing.empty()) {
    out << "\n  When it fails\n";
    printWrapped(out, one.failing, "    ", "    ");
  }
  out << "\n  Likely causes\n";
  for (const std::string& cause : one.causes) printWrapped(out, cause, "    - ", "      ");
  out << "\n  What to do next\n";
  for (std::size_t i = 0; i < one.next.size(); ++i) {
    const std::string number = std::to_string(i + 1) + ". ";
    printWrapped(out, one.next[i], "    " + number, std::string(4 + number.size(), ' '));
  }
  printErrors(out, one, all);
}

void printTitles(std::ostream& out, const std::vector<Explanation>& all) {
  for (const Explanation& one : all) {
    printNames(out, one);
    if (one.isError()) printWrapped(out, keyOf(one.domain, one.code), "", "");
    printWrapped(out, one.title, "  ", "  ");
  }
}

Json jsonOf(const ExplainedMessage& message) {
  return Json{{"text", message.text}, {"from", message.from}, {"meaning", message.meaning}};
}

Json jsonOf(const Explanation& one) {
  Json object = Json::object();
  if (one.isError()) {
    object["domain"] = one.domain;
    object["code"] = one.code;
    object["symbols"] = one.symbols;
    object["messages"] = Json::array();
    for (const ExplainedMessage& message : one.messages) object["messages"].push_back(jsonOf(message));
  } else {
    object["names"] = one.names;
    object["kind"] = one.kind;
    object["from"] = one.from;
    object["failing"] = one.failing;
    if (!one.parameters.empty()) {
      Json& parameters = object["parameters"] = Json::object();
      for (const ExplainedParameter& parameter : one.parameters)
        parameters[parameter.name] = rangeJson(parameter.range);
    }
  }
  object["title"] = one.title;
  object["meaning"] = one.meaning;
  object["causes"] = one.causes;
  object["next"] = one.next;
  return object;
}

Explanations explanationsFor(const std::vector<Explanation>& all, const std::vector<std::string>& asked) {
  Explanations found;
  for (const std::string& one : asked) {
    for (const Explanation* explanation : findExplanations(all, one)) {
      if (std::ranges::find(found, explanation) == found.end()) found.push_back(explanation);
    }
  }
  if (!asked.empty()) return found;
  for (const Explanation& explanation : all) found.push_back(&explanation);
  return found;
}

}  // namespace

void explain(const std::vector<std::string>& asked, const std::vector<std::filesystem::path>& directories, bool json,
             std::ostream& out) {
  const std::vector<Explanation> all = readExplanations(directories);
  const Explanations found = explanationsFor(all, asked);
  if (json) {
    Json document{{"schema", kDocumentSchema}, {"explanations", Json::array()}};
    for (const Explanation* one : found) document["explanations"].push_back(jsonOf(*one));
    out << documentText(document);
  } else if (asked.empty()) {
    printTitles(out, all);
  } else {
    std::string_view between;
    for (const Explanation* one : found) {
      out << between;
      printExplanation(out, *one, all);
      between = "\n";
    }
  }
}

}  // namespace quazor
