#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "cyclonedx_bom.h"
#include "findings_json.h"
#include "findings_output.h"
#include "findings_table.h"
#include "support/documents.h"

namespace trl::cli {
namespace {

using nlohmann::json;

// One application updated, one that two versions fit alike, one that no version fits wholly, one
// gone; on a remote computer, so that folders need no disk.
constexpr const char* kPlace =
    "<c c_id='1' c_text='pc' c_name='pc' c_local='0'><m m_id='1' "
    "m_text='C:' m_name='c:'>";
constexpr const char* kBefore =
    "<d d_id='1' d_text='\\one\\' d_name='\\one\\'><a a_id='1' a_name='One' v_id='10' "
    "v_name='1.0' v_seq='10' a_manage='1'/></d><d d_id='3' d_text='\\gone\\' d_name='\\gone\\'><a "
    "a_id='3' a_name='Gone' v_id='30' v_name='3.0' v_seq='30'/></d>";
constexpr const char* kAfter =
    "<d d_id='1' d_text='\\one\\' d_name='\\one\\'><a a_id='1' a_name='One' v_id='11' "
    "v_name='1.1' v_seq='11' a_manage='1'><v v_id='11' v_max='3' v_act='2' f_max='2' f_act='2'><f "
    "f_id='1' p_act='1'/></v></a></d><d d_id='2' d_text='\\twin\\' d_name='\\twin\\'><a a_id='2' "
    "a_name='T\xe7\x94\xb0in' v_id='-1' v_name='Multiple Matches' v_seq='-1' a_manage='0'><v "
    "v_guess='21' v_id='-1' v_max='4' v_act='4' f_max='1' f_act='1'/></a></d><d d_id='4' "
    "d_text='\\odd\\' d_name='\\odd\\'><a a_id='4' a_name='Odd' v_id='-1' v_name='Unsupported "
    "Version' v_seq='-1' a_manage='0'><v v_guess='40' v_id='-1' v_max='8' v_act='2' f_max='4' "
    "f_act='1'/></a></d>";

class FindingsFormatsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    before_ = testing::Parse(std::string("<trl_applicationdata>") + kPlace + kBefore +
                             "</m></c></trl_applicationdata>");
    merged_ = testing::Parse(std::string("<trl_applicationdata>") + kPlace + kAfter +
                             "</m></c><a_missing><a a_id='3'/></a_missing></trl_applicationdata>");
    // The digest has weight 1, the size weight 2: p_act 1 says only the digest agreed.
    auto fingerprint = testing::Parse(
        "<fp><a a_id='1'><v v_id='11' v_name='1.1'><f f_id='1'><p p_type='3' p_weight='1'/><p "
        "p_type='2' p_weight='2'/></f></v></a><a a_id='2'><v v_id='21' v_name='2.1'/></a><a "
        "a_id='4'><v "
        "v_id='40' v_name='4.0'/></a></fp>");
    findings_ = Inventory(*before_).Changes(*merged_, *fingerprint);
  }
  xml::DocumentPtr before_, merged_;
  std::vector<Finding> findings_;
};

// Each application's JSON, read back by a parser, says what its element in the user data says.
TEST_F(FindingsFormatsTest, JsonSaysWhatTheUserDataSays) {
  json document = json::parse(FindingsJson(findings_, nullptr));
  ASSERT_EQ(document["applications"].size(), 4u);
  for (const json& app : document["applications"]) {
    std::string id = app["application_id"];
    if (app["verdict"] == "missing") {
      EXPECT_EQ(id, "3");
      EXPECT_EQ(app["change"], "missing");
      continue;
    }
    xml::Node a = merged_->AsNode().SelectSingleNode("//d/a[@a_id='" + id + "']");
    xml::Node v = a.SelectSingleNode("v");
    EXPECT_EQ(app["application"], *a.GetAttribute("a_name"));
    EXPECT_EQ(app["version"]["id"], *a.GetAttribute("v_id"));
    EXPECT_EQ(app["version"]["name"], *a.GetAttribute("v_name"));
    EXPECT_EQ(app["version"]["seq"], *a.GetAttribute("v_seq"));
    EXPECT_EQ(app["managed"], *a.GetAttribute("a_manage") == "1");
    EXPECT_EQ(app["score"]["actual"], std::stoi(*v.GetAttribute("v_act")));
    EXPECT_EQ(app["score"]["max"], std::stoi(*v.GetAttribute("v_max")));
    EXPECT_EQ(app["files"]["found"], std::stoi(*v.GetAttribute("f_act")));
    EXPECT_EQ(app["files"]["expected"], std::stoi(*v.GetAttribute("f_max")));
    EXPECT_EQ(app["computer"], "pc");
  }
  const json& one = document["applications"][2];
  EXPECT_EQ(one["folder"], "C:/one/");
  EXPECT_EQ(one["change"], "updated");
  EXPECT_EQ(one["changed_from"], "1.0");
  EXPECT_EQ(document["applications"][1]["version"]["name"], "Unsupported Version");
  const json& twin = document["applications"][3];
  EXPECT_EQ(twin["verdict"], "unidentified");
  EXPECT_EQ(twin["best_guess"], (json{{"id", "21"}, {"name", "2.1"}}));
}

// The bill of materials lists what was identified, with the kinds of evidence that agreed; the
// unidentified only when asked, at half the confidence; the missing never. The table lines up a
// name of wide characters by the columns it takes.
TEST_F(FindingsFormatsTest, BomAndTableShowHowSureTheVerdictIs) {
  auto techniques = [](const json& component) {
    std::vector<std::string> found;
    for (const json& m : component["evidence"]["identity"][0]["methods"]) {
      found.push_back(m["technique"]);
    }
    return found;
  };
  json bom = json::parse(CycloneDxBom(findings_, false));
  ASSERT_EQ(bom["components"].size(), 1u);
  EXPECT_EQ(bom["components"][0]["version"], "1.1");
  EXPECT_EQ(techniques(bom["components"][0]),
            (std::vector<std::string>{"filename", "hash-comparison"}));
  EXPECT_DOUBLE_EQ(bom["components"][0]["evidence"]["identity"][0]["confidence"], 2.0 / 3);
  bom = json::parse(CycloneDxBom(findings_, true));
  ASSERT_EQ(bom["components"].size(), 3u);
  EXPECT_DOUBLE_EQ(bom["components"][0]["evidence"]["identity"][0]["confidence"], 0.125);
  EXPECT_EQ(bom["components"][2]["version"], "2.1");
  EXPECT_DOUBLE_EQ(bom["components"][2]["evidence"]["identity"][0]["confidence"], 0.5);

  // Below 70%: One goes; the missing, which have no score, stay.
  std::string strong = RenderFindings({.format = "table", .minScore = 70}, findings_, nullptr);
  EXPECT_EQ(strong.find("One"), std::string::npos);
  EXPECT_NE(strong.find("Gone"), std::string::npos);
  std::string table = FindingsTable(findings_);
  EXPECT_NE(table.find("pc        C:/one/   One          1.1" + std::string(28, ' ') +
                       "66%    updated from 1.0\n"),
            std::string::npos)
      << table;
  EXPECT_NE(table.find("pc        C:/twin/  T\xe7\x94\xb0in        unidentified (best guess 2.1)  "
                       "100%   new\n"),
            std::string::npos)
      << table;
}

}  // namespace
}  // namespace trl::cli
