#include <fmt/format.h>
#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

#include "command_error.h"
#include "fingerprint_author.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/temp_tree.h"

namespace trl::cli {
namespace {

using testing::Parse;
using testing::ValuesOf;
using Strings = std::vector<std::string>;

class FingerprintAuthorTest : public ::testing::Test {
 protected:
  ReferenceVersion Version(std::string appId, std::string versionId) const {
    return {tree_.Path("app"), appId, "Tool", std::nullopt, versionId, "1.0", "3"};
  }
  void Add(xml::Document& database, const ReferenceVersion& version) {
    AddReferenceVersion(database, version, *fileSystem_);
  }

  testing::TempTree tree_;
  std::unique_ptr<fs::FileSystem> fileSystem_ = fs::CreatePosixFileSystem({});
};

// Contents are RFC 1321 test inputs, so the expected digests are the published ones.
TEST_F(FingerprintAuthorTest, DescribesEveryFileWithItsFolderWeightSizeAndDigest) {
  // Rows: path below the installation, content, f_relpath, f_weight (2 for documentation, 3 for
  // the rest) and digest; in the expected order: a folder's files by name (byte order), then its
  // subfolders.
  const std::vector<std::array<std::string, 5>> cases = {
      {"ChangeLog", "abc", "", "2", "900150983cd24fb0d6963f7d28e17f72"},
      {"README", "", "", "2", "d41d8cd98f00b204e9800998ecf8427e"},
      {"md", "a", "", "3", "0cc175b9c0f1b6a831c399e269772661"},
      {"my-readme", "abc", "", "3", "900150983cd24fb0d6963f7d28e17f72"},
      {"tool", "", "", "3", "d41d8cd98f00b204e9800998ecf8427e"},
      {"lib/License-MIT", "a", "lib", "2", "0cc175b9c0f1b6a831c399e269772661"},
      {"lib/main.js", "message digest", "lib", "3", "f96b697d7cb7938d525a2f31aaf161d0"},
      {"lib/sub/.hidden", "abc", "lib\\sub", "3", "900150983cd24fb0d6963f7d28e17f72"},
      {"lib/sub/notes.MD", "", "lib\\sub", "2", "d41d8cd98f00b204e9800998ecf8427e"},
  };
  tree_.AddFolder("app/lib/sub");
  tree_.AddFolder("app/empty");
  for (auto it = cases.rbegin(); it != cases.rend(); ++it)
    tree_.AddFile("app/" + (*it)[0], (*it)[1]);
  ReferenceVersion version = Version("1", "10");
  version.docWeight = 2;
  version.fileWeight = 3;
  xml::Document database;
  Add(database, version);

  std::vector<xml::Node> files = database.AsNode().SelectNodes("/trl_fingerprint/a/v/f");
  ASSERT_EQ(files.size(), cases.size());
  for (size_t i = 0; i < cases.size(); ++i) {
    const auto& [path, content, relpath, weight, md5] = cases[i];
    EXPECT_EQ(
        files[i].Xml(),
        fmt::format(R"(<f f_id="{}" f_name="{}" f_relpath="{}" f_weight="{}"><p p_type="2" )"
                    R"(p_weight="1" p_value="{}"/><p p_type="3" p_weight="2" p_value="{}"/></f>)",
                    i + 1, path.substr(path.rfind('/') + 1), relpath, weight, content.size(), md5))
        << path;
  }
  EXPECT_EQ(database.DocumentElement().SelectSingleNode("a/v").Attributes(),
            (std::vector<std::pair<std::string, std::string>>{
                {"v_id", "10"}, {"v_name", "1.0"}, {"v_seq", "3"}}));
}

TEST_F(FingerprintAuthorTest, VersionsGoToTheApplicationWithTheSameIdAndATakenIdNeedsReplace) {
  tree_.AddFolder("app");
  tree_.AddFile("app/tool", "new");
  const std::string before = R"(<db><a a_id="1" a_name="Other"/><a a_id="7" a_name="Old name">)"
                             R"(<v v_id="1"/><v v_id="2" v_name="old"/><v v_id="3"/></a></db>)";
  auto database = Parse(before);
  EXPECT_THROW(Add(*database, Version("7", "2")), CommandError);
  EXPECT_EQ(database->Xml(), before);

  ReferenceVersion again = Version("7", "2");
  again.replace = true;
  Add(*database, again);
  ReferenceVersion added = Version("7", "4");
  added.parentId = "1";
  Add(*database, added);
  ReferenceVersion another = Version("8", "1");
  another.parentId = "7";
  another.appName.reset();
  EXPECT_THROW(Add(*database, another), CommandError);  // a new application needs its name
  another.appName = "Tool";
  Add(*database, another);

  EXPECT_EQ(ValuesOf(*database, "/db/a", "a_name"), (Strings{"Other", "Old name", "Tool"}));
  EXPECT_EQ(ValuesOf(*database, "/db/a", "a_parent"), (Strings{"<absent>", "<absent>", "7"}));
  EXPECT_EQ(ValuesOf(*database, "/db/a[@a_id='7']/v", "v_id"), (Strings{"1", "2", "3", "4"}));
  EXPECT_EQ(ValuesOf(*database, "/db/a/v[@v_id='2']/f/p[@p_type='2']", "p_value"), Strings{"3"});
}

}  // namespace
}  // namespace trl::cli
