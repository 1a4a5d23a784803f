#include "host/report/experiment_report.h"

#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <sstream>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

std::string printed(const Dictionary& data, bool blocks = false) {
  std::ostringstream out;
  printAuxiliaryData(out, data, blocks);
  return out.str();
}

// The numbers from 0 to `count` - 1.
Array ramp(int count) {
  Array samples;
  for (int i = 0; i < count; ++i) samples.emplace_back(i);
  return samples;
}

TEST(PrintAuxiliaryData, ShowsPlainValuesByName) {
  EXPECT_EQ(printed({{"number", 36.6F},
                     {"text", "a\033b"},
                     {"bytes", Bytes{0x00, 0xA5}},
                     {"few", Array{1, 2, 3}},
                     {"none", Array{}},
                     {"empty", Dictionary{}},
                     {"na\nme", true}}),
            "  number: 36.6\n"
            "  text: a\\x1bb\n"
            "  bytes: 00a5\n"
            "  few: (1, 2, 3)\n"
            "  none: ()\n"
            "  empty: {}\n"
            "  na\\x0ame: 1\n");
}

TEST(PrintAuxiliaryData, IndentsWhatIsInDictionariesAndLists) {
  EXPECT_EQ(printed({{"counters", Dictionary{{"BackWide", Dictionary{{"I2C", 0}, {"MIPI", 2}}}, {"total", 2}}},
                     {"list", Array{Dictionary{{"a", 1}}, Array{1, 2}, "text"}}}),
            "  counters:\n"
            "    BackWide:\n"
            "      I2C: 0\n"
            "      MIPI: 2\n"
            "    total: 2\n"
            "  list 1 of 3:\n"
            "    a: 1\n"
            "  list 2 of 3: (1, 2)\n"
            "  list 3 of 3: text\n");
}

TEST(PrintAuxiliaryData, ShowsEachImageWithItsValuesAndPictures) {
  const Value image(
      Dictionary{{"number", 7}, {"i", ramp(8)}, {"few", Array{5, 6}}, {"label", "x"}, {"more", Dictionary{{"z", 1}}}});
  EXPECT_EQ(printed({{"images", Array{image, Dictionary{{"i", Array{-3, 4}}}}}}),
            "  images 1 of 2: number 7, label x\n"
            "    i: 8 samples, min 0, max 7\n"
            "          .:\n"
            "        .:::\n"
            "      .:::::\n"
            "    .:::::::\n"
            "    few: (5, 6)\n"
            "    more:\n"
            "      z: 1\n"
            "\n"
            "  images 2 of 2:\n"
            "    i: (-3, 4)\n");
}

TEST(PrintAuxiliaryData, DrawsWithBlocksWhereTheyCanBeShown) {
  EXPECT_THAT(printed({{"i", ramp(8)}}, true), HasSubstr("\u2588"));
  EXPECT_THAT(printed({{"i", ramp(8)}}, false), Not(HasSubstr("\u2588")));
}

TEST(PrintAuxiliaryData, ShowsAnImageThatIsNotInAList) {
  EXPECT_THAT(printed({{"image", Dictionary{{"number", 7}, {"i", ramp(8)}}}}),
              testing::StartsWith("  image: number 7\n    i: 8 samples, min 0, max 7\n"));
}

TEST(PrintAuxiliaryData, DrawsFrom8To64Samples) {
  EXPECT_EQ(printed({{"s", ramp(7)}}), "  s: (0, 1, 2, 3, 4, 5, 6)\n");
  EXPECT_THAT(printed({{"s", ramp(8)}}), HasSubstr("\n  .:::::::\n"));
  EXPECT_THAT(printed({{"s", ramp(64)}}), HasSubstr("\n  .....:::"));
  EXPECT_EQ(printed({{"s", ramp(65)}}), "  s: 65 samples, min 0, max 64\n");
}

TEST(PrintAuxiliaryData, TellsLowestAndHighestAsTheyAre) {
  const auto rangeOf = [](const Value& first, const Value& last) {
    return printed({{"s", Array{first, 0, 0, 0, 0, 0, 0, last}}});
  };
  const double nan = std::numeric_limits<double>::quiet_NaN();
  EXPECT_THAT(rangeOf(-2147483648, 18446744073709551615U), HasSubstr("min -2147483648, max 18446744073709551615\n"));
  EXPECT_THAT(rangeOf(36.6F, -0.5), HasSubstr("min -0.5, max 36.6\n"));
  EXPECT_THAT(rangeOf(nan, 3), HasSubstr("min 0, max 3\n"));
  EXPECT_EQ(printed({{"s", Array{nan, nan, nan, nan, nan, nan, nan, nan}}}), "  s: 8 samples, none finite\n");
}

TEST(PrintAuxiliaryData, KeepsImagesWithin80Columns) {
  Array samples;
  for (int i = 0; i < 48; ++i) samples.emplace_back(i % 2 == 0 ? INT32_MIN : INT32_MAX);
  const std::string text = printed({{"images", Array{Dictionary{{"frameID", 4294967295U},
                                                                {"dScanI", samples},
                                                                {"tmonDataInC", -36.123456F},
                                                                {"timestampInMilliseconds", 4294967295U}}}}});
  EXPECT_THAT(text, testing::StartsWith("  images 1 of 1: frameID 4294967295, tmonDataInC -36.123455,\n"
                                        "    timestampInMilliseconds 4294967295\n"
                                        "    dScanI: 48 samples, min -2147483648, max 2147483647\n"));
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) EXPECT_LE(line.size(), 80U) << line;
}

TEST(PrintAuxiliaryData, FillsALineToTheLastColumn) {
  // Two spaces, "s:", a space and the item.
  const std::string exact(80 - 5 - 4, 'x');
  EXPECT_THAT(printed({{"s", Dictionary{{"key", exact}, {"i", Array{1}}}}}),
              testing::StartsWith("  s: key " + exact + "\n"));
  EXPECT_THAT(printed({{"s", Dictionary{{"key", exact + "x"}, {"i", Array{1}}}}}),
              testing::StartsWith("  s:\n    key " + exact + "x\n"));
}

std::string printedRecord(const DiagnosticRecord& record, TextStyle style = {}) {
  std::ostringstream out;
  printExperiment(out, record, style);
  return out.str();
}

DiagnosticRecord experimentOf(Verdict verdict) {
  DiagnosticRecord record = recordOf("Name", verdict);
  record.experimentOnly = true;
  record.measuredResults.clear();
  record.measurements.set("Longer", Measurement(0.5, QZDimensionlessUnit::events()));
  return record;
}

TEST(PrintExperiment, ShowsMeasurementsAndAuxiliaryDataAndNoVerdict) {
  EXPECT_EQ(printedRecord(experimentOf(Verdict::kPass)),
            "Name\n"
            "  Its summary.\n"
            "\n"
            "  Measurement  Value  Unit\n"
            "  Raw             90  frames\n"
            "  Longer         0.5  events\n"
            "\n"
            "  bytes: a5\n"
            "\n"
            "  DONE\n"
            "\n");
}

TEST(PrintExperiment, ShowsTheErrorAndLeavesOutWhatThereIsNot) {
  DiagnosticRecord record = experimentOf(Verdict::kError);
  record.measurements = {};
  record.auxiliaryData = {};
  EXPECT_EQ(printedRecord(record), kTextOfErrorAlone);
}

TEST(PrintExperiment, KeepsToItsStyle) {
  DiagnosticRecord record = experimentOf(Verdict::kPass);
  record.auxiliaryData = {{"s", ramp(8)}};
  EXPECT_THAT(printedRecord(record, {true, true}),
              testing::AllOf(HasSubstr("\033[32mDONE\033[0m"), HasSubstr("\u2588")));
  EXPECT_THAT(printedRecord(record), testing::AllOf(Not(HasSubstr("\033")), Not(HasSubstr("\u2588"))));
}

TEST(PrintExperimentSummary, CountsResultsAndErrors) {
  std::ostringstream out;
  printExperimentSummary(out,
                         {experimentOf(Verdict::kPass), experimentOf(Verdict::kError), experimentOf(Verdict::kPass)});
  printExperimentSummary(out, {experimentOf(Verdict::kError)});
  EXPECT_EQ(out.str(),
            "3 experiments: 2 returned a result, 1 ended in an error\n"
            "1 experiment: 0 returned a result, 1 ended in an error\n");
}

}  // namespace
}  // namespace quazor
