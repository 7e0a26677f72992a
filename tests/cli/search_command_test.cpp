#include "search_command.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "command_error.h"
#include "command_test_support.h"
#include "document_files.h"
#include "frame/error_handler.h"
#include "support/temp_tree.h"

namespace trl::cli {
namespace {

// The message of the CommandError that loading `path` raises, "" when it loads.
std::string LoadError(const std::string& path) {
  try {
    LoadDocumentFile(path, "search options");
  } catch (const CommandError& error) {
    EXPECT_EQ(error.ExitCode(), kExitBadInput);
    return error.what();
  }
  return "";
}

TEST(DocumentFilesTest, UnusableInputsSayWhichFileAndWhy) {
  testing::TempTree tree;
  tree.AddFile("broken.xml", "<a>\n  <b></a>");
  tree.AddFile("empty.xml", "");
  tree.AddFile("comment.xml", "<!-- nothing -->");
  tree.AddFile("good.xml", "<a/>");
  struct Case {
    std::string file;
    std::string message;
  } cases[] = {
      {"missing.xml", "cannot read the search options '" + tree.Native("missing.xml") +
                          "': No such file or directory"},
      {"", "cannot read the search options '" + tree.Native("") + "': Is a directory"},
      {"broken.xml", "the search options '" + tree.Native("broken.xml") +
                         "' is not well-formed XML: line 2, column"},
      {"empty.xml", "the search options '" + tree.Native("empty.xml") + "' is not well-formed XML"},
      {"comment.xml", "the search options '" + tree.Native("comment.xml") + "'"},
      {"good.xml", ""},
  };
  for (const Case& c : cases) {
    std::string message = LoadError(tree.Native(c.file));
    EXPECT_EQ(message.substr(0, c.message.size()), c.message) << c.file;
    EXPECT_EQ(message.empty(), c.message.empty()) << c.file;
  }
  if (geteuid() != 0) {
    tree.SetMode("good.xml", 0);
    EXPECT_NE(LoadError(tree.Native("good.xml")).find("Permission denied"), std::string::npos);
  }
}

TEST(DocumentFilesTest, OutputThatCannotBeWrittenFailsTheCommand) {
  try {
    WriteTextOutput("<a/>", "/nonexistent-folder/out.xml");
    FAIL() << "no error";
  } catch (const CommandError& error) {
    EXPECT_EQ(error.ExitCode(), kExitFailed);
    EXPECT_STREQ(error.what(),
                 "cannot write '/nonexistent-folder/out.xml': No such file or directory");
  }
}

// Runs `trllocator search` with `args`; answers the exit code.
int RunSearchCommand(std::vector<std::string> args) {
  return RunCommand(AddSearchCommand, "search", std::move(args));
}

TEST(SearchCommandTest, WritesTheDocumentAndPrintsWhatTheStageReports) {
  testing::TempTree tree;
  tree.AddFolder("App");
  tree.AddFile("App/Main.exe", "x");
  tree.AddFile("options.xml",
               "<o><c c_id='1' c_text='localhost' c_name='localhost' c_local='1'>"
               "<m m_id='1' m_text='' m_name=''>"
               "<d d_id='1' d_text='" +
                   tree.Path("App") +
                   "' d_search='1'><d_search_mask/></d>"
                   "<d d_id='2' d_text='" +
                   tree.Path("Gone") +
                   "' d_search='1'><d_search_mask/></d>"
                   "</m></c></o>");
  ::testing::internal::CaptureStderr();
  int code = RunSearchCommand(
      {"--search-options", tree.Native("options.xml"), "--output", tree.Native("out.xml")});
  std::string printed = ::testing::internal::GetCapturedStderr();
  ReleaseSharedReporter();

  EXPECT_EQ(code, kExitOk);
  EXPECT_EQ(printed,
            "trllocator: warning: Path '" + tree.Path("Gone") + "\\' could not be found\n");
  xml::Document out;
  ASSERT_TRUE(out.LoadXml(ReadFile(tree.Native("out.xml"))));
  EXPECT_EQ(out.AsNode().CountNodes("//f[@f_text='Main.exe']"), 1u);
  EXPECT_EQ(out.AsNode().CountNodes("//event"), 1u);
}

TEST(SearchCommandTest, BadShareMappingIsRejectedBeforeTheRun) {
  testing::TempTree tree;
  tree.AddFile("options.xml", "<o/>");
  try {
    RunSearchCommand({"--search-options", tree.Native("options.xml"), "--share", "host=dir",
                      "--output", tree.Native("out.xml")});
    FAIL() << "no error";
  } catch (const CommandError& error) {
    EXPECT_EQ(error.ExitCode(), kExitBadInput);
    EXPECT_NE(std::string(error.what()).find("'host=dir'"), std::string::npos);
  }
  EXPECT_FALSE(std::ifstream(tree.Native("out.xml")).good());
}

}  // namespace
}  // namespace trl::cli
