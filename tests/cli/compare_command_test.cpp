#include "compare_command.h"

#include <gtest/gtest.h>

#include <string>

#include "command_error.h"
#include "command_test_support.h"
#include "frame/error_handler.h"
#include "support/temp_tree.h"
#include "trl/xml.h"

namespace trl::cli {
namespace {

TEST(CompareCommandTest, MatchesThroughAShareAndWritesTheMatches) {
  testing::TempTree tree;
  tree.AddFolder("share/Tool");
  tree.AddFile("share/Tool/tool.exe", "x");
  tree.AddFile("local.xml",
               "<trl_applicationdata><c c_text='server' c_name='server'><m m_text='apps' "
               "m_name='apps'><d d_text='\\Tool\\' d_name='\\tool\\'><f f_text='Tool.exe' "
               "f_name='tool.exe'/></d></m></c></trl_applicationdata>");
  tree.AddFile("fingerprint.xml",
               "<fp><a a_id='1'><v v_id='1' v_seq='1'><f f_id='1' f_name='tool.exe' "
               "f_weight='1'><p p_type='2' p_weight='1' p_value='1'/></f></v></a></fp>");
  int code = RunCommand(
      AddCompareCommand, "compare",
      {"--local-files", tree.Native("local.xml"), "--fingerprint", tree.Native("fingerprint.xml"),
       "--share", "\\\\server\\apps=" + tree.Native("share"), "--output", tree.Native("out.xml")});
  ReleaseSharedReporter();
  EXPECT_EQ(code, kExitOk);
  xml::Document out;
  ASSERT_TRUE(out.LoadXml(ReadFile(tree.Native("out.xml"))));
  EXPECT_EQ(out.AsNode().CountNodes("/trl_applicationdata/c/m/d/a/v[@v_act='1']"), 1u);
}

TEST(CompareCommandTest, MissingFingerprintIsBadInput) {
  testing::TempTree tree;
  tree.AddFile("local.xml", "<trl_applicationdata/>");
  try {
    RunCommand(
        AddCompareCommand, "compare",
        {"--local-files", tree.Native("local.xml"), "--fingerprint", tree.Native("none.xml")});
    FAIL() << "no error";
  } catch (const CommandError& error) {
    EXPECT_EQ(error.ExitCode(), kExitBadInput);
    EXPECT_EQ(std::string(error.what()).find("cannot read the fingerprint database"), 0u);
  }
}

}  // namespace
}  // namespace trl::cli
