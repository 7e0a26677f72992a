#include "filter_command.h"

#include <gtest/gtest.h>

#include <string>

#include "command_error.h"
#include "command_test_support.h"
#include "filter_names.h"
#include "frame/error_handler.h"
#include "support/temp_tree.h"
#include "trl/xml.h"

namespace trl::cli {
namespace {

TEST(FilterNamesTest, NumbersAndNamesGiveTheOptionBits) {
  struct Case {
    const char* text;
    int16_t options;
  } cases[] = {
      {"0", 0},
      {"63", 63},
      {"007", 7},
      {"low-weights", 1},
      {"flag-unmanaged", 32},
      {"missing-files,low-file-count,duplicate-matches,flag-unknowns", 30},
      {"low-weights,low-weights", 1},
      {"all", 63},
  };
  for (const Case& c : cases) EXPECT_EQ(ParseFilterOptions(c.text), c.options) << c.text;
}

TEST(FilterNamesTest, AnythingElseIsBadInput) {
  for (const char* text : {"", "64", "-1", "1.5", "3x", "Low-Weights", "low-weights,", ",all",
                           "low-weights missing-files", "99999999999999999999"}) {
    try {
      ParseFilterOptions(text);
      ADD_FAILURE() << "accepted '" << text << "'";
    } catch (const CommandError& error) {
      EXPECT_EQ(error.ExitCode(), kExitBadInput);
      EXPECT_EQ(std::string(error.what()).find("--filter '" + std::string(text) + "'"), 0u);
    }
  }
}

TEST(FilterCommandTest, FiltersTheMatchesAndWritesThem) {
  testing::TempTree tree;
  tree.AddFile("matches.xml",
               "<trl_applicationdata><c><m><d><a a_id='1'>"
               "<v v_id='1' v_name='One' v_seq='1' v_max='3' v_act='3' f_max='2' f_act='1'/>"
               "<v v_id='2' v_name='Two' v_seq='2' v_max='3' v_act='1' f_max='2' f_act='2'/>"
               "</a></d></m></c></trl_applicationdata>");
  int code = RunCommand(AddFilterCommand, "filter",
                        {"--filter", "low-weights,flag-unmanaged", "--matches",
                         tree.Native("matches.xml"), "--output", tree.Native("out.xml")});
  ReleaseSharedReporter();
  EXPECT_EQ(code, kExitOk);
  xml::Document out;
  ASSERT_TRUE(out.LoadXml(ReadFile(tree.Native("out.xml"))));
  xml::Node a = out.AsNode().SelectSingleNode("/trl_applicationdata/c/m/d/a");
  EXPECT_EQ(a.GetAttribute("v_name"), "One");
  EXPECT_EQ(a.GetAttribute("a_manage"), "0");
  EXPECT_EQ(out.AsNode().CountNodes("//v"), 1u);
}

}  // namespace
}  // namespace trl::cli
