// The fitting of local folders to fingerprint files.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "compare/compare_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;

using FindCommonPathTest = CompareTest;

TEST_F(FindCommonPathTest, FolderFitsTheRelativePathOnlyAtABackslash) {
  struct Case {
    const char* relpath;  // nullptr: absent
    const char* fullpath;
    const char* folder;
    const char* expected;
  } cases[] = {
      {"bin", nullptr, R"(\apps\acme\bin\)", R"(\apps\acme\)"},
      {R"(\bin\)", nullptr, R"(\apps\acme\bin\)", R"(\apps\acme\)"},
      {"BIN", nullptr, R"(\apps\acme\bin\)", R"(\apps\acme\)"},
      {"", nullptr, R"(\apps\acme\bin\)", R"(\apps\acme\bin\)"},
      {R"(\)", nullptr, R"(\apps\acme\bin\)", R"(\apps\acme\bin\)"},
      {"data", nullptr, R"(\apps\acme\bin\)", ""},
      {R"(lib\plugins)", nullptr, R"(\x\lib\plugins\)", R"(\x\)"},
      {"bin", nullptr, R"(\x\bin)", R"(\x\)"},
      {"bin", nullptr, R"(\bin\)", R"(\)"},
      {"bin", nullptr, R"(\appsbin\)", ""},
      {"bin", nullptr, "bin", ""},
      {R"(\apps\acme\bin)", "True", R"(\apps\acme\bin\)", R"(\apps\acme\bin\)"},
      {R"(\apps\acme)", "True", R"(\apps\acme\bin\)", ""},
      {R"(\apps\acme\bin)", "true", R"(\apps\acme\bin\)", R"(\)"},
      {nullptr, nullptr, R"(\apps\)", R"(\apps\)"},
  };
  for (const Case& c : cases) {
    std::string f = "<f f_name='x'";
    if (c.relpath) f += std::string(" f_relpath='") + c.relpath + "'";
    if (c.fullpath) f += std::string(" f_fullpath='") + c.fullpath + "'";
    auto document = Parse(f + "/>");
    EXPECT_EQ(Compare::FindCommonPath(document->DocumentElement(), c.folder), c.expected)
        << (c.relpath ? c.relpath : "(absent)") << " in " << c.folder;
  }
  // Only the file without f_relpath is reported.
  EXPECT_THAT(TakeReportedEvents(),
              ElementsAre(ReportedEvent{94, 1, "Compare", "FindCommonPath", "Invalid use of Null",
                                        "trlLocator"}));
}

}  // namespace
}  // namespace trl::testing
