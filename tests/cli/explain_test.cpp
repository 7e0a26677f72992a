#include <gtest/gtest.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <fstream>
#include <iterator>
#include <nlohmann/json.hpp>

#include "command_error.h"
#include "explain_command.h"
#include "support/documents.h"
#include "support/temp_tree.h"

namespace trl::cli {
namespace {

// On a remote computer, so that folders need no disk. Tool: 1.0 misses a file of weight 0 and its
// tool.dat scored 1 of 3, 2.0 matched fully, 2.1 scored 0 and its size disagreed; 0.9 was taken
// back for want of old.dll. Twin: two versions alike, each missing a file of weight 0. Gone:
// taken back wholly.
constexpr const char* kMatches = R"(<trl_applicationdata>
<c c_id="1" c_text="pc" c_name="pc" c_local="0"><m m_id="1" m_text="C:" m_name="c:">
<d d_id="1" d_text="\tool\" d_name="\tool\"><a a_id="1" a_name="Tool">
 <v v_id="1" v_name="1.0" v_seq="1" v_max="1" v_act="1" f_max="3" f_act="2">
  <f f_id="1" f_name="tool.exe" f_weight="1" f_exists="1" p_max="1" p_act="1"/>
  <f f_id="2" f_name="readme.txt" f_weight="0" f_exists="0"/>
  <f f_id="3" f_name="tool.dat" f_weight="0" f_exists="1" p_max="3" p_act="1"/></v>
 <v v_id="2" v_name="2.0" v_seq="2" v_max="1" v_act="1" f_max="1" f_act="1">
  <f f_id="1" f_name="tool.exe" f_weight="1" f_exists="1" p_max="1" p_act="1"/></v>
 <v v_id="3" v_name="2.1" v_seq="3" v_max="1" v_act="0" f_max="1" f_act="1">
  <f f_id="1" f_name="tool.exe" f_weight="1" f_exists="1" p_max="3" p_act="2">
   <p_local p_type="2" p_expected="999" p_value="8"/></f></v></a></d>
<d d_id="2" d_text="\twin\" d_name="\twin\"><a a_id="2" a_name="Twin">
 <v v_id="1" v_name="a" v_seq="1" v_max="1" v_act="1" f_max="2" f_act="1">
  <f f_id="1" f_name="twin.exe" f_weight="1" f_exists="1" p_max="1" p_act="1"/></v>
 <v v_id="2" v_name="b" v_seq="2" v_max="1" v_act="1" f_max="2" f_act="1">
  <f f_id="1" f_name="twin.exe" f_weight="1" f_exists="1" p_max="1" p_act="1"/></v></a></d>
</m></c>
<taken_back c_text="pc" c_local="0" m_text="C:" d_text="\tool\" a_id="1" a_name="Tool">
 <v v_id="4" v_name="0.9" v_seq="0" v_max="3" v_act="1" f_max="2" f_act="1">
  <f f_id="1" f_name="tool.exe" f_weight="1" f_exists="1" p_max="0" p_act="0"/>
  <f f_id="2" f_name="old.dll" f_weight="2" f_exists="0"/></v></taken_back>
<taken_back c_text="pc" c_local="0" m_text="C:" d_text="\gone\" a_id="3" a_name="Gone">
 <v v_id="1" v_name="1" v_seq="1" v_max="1" v_act="0" f_max="1" f_act="0">
  <f f_id="1" f_name="gone.exe" f_weight="1" f_exists="0"/></v></taken_back>
</trl_applicationdata>)";

// Tool's tool.dat: an MD5 of weight 2, a size of weight 1 and a date without weight; 2.1's
// tool.exe, whose values the run recorded: a size. Twin's first version is "a".
constexpr const char* kFingerprint =
    "<fp><a a_id='1'><v v_id='1'><f f_id='3'><p p_type='3' p_weight='2' p_value='abc'/><p "
    "p_type='2' p_weight='1' p_value='1'/><p p_type='4' p_weight='0'/></f></v><v v_id='3'><f "
    "f_id='1'><p p_type='2' p_weight='1' p_value='999'/></f></v></a><a a_id='2'><v v_id='1' "
    "v_name='a'/></a></fp>";

// Saved user data, in which the filter left Twin's first version only.
constexpr const char* kUserData =
    "<trl_applicationdata><c c_text='pc' c_local='0'><m m_text='C:'><d d_text='\\twin\\'><a "
    "a_id='2' a_name='Twin' v_id='-1' v_name='Multiple Matches' v_seq='-1' a_manage='0'><v "
    "v_guess='1' v_id='-1' v_name='Multiple Matches' v_seq='-1' v_max='1' v_act='1' f_max='2' "
    "f_act='1'/></a></d></m></c></trl_applicationdata>";

class ExplainTest : public ::testing::Test {
 protected:
  void SetUp() override {
    tree_.AddFile("matches.xml", kMatches);
    tree_.AddFile("fp.xml", kFingerprint);
    tree_.AddFile("user.xml", kUserData);
  }
  // What `explain` with `line` ("@name" naming a file of the tree) writes.
  std::string Explain(const std::string& line) {
    std::vector<std::string> args = testing::Words("explain " + line + " -o @out.txt");
    for (auto& arg : args) {
      if (arg.starts_with("@")) arg = tree_.Native(arg.substr(1));
    }
    CLI::App app;
    auto run = AddExplainCommand(app);
    std::reverse(args.begin(), args.end());
    app.parse(args);
    EXPECT_EQ(run(), 0);
    std::ifstream in(tree_.Native("out.txt"));
    return {std::istreambuf_iterator<char>(in), {}};
  }
  testing::TempTree tree_;
};

// Each version names the rule that removed or relabelled it, its missing files and the properties
// that disagreed; a leading "!" marks a text that must not be there.
TEST_F(ExplainTest, EachVersionIsToldTheRuleThatRemovedItAndWhatItMissed) {
  const std::pair<const char*, std::vector<std::string>> cases[] = {
      {"--matches @matches.xml --fingerprint @fp.xml",
       {"Filter rules replayed, in the order they run: low-weights, missing-files, "
        "low-file-count, duplicate-matches, flag-unknowns, flag-unmanaged.\n",
        "\nTool (application 1) in C:/tool/ on pc: identified as 2.0 (version id 2).\n"
        "  Version 1.0 (id 1) was removed by the missing-files rule: it misses 1 of its files, "
        "and a version misses only 0. It scored 1 of 1, with 2 of 3 files found.\n"
        "    Missing: readme.txt (weight 0).\n"
        "    tool.dat disagreed on MD5 (expected abc, the value found is not recorded).\n"
        "  Version 2.0 (id 2) was kept.",
        "  Version 2.1 (id 3) was removed by the low-weights rule: its weight 0 is more than "
        "0.00001 below the best, 1.",
        "    tool.exe disagreed on size (expected 999, found 8).\n"
        "  Version 0.9 (id 4) was taken back by the compare: a file that carries weight is "
        "missing. It scored 1 of 3, with 1 of 2 files found.\n    Missing: old.dll (weight 2).\n",
        "Twin (application 2) in C:/twin/ on pc: unidentified, \"Multiple Matches\". Not "
        "manageable: the flag-unmanaged rule found that version a has 1 of its 2 files.\n"
        "  Version a (id 1) was kept. The duplicate-matches rule labelled it \"Multiple "
        "Matches\": it is the first of several candidates left, and it matched fully.",
        "  Version b (id 2) was removed by the duplicate-matches rule: only the first candidate "
        "left, a, is kept.",
        "Gone (application 3) in C:/gone/ on pc: not found: no version that matched has every "
        "file that carries weight.\n"}},
      {"--matches @matches.xml --filter low-file-count --app Tool",
       {"Version 2.0 (id 2) was removed by the low-file-count rule: its file count, 1, is below "
        "the most, 3."}},
      {"--matches @matches.xml --filter missing-files,flag-unknowns --app tOOL",
       {"unidentified, \"Unsupported Version\": 2 versions are left.\n",
        "Version 2.1 (id 3) was kept. The flag-unknowns rule labelled it \"Unsupported "
        "Version\": it matched only partly.",
        "tool.dat scored 1 of 3 on its properties (give --fingerprint to name them).", "!Twin",
        "!Gone"}},
      {"--matches @matches.xml --filter 0 --folder C:/twin",
       {"No filter rule was applied.\n",
        "Twin (application 2) in C:/twin/ on pc: unidentified, "
        "\"Unsupported Version\": 2 versions are left.\n",
        "!Tool"}},
      {"--user-data @user.xml --fingerprint @fp.xml",
       {"The user data holds only the versions the filter left: its rules cannot be replayed",
        "unidentified, \"Multiple Matches\". Not manageable.\n  Version a (id 1) was kept. The "
        "filter labelled it \"Multiple Matches\". It scored 1 of 1, with 1 of 2 files found."}},
  };
  EXPECT_THROW(Explain("--matches @matches.xml --user-data @user.xml"), CommandError);
  for (const auto& [line, texts] : cases) {
    std::string said = Explain(line);
    for (const std::string& text : texts) {
      bool absent = text.starts_with("!");
      EXPECT_EQ(said.find(absent ? text.substr(1) : text) == std::string::npos, absent)
          << line << " -> " << text << "\n"
          << said;
    }
  }
}

// The JSON tells the same: the rule, the missing file and the values of a property that disagreed.
TEST_F(ExplainTest, JsonTellsTheRuleTheMissingFileAndTheValues) {
  using nlohmann::json;
  json said = json::parse(Explain("--matches @matches.xml --format json --app 1"));
  ASSERT_EQ(said["applications"].size(), 1u);
  const json& versions = said["applications"][0]["versions"];
  ASSERT_EQ(versions.size(), 4u);
  EXPECT_EQ(versions[0]["outcome"], "removed");
  EXPECT_EQ(versions[0]["rule"], "missing-files");
  EXPECT_EQ(versions[1]["rule"], nullptr);
  EXPECT_EQ(versions[0]["files"][1], (json{{"id", "2"},
                                           {"name", "readme.txt"},
                                           {"weight", 0},
                                           {"found", false},
                                           {"properties", nullptr},
                                           {"disagreed", json::array()}}));
  EXPECT_EQ(versions[2]["files"][0]["disagreed"],
            (json{{{"type", 2}, {"property", "size"}, {"expected", "999"}, {"actual", "8"}}}));
  EXPECT_EQ(versions[3]["outcome"], "taken back");
  EXPECT_EQ(versions[3]["rule"], "compare");
  EXPECT_EQ(versions[3]["files"][1]["name"], "old.dll");
}

}  // namespace
}  // namespace trl::cli
