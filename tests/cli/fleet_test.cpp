// A fleet's inventory: what collect writes on each machine, and one merge of many machines'
// results into one user data.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <regex>
#include <string>
#include <tuple>
#include <vector>

#include "collect_command.h"
#include "command_error.h"
#include "findings_table.h"
#include "gzip_text.h"
#include "merge_command.h"
#include "support/documents.h"
#include "support/temp_tree.h"

namespace trl::cli {
namespace {

using testing::Lower;
using testing::Words;

std::vector<std::string> Split(const std::string& text, char separator) {
  std::vector<std::string> parts{""};
  for (char ch : text) {
    if (ch == separator) {
      parts.emplace_back();
    } else {
      parts.back() += ch;
    }
  }
  return parts;
}

// The text of a document, the times a merge stamps on history entries left out.
std::string Unstamped(const std::string& text) {
  static const std::regex kStamp("v_updated=\"[^\"]*\"");
  return std::regex_replace(testing::Parse(text)->Xml(), kStamp, "");
}

class FleetTest : public ::testing::Test {
 protected:
  // Runs a command line (files of the tree named "@name"); answers the exit code and the message
  // of the error that ended it.
  std::pair<int, std::string> Run(const std::string& line) const {
    std::vector<std::string> args;
    for (std::string word : Words(line)) {
      args.push_back(word.starts_with('@') ? tree_.Native(word.substr(1)) : word);
    }
    try {
      CLI::App app;
      auto merge = AddMergeCommand(app);
      auto collect = AddCollectCommand(app);
      std::reverse(args.begin(), args.end());  // CLI11 takes the arguments last first
      app.parse(args);
      int code = merge();
      return {code >= 0 ? code : collect(), ""};
    } catch (const CommandError& error) {
      return {error.ExitCode(), error.what()};
    } catch (const CLI::ParseError& error) {
      return {kExitBadInput, error.what()};
    }
  }

  std::string Read(const std::string& name) const {
    std::ifstream in(tree_.Native(name), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
  }

  // The results of a machine that searched `roots` (folders, in "\" form) and found `apps`, each
  // "FOLDER:ID:VERSION": every application identified and manageable, as the filter leaves it, but
  // one whose version is written "1u", which the filter found incomplete and left unmanaged.
  void AddMachine(const std::string& file, const std::string& name, const std::string& roots,
                  const std::string& apps) const {
    std::string computer = "c_text='" + name + "' c_name='" + Lower(name) + "'";
    std::string options, found;
    // A folder written "-\\opt\\" is one the machine did not search.
    for (const std::string& root : Words(roots)) {
      bool searched = !root.starts_with('-');
      options += "<d d_id='1' d_text='" + root.substr(searched ? 0 : 1) + "' d_search='" +
                 (searched ? "1" : "0") + "'/>";
    }
    for (const std::string& app : Words(apps)) {
      std::vector<std::string> part = Split(app, ':');
      found += "<d d_id='1' d_text='" + part[0] + "' d_name='" + Lower(part[0]) + "'><a a_id='" +
               part[1] + "' a_name='App" + part[1] + "' a_manage='" +
               (part[2].ends_with('u') ? "0" : "1") + "' v_id='" + part[2].substr(0, 1) +
               "' v_name='" + part[2] + ".0'><v v_id='" + part[2] + "'/></a></d>";
    }
    tree_.AddFile(
        file, "<trl_machine " + computer + "><trl_searchoptions><c c_id='1' " + computer +
                  " c_local='1'><m m_id='1' m_text='' m_name=''>" + options +
                  "</m></c></trl_searchoptions><trl_applicationdata>" +
                  (found.empty() ? ""
                                 : "<c c_id='1' " + computer + "><m m_id='1' m_text='' m_name=''>" +
                                       found + "</m></c>") +
                  "</trl_applicationdata></trl_machine>");
  }

  testing::TempTree tree_;
};

TEST_F(FleetTest, ManyMachinesMergeAsEachAfterTheOtherInTheOrderOfTheirNames) {
  struct Case {
    const char* what;
    std::vector<std::string> machines;  // "NAME|ROOTS|APPS", the first run, then the second
    std::vector<std::string> again;
    std::vector<const char*> expected;  // selections that each select one node
  } cases[] = {
      {"numbered by name, whatever the order given",
       {"Web2|\\srv\\|\\srv\\a\\:1:1", "Web1|\\srv\\|\\srv\\a\\:1:1", "db|\\srv\\|\\srv\\b\\:2:1"},
       {},
       {"/*[c[1][@c_id='1']/@c_name='db' and c[2][@c_id='2']/@c_name='web1' and "
        "c[3][@c_id='3']/@c_name='web2']"}},
      {"gone on one machine, missing there only",
       {"A|\\srv\\|\\srv\\x\\:1:1", "B|\\srv\\|\\srv\\a\\:1:1 \\srv\\x\\:1:1"},
       {"A|\\srv\\|\\srv\\x\\:1:1", "B|\\srv\\|\\srv\\x\\:1:1"},
       {"/*[count(a_missing/a)=1]/a_missing/a[@a_id='1'][starts-with(@a_guid,'c2m')]",
        "/*/c[@c_name='a']/m/d/a[@a_id='1'][not(v_history)]",
        "/*/c[@c_name='b'][count(m/d)=1]/m/d[@d_name='\\srv\\x\\']"}},
      {"upgraded on one machine, with its history there only",
       {"A|\\srv\\|\\srv\\a\\:1:1", "B|\\srv\\|\\srv\\a\\:1:1"},
       {"B|\\srv\\|\\srv\\a\\:1:2", "A|\\srv\\|\\srv\\a\\:1:1"},
       {"/*/c[@c_name='b']/m/d/a[@v_id='2']/v_history/v[@v_id='1']",
        "/*/c[@c_name='a']/m/d/a[@v_id='1'][not(v_history)]", "/*[not(a_missing)]"}},
      {"only where the machine searched, and only machines given",
       {"A|\\srv\\ \\opt\\|\\srv\\a\\:1:1 \\opt\\b\\:2:1 \\opt\\c\\:3:1u",
        "B|\\srv\\|\\srv\\a\\:1:1"},
       {"A|\\opt\\ -\\srv\\|"},
       {"/*[count(a_missing/a)=1]/a_missing/a[@a_id='2']", "/*/c[@c_name='a']/m/d/a[@a_id='1']",
        "/*/c[@c_name='b']/m/d/a[@a_id='1']"}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    // Every run both ways: all machines in one merge, and one merge for each machine by name.
    std::filesystem::remove(tree_.Native("all.xml"));
    std::filesystem::remove(tree_.Native("each.xml"));
    for (const auto* run : {&c.machines, &c.again}) {
      if (run->empty()) continue;
      std::string list;  // the files, in the order given
      std::map<std::string, std::string> byName;
      for (size_t i = 0; i < run->size(); ++i) {
        std::vector<std::string> part = Split((*run)[i], '|');
        std::string file = "m" + std::to_string(i) + ".xml";
        AddMachine(file, part[0], part[1], part[2]);
        list += tree_.Native(file) + "\n";
        byName[Lower(part[0])] = file;
      }
      tree_.AddFile("list.txt", list);
      EXPECT_EQ(Run("merge -q --user-data @all.xml --save --machine-list @list.txt").first,
                kExitOk);
      for (const auto& [name, file] : byName) {
        EXPECT_EQ(Run("merge -q --user-data @each.xml --save @" + file).first, kExitOk);
      }
    }
    auto all = testing::Parse(Read("all.xml"));
    EXPECT_EQ(Unstamped(Read("all.xml")), Unstamped(Read("each.xml")));
    for (const char* selection : c.expected) {
      EXPECT_EQ(all->AsNode().CountNodes(selection), 1u) << selection << "\n" << all->Xml();
    }
  }
}

TEST_F(FleetTest, TheSameApplicationOnAnotherMachineIsNotMarkedByAnEntryOfTheMissingList) {
  AddMachine("a.xml", "A", "\\srv\\", "\\srv\\a\\:1:1");
  AddMachine("b.xml", "B", "\\srv\\", "\\srv\\a\\:1:1");
  ASSERT_EQ(Run("merge -q --user-data @inv.xml --save @a.xml @b.xml").first, kExitOk);
  AddMachine("a.xml", "A", "\\srv\\", "");
  ASSERT_EQ(Run("merge -q --user-data @inv.xml --save @a.xml").first, kExitOk);
  AddMachine("a.xml", "A", "\\srv\\", "\\srv\\a\\:1:1");
  ASSERT_EQ(Run("merge -q --user-data @inv.xml --save @a.xml").first, kExitOk);
  auto inventory = testing::Parse(Read("inv.xml"));
  xml::Document none;
  std::map<std::string, bool> marked;
  for (const Finding& finding : Inventory(*inventory).Changes(*inventory, none)) {
    marked[finding.computer] = finding.stillMissing;
  }
  EXPECT_EQ(marked, (std::map<std::string, bool>{{"A", true}, {"B", false}}));
}

TEST_F(FleetTest, CollectWritesTheMachinesResultsUnderItsNameAndMergeReadsThemCompressed) {
  tree_.AddFolder("Root/Opt/Tool");
  tree_.AddFile("Root/Opt/Tool/tool.bin", "12345");
  tree_.AddFile("fp.xml",
                "<fp><a a_id='4' a_name='Tool'><v v_id='1' v_name='1.0' v_seq='1'><f f_id='1' "
                "f_name='tool.bin' f_relpath='' f_weight='1'><p p_type='2' p_weight='1' "
                "p_value='5'/></f></v></a></fp>");
  ASSERT_EQ(Run("collect @Root --fingerprint @fp.xml --computer Web01 -o @web.xml.gz"),
            std::make_pair(kExitOk, std::string()));
  EXPECT_TRUE(IsGzipFile(tree_.Native("web.xml.gz")));
  ASSERT_EQ(Run("merge --user-data @inv.xml --save @web.xml.gz").first, kExitOk);
  auto merged = testing::Parse(Read("inv.xml"));
  // The folder as the disk spells it: where the inventory is shown, the disk cannot be asked.
  EXPECT_EQ(merged->AsNode().CountNodes("/*/c[@c_text='Web01'][@c_name='web01']/m/d[@d_text='" +
                                        tree_.Path("Root/Opt/Tool") +
                                        "\\']/a[@a_id='4'][@v_id='1'][@a_manage='1']"),
            1u);

  // Run again with nothing changed, the inventory stays as it is, and keeps no backup.
  struct stat before {};
  ASSERT_EQ(::stat(tree_.Native("inv.xml").c_str(), &before), 0);
  ASSERT_EQ(Run("collect @Root --fingerprint @fp.xml --computer Web01 -o @web.xml.gz").first,
            kExitOk);
  ::testing::internal::CaptureStderr();
  ASSERT_EQ(Run("merge --user-data @inv.xml --save @web.xml.gz").first, kExitOk);
  EXPECT_THAT(::testing::internal::GetCapturedStderr(), ::testing::HasSubstr("unchanged"));
  struct stat after {};
  ASSERT_EQ(::stat(tree_.Native("inv.xml").c_str(), &after), 0);
  EXPECT_EQ(before.st_ino, after.st_ino);
  EXPECT_FALSE(std::filesystem::exists(tree_.Native("inv.xml.bak")));
}

TEST_F(FleetTest, ResultsThatCannotBeMergedAreRefusedOrLeftOut) {
  AddMachine("a.xml", "A", "\\srv\\", "\\srv\\a\\:1:1");
  AddMachine("a2.xml", "a", "\\srv\\", "\\srv\\a\\:1:2");
  tree_.AddFile("plain.xml", "<trl_applicationdata/>");
  AddMachine("c.xml", "C", "\\srv\\", "\\srv\\a\\:1:1");
  std::string whole = Read("c.xml");
  // Compressed, then cut short.
  std::string packed;
  {
    GzipWriter gzip([&](std::string_view bytes) { packed += bytes; });
    gzip.Put(whole);
    gzip.Finish();
  }
  tree_.AddFile("cut.xml.gz", packed.substr(0, packed.size() / 2));
  AddMachine("b.xml", "B", "\\srv\\", "\\srv\\a\\:1:1");
  const std::tuple<std::string, int, std::string> cases[] = {
      {"@a.xml @a2.xml", kExitBadInput, "are both results of the machine 'a'"},
      {"@a.xml @plain.xml @b.xml", kExitFailuresReported,
       "holds an empty results document; left out\n"},
      {"@a.xml @cut.xml.gz", kExitFailuresReported, "ends early"},
      {"@a.xml --new-results @plain.xml", kExitBadInput, "excludes"},
  };
  for (const auto& [files, code, message] : cases) {
    SCOPED_TRACE(files);
    std::filesystem::remove(tree_.Native("inv.xml"));
    ::testing::internal::CaptureStderr();
    auto [exit, error] = Run("merge --user-data @inv.xml --save " + files);
    std::string printed = ::testing::internal::GetCapturedStderr();
    EXPECT_EQ(exit, code);
    EXPECT_THAT(error + printed, ::testing::HasSubstr(message));
    // What could be merged is saved; a refused command saves nothing.
    EXPECT_EQ(std::filesystem::exists(tree_.Native("inv.xml")), code != kExitBadInput);
  }
}

}  // namespace
}  // namespace trl::cli
