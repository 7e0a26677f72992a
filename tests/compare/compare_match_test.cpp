// Scoring found files, the candidates a run tests, and the pruning of incomplete versions.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <ctime>

#include "compare/compare_fixture.h"
#include "support/fault_injecting_file_system.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

using CompareMatchTest = CompareTest;

std::vector<int32_t> EventNumbers(xml::Document& results) {
  std::vector<int32_t> numbers;
  for (const ReportedEvent& event : EventsIn(results)) numbers.push_back(event.number);
  return numbers;
}

std::string OneFileFingerprint(std::string_view properties) {
  return R"(<fp><a a_id="1" a_name="A"><v v_id="1" v_seq="1"><f f_id="1" f_name="data.bin" )"
         R"(f_relpath="" f_weight="1">)" +
         std::string(properties) + "</f></v></a></fp>";
}

TEST_F(CompareMatchTest, PropertiesAddTheBitsOfTheirWeightsWhenTheyAgree) {
  tree_.AddFile("data.bin", "abc");
  std::tm written{};
  written.tm_year = 124;  // 2024-05-06 07:08:09, local time
  written.tm_mon = 4;
  written.tm_mday = 6;
  written.tm_hour = 7;
  written.tm_min = 8;
  written.tm_sec = 9;
  written.tm_isdst = -1;
  const timespec times[2] = {{std::mktime(&written), 0}, {std::mktime(&written), 0}};
  ASSERT_EQ(utimensat(AT_FDCWD, tree_.Native("data.bin").c_str(), times, 0), 0);
  const std::string size = R"(<p p_type="2" p_weight="1" p_value="3"/>)";
  const std::string time = R"(<p p_type="4" p_weight="3" p_value="2024-05-06 07:08:09"/>)";
  struct Case {
    std::string properties;
    const char* mask;   // p_act
    const char* score;  // v_act: the file's bit only when every property agreed
    std::vector<int32_t> events;
  } cases[] = {
      {size, "1", "1", {}},
      {R"(<p p_type="2" p_weight="1" p_value="4"/>)", "0", "0", {}},
      {R"(<p p_type="2" p_weight="1" p_value="three"/>)", "0", "0", {13}},
      {R"(<p p_type="3" p_weight="2" p_value="900150983CD24FB0D6963F7D28E17F72"/>)", "2", "1", {}},
      {R"(<p p_type="3" p_weight="2" p_value="900150983cd24fb0d6963f7d28e17f73"/>)", "0", "0", {}},
      {R"(<p p_type="1" p_weight="1" p_value=""/>)", "1", "1", {}},
      {R"(<p p_type="1" p_weight="1" p_value="1.0.0.0"/>)", "0", "0", {}},
      {time, "4", "1", {}},
      {R"(<p p_type="4" p_weight="3" p_value="2024-05-06 07:08:10"/>)", "0", "0", {}},
      {R"(<p p_type="4" p_weight="3" p_value="soon"/>)", "0", "0", {13}},
      {R"(<p p_type="5" p_weight="1" p_value="3"/>)", "0", "0", {kErrUnknownPropertyType}},
      {size + R"(<p p_type="2" p_weight="2" p_value="9"/>)" + time, "5", "0", {}},
      // The mask cannot hold both; nor can the file's p_max hold their sum.
      {R"(<p p_type="2" p_weight="15" p_value="3"/><p p_type="2" p_weight="15" p_value="3"/>)",
       "16384",
       "0",
       {kOverflow, kOverflow}},
      {"", "0", "1", {}},
  };
  for (const Case& c : cases) {
    auto results = Run(OneFileFingerprint(c.properties), LocalFiles({{Folder(), {"data.bin"}}}));
    SCOPED_TRACE(c.properties);
    EXPECT_THAT(ValuesOf(*results, "//a/v/f", "p_act"), ElementsAre(c.mask));
    EXPECT_THAT(ValuesOf(*results, "//a/v", "v_act"), ElementsAre(c.score));
    EXPECT_THAT(ValuesOf(*results, "//a/v", "f_act"), ElementsAre("1"));
    EXPECT_EQ(EventNumbers(*results), c.events);
  }
}

TEST_F(CompareMatchTest, UnknownPropertyKindIsReportedByName) {
  tree_.AddFile("data.bin");
  auto results = Run(OneFileFingerprint(R"(<p p_type="7" p_weight="1" p_value="x"/>)"),
                     LocalFiles({{Folder(), {"data.bin"}}}));
  EXPECT_THAT(EventsIn(*results), ElementsAre(ReportedEvent{kErrUnknownPropertyType, 1, "Compare",
                                                            "MatchFile", "Unknown property type: 7",
                                                            "trlLocator.Compare.MatchFile"}));
}

// A file tested for several versions is looked at and opened once; a failure to read it is
// still reported at each test.
TEST_F(CompareMatchTest, FileTestedForSeveralVersionsIsReadOnceAndFailsEachTime) {
  tree_.AddFile("data.bin", "abc");
  auto system = fs::CreatePosixFileSystem({});
  auto faulty = std::make_unique<FaultInjectingFileSystem>(*system);
  FaultInjectingFileSystem& faults = *faulty;
  faults.FailOn(FaultInjectingFileSystem::Operation::kOpenFile, tree_.Path("data.bin"), 57);
  std::string version = R"(<f f_id="1" f_name="data.bin" f_relpath="" f_weight="1">)"
                        R"(<p p_type="2" p_weight="1" p_value="3"/>)"
                        R"(<p p_type="3" p_weight="2" p_value="x"/></f></v>)";
  Compare compare(std::move(faulty));
  compare.Asynchronous(false);
  auto results = Parse(compare.Start(nullptr, Parse(LocalFiles({{Folder(), {"data.bin"}}})),
                                     Parse(R"(<fp><a a_id="1"><v v_id="1" v_seq="1">)" + version +
                                           R"(<v v_id="2" v_seq="2">)" + version + "</a></fp>")));
  EXPECT_THAT(ValuesOf(*results, "//a/v/f", "p_act"), ElementsAre("1", "1"));
  EXPECT_THAT(EventNumbers(*results), ElementsAre(57, 57));
  EXPECT_EQ(faults.Calls(FaultInjectingFileSystem::Operation::kFileExists), 1);
  EXPECT_EQ(faults.Calls(FaultInjectingFileSystem::Operation::kOpenFile), 1);
}

// A fingerprint file is read once for all its candidates, but what cannot be read is reported at
// each candidate, in the order a fresh read would report it.
TEST_F(CompareMatchTest, UnreadableFingerprintValuesAreReportedAtEachCandidate) {
  tree_.AddFolder("two");
  tree_.AddFile("data.bin", "abc");
  tree_.AddFile("two/data.bin", "abc");
  auto results = Run(R"(<fp><a a_id="1"><v v_id="1" v_seq="1"><f f_name="data.bin" f_weight="1">)"
                     R"(<p p_type="2" p_weight="x" p_value="3"/></f></v></a></fp>)",
                     LocalFiles({{Folder(), {"data.bin"}}, {Folder("two"), {"data.bin"}}}));
  std::vector<std::string> where;
  for (const ReportedEvent& event : EventsIn(*results)) {
    where.push_back(event.procedure + " " + std::to_string(event.number));
  }
  // Without an f_id the find reaches no copy of the file (91).
  EXPECT_THAT(where,
              ElementsAre("UpgradeFingerprintData 13", "FindCommonPath 94", "MatchFile 13",
                          "UpdateFileDetails 94", "UpdateFileDetails 91", "FindCommonPath 94",
                          "MatchFile 13", "UpdateFileDetails 94", "UpdateFileDetails 91"));
}

TEST_F(CompareMatchTest, CandidatesAreTestedOnTheirOwnComputerAndOnlyWhereTheFolderFits) {
  for (const char* folder : {"local/Acme/bin", "share/Acme/bin", "local/Other"}) {
    tree_.AddFolder(folder);
    tree_.AddFile(std::string(folder) + "/Acme.exe", "x");
  }
  fs::ShareTable shares;
  shares.Add("fileserver", "apps", tree_.Native("share"));
  auto computer = [](const char* text, const char* local, const char* drive,
                     const std::string& folder) {
    return std::string("<c c_text='") + text + "' c_name='" + text + "' " + local + "><m m_text='" +
           drive + "' m_name='" + drive + "'><d d_text='" + folder + "' d_name='" + Lower(folder) +
           "'><f f_text='ACME.EXE' f_name='acme.exe'/></d></m></c>";
  };
  std::string localFiles =
      "<trl_applicationdata>" + computer("localhost", "c_local='1'", "", Folder("local/Acme/bin")) +
      computer("localhost", "c_local='1'", "", Folder("local/Other")) +
      computer("fileserver", "", "apps", "\\Acme\\bin\\") +
      computer("elsewhere", "c_local='0'", "apps", "\\Acme\\bin\\") + "</trl_applicationdata>";
  auto results = Run(R"(<fp><a a_id="1"><v v_id="1" v_seq="1"><f f_id="1" f_name="Acme.exe" )"
                     R"(f_relpath="bin" f_weight="1"/></v></a></fp>)",
                     localFiles, nullptr, std::move(shares));
  EXPECT_THAT(ValuesOf(*results, "/*/c", "c_text"), ElementsAre("localhost", "fileserver"));
  EXPECT_THAT(ValuesOf(*results, "/*/c/m/d", "d_text"),
              ElementsAre(Lower(Folder("local/Acme")), "\\acme\\"));
  EXPECT_THAT(ValuesOf(*results, "//v", "f_act"), ElementsAre("1", "1"));
  EXPECT_THAT(EventNumbers(*results), IsEmpty());
}

TEST_F(CompareMatchTest, FileFoundTwiceForOneVersionCountsOnce) {
  tree_.AddFile("app.exe");
  auto results = Run(R"(<fp><a a_id="1"><v v_id="1" v_seq="1"><f f_id="1" f_name="app.exe" )"
                     R"(f_relpath="" f_weight="2"/></v></a></fp>)",
                     LocalFiles({{Folder(), {"app.exe", "APP.EXE"}}}));
  EXPECT_THAT(ValuesOf(*results, "//v", "f_act"), ElementsAre("1"));
  EXPECT_THAT(ValuesOf(*results, "//v", "v_act"), ElementsAre("2"));
}

TEST_F(CompareMatchTest, VersionsMissingAWeightedFileAreRemoved) {
  tree_.AddFolder("acme");
  tree_.AddFile("acme/app.exe");
  auto results =
      Run(R"(<fp><a a_id="1"><v v_id="1" v_seq="1"><f f_id="1" f_name="app.exe" f_weight="1"/>)"
          R"(<f f_id="2" f_name="x.dll" f_weight="2"/></v>)"
          R"(<v v_id="2" v_seq="2"><f f_id="1" f_name="app.exe" f_weight="1"/>)"
          R"(<f f_id="2" f_name="optional.dll" f_weight="0"/></v>)"
          R"(<v v_id="3" v_seq="5"><f f_id="1" f_name="never.exe" f_weight="1"/></v></a>)"
          R"(<a a_id="2"><v v_id="1" v_seq="1"><f f_id="1" f_name="app.exe" f_weight="1"/>)"
          R"(<f f_id="2" f_name="gone.dll" f_weight="1"/></v></a></fp>)",
          LocalFiles({{Folder("acme"), {"app.exe"}}}));
  EXPECT_THAT(ValuesOf(*results, "//d/a", "a_id"), ElementsAre("1"));
  EXPECT_THAT(ValuesOf(*results, "//a", "a_max_seq"), ElementsAre("5"));
  EXPECT_THAT(ValuesOf(*results, "//a/v", "v_id"), ElementsAre("2"));
  EXPECT_THAT(ValuesOf(*results, "//a/v", "f_act"), ElementsAre("1"));
}

// Without pruning (no a_id to select by) an incomplete version stays; a later version with the
// same v_id completes the copy the first one made.
TEST_F(CompareMatchTest, IncompleteCopiesAreOnlyLeftOutWhenPruningWouldTakeThemOut) {
  tree_.AddFile("a.exe");
  tree_.AddFile("c.exe");
  auto versions = [](const char* secondId) {
    return R"(<v v_id="1" v_seq="1"><f f_id="1" f_name="a.exe" f_weight="1"/>)"
           R"(<f f_id="2" f_name="b.dll" f_weight="1"/></v><v v_id=")" +
           std::string(secondId) + R"(" v_seq="2"><f f_id="2" f_name="c.exe" f_weight="1"/></v>)";
  };
  std::string local = LocalFiles({{Folder(), {"a.exe", "c.exe"}}});
  auto unnamed = Run("<fp><a a_name='no id'>" + versions("2") + "</a></fp>", local);
  EXPECT_THAT(ValuesOf(*unnamed, "//a/v", "f_act"), ElementsAre("1", "1"));
  auto shared = Run("<fp><a a_id='1'>" + versions("1") + "</a></fp>", local);
  EXPECT_THAT(ValuesOf(*shared, "//a/v", "f_max"), ElementsAre("2"));
  EXPECT_THAT(ValuesOf(*shared, "//a/v", "f_act"), ElementsAre("2"));
}

// Every copy an application's pruning empties goes, each taking its folder; the copy between them
// and the next application's copies stay.
TEST_F(CompareMatchTest, PruningTakesOutEveryEmptiedCopyOfTheApplication) {
  for (const char* folder : {"one", "two", "three"}) {
    tree_.AddFolder(folder);
    tree_.AddFile(std::string(folder) + "/app.exe");
  }
  tree_.AddFile("two/x.dll");
  tree_.AddFile("three/tool.exe");
  auto results =
      Run(R"(<fp><a a_id="1"><v v_id="1" v_seq="1"><f f_id="1" f_name="app.exe" f_weight="1"/>)"
          R"(<f f_id="2" f_name="x.dll" f_weight="1"/></v></a>)"
          R"(<a a_id="2"><v v_id="1" v_seq="1"><f f_id="1" f_name="tool.exe" f_weight="1"/>)"
          R"(</v></a></fp>)",
          LocalFiles({{Folder("one"), {"app.exe"}},
                      {Folder("three"), {"app.exe", "tool.exe"}},
                      {Folder("two"), {"app.exe", "x.dll"}}}));
  EXPECT_THAT(ValuesOf(*results, "//d", "d_text"),
              ElementsAre(Lower(Folder("two")), Lower(Folder("three"))));
  EXPECT_THAT(ValuesOf(*results, "//d/a", "a_id"), ElementsAre("1", "2"));
}

TEST_F(CompareMatchTest, EmptiedBranchesGoUpToTheComputerOnlyWhenItIsTheOnlyOne) {
  tree_.AddFolder("share");
  tree_.AddFile("share/tool.exe");
  tree_.AddFile("app.exe");
  const std::string incomplete =
      R"(<a a_id="1"><v v_id="1" v_seq="1"><f f_id="1" f_name="app.exe" f_weight="1"/>)"
      R"(<f f_id="2" f_name="gone.dll" f_weight="1"/></v></a>)";
  const std::string complete =
      R"(<a a_id="2"><v v_id="1" v_seq="1"><f f_id="1" f_name="tool.exe" f_weight="1"/></v></a>)";
  std::string local = LocalFiles({{Folder(), {"app.exe"}}});
  auto alone = Run("<fp>" + incomplete + "</fp>", local);
  EXPECT_EQ(alone->AsNode().CountNodes("/*/c"), 0u);

  // The other computer's branch is made first, so the emptied computer stays, without drives.
  std::string remote = LocalFiles({{"\\", {"tool.exe"}}}, "fileserver", "", "apps");
  std::string both =
      remote.substr(0, remote.find("</trl_applicationdata>")) +
      local.substr(local.find("<c "), local.find("</trl_applicationdata>") - local.find("<c ")) +
      "</trl_applicationdata>";
  fs::ShareTable shares;
  shares.Add("fileserver", "apps", tree_.Native("share"));
  auto two = Run("<fp>" + complete + incomplete + "</fp>", both, nullptr, std::move(shares));
  EXPECT_THAT(ValuesOf(*two, "/*/c", "c_text"), ElementsAre("fileserver", "localhost"));
  EXPECT_EQ(two->AsNode().CountNodes("/*/c[@c_text='localhost']/*"), 0u);
  EXPECT_THAT(ValuesOf(*two, "//d/a", "a_id"), ElementsAre("2"));
}

}  // namespace
}  // namespace trl::testing
