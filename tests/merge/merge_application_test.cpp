// The entry a version change adds to an application's history. (What an application found again
// carries over is checked against an oracle in merge_property_test.)
#include <gtest/gtest.h>

#include <regex>

#include "merge/merge_fixture.h"

namespace trl::testing {
namespace {

TEST(MergeHistoryTest, TheAddedEntryIsTheOldFirstVersionStampedNow) {
  auto old = Parse(
      Results(Place("Host", "C:", "\\App\\",
                    "<a a_id='7' v_id='12'><v v_id='12' v_name='1.2'><f f_id='1'/></v></a>")));
  auto fresh =
      Parse(Results(Place("Host", "C:", "\\App\\", "<a a_id='7' a_name='App' v_id='15'/>")));
  MergeNow(Parse("<o/>"), nullptr, old, fresh);
  auto entries = old->AsNode().SelectNodes("//a/v_history/v");
  ASSERT_EQ(entries.size(), 1u);
  auto attributes = entries[0].Attributes();
  ASSERT_EQ(attributes.size(), 4u);
  EXPECT_EQ(attributes[1], (std::pair<std::string, std::string>{"v_name", "1.2"}));
  EXPECT_EQ(attributes[2].first, "v_updated");
  EXPECT_TRUE(
      std::regex_match(attributes[2].second, std::regex(R"(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d)")));
  EXPECT_EQ(attributes[3], (std::pair<std::string, std::string>{"v_update_q", "1"}));
  EXPECT_TRUE(entries[0].ChildNodes().empty()) << "history entries are shallow";
}

}  // namespace
}  // namespace trl::testing
