// Arbitrary text as the environment variable with settings: each word becomes a setting with the number in its text,
// and sets the parameters that it names, or is refused.
#include "host/plugin/parameters.h"
#include "host/text/parameter_number.h"
#include "tests/fuzz/fuzzing.h"

#include <cstdlib>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

std::vector<std::string> wordsOf(std::string_view text) {
  constexpr std::string_view kSpace = " \t\n\v\f\r";
  std::vector<std::string> words;
  for (std::size_t begin = text.find_first_not_of(kSpace); begin != std::string_view::npos;) {
    const std::size_t end = text.find_first_of(kSpace, begin);
    words.emplace_back(text.substr(begin, end - begin));
    begin = text.find_first_not_of(kSpace, end);
  }
  return words;
}

void requireSetting(const ParameterOverride& setting, const std::string& word) {
  require(setting.text == word && setting.place == OverridePlace::kEnvironment, "a setting keeps its text and place");
  const std::string part = setting.part ? std::string(nameOf(*setting.part)) + "." : "";
  const std::string beginning = part + setting.name + "=";
  require(!setting.name.empty() && word.starts_with(beginning), "a setting has the name in its text");
  require(parseNumber(word.substr(beginning.size())) == setting.value, "a setting has the number in its text");
  const ParameterOverride again = parseOverride(word);
  require(again.name == setting.name && again.part == setting.part && again.value == setting.value,
          "a setting means the same on the command line");
}

DescribedDiagnostic diagnosticWithParameters() {
  DescribedDiagnostic one{{"D", "", "E", "A", nullptr, nullptr}, {}};
  one.description.experiment.addParameter(QZNumberParameter("", true), "duration");
  one.description.experiment.addParameter(QZNumberParameter("", true), "frameCount");
  one.description.analysis.addParameter(QZNumberParameter("", true), "frameCount");
  return one;
}

bool applies(const ParameterOverride& setting, Part part, const std::string& name) {
  return setting.name == name && (!setting.part || *setting.part == part);
}

// Accepted settings of known parameters are the values of these, and no parameter has another.
void requireValues(const std::vector<ParameterOverride>& settings) {
  const DescribedDiagnostic diagnostic = diagnosticWithParameters();
  if (!accepted([&] { return checkOverrides(settings, {diagnostic}), true; })) return;
  const ResolvedParameters parameters = resolveParameters(diagnostic, {}, settings);
  bool isComplete = true;
  for (const Part part : {Part::kExperiment, Part::kAnalysis}) {
    for (const ResolvedParameter& one : parameters.of(part)) {
      std::optional<Value> expected;
      for (const ParameterOverride& setting : settings) {
        if (!applies(setting, part, one.name)) continue;
        require(!expected, "a parameter is set once");
        expected = setting.value;
      }
      require(one.value == expected && one.source == (expected ? "environment" : ""), "a setting sets its parameter");
      isComplete = isComplete && one.value;
    }
  }
  require(missingParameterOf(diagnostic, parameters).empty() == isComplete,
          "a required parameter without a value is told");
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  std::string text(asText(data, size));
  text.resize(std::strlen(text.c_str()));  // the environment holds C strings
  require(setenv(kSettingsVariable, text.c_str(), 1) == 0, "the environment can be changed");
  const std::optional<std::vector<ParameterOverride>> settings = accepted(overridesOfEnvironment);
  const std::vector<std::string> words = wordsOf(text);
  if (!settings) {
    bool refused = false;
    for (const std::string& word : words) refused = refused || !accepted([&] { return parseOverride(word); });
    require(refused, "settings are refused because one of them is wrong");
    return 0;
  }
  require(settings->size() == words.size(), "every word is a setting");
  for (std::size_t i = 0; i < words.size(); ++i) requireSetting((*settings)[i], words[i]);
  requireValues(*settings);
  return 0;
}
