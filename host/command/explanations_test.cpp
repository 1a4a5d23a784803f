#include "host/command/explanations.h"

#include "host/error/exit_code.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_refusals.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kError = R"({
  "code": -5,
  "symbols": ["kFive"],
  "title": "It is five",
  "meaning": "Too much.",
  "messages": [{"text": "... is five!", "from": ["D"], "meaning": "It was set so."},
               {"text": "Five.", "from": ["D", "E"]}],
  "causes": ["Counting."],
  "next": ["Count again.", "Go home."]
})";

constexpr const char* kPlainError = R"({"code": 6, "title": "T", "meaning": "M", "causes": ["C"], "next": ["N"]})";

constexpr const char* kResult = R"({
  "names": ["R 1", "R 2"], "kind": "result", "from": ["D"], "title": "T", "meaning": "M", "failing": "F",
  "causes": ["C"], "next": ["N"]
})";

constexpr const char* kDiagnostic =
    R"({"names": ["D"], "kind": "diagnostic", "title": "T", "meaning": "M", "causes": ["C"], "next": ["N"]})";

std::string errors(const std::string& domain, const std::string& entries) {
  return R"({"$schema": "s", "schema": 1, "domain": ")" + domain + R"(", "errors": [)" + entries + "]}";
}

std::string names(const std::string& entries) { return R"({"schema": 1, "names": [)" + entries + "]}"; }

std::string with(std::string text, const std::string& old, const std::string& replacement) {
  const std::size_t at = text.find(old);
  EXPECT_NE(at, std::string::npos) << old;
  return text.replace(at, old.size(), replacement);
}

TEST(ParseExplanations, ReadsErrors) {
  const std::vector<Explanation> all = parseExplanations("f", errors("Dom", std::string(kError) + "," + kPlainError));
  ASSERT_EQ(all.size(), 2U);
  const Explanation& one = all[0];
  EXPECT_TRUE(one.isError());
  EXPECT_EQ(one.domain, "Dom");
  EXPECT_EQ(one.code, -5);
  EXPECT_THAT(one.symbols, ElementsAre("kFive"));
  EXPECT_EQ(one.title, "It is five");
  EXPECT_EQ(one.meaning, "Too much.");
  EXPECT_THAT(one.causes, ElementsAre("Counting."));
  EXPECT_THAT(one.next, ElementsAre("Count again.", "Go home."));
  ASSERT_EQ(one.messages.size(), 2U);
  EXPECT_EQ(one.messages[0].text, "... is five!");
  EXPECT_THAT(one.messages[0].from, ElementsAre("D"));
  EXPECT_EQ(one.messages[0].meaning, "It was set so.");
  EXPECT_THAT(one.messages[1].from, ElementsAre("D", "E"));
  EXPECT_EQ(one.messages[1].meaning, "");
  EXPECT_THAT(all[1].symbols, IsEmpty());
  EXPECT_THAT(all[1].messages, IsEmpty());
}

TEST(ParseExplanations, ReadsNames) {
  const std::vector<Explanation> all = parseExplanations("f", names(std::string(kResult) + "," + kDiagnostic));
  ASSERT_EQ(all.size(), 2U);
  EXPECT_FALSE(all[0].isError());
  EXPECT_THAT(all[0].names, ElementsAre("R 1", "R 2"));
  EXPECT_EQ(all[0].kind, "result");
  EXPECT_THAT(all[0].from, ElementsAre("D"));
  EXPECT_EQ(all[0].failing, "F");
  EXPECT_EQ(all[1].kind, "diagnostic");
  EXPECT_EQ(all[1].failing, "");
  EXPECT_THAT(all[1].from, IsEmpty());
}

TEST(ParseExplanations, RefusesWhatIsNotExactlyOfTheForm) {
  const std::string plain = errors("Dom", kPlainError);
  const std::string full = errors("Dom", kError);
  const std::string result = names(kResult);
  const NamedRefusal rows[] = {
      {"no JSON", "{", "f:1: not valid JSON"},
      {"one key twice", R"({"schema": 1, "schema": 1})", "\"schema\" is duplicated"},
      {"no object", "[]", "f:1: the document: must be an object"},
      {"no schema", with(plain, R"("schema": 1, )", ""), "the key \"schema\" is missing"},
      {"another schema", with(plain, R"("schema": 1)", R"("schema": 2)"), "schema: must be 1, not 2."},
      {"an unknown key", with(plain, "errors", "error"), "unknown key \"error\"; did you mean \"errors\"?"},
      {"neither errors nor names", R"({"schema": 1})", "the key \"domain\" is missing"},
      {"no errors", R"({"schema": 1, "domain": "D"})", "the key \"errors\" is missing"},
      {"errors and names", R"({"schema": 1, "errors": [], "names": []})",
       "a file contains either errors or names, not both."},
      {"a domain and names", R"({"schema": 1, "domain": "D", "names": []})",
       "a file contains either errors or names, not both."},
      {"errors that are no array", with(plain, "[{", "{\"x\": [{").replace(0, 0, "").append("}"), "errors: must be"},
      {"an unknown key of an error", with(plain, "title", "titel"), "errors[0]: unknown key \"titel\""},
      {"no code", with(plain, R"("code": 6, )", ""), "errors[0]: the key \"code\" is missing"},
      {"a code that is a fraction", with(plain, "6", "6.5"), "errors[0].code: must be a signed 64-bit integer"},
      {"no title", with(plain, R"("title": "T", )", ""), "the key \"title\" is missing"},
      {"no meaning", with(plain, R"("meaning": "M", )", ""), "the key \"meaning\" is missing"},
      {"no causes", with(plain, R"("causes": ["C"], )", ""), "the key \"causes\" is missing"},
      {"no steps", with(plain, R"(, "next": ["N"])", ""), "the key \"next\" is missing"},
      {"no cause", with(plain, R"(["C"])", "[]"), "errors[0].causes: at least one entry is required."},
      {"no step", with(plain, R"(["N"])", "[]"), "errors[0].next: at least one entry is required."},
      {"an empty step", with(plain, R"(["N"])", R"([""])"), "errors[0].next[0]: must be a non-empty string"},
      {"a step twice", with(plain, R"(["N"])", R"(["N", "O", "N"])"), "errors[0].next[2]: this entry is a duplicate."},
      {"a blank before a text", with(plain, R"("T")", R"(" T")"), "errors[0].title: the text must be one line"},
      {"a blank after a text", with(plain, R"("T")", R"("T ")"), "errors[0].title: the text must be one line"},
      {"two lines", with(plain, R"("M")", R"("M\nN")"), "errors[0].meaning: the text must be one line"},
      {"a delete character", with(plain, R"("M")", "\"M\x7FN\""), "errors[0].meaning: the text must be one line"},
      {"a control character of two bytes", with(plain, R"("M")", "\"M\xC2\x9BN\""),
       "errors[0].meaning: the text must be one line"},
      {"no symbol", with(full, R"(["kFive"])", "[]"), "errors[0].symbols: at least one entry is required."},
      {"an unknown key of a message", with(full, R"("text")", R"("txt")"), "errors[0].messages[0]: unknown key"},
      {"a message from nobody", with(full, R"(["D"])", "[]"), "messages[0].from: at least one entry is required."},
      {"a message's empty meaning", with(full, "It was set so.", ""),
       "errors[0].messages[0].meaning: must be a non-empty string"},
      {"an unknown key of a name", with(result, "failing", "fails"), "names[0]: unknown key \"fails\""},
      {"no name", with(result, R"(["R 1", "R 2"])", "[]"), "names[0].names: at least one entry is required."},
      {"an unknown kind", with(result, R"("result")", R"("results")"), "\"results\" is not a kind; did you mean"},
      {"a result of nothing", with(result, R"("from": ["D"], )", ""), "names[0]: the key \"from\" is missing"},
      {"a diagnostic of something", with(result, R"("result")", R"("diagnostic")"),
       "names[0].from: only a result can have"},
      {"an empty failing", with(result, R"("F")", R"("")"), "names[0].failing: must be a non-empty string"},
  };
  for (const auto& row : rows) {
    EXPECT_THAT(thrownText<InputError>([&] { parseExplanations("f", row.text); }), testing::HasSubstr(row.problem))
        << row.name;
  }
}

TEST(ReadExplanations, ReadsTheFilesOfADirectoryInTheOrderOfTheirNames) {
  const TestDirectory directory;
  directory.write("b.json", errors("B", kPlainError));
  directory.write("a.json", names(kDiagnostic));
  directory.write("c.schema.json", "{}");
  directory.write("d.txt", "no JSON");
  const std::vector<Explanation> all = readExplanations({directory.path()});
  ASSERT_EQ(all.size(), 2U);
  EXPECT_THAT(all[0].names, ElementsAre("D"));
  EXPECT_EQ(all[1].domain, "B");
}

TEST(ReadExplanations, RefusesWhatItCannotUse) {
  struct Row {
    const char* name;
    std::vector<std::pair<std::string, std::string>> files;
    const char* problem;
  };
  const Row rows[] = {
      {"nothing", {}, "the directory contains none."},
      {"a file without explanations", {{"a.json", names("")}}, "the directory contains none."},
      {"a file that is no JSON", {{"a.json", "x"}}, "/a.json:1: not valid JSON"},
      {"a file of another form", {{"a.json", "{}"}}, "/a.json:1: the document: the key"},
      {"a directory of such a name", {{"a.json/b", ""}}, "/a.json: this is a directory"},
      {"one error twice in a file",
       {{"a.json", errors("D", std::string(kPlainError) + "," + kPlainError)}},
       "'D:6' is already explained in '"},
      {"one name in two files",
       {{"a.json", names(kDiagnostic)}, {"b.json", names(kDiagnostic)}},
       "/b.json' cannot be used: 'D' is already explained in '"},
  };
  for (const Row& row : rows) {
    const TestDirectory directory;
    for (const auto& [name, text] : row.files) directory.write(name, text);
    EXPECT_THAT(thrownText<InputError>([&] { readExplanations({directory.path()}); }), testing::HasSubstr(row.problem))
        << row.name;
  }
  EXPECT_EQ(thrownText<InputError>([] { readExplanations({"/nowhere"}); }),
            "the explanations in '/nowhere' cannot be used: No such file or directory.");
}

std::vector<Explanation> fewExplanations() {
  std::vector<Explanation> all = parseExplanations("f", errors("FirstDomain", std::string(kError) + "," + kPlainError));
  for (const std::string& text :
       {errors("SecondDomain", kPlainError), names(std::string(kResult) + "," + kDiagnostic)}) {
    for (Explanation& one : parseExplanations("f", text)) all.push_back(std::move(one));
  }
  return all;
}

TEST(FindExplanations, FindsByDomainCodeNameAndSymbol) {
  const std::vector<Explanation> all = fewExplanations();
  struct Row {
    const char* name;
    std::string asked;
    std::vector<std::size_t> found;
  };
  const Row rows[] = {
      {"domain and code", "FirstDomain:6", {1}},
      {"a negative code of a domain", "FirstDomain:-5", {0}},
      {"a code of two domains", "6", {1, 2}},
      {"a negative code", "-5", {0}},
      {"a domain", "FirstDomain", {0, 1}},
      {"a symbol", "kFive", {0}},
      {"a name", "R 2", {3}},
      {"a pattern of names", "R*", {3}},
      {"a pattern of all names", "*", {3, 4}},
  };
  for (const Row& row : rows) {
    std::vector<std::size_t> found;
    for (const Explanation* one : findExplanations(all, row.asked)) {
      found.push_back(static_cast<std::size_t>(one - all.data()));
    }
    EXPECT_EQ(found, row.found) << row.name;
  }
}

const std::string kOwn = "; if it is of your own plug-in, install that first: 'cmake --install build' in its project";
const std::string kListed = "; 'quazor explain' lists all explanations" + kOwn;

TEST(FindExplanations, TellsTheNearestDomainWhateverItsEnding) {
  const std::vector<Explanation> all = parseExplanations("f", errors("LampErrorDomain", kPlainError));
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [&] { findExplanations(all, "LapmErrorDomain:6"); }),
            "no explanation of the error domain 'LapmErrorDomain'; did you mean 'LampErrorDomain'?");
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [&] { findExplanations(all, "OvenErrorDomain:6"); }),
            "no explanation of the error domain 'OvenErrorDomain'; if the report shows it after 'caused by', look up "
            "the error on the line above" +
                kOwn);
}

TEST(FindExplanations, TellsWhichOneMentionsIt) {
  const std::vector<Explanation> all = parseExplanations(
      "f",
      R"({"schema": 1, "names": [{"names": ["Total"], "kind": "result", "from": ["D"], "title": "t", "meaning": "m",
                "failing": "Its limit, TotalLimit, is its own total.", "causes": ["c"], "next": ["n"]}]})");
  const auto problemOf = [&all](const char* asked) {
    return refusalOf(ExitCode::kUsage, [&] { findExplanations(all, asked); });
  };
  EXPECT_EQ(problemOf("TotalLimit"), "no explanation of 'TotalLimit'; that of 'Total' mentions it");
  EXPECT_EQ(problemOf("talLimit"), "no explanation of 'talLimit'" + kListed);
  EXPECT_EQ(problemOf("To"), "no explanation of 'To'; did you mean 'Total'?");
  EXPECT_EQ(problemOf("its"), "no explanation of 'its'" + kListed);
}

TEST(FindExplanations, RefusesWhatHasNoneAndTellsTheNearest) {
  const std::vector<Explanation> all = fewExplanations();
  struct Row {
    const char* name;
    std::string text;
    std::string problem;
  };
  const Row rows[] = {
      {"a code that the domain does not have", "FirstDomain:7",
       "no explanation of code 7 in 'FirstDomain'; the explained codes are -5, 6"},
      {"a domain with a slip", "FristDomain:6",
       "no explanation of the error domain 'FristDomain'; did you mean 'FirstDomain'?"},
      {"a foreign domain", "Alien:6",
       "no explanation of the error domain 'Alien'; if the report shows it after 'caused by', look up the error on the "
       "line above" +
           kOwn},
      {"no domain", ":0",
       "no explanation of the error domain ''; if the report shows it after 'caused by', look up the error on the line "
       "above" +
           kOwn},
      {"a code that no domain has", "999", "no error domain has an explanation of code 999"},
      {"a code that is no integer", "FirstDomain:x", "no explanation of 'FirstDomain:x'; did you mean 'FirstDomain'?"},
      {"a code with something behind it", "6x", "no explanation of '6x'" + kListed},
      {"a code too large", "99999999999999999999", "no explanation of '99999999999999999999'" + kListed},
      {"a name with a slip", "R 3", "no explanation of 'R 3'; did you mean 'R 1'?"},
      {"a symbol with a slip", "kFiwe", "no explanation of 'kFiwe'; did you mean 'kFive'?"},
      {"a domain alone with a slip", "SecondDomian", "no explanation of 'SecondDomian'; did you mean 'SecondDomain'?"},
      {"a pattern that fits nothing", "X*", "no explanation of 'X*'" + kListed},
      {"nothing", "", "no explanation of ''" + kListed},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(refusalOf(ExitCode::kUsage, [&] { findExplanations(all, row.text); }), row.problem) << row.name;
  }
}

}  // namespace
}  // namespace quazor
