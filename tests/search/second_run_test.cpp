// A worker run again sees the disk as it is then, not as its earlier run found it.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <functional>

#include "search/search_fixture.h"
#include "trl/compare.h"
#include "trl/locate.h"

namespace trl::testing {
namespace {

// Zeta is installed; Acme's App.EXE is looked up by its lower-cased name, below Apps.
xml::DocumentPtr Fingerprint() {
  return Parse(R"(<fp><a a_id="1" a_name="Zeta"><v v_id="1" v_name="1" v_seq="1"><f f_id="1")"
               R"( f_name="zeta.exe" f_relpath="Zeta" f_fullpath="" f_weight="1"/></v></a>)"
               R"(<a a_id="2" a_name="Acme"><v v_id="2" v_name="1" v_seq="1"><f f_id="2")"
               R"( f_name="App.exe" f_relpath="Acme" f_fullpath="" f_weight="1"/></v></a></fp>)");
}

// The files, applications and events a run's output holds, in byte order.
std::vector<std::string> Found(xml::Document& output) {
  std::vector<std::string> found = ValuesOf(output, "//d/f", "f_text");
  for (const std::string& name : ValuesOf(output, "//d/a", "a_name")) found.push_back(name);
  for (const ReportedEvent& e : EventsIn(output)) found.push_back(e.description);
  std::sort(found.begin(), found.end());
  return found;
}

TEST_F(SearchTest, EachRunSeesTheDiskAsItIsThen) {
  const std::string apps = Folder("Apps"), zeta = Folder("Apps/Zeta");
  // Zeta walked, then Apps without recursion (it lists Zeta again) and a probe for Acme.
  const std::string options =
      "<o>" +
      Computer(1, "localhost", "",
               Entry(1, zeta) + Entry(2, apps, R"(d_search="1" d_search_recurse="0")",
                                      R"(<d_search_mask/><a a_id="2" a_name="Acme"/>)")) +
      "</o>";
  using Runs = std::function<xml::DocumentPtr()>;  // one worker, run again at each call
  const auto search = [&]() -> Runs {
    auto worker = std::make_shared<Search>(fs::CreatePosixFileSystem({}));
    worker->Asynchronous(false);
    return [=] { return Parse(worker->Start(Parse(options), nullptr, Fingerprint())); };
  };
  const auto compare = [&]() -> Runs {
    auto worker = std::make_shared<Compare>(fs::CreatePosixFileSystem({}));
    worker->Asynchronous(false);
    return [=] { return Parse(worker->Start(nullptr, Run(LocalOptions(apps)), Fingerprint())); };
  };
  const auto locate = [&]() -> Runs {
    auto worker =
        std::make_shared<Locate>(fs::CreatePosixFileSystem({}), fs::CreatePosixFileSystem({}));
    worker->Asynchronous(false);
    return
        [=] { return Parse(worker->Start(Parse(LocalOptions(apps)), nullptr, 0, Fingerprint())); };
  };
  const auto update = [&] {
    std::filesystem::remove(tree_.Native("Apps/Zeta/old.txt"));
    tree_.AddFile("Apps/Zeta/new.txt");
    tree_.AddFolder("Apps/Acme");
    tree_.AddFile("Apps/Acme/App.EXE");
  };
  const auto uninstall = [&] { std::filesystem::remove_all(tree_.Native("Apps/Zeta")); };
  struct Case {
    std::function<Runs()> worker;
    std::function<void()> change;
    std::vector<std::string> first, second;
  };
  const Case cases[] = {
      {search, update, {"Zeta.EXE", "old.txt"}, {"App.EXE", "Zeta.EXE", "new.txt"}},
      {search, uninstall, {"Zeta.EXE", "old.txt"}, {"Path '" + zeta + "' could not be found"}},
      {compare, update, {"Zeta"}, {"Acme", "Zeta"}},
      {locate, update, {"Zeta"}, {"Acme", "Zeta"}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(&c - cases);
    std::filesystem::remove_all(tree_.Native("Apps"));
    tree_.AddFolder("Apps/Zeta");
    tree_.AddFile("Apps/Zeta/Zeta.EXE");
    tree_.AddFile("Apps/Zeta/old.txt");
    Runs run = c.worker();
    EXPECT_EQ(Found(*run()), c.first);
    c.change();
    EXPECT_EQ(Found(*run()), c.second);
  }
}

}  // namespace
}  // namespace trl::testing
