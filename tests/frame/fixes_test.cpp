#include "frame/fixes.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "frame/error_handler.h"
#include "support/reported_events.h"

namespace trl {
namespace {

using testing::TakeReportedEvents;

class FixesTest : public ::testing::Test {
 protected:
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }

  std::string Upgraded(const std::string& text, void (*upgrade)(xml::Document&)) {
    xml::Document document;
    EXPECT_TRUE(document.LoadXml(text)) << text;
    upgrade(document);
    return document.Xml();
  }
};

TEST_F(FixesTest, UserDataTakesTheCurrentForm) {
  struct Case {
    const char* name;
    const char* before;
    const char* after;
  } cases[] = {
      {"current form keeps its names",
       R"(<r><c c_id="1" c_text="Home" c_name="whatever"><m m_id="1" m_text="" m_name="C:"><d d_id="2"><a a_id="3"/></d></m></c></r>)",
       R"(<r><c c_id="1" c_text="Home" c_name="whatever"><m m_id="1" m_text="C:" m_name="c:"><d d_id="2"><a a_id="3" a_guid="c1m1d2a3"/></d></m></c></r>)"},
      {"older form moves the plain name", R"(<r><c c_id="4" c_name="Home's PC"/></r>)",
       R"(<r><c c_id="4" c_name="home%27s pc" c_text="Home's PC"/></r>)"},
      {"nested computers are upgraded too",
       R"(<r><x><c c_id="1" c_text="A" c_name="a"><m m_id="9" m_text="D:" m_name="d:"><d d_id="5"><a a_id="7" a_guid="old"/><a a_id="8"/></d></m></c></x></r>)",
       R"(<r><x><c c_id="1" c_text="A" c_name="a"><m m_id="9" m_text="D:" m_name="d:"><d d_id="5"><a a_id="7" a_guid="c1m9d5a7"/><a a_id="8" a_guid="c1m9d5a8"/></d></m></c></x></r>)"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Upgraded(c.before, UpgradeUserData), c.after) << c.name;
    EXPECT_TRUE(TakeReportedEvents().empty()) << c.name;
  }
}

TEST_F(FixesTest, UpgradingUserDataTwiceChangesNothingMore) {
  std::string once = Upgraded(
      R"(<r><c c_id="1" c_name="PC"><m m_id="2" m_name="E:"><d d_id="3"><a a_id="4"/></d></m></c></r>)",
      UpgradeUserData);
  EXPECT_EQ(Upgraded(once, UpgradeUserData), once);
}

TEST_F(FixesTest, MissingIdsKeepThePreviousOnesAndAreReported) {
  std::string after = Upgraded(
      R"(<r><c c_id="1" c_text="A" c_name="a"><m m_id="2" m_text="C:" m_name="c:"><d d_id="3"><a a_id="4"/></d><d><a/></d></m></c></r>)",
      UpgradeUserData);
  EXPECT_NE(after.find(R"(<d><a a_guid="c1m2d3a4"/></d>)"), std::string::npos) << after;
  auto events = TakeReportedEvents();
  ASSERT_EQ(events.size(), 2u);  // d_id and a_id
  for (const auto& e : events) {
    EXPECT_EQ(e.number, kInvalidUseOfNull);
    EXPECT_EQ(e.className, "basFixes");
    EXPECT_EQ(e.procedure, "UpgradeUserData");
  }
}

TEST_F(FixesTest, AComputerWithoutAnyNameStaysAsItWas) {
  EXPECT_EQ(Upgraded(R"(<r><c c_id="1"/></r>)", UpgradeUserData), R"(<r><c c_id="1"/></r>)");
  EXPECT_EQ(TakeReportedEvents().size(), 2u);  // the copy and the encoding
}

TEST_F(FixesTest, DocumentsWithoutRootAreReportedAndLeftAlone) {
  xml::Document empty;
  UpgradeUserData(empty);
  UpgradeFingerprintData(empty);
  EXPECT_EQ(empty.Xml(), "");
  auto events = TakeReportedEvents();
  ASSERT_EQ(events.size(), 2u);
  EXPECT_EQ(events[0].procedure, "UpgradeUserData");
  EXPECT_EQ(events[1].procedure, "UpgradeFingerprintData");
}

TEST_F(FixesTest, FingerprintGetsBitValuesAndMaxima) {
  struct Case {
    const char* name;
    const char* before;
    const char* after;
  } cases[] = {
      {"weights 1, 2, 3",
       R"(<fp><a><v><f f_weight="1"/><f f_weight="2"/><f f_weight="3"/></v></a></fp>)",
       R"(<fp><a><v v_max="7"><f f_weight="1" f_bitmask="1" p_max="0"/><f f_weight="2" f_bitmask="2" p_max="0"/><f f_weight="3" f_bitmask="4" p_max="0"/></v></a></fp>)"},
      {"property weights 15 and 16",
       R"(<fp><v><f f_weight="0"><p p_weight="15"/><p p_weight="16"/></f></v></fp>)",
       R"(<fp><v v_max="0"><f f_weight="0" f_bitmask="0" p_max="32768"><p p_weight="15" p_bitmask="16384"/><p p_weight="16" p_bitmask="16384"/></f></v></fp>)"},
      {"nested file counts, nested property does not",
       R"(<fp><v><g><f f_weight="2"><x><p p_weight="3"/></x></f></g></v></fp>)",
       R"(<fp><v v_max="2"><g><f f_weight="2" f_bitmask="2" p_max="0"><x><p p_weight="3"/></x></f></g></v></fp>)"},
      {"old values are rewritten",
       R"(<fp><v v_max="99"><f f_weight="1" f_bitmask="5" p_max="5"/></v></fp>)",
       R"(<fp><v v_max="1"><f f_weight="1" f_bitmask="1" p_max="0"/></v></fp>)"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Upgraded(c.before, UpgradeFingerprintData), c.after) << c.name;
    EXPECT_TRUE(TakeReportedEvents().empty()) << c.name;
  }
}

TEST_F(FixesTest, UnreadableWeightsFallBackToThePreviousOne) {
  std::string after = Upgraded(
      R"(<fp><v><f f_weight="3"><p p_weight="2"/><p p_weight="x"/></f><f><p/></f><f f_weight="99999999999"/></v></fp>)",
      UpgradeFingerprintData);
  EXPECT_EQ(
      after,
      R"(<fp><v v_max="12"><f f_weight="3" f_bitmask="4" p_max="4"><p p_weight="2" p_bitmask="2"/><p p_weight="x" p_bitmask="2"/></f><f f_bitmask="4" p_max="2"><p p_bitmask="2"/></f><f f_weight="99999999999" f_bitmask="4" p_max="0"/></v></fp>)");
  auto events = TakeReportedEvents();
  std::vector<int32_t> numbers;
  for (const auto& e : events) numbers.push_back(e.number);
  EXPECT_EQ(numbers,
            (std::vector<int32_t>{kTypeMismatch, kInvalidUseOfNull, kInvalidUseOfNull, kOverflow}));
  for (const auto& e : events) EXPECT_EQ(e.procedure, "UpgradeFingerprintData");
}

TEST_F(FixesTest, FirstWeightUnreadableCountsAsZero) {
  EXPECT_EQ(Upgraded(R"(<fp><v><f f_weight=""/></v></fp>)", UpgradeFingerprintData),
            R"(<fp><v v_max="0"><f f_weight="" f_bitmask="0" p_max="0"/></v></fp>)");
  EXPECT_EQ(TakeReportedEvents().size(), 1u);
}

}  // namespace
}  // namespace trl
