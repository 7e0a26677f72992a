#include "merge_command.h"

#include <gtest/gtest.h>

#include <string>

#include "command_error.h"
#include "command_test_support.h"
#include "frame/error_handler.h"
#include "support/temp_tree.h"
#include "trl/xml.h"

namespace trl::cli {
namespace {

constexpr const char* kPlace =
    "<c c_id='1' c_text='Host' c_name='host'><m m_id='1' m_text='C:' m_name='c:'><d d_id='1' "
    "d_text='\\App\\' d_name='\\app\\'>";

TEST(MergeCommandTest, MergesTheNewResultsIntoTheUserData) {
  testing::TempTree tree;
  tree.AddFile("options.xml",
               "<o><c c_name='host'><m m_name='c:'><d d_name='\\app\\'><a a_id='8' "
               "a_manage='1'/></d></m></c></o>");
  tree.AddFile("user.xml", std::string("<trl_applicationdata>") + kPlace +
                               "<a a_id='7' a_manage='0' v_id='1'><v v_id='1'/></a>"
                               "<a a_id='8' a_name='Gone' v_id='1'/></d></m></c>"
                               "</trl_applicationdata>");
  tree.AddFile("new.xml", std::string("<trl_applicationdata>") + kPlace +
                              "<a a_id='7' a_name='Kept' v_id='2'><v v_id='2'/></a></d></m></c>"
                              "</trl_applicationdata>");
  int code = RunCommand(
      AddMergeCommand, "merge",
      {"--search-options", tree.Native("options.xml"), "--user-data", tree.Native("user.xml"),
       "--new-results", tree.Native("new.xml"), "--output", tree.Native("out.xml")});
  ReleaseSharedReporter();
  EXPECT_EQ(code, kExitOk);
  xml::Document out;
  ASSERT_TRUE(out.LoadXml(ReadFile(tree.Native("out.xml"))));
  EXPECT_EQ(out.AsNode().CountNodes("//d/a[@a_id='7'][@a_manage='0']/v_history/v[@v_id='1']"), 1u);
  EXPECT_EQ(out.AsNode().CountNodes("/trl_applicationdata/a_missing/a[@a_id='8']"), 1u);
}

TEST(MergeCommandTest, MissingNewResultsIsBadInput) {
  testing::TempTree tree;
  tree.AddFile("doc.xml", "<trl_applicationdata/>");
  try {
    RunCommand(AddMergeCommand, "merge",
               {"--search-options", tree.Native("doc.xml"), "--user-data", tree.Native("doc.xml"),
                "--new-results", tree.Native("none.xml")});
    FAIL() << "no error";
  } catch (const CommandError& error) {
    EXPECT_EQ(error.ExitCode(), kExitBadInput);
    EXPECT_EQ(std::string(error.what()).find("cannot read the new results"), 0u);
  }
}

}  // namespace
}  // namespace trl::cli
