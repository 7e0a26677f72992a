// The probe of the applications a folder entry lists, from their fingerprint files.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "search/search_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;

class SearchProbeTest : public SearchTest {
 protected:
  void SetUp() override {
    SearchTest::SetUp();
    tree_.AddFolder("Acme/Bin");
    tree_.AddFile("Acme/Main.DLL", "main");
    tree_.AddFile("Acme/Bin/App.EXE", "app");
  }

  // The Acme folder entry, not walked, listing `applications`.
  std::string Options(std::string_view applications) const {
    return LocalOptions(tree_.Path("Acme"), "", applications);
  }
};

TEST_F(SearchProbeTest, ProbeFolderFollowsRelativeAndFullPaths) {
  const std::string acme = Lower(Folder("Acme"));
  const std::string bin = Lower(Folder("Acme/Bin"));
  const std::string fullBin = tree_.Path("Acme/Bin");
  struct Case {
    std::string name, relpath, fullpath, folder;
    std::vector<std::string> found;
  };
  const Case cases[] = {
      {"MAIN.dll", "", "", acme, {"Main.DLL"}},
      {"app.exe", "", "", acme, {}},
      {"app.exe", "Bin", "", bin, {"App.EXE"}},
      {"app.exe", "\\Bin", "", bin, {"App.EXE"}},
      {"app.exe", "Bin\\", "", bin, {"App.EXE"}},
      {"app.exe", fullBin, "True", Lower(fullBin + "\\"), {"App.EXE"}},
      // Only "True" makes the path full: otherwise it is joined to the folder.
      {"app.exe", fullBin, "true", acme + Lower(fullBin.substr(1) + "\\"), {}},
      {"missing.exe", "Bin", "", bin, {}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name + " in '" + c.relpath + "' full '" + c.fullpath + "'");
    auto fingerprint =
        Parse(R"(<fp><a a_id="100"><v v_id="1"><f f_name=")" + c.name + R"(" f_relpath=")" +
              c.relpath + R"(" f_fullpath=")" + c.fullpath + R"("/></v></a></fp>)");
    auto results = Run(Options(R"(<a a_id="100" a_name="Acme"/>)"), fingerprint);
    EXPECT_THAT(ValuesOf(*results, "/*/c/m/d", "d_text"), ElementsAre(c.folder));
    EXPECT_THAT(ValuesOf(*results, "/*/c/m/d/f", "f_text"), ElementsAreArray(c.found));
    EXPECT_THAT(EventsIn(*results), IsEmpty());
  }
}

TEST_F(SearchProbeTest, RecordsTheFileUnderItsProbeFolder) {
  auto fingerprint =
      Parse(R"(<fp><a a_id="100"><v v_id="1"><f f_name="App.exe" f_relpath="Bin" f_fullpath=""/>)"
            R"(</v></a></fp>)");
  auto results = Run(Options(R"(<a a_id="100" a_name="Acme"/>)"), fingerprint);
  const std::string bin = Lower(Folder("Acme/Bin"));
  EXPECT_EQ(Untimed(*results),
            R"(<trl_applicationdata><c c_id="1" c_text="localhost" c_name="localhost" )"
            R"(c_local="1"><m m_id="1" m_text="" m_name=""><d d_id="1" d_text=")" +
                bin + R"(" d_name=")" + bin +
                R"("><f f_id="1" f_text="App.EXE" f_name="app.exe"/></d></m></c>)"
                R"(</trl_applicationdata>)");
}

TEST_F(SearchProbeTest, ChildApplicationsOfTheListedOneAreProbedToo) {
  auto fingerprint =
      Parse(R"(<fp><a a_id="100"><f f_name="main.dll" f_relpath="" f_fullpath=""/></a>)"
            R"(<a a_id="200" a_parent="100"><v v_id="2"><f f_name="app.exe" f_relpath="Bin")"
            R"( f_fullpath=""/></v></a>)"
            R"(<a a_id="300" a_parent="999"><f f_name="other.exe" f_relpath="Other")"
            R"( f_fullpath=""/></a></fp>)");
  auto results = Run(Options(R"(<a a_id="100" a_name="Acme"/>)"), fingerprint);
  EXPECT_THAT(ValuesOf(*results, "//d", "d_text"),
              ElementsAre(Lower(Folder("Acme")), Lower(Folder("Acme/Bin"))));
  EXPECT_THAT(ValuesOf(*results, "//f", "f_text"), ElementsAre("Main.DLL", "App.EXE"));
}

TEST_F(SearchProbeTest, UnknownApplicationIsOneWarningAndNoFolder) {
  auto fingerprint = Parse(R"(<fp><a a_id="100"><f f_name="main.dll"/></a></fp>)");
  auto results = Run(Options(R"(<a a_id="555" a_name="Gadget"/>)"), fingerprint);
  EXPECT_THAT(ValuesOf(*results, "//d", "d_text"), IsEmpty());
  EXPECT_THAT(EventsIn(*results),
              ElementsAre(ReportedEvent{-2147201302, 2, "Search", "Search",
                                        "'Gadget' is not currently supported", ""}));
}

TEST_F(SearchProbeTest, DeselectedApplicationLeavesNoTrace) {
  auto fingerprint =
      Parse(R"(<fp><a a_id="7"><f f_name="main.dll" f_relpath="" f_fullpath=""/></a></fp>)");
  auto results = Run(Options(R"(<a a_id="7" a_name="Acme"/>)"), fingerprint,
                     Parse(R"(<opts><a a_id="7" a_selected="0"/></opts>)"));
  EXPECT_EQ(Untimed(*results),
            R"(<trl_applicationdata><c c_id="1" c_text="localhost" c_name="localhost" )"
            R"(c_local="1"><m m_id="1" m_text="" m_name=""/></c></trl_applicationdata>)");
}

// A probe of a folder the walk recorded adds to its d instead of making another.
TEST_F(SearchProbeTest, ProbeOfAWalkedFolderJoinsItsRecord) {
  auto fingerprint =
      Parse(R"(<fp><a a_id="100"><f f_name="app.exe" f_relpath="Bin" f_fullpath=""/></a></fp>)");
  auto results = Run(LocalOptions(tree_.Path("Acme"), R"(d_search="1")",
                                  R"(<d_search_mask/><a a_id="100" a_name="Acme"/>)"),
                     fingerprint);
  EXPECT_THAT(ValuesOf(*results, "//d", "d_text"), ElementsAre(Folder("Acme"), Folder("Acme/Bin")));
  EXPECT_THAT(ValuesOf(*results, "//f", "f_text"), ElementsAre("Main.DLL", "App.EXE"));
}

}  // namespace
}  // namespace trl::testing
