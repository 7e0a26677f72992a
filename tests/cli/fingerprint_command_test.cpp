#include "fingerprint_command.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "command_error.h"
#include "command_test_support.h"
#include "frame/error_handler.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/temp_tree.h"
#include "trl/compare.h"
#include "trl/search.h"

namespace trl::cli {
namespace {

using testing::Parse;
using testing::ValuesOf;

std::vector<std::string> AddArgs(const testing::TempTree& tree, std::string_view folder,
                                 std::string_view versionId) {
  return {"add",
          "--folder",
          tree.Native(folder),
          "--app-id",
          "4",
          "--app-name",
          "Tool",
          "--version-id",
          std::string(versionId),
          "--version-name",
          "v" + std::string(versionId),
          "--seq",
          "1",
          "--database",
          tree.Native("db/fingerprint.xml")};
}

std::vector<std::string> FilesIn(const std::string& folder) {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) {
    names.push_back(entry.path().filename());
  }
  return names;
}

TEST(FingerprintCommandTest, CreatesThenRewritesTheDatabaseAndRefusesBadInput) {
  testing::TempTree tree;
  tree.AddFolder("one/bin");
  tree.AddFile("one/bin/tool", "1");
  tree.AddFolder("db");
  EXPECT_EQ(RunCommand(AddFingerprintCommand, "fingerprint", AddArgs(tree, "one", "1")), kExitOk);
  EXPECT_EQ(RunCommand(AddFingerprintCommand, "fingerprint", AddArgs(tree, "one", "2")), kExitOk);
  const std::string written = ReadFile(tree.Native("db/fingerprint.xml"));
  auto database = Parse(written);
  EXPECT_EQ(ValuesOf(*database, "/trl_fingerprint/a[@a_id='4']/v", "v_id"),
            (std::vector<std::string>{"1", "2"}));
  EXPECT_EQ(ValuesOf(*database, "//f", "f_relpath"), (std::vector<std::string>{"bin", "bin"}));

  struct Case {
    std::vector<std::string> args;
    std::string message;
  };
  std::vector<Case> refused = {
      {AddArgs(tree, "one", "2"), "application 4 already has a version 2"},
      {AddArgs(tree, "missing", "3"), "the folder '" + tree.Native("missing") + "' does not"},
  };
  for (const Case& c : refused) {
    try {
      RunCommand(AddFingerprintCommand, "fingerprint", c.args);
      ADD_FAILURE() << "no error for " << c.message;
    } catch (const CommandError& error) {
      EXPECT_EQ(error.ExitCode(), kExitBadInput);
      EXPECT_EQ(std::string(error.what()).find(c.message), 0u) << error.what();
    }
  }
  EXPECT_THROW(RunCommand(AddFingerprintCommand, "fingerprint",
                          {"add", "--folder", tree.Native("one"), "--app-id", "x", "--version-id",
                           "1", "--version-name", "1", "--seq", "1", "--database", "d.xml"}),
               CLI::ValidationError);

  tree.AddFile("db/fingerprint.xml", "<trl_fingerprint><a>");
  try {
    RunCommand(AddFingerprintCommand, "fingerprint", AddArgs(tree, "one", "3"));
    ADD_FAILURE() << "an ill-formed database was taken";
  } catch (const CommandError& error) {
    EXPECT_EQ(error.ExitCode(), kExitBadInput);
  }
  EXPECT_EQ(ReadFile(tree.Native("db/fingerprint.xml")), "<trl_fingerprint><a>");
  EXPECT_EQ(FilesIn(tree.Native("db")), std::vector<std::string>{"fingerprint.xml"});
}

// An installation described by the command is found where it lies, at full score; a changed file
// costs its weight.
TEST(FingerprintCommandTest, AnAuthoredInstallationIsFoundAndFullyMatched) {
  testing::TempTree tree;
  tree.AddFolder("apps/Tool/lib/.cache");
  tree.AddFolder("db");
  tree.AddFile("apps/Tool/tool.bin", "binary");
  tree.AddFile("apps/Tool/README.md", "read me");
  tree.AddFile("apps/Tool/lib/core.js", "core");
  tree.AddFile("apps/Tool/lib/.cache/state", "state");
  ASSERT_EQ(RunCommand(AddFingerprintCommand, "fingerprint", AddArgs(tree, "apps/Tool", "9")),
            kExitOk);
  auto fingerprint = Parse(ReadFile(tree.Native("db/fingerprint.xml")));
  // A copy elsewhere that lacks a file does not count.
  tree.AddFolder("other/Tool");
  tree.AddFile("other/Tool/tool.bin", "binary");

  const std::string options =
      R"(<o><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" )"
      R"(m_name=""><d d_id="1" d_text=")" +
      tree.Path() +
      R"(" d_search="1" d_search_d_attributes="35" d_search_f_attributes="35"><d_search_mask/>)"
      R"(</d></m></c></o>)";
  auto locate = [&] {
    Search search(fs::CreatePosixFileSystem({}));
    search.Asynchronous(false);
    auto localFiles = Parse(search.Start(Parse(options), nullptr, fingerprint));
    Compare compare(fs::CreatePosixFileSystem({}));
    compare.Asynchronous(false);
    return Parse(compare.Start(nullptr, localFiles, fingerprint));
  };

  auto matches = locate();
  const std::string version = "/trl_applicationdata/c/m/d/a[@a_id='4']/v[@v_id='9']";
  EXPECT_EQ(ValuesOf(*matches, "//d", "d_text"),
            std::vector<std::string>{testing::Lower(tree.Path("apps/Tool")) + "\\"});
  EXPECT_EQ(ValuesOf(*matches, version, "v_act"), std::vector<std::string>{"3"});
  EXPECT_EQ(ValuesOf(*matches, version, "v_max"), std::vector<std::string>{"3"});
  EXPECT_EQ(ValuesOf(*matches, version, "f_act"), std::vector<std::string>{"4"});

  std::filesystem::remove(tree.Native("apps/Tool/README.md"));
  tree.AddFile("apps/Tool/lib/core.js", "CORE");
  matches = locate();
  EXPECT_EQ(ValuesOf(*matches, version, "v_act"), std::vector<std::string>{"2"});
  EXPECT_EQ(ValuesOf(*matches, version, "f_act"), std::vector<std::string>{"3"});
  ReleaseSharedReporter();
}

}  // namespace
}  // namespace trl::cli
