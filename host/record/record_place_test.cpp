#include "host/record/record_place.h"

#include "host/error/exit_code.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_refusals.h"
#include "host/text/timestamp.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(RecordPlaceTest, IsAFolderIfItEndsInASlashOrExists) {
  const TestDirectory directory;
  EXPECT_TRUE(isFolderOfRecords(directory.path()));
  EXPECT_TRUE(isFolderOfRecords(directory.path() / "new" / ""));
  EXPECT_TRUE(isFolderOfRecords("."));
  EXPECT_FALSE(isFolderOfRecords(directory.path() / "new"));
  EXPECT_FALSE(isFolderOfRecords(directory.write("file", "")));
  EXPECT_FALSE(isFolderOfRecords(""));
}

TEST(RecordPlaceTest, NamesARecordByDateAndId) {
  RunStarted began;
  began.date = *parseTimestamp("2026-11-21T01:08:09.987654321Z");
  began.id = "00112233445566778899aabbccddeeff";
  EXPECT_EQ(recordNameOf(began), "20261121T010809Z-00112233445566778899aabbccddeeff.jsonl");
}

TEST(RecordPlaceTest, MakesAFolder) {
  const TestDirectory directory;
  const std::filesystem::path folder = directory.path() / "a" / "b" / "";
  makeFolderOfRecords(folder);
  makeFolderOfRecords(folder);
  EXPECT_TRUE(std::filesystem::is_directory(folder));
  const std::filesystem::path file = directory.write("file", "");
  const std::string refusal = refusalOf(ExitCode::kCannotWrite, [&] { makeFolderOfRecords(file / "x"); });
  EXPECT_THAT(refusal, testing::StartsWith("the folder '" + (file / "x").string() + "' of records cannot be made: "));
}

}  // namespace
}  // namespace quazor
