// The local-file index and the fitting of local folders to fingerprint files.
#include "compare/local_file_index.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "compare/compare_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

struct Seen {
  int32_t id;
  std::string folder, filename, encoded, path;
  bool operator==(const Seen&) const = default;
};

std::vector<Seen> Lookup(const LocalFileIndex& index, std::string_view key) {
  std::vector<Seen> seen;
  for (LocalFileRecord r : index.Find(key)) {
    seen.push_back({r.FileID(), r.Folder(), std::string(r.Filename()),
                    std::string(r.EncodedFilename()), r.FullPath()});
  }
  return seen;
}

TEST(LocalFileIndexTest, LookupsIgnoreCaseAndKeepTheOrderRecordsWereAdded) {
  LocalFileIndex index;
  index.AddDrive("Here", "here", true, "/mnt/d", "/mnt/d");
  index.AddFolder("\\a\\", "\\a\\");
  index.AddFile(1, "acme.exe", "acme.exe");
  index.AddFile(2, "it's.txt", "IT%27S.TXT");
  index.AddDrive("Server", "server", false, "apps", "apps");
  index.AddFolder("\\b\\", "\\b\\");
  index.AddFile(3, "readme", "readme");
  index.AddFile(4, "acme.exe", "ACME.EXE");

  EXPECT_THAT(
      Lookup(index, "Acme.EXE"),
      ElementsAre(Seen{1, "\\a\\", "acme.exe", "acme.exe", "/mnt/d\\a\\acme.exe"},
                  Seen{4, "\\b\\", "acme.exe", "acme.exe", "\\\\Server\\apps\\b\\acme.exe"}));
  EXPECT_THAT(Lookup(index, "it%27s.txt"),
              ElementsAre(Seen{2, "\\a\\", "it's.txt", "it%27s.txt", "/mnt/d\\a\\it's.txt"}));
  EXPECT_THAT(Lookup(index, "missing"), IsEmpty());
  EXPECT_THAT(Lookup(index, "readme"),
              ElementsAre(Seen{3, "\\b\\", "readme", "readme", "\\\\Server\\apps\\b\\readme"}));
  EXPECT_EQ(index.Find("acme.exe").size(), 2u);
  EXPECT_EQ(index.Size(), 4u);
  EXPECT_EQ(index.At(3).Machine(), "Server");
  EXPECT_FALSE(index.At(3).LocalMachine());
  EXPECT_EQ(index.At(0).EncodedDrive(), "/mnt/d");
}

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
