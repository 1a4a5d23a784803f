#include "host/report/csv_report.h"

#include "host/testing/test_records.h"

#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

DiagnosticRecord experimentOf(const std::string& name, Dictionary auxiliaryData) {
  DiagnosticRecord record;
  record.experimentOnly = true;
  record.name = name;
  record.verdict = Verdict::kPass;
  record.auxiliaryData = std::move(auxiliaryData);
  return record;
}

Dictionary imageOf(std::uint32_t frame, Array i, Array q) {
  return {{"frameID", frame},
          {"dScanI", std::move(i)},
          {"dScanQ", std::move(q)},
          {"tmonDataInC", 36.6F},
          {"timestampInMilliseconds", 40U}};
}

TEST(CsvField, QuotesOnlyWhatNeedsIt) {
  struct Row {
    const char* text;
    const char* field;
  };
  constexpr Row kRows[] = {
      {"", ""},
      {"plain text; it's", "plain text; it's"},
      {"a,b", "\"a,b\""},
      {"say \"x\"", "\"say \"\"x\"\"\""},
      {"a\nb", "\"a\nb\""},
      {"a\rb", "\"a\rb\""},
      {"\"", "\"\"\"\""},
  };
  for (const Row& row : kRows) EXPECT_EQ(csvField(row.text), row.field) << row.text;
}

TEST(Csv, KeepsTextsFromBeingTakenForFormulas) {
  struct Row {
    const char* text;
    const char* cell;
  };
  constexpr Row kRows[] = {
      {"=1+1", "'=1+1"},
      {"+1", "'+1"},
      {"-1", "'-1"},
      {"@SUM(A1)", "'@SUM(A1)"},
      {"\t=1", "'\t=1"},
      {"'=1", "\'\'=1"},
      {"=\"a\"", "\"'=\"\"a\"\"\""},
      {"a=1", "a=1"},
      {" =1", " =1"},
      {"'a", "'a"},
      {"'", "'"},
      {"", ""},
  };
  for (const auto& [text, cell] : kRows) {
    DiagnosticRecord experiment = experimentOf(text, {});
    experiment.measurements.set(text, Measurement(-0.5, QZUnit::unitWithSymbol(text)));
    EXPECT_EQ(experimentCsv({experiment}),
              "experiment,measurement,value,unit\n" + std::string(cell) + ',' + cell + ",-0.5," + cell + '\n')
        << text;
    DiagnosticRecord diagnostic;
    diagnostic.name = text;
    diagnostic.verdict = Verdict::kError;
    diagnostic.error = errorWithMessage(text, -7, text, nullptr);
    QZMeasuredResult result(text, Measurement(-2, QZUnit::unitWithSymbol(text)));
    result.setLimit(QZLimit(text));
    diagnostic.measuredResults.push_back(judgeResult(result));
    const std::string csv = diagnosticCsv({diagnostic});
    EXPECT_EQ(csv.substr(csv.find('\n') + 1), std::string(cell) + ",error," + cell + ",-2," + cell + ',' + cell +
                                                  ",,,,,,none,analyze," + cell + ",-7," + cell + '\n')
        << text;
  }
}

TEST(Csv, KeepsTheTextsOfImagesFromBeingTakenForFormulas) {
  const Value image(Dictionary{{"-b", "=c"}, {"n", -1}, {"=s", Array{-5}}});
  EXPECT_EQ(experimentCsv({experimentOf("X", {{"images", image}})}),
            "experiment,image,'-b,n,sample,'=s\n"
            "X,1,'=c,-1,0,-5\n");
}

TEST(ExperimentCsv, HasALineForEachSample) {
  const Value image0(imageOf(4294967295U, {-2147483648, 1}, {2, 3}));
  const Value image1(imageOf(8, {4, 5}, {6, 7}));
  EXPECT_EQ(experimentCsv({experimentOf("X", {{"images", Array{image0, image1}}})}),
            "experiment,image,frameID,timestampInMilliseconds,tmonDataInC,sample,dScanI,dScanQ\n"
            "X,1,4294967295,40,36.6,0,-2147483648,2\n"
            "X,1,4294967295,40,36.6,1,1,3\n"
            "X,2,8,40,36.6,0,4,6\n"
            "X,2,8,40,36.6,1,5,7\n");
}

TEST(ExperimentCsv, HasALineForEachMeasurement) {
  DiagnosticRecord record = experimentOf("X, Y", {{"counters", Dictionary{{"I2C", 3}}}});
  record.measurements.set("B", Measurement(0.1, QZDimensionlessUnit::frames()));
  record.measurements.set("A \"one\"",
                          Measurement(std::numeric_limits<double>::quiet_NaN(), QZDimensionlessUnit::events()));
  EXPECT_EQ(experimentCsv({record}),
            "experiment,measurement,value,unit\n"
            "\"X, Y\",B,0.1,frames\n"
            "\"X, Y\",\"A \"\"one\"\"\",nan,events\n");
}

TEST(ExperimentCsv, LeavesCellsEmptyThatALineDoesNotHave) {
  DiagnosticRecord counts = experimentOf("Counts", {});
  counts.measurements.set("Raw", Measurement(3, QZDimensionlessUnit::frames()));
  const DiagnosticRecord images = experimentOf("Images", {{"a", Dictionary{{"s", Array{1, 2}}, {"t", Array{0.5}}}},
                                                          {"note", "text"},
                                                          {"b", Array{Dictionary{{"n", 7}, {"s", Array{true}}}}}});
  EXPECT_EQ(experimentCsv({counts, images}),
            "experiment,image,n,sample,s,t,measurement,value,unit\n"
            "Counts,,,,,,Raw,3,frames\n"
            "Images,1,,0,1,0.5,,,\n"
            "Images,1,,1,2,,,,\n"
            "Images,2,7,0,1,,,,\n");
}

TEST(ExperimentCsv, IsAHeaderAloneWhenNothingWasMeasured) {
  EXPECT_EQ(experimentCsv({}), "experiment,measurement,value,unit\n");
  EXPECT_EQ(experimentCsv({experimentOf("X", {{"images", Array{}}})}), "experiment,measurement,value,unit\n");
}

constexpr const char* kDiagnosticHeader =
    "diagnostic,verdict,result,value,unit,limit,lower,lowerOpen,upper,upperOpen,severity,resultVerdict,"
    "errorStage,errorDomain,errorCode,errorMessage\n";

TEST(DiagnosticCsv, HasALineForEachResult) {
  DiagnosticRecord record = recordOf("D, 1", Verdict::kFail);
  QZMeasuredResult both("Both", Measurement(std::numeric_limits<double>::quiet_NaN(), QZDimensionlessUnit::errors()));
  QZLimit limit("A \"range\"");
  limit.setLowerBound(std::make_shared<const QZBound>(Measurement(0.5, QZDimensionlessUnit::errors()), true));
  limit.setUpperBound(std::make_shared<const QZBound>(Measurement(2, QZDimensionlessUnit::errors()), false));
  both.setLimit(limit);
  record.measuredResults.push_back({both, ResultVerdict::kPass});
  EXPECT_EQ(diagnosticCsv({record, recordOf("D2", Verdict::kPass)}),
            std::string(kDiagnosticHeader) +
                "\"D, 1\",fail,Count,89,frames,Enough,90,0,,,,fail,,,,\n"
                "\"D, 1\",fail,Offset,0.5,events,,,,,,,none,,,,\n"
                "\"D, 1\",fail,Both,nan,errors,\"A \"\"range\"\"\",0.5,1,2,0,,pass,,,,\n"
                "D2,pass,Count,90,frames,Enough,90,0,,,,pass,,,,\n"
                "D2,pass,Offset,0.5,events,,,,,,,none,,,,\n");
}

TEST(DiagnosticCsv, HasTheErrorOnEachLine) {
  DiagnosticRecord record = recordOf("D", Verdict::kError);
  record.errorStage = Stage::kTeardown;
  EXPECT_EQ(diagnosticCsv({record}), std::string(kDiagnosticHeader) +
                                         "D,error,Count,90,frames,Enough,90,0,,,,pass,teardown,Domain,-1,it failed\n"
                                         "D,error,Offset,0.5,events,,,,,,,none,teardown,Domain,-1,it failed\n");
}

TEST(DiagnosticCsv, HasALineForADiagnosticWithoutResults) {
  DiagnosticRecord record = recordOf("D", Verdict::kError);
  record.measuredResults.clear();
  EXPECT_EQ(diagnosticCsv({record}),
            std::string(kDiagnosticHeader) + "D,error,,,,,,,,,,,analyze,Domain,-1,it failed\n");
  EXPECT_EQ(diagnosticCsv({}), kDiagnosticHeader);
}

}  // namespace
}  // namespace quazor
