// How one application found again carries the client's settings and its version history.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>

#include "merge/merge_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

struct Case {
  const char* name;
  const char* rootAttributes;
  const char* oldApplication;  // "" when the old results do not hold it
  const char* newApplication;
  const char *manage, *update, *dupes;
  const char* history;  // v_id of each history entry, oldest first
};

const Case kCases[] = {
    {"SameVersionKeepsOldFlagsAndHistory", "",
     "<a a_id='7' a_manage='0' a_update_q='0' a_dupes_q='0' v_id='12'><v v_id='12'/>"
     "<v_history><v v_id='10' v_update_q='1'/></v_history></a>",
     "<a a_id='7' a_name='App' v_id='12'><v v_id='12'/></a>", "0", "0", "0", "10"},
    {"ChangedVersionAddsTheOldVersion", "",
     "<a a_id='7' a_update_q='0' v_id='12'><v v_id='12' v_name='1.2'/><v v_id='11'/>"
     "<v_history><v v_id='10'/></v_history></a>",
     "<a a_id='7' a_name='App' v_id='15'><v v_id='15'/></a>", "1", "0", "1", "10 12"},
    {"IdentifiedThenUnknownRaisesTheUpdateFlag", "",
     "<a a_id='7' a_update_q='0' v_id='12'><v v_id='12'/></a>",
     "<a a_id='7' a_name='App' v_id='-1'><v v_id='12'/><v v_id='13'/></a>", "1", "1", "1", "12"},
    {"NoOldVersionGivesNoHistory", "", "<a a_id='7' a_update_q='0'><v v_id='4'/></a>",
     "<a a_id='7' a_name='App' v_id='-1'><v v_id='4'/></a>", "1", "1", "1", ""},
    {"UnknownBeforeAndNowKeepsTheFlag", "",
     "<a a_id='7' a_update_q='0' v_id='-1'><v v_id='4'/></a>",
     "<a a_id='7' a_name='App' v_id='-1'><v v_id='4'/></a>", "1", "0", "1", ""},
    {"ManagementSwitchedOffStaysOff", "", "<a a_id='7' a_manage='0' v_id='3'><v v_id='3'/></a>",
     "<a a_id='7' a_name='App' a_manage='1' v_id='3'><v v_id='3'/></a>", "0", "1", "1", ""},
    {"OwnFlagsWin", "a_update_q='0' a_dupes_q='0'",
     "<a a_id='7' a_update_q='0' a_dupes_q='0' v_id='3'><v v_id='3'/></a>",
     "<a a_id='7' a_name='App' a_update_q='1' a_dupes_q='1' v_id='3'><v v_id='3'/></a>", "1", "1",
     "1", ""},
    {"NewApplicationTakesRootDefaults", "a_update_q='0'", "",
     "<a a_id='7' a_name='App' a_manage='0' v_id='3'><v v_id='3'/></a>", "0", "0", "1", ""},
    {"NewApplicationWithoutRootDefaults", "a_dupes_q='0'", "",
     "<a a_id='7' a_name='App' v_id='-1'><v v_id='3'/></a>", "1", "1", "0", ""},
};

void PrintTo(const Case& c, std::ostream* os) { *os << c.name; }

class MergeApplicationTest : public ::testing::TestWithParam<Case> {};

TEST_P(MergeApplicationTest, CarriesSettingsAndHistory) {
  const Case& c = GetParam();
  auto old = Parse(Results(Place("Host", "C:", "\\App\\", c.oldApplication), c.rootAttributes));
  auto fresh = Parse(Results(Place("Host", "C:", "\\App\\", c.newApplication)));
  EXPECT_THAT(MergeNow(Parse("<o/>"), nullptr, old, fresh).events, IsEmpty());
  ASSERT_EQ(old->AsNode().CountNodes("//d/a"), 1u);
  EXPECT_THAT(ValuesOf(*old, "//d/a", "a_name"), ElementsAre("App"));  // the new entry
  EXPECT_THAT(ValuesOf(*old, "//d/a", "a_manage"), ElementsAre(c.manage));
  EXPECT_THAT(ValuesOf(*old, "//d/a", "a_update_q"), ElementsAre(c.update));
  EXPECT_THAT(ValuesOf(*old, "//d/a", "a_dupes_q"), ElementsAre(c.dupes));
  EXPECT_EQ(ValuesOf(*old, "//d/a/v_history/v", "v_id"), Words(c.history));
  EXPECT_LE(old->AsNode().CountNodes("//d/a/v_history"), 1u);
  EXPECT_EQ(old->AsNode().CountNodes("//v_history/v/*"), 0u) << "history entries are shallow";
  EXPECT_EQ(fresh->AsNode().CountNodes("//a"), 0u);
}

INSTANTIATE_TEST_SUITE_P(Cases, MergeApplicationTest, ::testing::ValuesIn(kCases),
                         [](const auto& info) { return std::string(info.param.name); });

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
}

}  // namespace
}  // namespace trl::testing
