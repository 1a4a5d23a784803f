#include "base/json/json_line.h"

#include "base/json/json_limits.h"
#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

std::string repeated(std::string_view text, std::size_t times) {
  std::string all;
  all.reserve(text.size() * times);
  for (std::size_t i = 0; i < times; ++i) all += text;
  return all;
}

std::string objects(std::size_t levels) { return repeated(R"({"a":)", levels) + "1" + repeated("}", levels); }

std::string arrays(std::size_t levels) { return repeated("[", levels) + repeated("]", levels); }

std::string problemOfLine(const std::string& line) {
  return thrownText<InputError>([&] { static_cast<void>(parseJsonLine(line)); });
}

TEST(ParseJsonLine, GivesTheValue) {
  EXPECT_EQ(parseJsonLine(R"({"b":[1,-2.5,"x"],"a":{"b":null}})").dump(), R"({"b":[1,-2.5,"x"],"a":{"b":null}})");
  EXPECT_EQ(parseJsonLine("7"), 7);
}

TEST(ParseJsonLine, RefusesWhatIsNoJson) {
  for (const char* line : {"", "{", "{} {}", "[1,]", "1e999", "\"\xff\"", "nul"}) {
    EXPECT_EQ(problemOfLine(line), "not valid JSON") << line;
  }
}

TEST(ParseJsonLine, RefusesAKeyThatAnObjectHasTwice) {
  EXPECT_EQ(problemOfLine(R"({"a":1,"b":2,"a":3})"), R"(the key "a" is duplicated)");
  EXPECT_EQ(problemOfLine(R"([{"x":{"a":1,"\u0061":1}}])"), R"(the key "a" is duplicated)");
  EXPECT_EQ(parseJsonLine(R"([{"a":{"a":1}},{"a":2}])").size(), 2U);
}

TEST(ParseJsonLine, HasALimitOfDepth) {
  const std::string sentence = "the line is nested more than " + std::to_string(kMaxLineLevels) + " levels deep";
  EXPECT_EQ(parseJsonLine(arrays(kMaxLineLevels)).size(), 1U);
  EXPECT_EQ(parseJsonLine(objects(kMaxLineLevels)).size(), 1U);
  for (const std::size_t levels : {kMaxLineLevels + 1, std::size_t{100'000}, std::size_t{5'000'000}}) {
    EXPECT_EQ(problemOfLine(arrays(levels)), sentence);
    EXPECT_EQ(problemOfLine(objects(levels)), sentence);
    EXPECT_EQ(problemOfLine(repeated("[", levels)), sentence);
  }
}

TEST(ParseJsonLine, WhatItAcceptsCanBeCopiedAndPrinted) {
#ifdef QUAZOR_ADDRESS_SANITIZER
  GTEST_SKIP() << "the frames of a sanitized build need a larger stack";
#endif
  const nlohmann::ordered_json parsed = parseJsonLine(objects(kMaxLineLevels));
  const nlohmann::ordered_json copy = parsed;
  EXPECT_EQ(copy.dump(), objects(kMaxLineLevels));
}

TEST(ParseJsonLine, HasALimitOfKeys) {
  const auto object = [](std::size_t keys) {
    std::string text = "{\"0\":0";
    for (std::size_t i = 1; i < keys; ++i) text += ",\"" + std::to_string(i) + "\":0";
    return text + "}";
  };
  EXPECT_EQ(parseJsonLine(object(kMaxLineKeys)).size(), kMaxLineKeys);
  EXPECT_EQ(problemOfLine(object(kMaxLineKeys + 1)),
            "an object has more than " + std::to_string(kMaxLineKeys) + " keys");
}

TEST(ParseJsonLine, HasALimitOfSize) {
  EXPECT_EQ(parseJsonLine("\"" + std::string(kMaxLine - 2, 'x') + "\"").get_ref<const std::string&>().size(),
            kMaxLine - 2);
  EXPECT_EQ(problemOfLine("\"" + std::string(kMaxLine - 1, 'x') + "\""), "the line is longer than 64 MiB");
}

}  // namespace
}  // namespace quazor
