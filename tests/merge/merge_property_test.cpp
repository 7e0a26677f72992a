// Generated user data and runs: every old application survives, is replaced by its new entry or
// goes to the missing list, and every new application lands in the merged tree.
#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <optional>
#include <random>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "merge/merge_fixture.h"

namespace trl::testing {
namespace {

using Place3 = std::tuple<int, int, int>;    // computer, drive, folder
using Key = std::tuple<int, int, int, int>;  // place and a_id

struct App {
  Place3 place;
  int id = 0;
  std::optional<int> vId;  // the a's v_id; nothing when absent
  std::optional<std::string> manage, update, dupes;
  std::vector<int> history;  // old entries only
  int firstVersion = 0;      // the first v's v_id
};

class Generator {
 public:
  explicit Generator(uint32_t trial) : rng_(trial) {}

  int Below(int n) { return static_cast<int>(rng_() % static_cast<uint32_t>(n)); }
  bool Chance(int percent) { return Below(100) < percent; }
  std::optional<std::string> Flag(int percentPresent) {
    if (!Chance(percentPresent)) return std::nullopt;
    return std::string(Chance(50) ? "1" : "0");
  }
  Place3 AnyPlace(int computers) { return {Below(computers), Below(2), Below(3)}; }

 private:
  std::mt19937 rng_;
};

std::string Attr(std::string_view name, const std::optional<std::string>& value) {
  return value ? " " + std::string(name) + "='" + *value + "'" : "";
}

std::string AppXml(const App& app, bool withHistory) {
  std::string text =
      "<a a_id='" + std::to_string(app.id) + "' a_name='N" + std::to_string(app.id) + "'" +
      Attr("v_id", app.vId ? std::optional(std::to_string(*app.vId)) : std::nullopt) +
      Attr("a_manage", app.manage) + Attr("a_update_q", app.update) + Attr("a_dupes_q", app.dupes) +
      "><v v_id='" + std::to_string(app.firstVersion) + "'/>";
  if (withHistory && !app.history.empty()) {
    text += "<v_history>";
    for (int v : app.history) text += "<v v_id='" + std::to_string(v) + "'/>";
    text += "</v_history>";
  }
  return text + "</a>";
}

std::string Names(const Place3& place) {
  auto [c, m, d] = place;
  return "//c[@c_name='host" + std::to_string(c) + "']/m[@m_name='" + std::string(1, 'c' + m) +
         ":']/d[@d_name='\\f" + std::to_string(d) + "\\']";
}

// Results text with the applications grouped by place; only places with applications appear.
std::string ResultsXml(const std::vector<App>& apps, bool withHistory, const std::string& root) {
  std::map<Place3, std::vector<const App*>> byPlace;
  for (const App& app : apps) byPlace[app.place].push_back(&app);
  std::string body;
  int ids = 0;
  std::optional<int> openC, openM;
  for (const auto& [place, list] : byPlace) {
    auto [c, m, d] = place;
    if (openC != c) {
      if (openC) body += "</m></c>";
      body += "<c c_id='" + std::to_string(++ids) + "' c_text='Host" + std::to_string(c) +
              "' c_name='host" + std::to_string(c) + "'>";
      openC = c;
      openM.reset();
    }
    if (openM != m) {
      if (openM) body += "</m>";
      std::string drive = std::string(1, 'c' + m) + ":";
      body +=
          "<m m_id='" + std::to_string(++ids) + "' m_text='" + drive + "' m_name='" + drive + "'>";
      openM = m;
    }
    body += "<d d_id='" + std::to_string(++ids) + "' d_text='\\F" + std::to_string(d) +
            "\\' d_name='\\f" + std::to_string(d) + "\\'>";
    for (const App* app : list) body += AppXml(*app, withHistory);
    body += "</d>";
  }
  if (openC) body += "</m></c>";
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
  std::vector<App> old, fresh;
  std::set<Key> managed;   // places and ids the search options manage
  std::set<int> rejected;  // a_ids the application options reject
  std::optional<std::string> rootUpdate, rootDupes;
  int computers = 1;
};

Run Generate(uint32_t trial) {
  Generator g(trial);
  Run run;
  run.computers = 1 + g.Below(2);
  run.rootUpdate = g.Flag(50);
  run.rootDupes = g.Flag(50);
  std::set<Key> oldKeys, newKeys;
  for (int i = 0, n = 1 + g.Below(10); i < n; ++i) {
    App app;
    app.place = g.AnyPlace(run.computers);
    app.id = 1 + g.Below(6);
    auto [c, m, d] = app.place;
    if (!oldKeys.insert({c, m, d, app.id}).second) continue;
    if (int kind = g.Below(6); kind > 0) app.vId = kind == 1 ? -1 : kind - 1;
    app.manage = g.Flag(70);
    app.update = g.Flag(40);
    app.dupes = g.Flag(40);
    for (int h = g.Below(3); h > 0; --h) app.history.push_back(1 + g.Below(9));
    app.firstVersion = app.vId && *app.vId > 0 ? *app.vId : 1 + g.Below(5);
    run.old.push_back(app);
    if (g.Chance(50)) run.managed.insert({c, m, d, app.id});
  }
  auto addNew = [&](App app) {
    auto [c, m, d] = app.place;
    if (!newKeys.insert({c, m, d, app.id}).second) return;
    app.manage = g.Chance(30) ? std::optional<std::string>(g.Chance(50) ? "1" : "0") : std::nullopt;
    app.update = g.Flag(20);
    app.dupes = g.Flag(20);
    app.history.clear();
    app.firstVersion = app.vId && *app.vId > 0 ? *app.vId : 1;
    run.fresh.push_back(app);
  };
  for (const App& old : run.old) {
    App next = old;
    switch (g.Below(6)) {
      case 0:
        break;  // same version
      case 1:
        next.vId = old.vId.value_or(0) + 1;
        break;  // upgrade
      case 2:
        next.vId = -1;
        break;  // no longer identified
      case 3:
        next.vId = g.Below(2) ? 1 : -1;
        break;  // downgrade or unknown
      case 4:
        next.place = g.AnyPlace(run.computers + 1);
        break;  // moved, maybe to a new computer
      case 5:
        continue;  // gone
    }
    if (!next.vId) next.vId = 1;
    addNew(next);
  }
  for (int i = g.Below(4); i > 0; --i) {
    App app;
    app.place = g.AnyPlace(run.computers + 1);
    app.id = 1 + g.Below(6);
    app.vId = g.Chance(20) ? -1 : 1 + g.Below(5);
    addNew(app);
  }
  for (int i = g.Below(3); i > 0; --i) {  // managed places that may hold nothing
    auto [c, m, d] = g.AnyPlace(run.computers);
    run.managed.insert({c, m, d, 1 + g.Below(6)});
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
    std::string idText = (g.Chance(20) ? "00" : "") + std::to_string(id);
    std::string computer = "host" + std::to_string(c);
    std::string drive = std::string(1, 'c' + m) + ":";
    std::string folder = "\\f" + std::to_string(d) + "\\";
    text += Managed(computer, drive, folder, idText);
    if (g.Chance(20)) text += Managed("host" + std::to_string(c), "c:", "\\f0\\", idText, "0");
    // Checked twice: the second check must not find what the first one moved.
    if (g.Chance(10)) text += Managed(computer, drive, folder, std::to_string(id));
  }
  return text + "</options>";
}

std::string ApplicationOptions(const Run& run) {
  std::string text = "<options>";
  for (int id : run.rejected) text += "<a a_id='" + std::to_string(id) + "' a_selected='0'/>";
  return text + "</options>";
}

xml::Node At(xml::Document& document, const App& app) {
  return document.AsNode().SelectSingleNode(Names(app.place) + "/a[@a_id='" +
                                            std::to_string(app.id) + "']");
}

// How often each outcome came up, so that the generator is seen to reach them all.
struct Seen {
  int kept = 0, replaced = 0, changed = 0, missing = 0, pruned = 0;
};

void CheckRun(uint32_t trial, Seen& seen) {
  SCOPED_TRACE("trial " + std::to_string(trial));
  Run run = Generate(trial);
  Generator g(trial ^ 0x5bd1e995u);
  std::string root = Attr("a_update_q", run.rootUpdate) + Attr("a_dupes_q", run.rootDupes);
  auto old = Parse(ResultsXml(run.old, true, root));
  auto fresh = Parse(ResultsXml(run.fresh, false, ""));
  std::map<Key, std::string> before;
  for (const App& app : run.old)
    before[{std::get<0>(app.place), std::get<1>(app.place), std::get<2>(app.place), app.id}] =
        Content(At(*old, app));

  ASSERT_TRUE(MergeNow(Parse(SearchOptions(run, g)), Parse(ApplicationOptions(run)), old, fresh)
                  .events.empty());
  EXPECT_EQ(fresh->AsNode().CountNodes("//a"), 0u);

  std::map<Key, const App*> freshAt;
  for (const App& app : run.fresh) {
    freshAt[{std::get<0>(app.place), std::get<1>(app.place), std::get<2>(app.place), app.id}] =
        &app;
  }
  std::multiset<std::string> missing;
  size_t kept = 0;
  for (const App& o : run.old) {
    Key key{std::get<0>(o.place), std::get<1>(o.place), std::get<2>(o.place), o.id};
    xml::Node now = At(*old, o);
    if (auto n = freshAt.find(key); n != freshAt.end()) {
      ASSERT_TRUE(now) << "replaced " << o.id;
      const App& fresher = *n->second;
      EXPECT_EQ(now.GetAttribute("v_id"), std::to_string(*fresher.vId));
      EXPECT_EQ(now.GetAttribute("a_manage"), o.manage.value_or("1"));
      int oldId = o.vId.value_or(0);
      std::string update = fresher.update.value_or(o.update.value_or(run.rootUpdate.value_or("1")));
      if (*fresher.vId == -1 && oldId != -1) update = "1";
      EXPECT_EQ(now.GetAttribute("a_update_q"), update);
      EXPECT_EQ(now.GetAttribute("a_dupes_q"),
                fresher.dupes.value_or(o.dupes.value_or(run.rootDupes.value_or("1"))));
      std::vector<std::string> history;
      for (int v : o.history) history.push_back(std::to_string(v));
      if (*fresher.vId != oldId && oldId != 0) history.push_back(std::to_string(o.firstVersion));
      std::vector<std::string> actual;
      for (const xml::Node& v : now.SelectNodes("v_history/v"))
        actual.push_back(*v.GetAttribute("v_id"));
      EXPECT_EQ(actual, history) << "history of " << o.id;
      ++seen.replaced;
      if (actual.size() > o.history.size()) ++seen.changed;
    } else if (run.managed.count(key) && !run.rejected.count(o.id)) {
      EXPECT_FALSE(now) << "missing " << o.id;
      missing.insert(std::to_string(o.id));
      ++seen.missing;
      if (old->AsNode().CountNodes(Names(o.place)) == 0) ++seen.pruned;
    } else {
      ASSERT_TRUE(now) << "kept " << o.id;
      EXPECT_EQ(Content(now), before[key]);
      ++kept;
      ++seen.kept;
    }
  }
  for (const App& n : run.fresh) {
    xml::Node now = At(*old, n);
    ASSERT_TRUE(now) << "new " << n.id;
    EXPECT_EQ(now.SelectSingleNode("v").GetAttribute("v_id"), std::to_string(n.firstVersion));
  }
  EXPECT_EQ(old->AsNode().CountNodes("//d/a"), kept + run.fresh.size());

  std::multiset<std::string> listed;
  for (const xml::Node& copy : old->AsNode().SelectNodes("/*/a_missing/a")) {
    listed.insert(*copy.GetAttribute("a_id"));
    EXPECT_EQ(copy.GetAttribute("a_manage"), "0");
    EXPECT_EQ(copy.GetAttribute("a_missing"), "1");
  }
  EXPECT_EQ(listed, missing);
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
