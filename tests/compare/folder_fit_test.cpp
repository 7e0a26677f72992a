// The fitting of local folders to fingerprint files.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "compare/compare_fixture.h"

namespace trl::testing {
namespace {

TEST_F(CompareTest, FolderFitsTheRelativePathOnlyAtABackslash) {
  // Rows "f_relpath|f_fullpath|folder|expected", an attribute left out where it is "-".
  const char* const rows =
      R"(bin|-|\apps\acme\bin\|\apps\acme\  \bin\|-|\apps\acme\bin\|\apps\acme\ )"
      R"(BIN|-|\apps\acme\bin\|\apps\acme\  |-|\apps\acme\bin\|\apps\acme\bin\ )"
      R"(\|-|\apps\acme\bin\|\apps\acme\bin\  data|-|\apps\acme\bin\|  bin|-|\x\bin|\x\ )"
      R"(lib\plugins|-|\x\lib\plugins\|\x\  bin|-|\bin\|\  bin|-|\appsbin\|  bin|-|bin| )"
      R"(\apps\acme\bin|True|\apps\acme\bin\|\apps\acme\bin\  -|-|\apps\|\apps\ )"
      R"(\apps\acme|True|\apps\acme\bin\|  \apps\acme\bin|true|\apps\acme\bin\|\)";
  for (const std::string& row : Words(rows)) {
    std::vector<std::string> c = Fields(row);
    std::string f = "<f f_name='x'";
    if (c[0] != "-") f += " f_relpath='" + c[0] + "'";
    if (c[1] != "-") f += " f_fullpath='" + c[1] + "'";
    EXPECT_EQ(Compare::FindCommonPath(Parse(f + "/>")->DocumentElement(), c[2]), c[3]) << row;
  }
  // Only the file without f_relpath is reported.
  EXPECT_THAT(TakeReportedEvents(),
              ::testing::ElementsAre(ReportedEvent{94, 1, "Compare", "FindCommonPath",
                                                   "Invalid use of Null", "trlLocator"}));
}

}  // namespace
}  // namespace trl::testing
