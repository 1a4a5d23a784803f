#include "host/command/explain_command.h"

#include "host/error/exit_code.h"
#include "host/testing/test_directory.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <sstream>

namespace quazor {
namespace {

constexpr const char* kErrors = R"({"schema": 1, "domain": "LampErrorDomain", "errors": [
  {"code": 1, "symbols": ["kDark", "kOut"], "title": "The lamp is dark", "meaning": "It does not shine.",
   "messages": [{"text": "Lamp ... is dark!", "from": ["LampDiagnostic", "LampExperiment"], "meaning": "No current."},
                {"text": "Dark.", "from": ["LampDiagnostic"]}],
   "causes": ["It is not screwed in, as it came loose on its way from the shop to the station.", "It is broken."],
   "next": ["Screw it in and run `quazor run LampDiagnostic --log-level debug` again.", "Swap it."]},
  {"code": 2, "title": "T2", "meaning": "M2", "causes": ["C2"], "next": ["N2"]}]})";

constexpr const char* kNames = R"({"schema": 1, "names": [
  {"names": ["LampDiagnostic"], "kind": "diagnostic", "title": "The lamp", "meaning": "Does it shine?",
   "failing": "It is too weak.", "causes": ["Age."], "next": ["Swap it."]},
  {"names": ["Light", "Warmth"], "kind": "result", "from": ["LampDiagnostic", "OvenDiagnostic"], "title": "Of the lamp",
   "meaning": "In lux.", "causes": ["Age."], "next": ["Swap it."]}]})";

class Explain : public testing::Test {
 protected:
  void SetUp() override {
    directory_.write("a.json", kErrors);
    directory_.write("b.json", kNames);
  }

  std::string text(const std::vector<std::string>& asked, bool json = false) const {
    std::ostringstream out;
    explain(asked, {directory_.path()}, json, out);
    return out.str();
  }

  TestDirectory directory_;
};

TEST_F(Explain, TellsWhatAnErrorMeansInLinesOf80Columns) {
  EXPECT_EQ(text({"LampErrorDomain:1"}),
            "LampErrorDomain code 1 (kDark, kOut)\n"
            "  The lamp is dark\n"
            "\n"
            "  It does not shine.\n"
            "\n"
            "  Messages\n"
            "    \"Lamp ... is dark!\"\n"
            "      from LampDiagnostic, LampExperiment\n"
            "      No current.\n"
            "    \"Dark.\"\n"
            "      from LampDiagnostic\n"
            "\n"
            "  Likely causes\n"
            "    - It is not screwed in, as it came loose on its way from the shop to the\n"
            "      station.\n"
            "    - It is broken.\n"
            "\n"
            "  What to do next\n"
            "    1. Screw it in and run `quazor run LampDiagnostic --log-level debug` again.\n"
            "    2. Swap it.\n");
}

TEST_F(Explain, TellsWhatADiagnosticShowsAndTheErrorsThatItCanEndIn) {
  EXPECT_EQ(text({"LampDiagnostic"}),
            "LampDiagnostic\n"
            "  The lamp\n"
            "\n"
            "  Does it shine?\n"
            "\n"
            "  When it fails\n"
            "    It is too weak.\n"
            "\n"
            "  Likely causes\n"
            "    - Age.\n"
            "\n"
            "  What to do next\n"
            "    1. Swap it.\n"
            "\n"
            "  Possible errors\n"
            "    LampErrorDomain:1\n"
            "      The lamp is dark\n");
}

TEST_F(Explain, TellsWhoseAResultIs) {
  EXPECT_EQ(text({"Warmth"}),
            "Light\n"
            "Warmth\n"
            "  Of the lamp\n"
            "\n"
            "  In lux.\n"
            "\n"
            "  Result of\n"
            "    LampDiagnostic, OvenDiagnostic\n"
            "\n"
            "  Likely causes\n"
            "    - Age.\n"
            "\n"
            "  What to do next\n"
            "    1. Swap it.\n");
}

TEST_F(Explain, ExplainsEachThingOnceInTheOrderAskedFor) {
  const std::string second = text({"LampErrorDomain:2"});
  const std::string result = text({"Light"});
  EXPECT_EQ(second.substr(0, second.find('\n')), "LampErrorDomain code 2");
  EXPECT_EQ(text({"Light", "2", "Warmth", "LampErrorDomain:2"}), result + "\n" + second);
}

TEST_F(Explain, ListsTheTitlesWhenNothingIsAskedFor) {
  EXPECT_EQ(text({}),
            "LampErrorDomain:1\n  The lamp is dark\nLampErrorDomain:2\n  T2\n"
            "LampDiagnostic\n  The lamp\nLight\nWarmth\n  Of the lamp\n");
}

TEST_F(Explain, WritesOneJsonDocument) {
  const auto document = nlohmann::json::parse(text({"1", "Light"}, true));
  EXPECT_EQ(document["schema"], 1);
  ASSERT_EQ(document["explanations"].size(), 2U);
  EXPECT_EQ(document["explanations"][0], nlohmann::json::parse(R"({
    "domain": "LampErrorDomain", "code": 1, "symbols": ["kDark", "kOut"],
    "messages": [{"text": "Lamp ... is dark!", "from": ["LampDiagnostic", "LampExperiment"], "meaning": "No current."},
                 {"text": "Dark.", "from": ["LampDiagnostic"], "meaning": ""}],
    "title": "The lamp is dark", "meaning": "It does not shine.",
    "causes": ["It is not screwed in, as it came loose on its way from the shop to the station.", "It is broken."],
    "next": ["Screw it in and run `quazor run LampDiagnostic --log-level debug` again.", "Swap it."]})"));
  EXPECT_EQ(document["explanations"][1], nlohmann::json::parse(R"({
    "names": ["Light", "Warmth"], "kind": "result", "from": ["LampDiagnostic", "OvenDiagnostic"], "failing": "",
    "title": "Of the lamp", "meaning": "In lux.", "causes": ["Age."], "next": ["Swap it."]})"));
  EXPECT_EQ(nlohmann::json::parse(text({}, true))["explanations"].size(), 4U);
}

TEST_F(Explain, WritesNothingWhenOneOfTheNamesHasNoExplanation) {
  std::ostringstream out;
  EXPECT_THROW(explain({"Light", "Lihgt"}, {directory_.path()}, false, out), CommandError);
  EXPECT_EQ(out.str(), "");
}

TEST(ExplainWithoutExplanations, IsRefused) {
  std::ostringstream out;
  EXPECT_THROW(explain({}, {"/nowhere"}, false, out), InputError);
}

}  // namespace
}  // namespace quazor
