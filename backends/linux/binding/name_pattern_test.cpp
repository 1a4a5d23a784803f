#include "backends/linux/binding/name_pattern.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

// "GROUP|SUBGROUP|NAME" as matched by the placeholders, "-" for none; "no" if the name does not match.
std::string matched(std::string_view pattern, std::string_view name) {
  const NamePattern parsed = NamePattern::parse(pattern);
  ChannelNames names;
  const bool matches = parsed.match(name, &names);
  EXPECT_EQ(parsed.matches(name), matches) << pattern << " " << name;
  if (!matches) return "no";
  return names.group.value_or("-") + "|" + names.subgroup.value_or("-") + "|" + names.name.value_or("-");
}

TEST(NamePattern, TellsWhatThePlaceholdersStoodFor) {
  const struct {
    const char* pattern;
    const char* name;
    const char* expected;
  } kRows[] = {
      {"cpu.stat", "cpu.stat", "-|-|-"},
      {"cpu.stat", "cpu.sta", "no"},
      {"", "", "-|-|-"},
      {"{name}", "Number ZE FAULT_A", "-|-|Number ZE FAULT_A"},
      {"{name}", "", "no"},
      {"*", "", "-|-|-"},
      {"*", "anything", "-|-|-"},
      {"a*", "a", "-|-|-"},
      {"a*", "b", "no"},
      {"*a", "ba", "-|-|-"},
      {"*a", "ab", "no"},
      {"aa*a", "aa", "no"},
      {"a{name}a", "aa", "no"},
      {"a{name}a", "aaa", "-|-|a"},
      {"{group}-{name}", "a-b-c", "a|-|b-c"},
      {"{group}-{name}", "--c", "-|-|c"},
      {"{group}-{name}", "-c", "no"},
      {"{group}-{name}", "a-", "no"},
      {"{group}-{name}", "", "no"},
      {"{group}/{subgroup}/x_{name}_y", "g/s/x_n_y", "g|s|n"},
      {"*_{name}_*", "ab_cd_ef_g", "-|-|cd"},
      {"*ab", "aab", "-|-|-"},
      {"*a*b", "xaxb", "-|-|-"},
      {"*a*b", "xbxa", "no"},
      {"*a*bc", "abc", "-|-|-"},
      {"*ab*bc", "abc", "no"},
  };
  for (const auto& row : kRows)
    EXPECT_EQ(matched(row.pattern, row.name), row.expected) << row.pattern << " " << row.name;
}

TEST(NamePattern, LeavesTheNamesWhereNothingMatches) {
  ChannelNames names;
  names.group = "before";
  EXPECT_FALSE(NamePattern::parse("{group}-{name}b").match("a-c", &names));
  EXPECT_EQ(names.group, "before");
}

TEST(NamePattern, KnowsItsPlaceholders) {
  const NamePattern pattern = NamePattern::parse("a*b{name}");
  EXPECT_TRUE(pattern.hasPlaceholder("name"));
  EXPECT_FALSE(pattern.hasPlaceholder("group"));
  EXPECT_FALSE(pattern.isLiteral());
  EXPECT_TRUE(NamePattern::parse("ab").isLiteral());
}

TEST(NamePattern, RefusesWhatIsNone) {
  const RefusedText kRows[] = {
      {"{", "contains an unmatched brace."},
      {"a{b", "contains an unmatched brace."},
      {"a}b", "contains an unmatched brace."},
      {"**", "needs text between two placeholders or *, so that they can be told apart."},
      {"{}", "contains the unknown placeholder \"{}\"; expected one of \"{group}\", \"{subgroup}\" and \"{name}\"."},
      {"{name}-{name}", "contains the placeholder \"{name}\" twice; remove one."},
  };
  for (const auto& row : kRows) {
    EXPECT_THAT([&] { static_cast<void>(NamePattern::parse(row.text)); },
                testing::ThrowsMessage<InputError>(row.problem))
        << row.text;
  }
}

}  // namespace
}  // namespace quazor
