// A sequence of merges leaves the user data as one merge after another does: generated user data
// of several computers, merged with runs of one computer each, of two, or of a computer another
// run of the sequence names too.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <map>
#include <numeric>
#include <random>
#include <regex>
#include <string>
#include <vector>

#include "merge/merge_fixture.h"

namespace trl::testing {
namespace {

std::string N(int value) { return std::to_string(value); }

struct Generator {
  std::mt19937 rng;
  int Below(int n) { return static_cast<int>(rng() % static_cast<uint32_t>(n)); }
  bool Chance(int percent) { return Below(100) < percent; }
  // 1..n in a random order: the highest id of a level can stand anywhere.
  std::vector<int> Ids(int n) {
    std::vector<int> ids(n);
    std::iota(ids.begin(), ids.end(), 1);
    std::shuffle(ids.begin(), ids.end(), rng);
    return ids;
  }
};

using Spot = std::array<int, 3>;                // computer, drive, folder
using Tree = std::map<Spot, std::vector<int>>;  // the a_ids at each place

std::string AppXml(Generator& g, int id, bool old) {
  int version = g.Chance(15) ? -1 : 1 + g.Below(3);
  std::string text = "<a a_id='" + N(id) + "' a_name='A" + N(id) + "' v_id='" + N(version) + "'";
  if (g.Chance(50)) text += std::string(" a_manage='") + (g.Chance(70) ? "1" : "0") + "'";
  if (g.Chance(30)) text += " a_update_q='0'";
  text += "><v v_id='" + N(version) + "' v_name='V" + N(version) + "'/>";
  // Rarely a place inside the application, numbered high: it comes and goes with it.
  if (g.Chance(4)) {
    text += "<v>" + Place("In" + N(id), "X", "\\I\\", "", N(20 + g.Below(9)) + " 50 70") + "</v>";
  }
  if (old && g.Chance(30)) text += "<v_history><v v_id='9'/></v_history>";
  return text + "</a>";
}

// A results document of `tree`, its computers, drives and folders numbered in a random order.
std::string ResultsXml(Generator& g, const Tree& tree, bool old) {
  std::vector<int> c = g.Ids(12), m = g.Ids(24), d = g.Ids(48);
  std::string body;
  int at[3] = {0, 0, 0};
  Spot open = {-1, -1, -1};
  for (const auto& [place, apps] : tree) {
    if (place[0] != open[0]) {
      if (open[0] >= 0) body += "</m></c>";
      body += "<c c_id='" + N(c[at[0]++]) + "' c_text='Host" + N(place[0]) + "' c_name='host" +
              N(place[0]) + "'>";
      open = {place[0], -1, -1};
    }
    if (place[1] != open[1]) {
      if (open[1] >= 0) body += "</m>";
      body += "<m m_id='" + N(m[at[1]++]) + "' m_text='D" + N(place[1]) + "' m_name='d" +
              N(place[1]) + "'>";
      open[1] = place[1];
    }
    body += "<d d_id='" + N(d[at[2]++]) + "' d_text='\\F" + N(place[2]) + "\\' d_name='\\f" +
            N(place[2]) + "\\'>";
    for (int id : apps) body += AppXml(g, id, old);
    body += "</d>";
  }
  if (open[0] >= 0) body += "</m></c>";
  return "<trl_applicationdata" + std::string(g.Chance(30) ? " a_dupes_q='0'" : "") + ">" + body +
         "</trl_applicationdata>";
}

std::string ManagedXml(const Spot& place, int id) {
  return Managed("host" + N(place[0]), "d" + N(place[1]), "\\f" + N(place[2]) + "\\", N(id));
}

struct Scenario {
  std::string old;
  std::vector<std::pair<std::string, std::string>> runs;  // search options, new results
  bool twice = false;                                     // a computer has two runs
};

Scenario Generate(uint32_t trial) {
  Generator g{std::mt19937(trial)};
  Scenario scenario;
  Tree old;
  // Often one computer with one application: one that goes missing takes its computer along.
  int computers = 1 + g.Below(3);
  for (int i = 0, n = 1 + g.Below(g.Chance(40) ? 2 : 9); i < n; ++i) {
    std::vector<int>& apps = old[{g.Below(computers), g.Below(2), g.Below(3)}];
    int id = 1 + g.Below(4);
    if (std::find(apps.begin(), apps.end(), id) == apps.end()) apps.push_back(id);
  }
  scenario.old = ResultsXml(g, old, true);
  std::vector<int> runComputers;
  for (int r = 0, n = 1 + g.Below(4); r < n; ++r) {
    int computer = g.Chance(50) ? g.Below(computers) : g.Below(5);
    scenario.twice |= std::count(runComputers.begin(), runComputers.end(), computer) > 0;
    runComputers.push_back(computer);
    std::vector<int> computers{computer};
    if (g.Chance(15)) computers.push_back(g.Below(5));
    Tree fresh;
    std::string options = "<o>";
    for (const auto& [place, apps] : old) {
      if (std::find(computers.begin(), computers.end(), place[0]) == computers.end()) continue;
      for (int id : apps) {
        if (g.Chance(60)) options += ManagedXml(place, id);
        if (g.Chance(65)) fresh[place].push_back(id);
        if (g.Chance(10)) fresh[{place[0], g.Below(2), g.Below(3)}].push_back(id);  // moved
      }
    }
    for (int i = g.Below(3); i > 0; --i) {
      Spot place{computers[0], g.Below(2), g.Below(3)};
      fresh[place].push_back(5 + i);
      if (g.Chance(30)) options += ManagedXml(place, 1 + g.Below(4));
    }
    if (g.Chance(10)) options += ManagedXml({g.Below(3), g.Below(2), g.Below(3)}, 1 + g.Below(4));
    for (auto& [place, apps] : fresh) {
      std::sort(apps.begin(), apps.end());
      apps.erase(std::unique(apps.begin(), apps.end()), apps.end());
    }
    scenario.runs.emplace_back(options + "</o>", ResultsXml(g, fresh, false));
  }
  return scenario;
}

// The text of a document, the times a merge stamps on history entries left out.
std::string Unstamped(xml::Document& document) {
  static const std::regex kStamp("v_updated=\"[^\"]*\"");
  return std::regex_replace(document.Xml(), kStamp, "v_updated=\"\"");
}

// The c_id of each computer by its name.
std::map<std::string, std::string> Computers(xml::Document& document) {
  std::map<std::string, std::string> ids;
  for (const xml::Node& c : document.AsNode().SelectNodes("/*/c")) {
    ids[c.GetAttribute("c_name").value_or("")] = c.GetAttribute("c_id").value_or("");
  }
  return ids;
}

TEST(MergeSequenceTest, LeavesTheUserDataAsOneMergeAfterAnotherDoes) {
  int missing = 0, computersGone = 0, twice = 0;
  for (uint32_t trial = 1; trial <= 2500; ++trial) {
    SCOPED_TRACE("trial " + std::to_string(trial));
    Scenario scenario = Generate(trial);
    auto each = Parse(scenario.old);
    Merge one;
    one.Asynchronous(false);
    for (const auto& [options, results] : scenario.runs) {
      auto before = Computers(*each);
      one.Start(Parse(options), nullptr, each, Parse(results));
      auto after = Computers(*each);
      // Pruned, and perhaps added again under a new id.
      computersGone += std::any_of(before.begin(), before.end(), [&](const auto& computer) {
        return after[computer.first] != computer.second;
      });
    }
    ASSERT_TRUE(TakeReportedEvents().empty());

    auto whole = Parse(scenario.old);
    Merge sequence;
    ASSERT_TRUE(sequence.BeginSequence(nullptr, whole));
    for (const auto& [options, results] : scenario.runs) {
      sequence.MergeNext(Parse(options), Parse(results));
    }
    sequence.EndSequence();
    ASSERT_TRUE(TakeReportedEvents().empty());
    ASSERT_EQ(Unstamped(*whole), Unstamped(*each));

    missing += whole->AsNode().CountNodes("/*/a_missing/a") > 0;
    twice += scenario.twice;
  }
  for (int seen : {missing, computersGone, twice}) EXPECT_GT(seen, 50);
}

TEST(MergeSequenceTest, IsRefusedWhileARunIsUnderWayAndGivesTheWorkerBackAfterwards) {
  Merge merge;
  auto old = Parse(Results(""));
  EXPECT_EQ(merge.Start(nullptr, nullptr, old, nullptr), "");  // asynchronous: waits for its tick
  EXPECT_FALSE(merge.BeginSequence(nullptr, old));

  Merge second;
  ASSERT_TRUE(second.BeginSequence(nullptr, old));
  EXPECT_FALSE(second.BeginSequence(nullptr, old));
  EXPECT_EQ(second.Start(nullptr, nullptr, old, nullptr), "");
  second.MergeNext(nullptr, Parse(Results(Place("Host", "C:", "\\App\\", Application("7")))));
  second.EndSequence();
  EXPECT_EQ(Shape(old->DocumentElement()), "c1(m1(d1(a7)))");
  EXPECT_TRUE(second.Asynchronous());
  EXPECT_EQ(second.Status(), kStatusComplete);
}

}  // namespace
}  // namespace trl::testing
