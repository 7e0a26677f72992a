// Generated user data and runs: every old application survives, is replaced by its new entry or
// goes to the missing list, and every new application lands in the merged tree.
#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <map>
#include <optional>
#include <random>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include "merge/merge_fixture.h"

namespace trl::testing {
namespace {

using Key = std::array<int, 4>;  // computer, drive, folder and a_id
using Flag = std::optional<std::string>;

const std::regex kStamp(R"(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d)");

std::string N(int value) { return std::to_string(value); }
std::string Drive(int m) { return std::string(1, 'c' + m) + ":"; }

struct App {
  Key key;
  std::optional<int> vId;  // the a's v_id; nothing when absent
  Flag manage, update, dupes;
  std::vector<int> history;  // old entries only
  int firstVersion = 0;      // the first v's v_id
};

struct Generator {
  std::mt19937 rng;
  int Below(int n) { return static_cast<int>(rng() % static_cast<uint32_t>(n)); }
  bool Chance(int percent) { return Below(100) < percent; }
  Flag Pick(int percentPresent) {
    if (!Chance(percentPresent)) return std::nullopt;
    return std::string(Chance(50) ? "1" : "0");
  }
  Key AnyPlace(int computers, int id) { return {Below(computers), Below(2), Below(3), id}; }
};

std::string Attr(std::string_view name, const Flag& value) {
  return value ? " " + std::string(name) + "='" + *value + "'" : "";
}

std::string AppXml(const App& app) {
  std::string text = "<a a_id='" + N(app.key[3]) + "' a_name='N" + N(app.key[3]) + "'" +
                     Attr("v_id", app.vId ? Flag(N(*app.vId)) : std::nullopt) +
                     Attr("a_manage", app.manage) + Attr("a_update_q", app.update) +
                     Attr("a_dupes_q", app.dupes) + "><v v_id='" + N(app.firstVersion) +
                     "' v_name='V" + N(app.firstVersion) + "'><f f_id='1'/></v>";
  if (!app.history.empty()) {
    text += "<v_history>";
    for (int v : app.history) text += "<v v_id='" + N(v) + "'/>";
    text += "</v_history>";
  }
  return text + "</a>";
}

std::string Names(const Key& key) {
  return "//c[@c_name='host" + N(key[0]) + "']/m[@m_name='" + Drive(key[1]) + "']/d[@d_name='\\f" +
         N(key[2]) + "\\']";
}

// Results text with the applications grouped by place; only places with applications appear.
std::string ResultsXml(const std::map<Key, App>& apps, const std::string& root) {
  std::map<int, std::map<int, std::map<int, std::string>>> tree;
  for (const auto& [key, app] : apps) tree[key[0]][key[1]][key[2]] += AppXml(app);
  std::string body;
  int ids = 0;
  for (const auto& [c, drives] : tree) {
    body += "<c c_id='" + N(++ids) + "' c_text='Host" + N(c) + "' c_name='host" + N(c) + "'>";
    for (const auto& [m, folders] : drives) {
      body += "<m m_id='" + N(++ids) + "' m_text='" + Drive(m) + "' m_name='" + Drive(m) + "'>";
      for (const auto& [d, text] : folders) {
        body += "<d d_id='" + N(++ids) + "' d_text='\\F" + N(d) + "\\' d_name='\\f" + N(d) +
                "\\'>" + text + "</d>";
      }
      body += "</m>";
    }
    body += "</c>";
  }
  return "<trl_applicationdata" + root + ">" + body + "</trl_applicationdata>";
}

// The attributes but a_guid (rewritten on every upgrade) and the children, as text.
std::string Content(const xml::Node& a) {
  std::string text;
  for (const auto& [name, value] : a.Attributes()) {
    if (name != "a_guid") text += name + "=" + value + ";";
  }
  for (const xml::Node& child : a.ChildNodes()) text += child.Xml();
  return text;
}

struct Run {
  std::map<Key, App> old, fresh;  // by place and id
  std::set<Key> managed;          // places and ids the search options manage
  std::set<int> rejected;         // a_ids the application options reject
  Flag rootUpdate, rootDupes;
  int computers = 1;
};

Run Generate(uint32_t trial) {
  Generator g{std::mt19937(trial)};
  Run run;
  run.computers = 1 + g.Below(2);
  run.rootUpdate = g.Pick(50);
  run.rootDupes = g.Pick(50);
  for (int i = 0, n = 1 + g.Below(10); i < n; ++i) {
    App app;
    app.key = g.AnyPlace(run.computers, 1 + g.Below(6));
    if (run.old.count(app.key)) continue;
    if (int kind = g.Below(6); kind > 0) app.vId = kind == 1 ? -1 : kind - 1;
    app.manage = g.Pick(70);
    app.update = g.Pick(40);
    app.dupes = g.Pick(40);
    for (int h = g.Below(3); h > 0; --h) app.history.push_back(1 + g.Below(9));
    app.firstVersion = app.vId && *app.vId > 0 ? *app.vId : 1 + g.Below(5);
    run.old[app.key] = app;
    if (g.Chance(50)) run.managed.insert(app.key);
  }
  auto addNew = [&](App app) {
    if (run.fresh.count(app.key)) return;
    app.manage = g.Pick(30);
    app.update = g.Pick(20);
    app.dupes = g.Pick(20);
    app.history.clear();
    app.firstVersion = app.vId && *app.vId > 0 ? *app.vId : 1;
    run.fresh[app.key] = app;
  };
  for (const auto& [key, old] : run.old) {
    App next = old;
    int change = g.Below(6);
    if (change == 5) continue;                                              // gone
    if (change == 1) next.vId = old.vId.value_or(0) + 1;                    // upgrade
    if (change == 2) next.vId = -1;                                         // no longer identified
    if (change == 3) next.vId = g.Below(2) ? 1 : -1;                        // downgrade or unknown
    if (change == 4) next.key = g.AnyPlace(run.computers + 1, old.key[3]);  // moved
    if (!next.vId) next.vId = 1;
    addNew(next);
  }
  for (int i = g.Below(4); i > 0; --i) {
    App app;
    app.key = g.AnyPlace(run.computers + 1, 1 + g.Below(6));
    app.vId = g.Chance(20) ? -1 : 1 + g.Below(5);
    addNew(app);
  }
  for (int i = g.Below(3); i > 0; --i) {  // managed places that may hold nothing
    run.managed.insert(g.AnyPlace(run.computers, 1 + g.Below(6)));
  }
  for (int id = 1; id <= 6; ++id) {
    if (g.Chance(15)) run.rejected.insert(id);
  }
  return run;
}

std::string SearchOptions(const Run& run, Generator& g) {
  std::string text = "<options>";
  for (const auto& [c, m, d, id] : run.managed) {
    // An id written with leading zeros is looked for as its number.
    std::string idText = (g.Chance(20) ? "00" : "") + N(id);
    std::string computer = "host" + N(c), folder = "\\f" + N(d) + "\\";
    text += Managed(computer, Drive(m), folder, idText);
    if (g.Chance(20)) text += Managed(computer, "c:", "\\f0\\", idText, "0");
    // Checked twice: the second check must not find what the first one moved.
    if (g.Chance(10)) text += Managed(computer, Drive(m), folder, N(id));
  }
  return text + "</options>";
}

std::string PathOf(const Key& key) { return Names(key) + "/a[@a_id='" + N(key[3]) + "']"; }

xml::Node At(xml::Document& document, const App& app) {
  return document.AsNode().SelectSingleNode(PathOf(app.key));
}

// How often each outcome came up, so that the generator is seen to reach them all.
struct Seen {
  int kept = 0, replaced = 0, changed = 0, missing = 0, pruned = 0;
};

void CheckRun(uint32_t trial, Seen& seen) {
  SCOPED_TRACE("trial " + std::to_string(trial));
  Run run = Generate(trial);
  Generator g{std::mt19937(trial ^ 0x5bd1e995u)};
  std::string root = Attr("a_update_q", run.rootUpdate) + Attr("a_dupes_q", run.rootDupes);
  auto old = Parse(ResultsXml(run.old, root));
  // Without new results the merge takes an empty list of them.
  auto fresh = run.fresh.empty() ? nullptr : Parse(ResultsXml(run.fresh, ""));
  std::map<Key, std::string> before;
  for (const auto& [key, app] : run.old) before[key] = Content(At(*old, app));

  std::string rejected = "<options>";
  for (int id : run.rejected) rejected += "<a a_id='" + N(id) + "' a_selected='0'/>";
  ASSERT_TRUE(MergeNow(Parse(SearchOptions(run, g)), Parse(rejected + "</options>"), old, fresh)
                  .events.empty());
  EXPECT_EQ(fresh ? fresh->AsNode().CountNodes("//a") : 0u, 0u);

  std::multiset<std::string> missing;
  size_t kept = 0;
  for (const auto& [key, o] : run.old) {
    xml::Node now = At(*old, o);
    if (auto n = run.fresh.find(key); n != run.fresh.end()) {
      ASSERT_TRUE(now) << "replaced " << key[3];
      const App& fresher = n->second;
      EXPECT_EQ(now.GetAttribute("v_id"), N(*fresher.vId));
      EXPECT_EQ(now.GetAttribute("a_manage"), o.manage.value_or("1"));
      int oldId = o.vId.value_or(0);
      std::string update = fresher.update.value_or(o.update.value_or(run.rootUpdate.value_or("1")));
      if (*fresher.vId == -1 && oldId != -1) update = "1";
      EXPECT_EQ(now.GetAttribute("a_update_q"), update);
      EXPECT_EQ(now.GetAttribute("a_dupes_q"),
                fresher.dupes.value_or(o.dupes.value_or(run.rootDupes.value_or("1"))));
      std::vector<std::string> history;
      for (int v : o.history) history.push_back(N(v));
      if (*fresher.vId != oldId && oldId != 0) history.push_back(N(o.firstVersion));
      auto actual = ValuesOf(*old, PathOf(key) + "/v_history/v", "v_id");
      EXPECT_EQ(actual, history) << "history of " << key[3];
      ++seen.replaced;
      if (actual.size() > o.history.size()) {
        // The entry added is a shallow copy of the old first version, stamped now.
        ++seen.changed;
        std::string entry;
        for (const auto& [name, value] : now.SelectNodes("v_history/v").back().Attributes())
          entry += name + "=" +
                   (name == "v_updated" && std::regex_match(value, kStamp) ? "" : value) + ";";
        EXPECT_EQ(entry, "v_id=" + actual.back() + ";v_name=V" + actual.back() +
                             ";v_updated=;v_update_q=1;");
        EXPECT_TRUE(now.SelectNodes("v_history/v").back().ChildNodes().empty());
      }
    } else if (run.managed.count(key) && !run.rejected.count(key[3])) {
      EXPECT_FALSE(now) << "missing " << key[3];
      missing.insert(N(key[3]));
      ++seen.missing;
      if (old->AsNode().CountNodes(Names(key)) == 0) ++seen.pruned;
    } else {
      ASSERT_TRUE(now) << "kept " << key[3];
      EXPECT_EQ(Content(now), before[key]);
      ++kept;
      ++seen.kept;
    }
  }
  for (const auto& [key, n] : run.fresh) {
    xml::Node now = At(*old, n);
    ASSERT_TRUE(now) << "new " << n.key[3];
    EXPECT_EQ(now.SelectSingleNode("v").GetAttribute("v_id"), N(n.firstVersion));
  }
  EXPECT_EQ(old->AsNode().CountNodes("//d/a"), kept + run.fresh.size());

  auto listed = ValuesOf(*old, "/*/a_missing/a", "a_id");
  EXPECT_EQ(std::multiset<std::string>(listed.begin(), listed.end()), missing);
  // Listed copies are shallow, and marked as neither managed nor present.
  EXPECT_EQ(old->AsNode().CountNodes("//a_missing/a[* or not(@a_manage='0' and @a_missing='1')]"),
            0u);
  EXPECT_EQ(old->AsNode().CountNodes("/*/a_missing"), missing.empty() ? 0u : 1u);
  // Pruning leaves no empty folder or drive; an emptied computer stays only beside others.
  EXPECT_EQ(old->AsNode().CountNodes("//d[not(a)] | //m[not(d)]"), 0u);
  if (run.computers == 1) {
    EXPECT_EQ(old->AsNode().CountNodes("//c[not(m)]"), 0u);
  }
}

TEST(MergePropertyTest, EveryApplicationIsKeptReplacedOrMissing) {
  Seen seen;
  for (uint32_t trial = 1; trial <= 1500; ++trial) {
    CheckRun(trial, seen);
    if (HasFatalFailure() || HasNonfatalFailure()) break;
  }
  for (int count : {seen.kept, seen.replaced, seen.changed, seen.missing, seen.pruned}) {
    EXPECT_GT(count, 100);
  }
}

}  // namespace
}  // namespace trl::testing
