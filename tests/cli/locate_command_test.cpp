#include "locate_command.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <string>
#include <vector>

#include "command_error.h"
#include "command_test_support.h"
#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "support/temp_tree.h"
#include "trl/xml.h"

namespace trl::cli {
namespace {

using ::testing::ContainsRegex;
using ::testing::HasSubstr;

class LocateCommandTest : public ::testing::Test {
 protected:
  void SetUp() override {
    tree_.AddFolder("Apps/Tool");
    tree_.AddFile("Apps/Tool/tool.exe", "one");
    tree_.AddFile("fingerprint.xml",
                  "<fp><a a_id='1' a_name='Tool'>"
                  "<v v_id='1' v_name='1.0' v_seq='1'><f f_id='1' f_name='tool.exe' f_relpath='' "
                  "f_weight='1'><p p_type='2' p_weight='1' p_value='3'/></f></v>"
                  "<v v_id='2' v_name='2.0' v_seq='2'><f f_id='1' f_name='tool.exe' f_relpath='' "
                  "f_weight='1'><p p_type='2' p_weight='1' p_value='5'/></f></v></a></fp>");
    tree_.AddFile("search.xml",
                  "<s><c c_id='1' c_text='localhost' c_name='localhost' c_local='1'><m m_id='1' "
                  "m_text='' m_name='' m_type='3'><d d_id='1' d_text='" +
                      tree_.Path("Apps") +
                      "' d_search='1' d_search_recurse='1'><d_search_mask/></d></m></c></s>");
    tree_.AddFile("user.xml", kEmptyUserData);
  }
  void TearDown() override { ReleaseSharedReporter(); }

  int Locate(std::vector<std::string> more) {
    std::vector<std::string> args{"--search-options", tree_.Native("search.xml"),
                                  "--fingerprint",    tree_.Native("fingerprint.xml"),
                                  "--user-data",      tree_.Native("user.xml")};
    args.insert(args.end(), more.begin(), more.end());
    return RunCommand(AddLocateCommand, "locate", args);
  }

  static constexpr const char* kEmptyUserData = "<trl_applicationdata/>";
  testing::TempTree tree_;
};

TEST_F(LocateCommandTest, SaveReplacesTheUserDataAndKeepsTheOldOneAsBackup) {
  ASSERT_EQ(Locate({"--save", "--output", tree_.Native("out.xml")}), kExitOk);
  xml::Document saved;
  ASSERT_TRUE(saved.LoadXml(ReadFile(tree_.Native("user.xml"))));
  EXPECT_EQ(saved.AsNode().CountNodes("/trl_applicationdata/c/m/d/a[@v_name='1.0']"), 1u);
  // The user data holds the inventory only; the run's events go to the output.
  EXPECT_EQ(saved.AsNode().CountNodes("//events"), 0u);
  EXPECT_THAT(ReadFile(tree_.Native("out.xml")), HasSubstr("</events></trl_applicationdata>"));
  EXPECT_EQ(ReadFile(tree_.Native("user.xml.bak")), kEmptyUserData);
  // No temporary file is left beside them: the Apps folder, three inputs, out.xml and the backup.
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(tree_.Root()), {}), 6);
}

TEST_F(LocateCommandTest, CancelledRunNeverTouchesTheUserData) {
  // Ctrl-C arrives on the first pass of the event loop, before the search has begun.
  Timer interrupt;
  interrupt.Tick([&interrupt] {
    interrupt.Enabled(false);
    std::raise(SIGINT);
  });
  interrupt.Interval(1);
  interrupt.Enabled(true);
  int code = Locate({"--save", "--output", tree_.Native("out.xml")});
  EXPECT_EQ(code, kExitInterrupted);
  EXPECT_EQ(ReadFile(tree_.Native("user.xml")), kEmptyUserData);
  EXPECT_FALSE(std::filesystem::exists(tree_.Native("user.xml.bak")));
  // What the search had when it stopped is written, marked as cancelled.
  EXPECT_THAT(ReadFile(tree_.Native("out.xml")), HasSubstr("cancelled=\"1\""));
}

TEST_F(LocateCommandTest, TableTellsWhatChangedSinceTheLastRun) {
  ASSERT_EQ(Locate({"--save", "--format", "table", "--output", tree_.Native("first.txt")}),
            kExitOk);
  EXPECT_THAT(ReadFile(tree_.Native("first.txt")), ContainsRegex("Tool +1\\.0 +new\n"));

  tree_.AddFile("Apps/Tool/tool.exe", "three");
  ASSERT_EQ(Locate({"--save", "--format", "table", "--output", tree_.Native("second.txt")}),
            kExitOk);
  std::string second = ReadFile(tree_.Native("second.txt"));
  EXPECT_THAT(second, ContainsRegex("Tool +2\\.0 +updated from 1\\.0\n"));
  EXPECT_THAT(second, HasSubstr("1 application listed, 1 changed since the last run"));
}

}  // namespace
}  // namespace trl::cli
