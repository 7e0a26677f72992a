// An index told which names will be asked for keeps only files that may bear them, and answers
// for those exactly as an index of every file does.
#include "compare/local_file_index.h"

#include <gtest/gtest.h>

#include <string>
#include <tuple>
#include <vector>

namespace trl::testing {
namespace {

// A drive, then folders ("+" and the folder as written) and files (name and encoded name).
const std::vector<std::tuple<std::string, std::string>> kListing = {
    {"+\\A\\", ""},
    {"setup.exe", "setup.exe"},
    {"README", "readme"},
    {"+\\Empty\\", ""},
    {"+\\B\\", ""},
    {"other.dll", "other.dll"},
    {"Setup.EXE", "setup.exe%~Setup.EXE"},
    {"readme", "readme"},
    {"+\\C\\", ""},
    {"SETUP.exe", "SETUP.exe"},
};

void Fill(LocalFileIndex& index) {
  index.AddDrive("host", "host", true, "/mnt", "/mnt");
  for (const auto& [name, encoded] : kListing) {
    if (name.starts_with('+')) {
      index.AddFolder(name.substr(1), name.substr(1));
    } else {
      index.AddFile(name, encoded);
    }
  }
}

// What Find gives for `key`: each record's folder as written and file name.
std::vector<std::string> Found(const LocalFileIndex& index, const std::string& key) {
  std::vector<std::string> found;
  for (LocalFileRecord record : index.Find(key)) {
    found.push_back(record.ExactFolder() + std::string(record.Filename()) + " folder " +
                    std::to_string(record.FolderIndex()) + " drive " +
                    std::to_string(record.DriveIndex()));
  }
  return found;
}

TEST(LocalFileIndexTest, KeptNamesAreFoundAsInAnIndexOfEveryFileAndOthersAreNotKept) {
  LocalFileIndex every, kept;
  kept.KeepOnly({"SETUP.EXE", "readme"});
  Fill(every);
  Fill(kept);
  for (std::string key : {"setup.exe", "Setup.Exe", "readme"}) {
    SCOPED_TRACE(key);
    EXPECT_TRUE(kept.Covers(key));
    EXPECT_EQ(Found(kept, key), Found(every, key));
  }
  // A folder is one entry for all its records, and one without a record kept is none.
  EXPECT_EQ(Found(kept, "readme"), (std::vector<std::string>{"\\A\\README folder 0 drive 0",
                                                             "\\B\\readme folder 1 drive 0"}));
  EXPECT_EQ(Found(kept, "setup.exe").size(), 3u);
  EXPECT_EQ(kept.Size(), 5u);  // other.dll is not kept
  EXPECT_EQ(Found(every, "other.dll").size(), 1u);
  EXPECT_TRUE(every.Covers("other.dll"));
  // Two bits of a thousand per name: a name not kept is almost never covered.
  int covered = 0;
  for (int i = 0; i < 200; ++i) covered += kept.Covers("name" + std::to_string(i) + ".bin");
  EXPECT_LT(covered, 10);
}

}  // namespace
}  // namespace trl::testing
