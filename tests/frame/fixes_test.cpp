#include "frame/fixes.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "frame/error_handler.h"
#include "support/reported_events.h"

namespace trl {
namespace {

struct Case {
  const char* before;  // "" for a document without root
  const char* after;
  std::vector<int32_t> reported;  // numbers of the failures reported, in order
};

// Upgrades each case's document and checks it and the failures reported under `procedure`.
void CheckUpgrades(void (*upgrade)(xml::Document&), std::string_view procedure,
                   const std::vector<Case>& cases) {
  for (const Case& c : cases) {
    xml::Document document;
    if (*c.before) EXPECT_TRUE(document.LoadXml(c.before)) << c.before;
    upgrade(document);
    EXPECT_EQ(document.Xml(), c.after) << c.before;
    std::vector<int32_t> numbers;
    for (const auto& e : testing::TakeReportedEvents()) {
      numbers.push_back(e.number);
      EXPECT_EQ(e.className + "." + e.procedure, "basFixes." + std::string(procedure));
    }
    EXPECT_EQ(numbers, c.reported) << c.before;
  }
}

TEST(FixesTest, UserDataTakesTheCurrentForm) {
  CheckUpgrades(
      UpgradeUserData, "UpgradeUserData",
      {
          // The current form keeps its names, the older one moves the plain name to the text and
          // encodes it; nested computers are upgraded too and a stale guid is rewritten.
          {R"(<r><c c_id="1" c_text="Home" c_name="whatever"><m m_id="1" m_text="" m_name="C:"><d d_id="2"><a a_id="3"/></d></m></c><c c_id="4" c_name="Home's PC"/><x><c c_id="5" c_text="A" c_name="a"><m m_id="9" m_text="D:" m_name="d:"><d d_id="5"><a a_id="7" a_guid="old"/><a a_id="8"/></d></m></c></x></r>)",
           R"(<r><c c_id="1" c_text="Home" c_name="whatever"><m m_id="1" m_text="C:" m_name="c:"><d d_id="2"><a a_id="3" a_guid="c1m1d2a3"/></d></m></c><c c_id="4" c_name="home%27s pc" c_text="Home's PC"/><x><c c_id="5" c_text="A" c_name="a"><m m_id="9" m_text="D:" m_name="d:"><d d_id="5"><a a_id="7" a_guid="c5m9d5a7"/><a a_id="8" a_guid="c5m9d5a8"/></d></m></c></x></r>)",
           {}},
          // Missing ids keep the previous ones; a computer without any name stays as it was.
          {R"(<r><c c_id="1" c_text="A" c_name="a"><m m_id="2" m_text="C:" m_name="c:"><d d_id="3"><a a_id="4"/></d><d><a/></d></m></c><c c_id="6"/></r>)",
           R"(<r><c c_id="1" c_text="A" c_name="a"><m m_id="2" m_text="C:" m_name="c:"><d d_id="3"><a a_id="4" a_guid="c1m2d3a4"/></d><d><a a_guid="c1m2d3a4"/></d></m></c><c c_id="6"/></r>)",
           {kInvalidUseOfNull, kInvalidUseOfNull, kInvalidUseOfNull, kInvalidUseOfNull}},
          {"", "", {kObjectNotSet}},
      });
}

TEST(FixesTest, FingerprintGetsBitValuesAndMaxima) {
  CheckUpgrades(
      UpgradeFingerprintData, "UpgradeFingerprintData",
      {
          // Old values are rewritten; a nested file counts, a nested property does not; weights
          // from 15 up share one bit.
          {R"(<fp><a><v v_max="99"><f f_weight="1" f_bitmask="5" p_max="5"/><f f_weight="2"/><f f_weight="3"/></v></a><v><g><f f_weight="2"><p p_weight="15"/><p p_weight="16"/><x><p p_weight="3"/></x></f></g></v></fp>)",
           R"(<fp><a><v v_max="7"><f f_weight="1" f_bitmask="1" p_max="0"/><f f_weight="2" f_bitmask="2" p_max="0"/><f f_weight="3" f_bitmask="4" p_max="0"/></v></a><v v_max="2"><g><f f_weight="2" f_bitmask="2" p_max="32768"><p p_weight="15" p_bitmask="16384"/><p p_weight="16" p_bitmask="16384"/><x><p p_weight="3"/></x></f></g></v></fp>)",
           {}},
          // An unreadable weight falls back to the one read before it, the first to 0.
          {R"(<fp><v><f f_weight=""><p/></f><f f_weight="3"><p p_weight="2"/><p p_weight="x"/></f><f><p/></f><f f_weight="99999999999"/></v></fp>)",
           R"(<fp><v v_max="12"><f f_weight="" f_bitmask="0" p_max="0"><p p_bitmask="0"/></f><f f_weight="3" f_bitmask="4" p_max="4"><p p_weight="2" p_bitmask="2"/><p p_weight="x" p_bitmask="2"/></f><f f_bitmask="4" p_max="2"><p p_bitmask="2"/></f><f f_weight="99999999999" f_bitmask="4" p_max="0"/></v></fp>)",
           {kTypeMismatch, kInvalidUseOfNull, kTypeMismatch, kInvalidUseOfNull, kInvalidUseOfNull,
            kOverflow}},
          {"", "", {kObjectNotSet}},
      });
}

}  // namespace
}  // namespace trl
