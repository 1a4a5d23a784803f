#include "host/report/page/plot_library.h"

#include "host/testing/test_directory.h"

#include <filesystem>
#include <string>

#include <gtest/gtest.h>

namespace quazor {
namespace {

namespace fs = std::filesystem;

fs::path folderWith(const TestDirectory& directory, const std::string& name, const std::string& script) {
  directory.write(name + "/javascript/dygraphs/dygraph.min.js", script);
  directory.write(name + "/javascript/dygraphs/dygraph.min.css", "style");
  directory.write(name + "/doc/libjs-dygraphs/copyright", "licence");
  return directory.path() / name;
}

TEST(PlotLibrary, IsThatOfTheFirstFolderThatHasIt) {
  const TestDirectory directory;
  const fs::path one = folderWith(directory, "one", "1");
  const fs::path two = folderWith(directory, "two", "2");
  EXPECT_EQ(plotLibraryIn({directory.path(), two, one})->script, "2");
  EXPECT_EQ(plotLibraryIn({one, two})->style, "style");
  EXPECT_FALSE(plotLibraryIn({directory.path()}));
  EXPECT_FALSE(plotLibraryIn({}));
}

TEST(PlotLibrary, HasItsLicence) {
  const TestDirectory directory;
  const fs::path folder = folderWith(directory, "one", "1");
  EXPECT_EQ(plotLibraryIn({folder})->licence, "licence");
  fs::remove(folder / "doc/libjs-dygraphs/copyright");
  EXPECT_FALSE(plotLibraryIn({folder}));
}

TEST(PlotLibrary, RefusesWhatWouldEndTheScript) {
  const TestDirectory directory;
  for (const char* const script : {"", "a</SCRIPT>b", "a</style>b", "a<!--b"}) {
    EXPECT_FALSE(plotLibraryIn({folderWith(directory, "bad", script)})) << script;
  }
  EXPECT_TRUE(plotLibraryIn({folderWith(directory, "good", "'</div>'")}));
}

}  // namespace
}  // namespace quazor
