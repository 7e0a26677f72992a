// Fitting folders to files, scoring found files, the candidates a run tests, the copies it files
// and prunes, whole asynchronous runs (their reports, selection and cancel), and version copies
// kept aside until their version is matched against copies made at every find.
#include "trl/compare.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <memory>
#include <random>
#include <regex>
#include <string>
#include <string_view>
#include <tuple>
#include <utility>
#include <vector>

#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "platform/failure.h"
#include "support/documents.h"
#include "support/memory_file.h"

namespace trl::testing {
namespace {

// A folder of a local-files document and the names recorded in it.
struct LocalFolder {
  std::string text;  // d_text
  std::vector<std::string> files;
};

// A computer of a local-files document with one drive; names need no escapes. A file's f_name is
// its name as given: letter case must not matter to lookups.
std::string Computer(const std::string& name, const std::string& local, const std::string& drive,
                     const std::vector<LocalFolder>& folders) {
  std::string text = "<c c_text='" + name + "' c_name='" + Lower(name) + "' " + local +
                     "><m m_text='" + drive + "' m_name='" + Lower(drive) + "'>";
  for (const LocalFolder& folder : folders) {
    text += "<d d_text='" + folder.text + "' d_name='" + Lower(folder.text) + "'>";
    for (const std::string& file : folder.files) {
      text += "<f f_text='" + file + "' f_name='" + file + "'/>";
    }
    text += "</d>";
  }
  return text + "</m></c>";
}

// A local-files document with this computer alone.
std::string LocalFiles(const std::vector<LocalFolder>& folders) {
  return "<trl_applicationdata search_start='s0' search_end='s1'>" +
         Computer("localhost", "c_local='1'", "", folders) + "</trl_applicationdata>";
}

// The fields of a table row; none in an empty one.
std::vector<std::string> Fields(std::string_view row, char separator = '|') {
  std::vector<std::string> fields;
  if (!row.empty()) fields.emplace_back();
  for (char c : row) c == separator ? fields.emplace_back() : fields.back() += c;
  return fields;
}

// A fingerprint version: `files` as "name:weight ...", numbered from 1.
std::string Version(std::string_view attributes, std::string_view files) {
  std::string text = "<v " + std::string(attributes) + ">";
  int id = 0;
  for (const std::string& file : Words(files)) {
    std::vector<std::string> nameWeight = Fields(file, ':');
    text += "<f f_id='" + std::to_string(++id) + "' f_name='" + nameWeight[0] + "' f_weight='" +
            nameWeight[1] + "'/>";
  }
  return text + "</v>";
}

// Every file asked for exists but those whose name holds "gone"; its content is its own name and
// it was last written 2024-05-06 07:08:09. Every path tested is noted.
class NamedFiles : public fs::FileSystem {
 public:
  explicit NamedFiles(std::vector<std::string>* tested = nullptr) : tested_(tested) {}

  bool FileExists(std::string_view path) override {
    if (tested_) tested_->emplace_back(path);
    return path.find("gone") == std::string_view::npos;
  }
  bool FolderExists(std::string_view) override { return false; }
  std::unique_ptr<fs::File> GetFile(std::string_view path) override {
    std::string name(path.substr(path.rfind('\\') + 1));
    return std::make_unique<MemoryFile>(name, name, DateTime{2024, 5, 6, 7, 8, 9});
  }
  std::unique_ptr<fs::Folder> GetFolder(std::string_view) override { Fail(kPathNotFound); }

 private:
  std::vector<std::string>* tested_;
};

class SwitchedCompare : public Compare {
 public:
  SwitchedCompare(bool draft, std::unique_ptr<fs::FileSystem> files, bool explain)
      : Compare(std::move(files)) {
    DraftCopies(draft);
    Explaining(explain);
  }
};

class CompareTest : public ::testing::Test {
 protected:
  // Each test starts and ends with no reported events.
  void SetUp() override { ReleaseSharedReporter(); }
  void TearDown() override { ReleaseSharedReporter(); }

  // The text of a synchronous run, on NamedFiles unless `files` are given.
  static std::string Run(std::string_view fingerprint, std::string_view localFiles,
                         bool draft = true, std::unique_ptr<fs::FileSystem> files = nullptr,
                         bool explain = false) {
    SwitchedCompare compare(draft, files ? std::move(files) : std::make_unique<NamedFiles>(),
                            explain);
    compare.Asynchronous(false);
    return compare.Start(nullptr, Parse(localFiles), Parse(fingerprint));
  }
};

// The results in document order, in short: "c=c_text d=d_text a=a_id^a_max_seq v_name
// f_act/f_max/v_act ...".
std::string Summary(std::string_view results) {
  auto document = Parse(results);
  std::string text;
  for (const xml::Node& e : document->AsNode().SelectNodes("/*/c | //d | //d/a | //a/v")) {
    auto value = [&](const char* name) { return e.GetAttribute(name).value_or("-"); };
    std::string tag = e.NodeName();
    if (tag == "c") text += " c=" + value("c_text");
    if (tag == "d") text += " d=" + value("d_text");
    if (tag == "a") text += " a=" + value("a_id") + "^" + value("a_max_seq");
    if (tag == "v") {
      text += " " + value("v_name") + " " + value("f_act") + "/" + value("f_max") + "/" +
              value("v_act");
    }
  }
  return text.empty() ? text : text.substr(1);
}

using ::testing::ElementsAre;

std::vector<std::string> Events(const std::string& results) {
  std::vector<std::string> events;
  for (const ReportedEvent& event : EventsIn(*Parse(results))) events.push_back(event.description);
  return events;
}

// A fingerprint file data.bin with properties "type/weight[/value];...".
std::string OneFileFingerprint(const std::string& properties) {
  std::string text = R"(<fp><a a_id="1" a_name="A"><v v_id="1" v_name="v" v_seq="1"><f f_id="1" )"
                     R"(f_name="data.bin" f_relpath="" f_weight="1">)";
  for (const std::string& property : Fields(properties, ';')) {
    std::vector<std::string> p = Fields(property, '/');
    text += "<p p_type='" + p[0] + "' p_weight='" + p[1] + "'" +
            (p.size() > 2 ? " p_value='" + p[2] + "'/>" : "/>");
  }
  return text + "</f></v></a></fp>";
}

TEST_F(CompareTest, FolderFitsTheRelativePathOnlyAtABackslash) {
  // Rows "f_relpath|f_fullpath|folder|expected", an attribute left out where it is "-".
  const char* const rows =
      R"(bin|-|\apps\acme\bin\|\apps\acme\  \bin\|-|\apps\acme\bin\|\apps\acme\ )"
      R"(BIN|-|\apps\acme\bin\|\apps\acme\  |-|\apps\acme\bin\|\apps\acme\bin\ )"
      R"(\|-|\apps\acme\bin\|\apps\acme\bin\  data|-|\apps\acme\bin\|  bin|-|\x\bin|\x\ )"
      R"(lib\plugins|-|\x\lib\plugins\|\x\  bin|-|\bin\|\  bin|-|\appsbin\|  bin|-|bin| )"
      R"(\apps\acme\bin|True|\apps\acme\bin\|\apps\acme\bin\  -|-|\apps\|\apps\ )"
      R"(\apps\acme|True|\apps\acme\bin\|  \apps\acme\bin|true|\apps\acme\bin\|\)";
  for (const std::string& row : Words(rows)) {
    std::vector<std::string> c = Fields(row);
    std::string f = "<f f_name='x'";
    if (c[0] != "-") f += " f_relpath='" + c[0] + "'";
    if (c[1] != "-") f += " f_fullpath='" + c[1] + "'";
    EXPECT_EQ(Compare::FindCommonPath(Parse(f + "/>")->DocumentElement(), c[2]), c[3]) << row;
  }
  // Only the file without f_relpath is reported.
  EXPECT_THAT(TakeReportedEvents(),
              ElementsAre(ReportedEvent{94, 1, "Compare", "FindCommonPath", "Invalid use of Null",
                                        "trlLocator"}));
}

// data.bin holds "data.bin". Rows "properties|p_act|v_act|events;...": the file's bit counts in
// v_act only when every property agreed.
TEST_F(CompareTest, PropertiesAddTheBitsOfTheirWeightsWhenTheyAgree) {
  const char* const rows[] = {
      "2/1/8|1|1|",
      "2/1/9|0|0|",
      "2/1/eight|0|0|Type mismatch",
      "3/2/1094B026F81945A54E2B8F965AEE37DA|2|1|",
      "3/2/1094b026f81945a54e2b8f965aee37db|0|0|",
      "1/1/|1|1|",
      "1/1/1.0.0.0|0|0|",
      "4/3/2024-05-06 07:08:09|4|1|",
      "4/3/2024-05-06 07:08:10|0|0|",
      "4/3/soon|0|0|Type mismatch",
      "5/1/8|0|0|Unknown property type: 5",
      "5/1|0|0|Unknown property type: 5",  // an unknown kind reads no expected value
      "2/1/8;2/2/9;4/3/2024-05-06 07:08:09|5|0|",
      // The mask cannot hold both; nor can the file's p_max hold their sum.
      "2/15/8;2/15/8|16384|0|Overflow;Overflow",
      "|0|1|",
      // A weight that cannot be read is reported by the upgrade and again at each test.
      "2/x/8|0|1|Type mismatch;Type mismatch",
  };
  for (const char* row : rows) {
    std::vector<std::string> c = Fields(row);
    auto results = Run(OneFileFingerprint(c[0]), LocalFiles({{"\\", {"data.bin"}}}));
    SCOPED_TRACE(row);
    EXPECT_THAT(ValuesOf(*Parse(results), "//a/v/f", "p_act"), ElementsAre(c[1]));
    EXPECT_EQ(Summary(results), "c=localhost d=\\ a=1^1 v 1/1/" + c[2]);
    EXPECT_EQ(Events(results), Fields(c[3], ';'));
  }
}

// A local file that cannot be read into the index is reported while the run fills it, after what
// preparing the fingerprint reported, however many threads read ahead; the others are matched.
// Also where the local files far outnumber the fingerprint's, so that few are indexed.
TEST_F(CompareTest, IndexFailuresAreReportedInTheirPlaceWhateverReadsAhead) {
  std::vector<std::string> many;
  for (int i = 0; i < 8; ++i) many.push_back("other" + std::to_string(i) + ".txt");
  for (auto [threads, others] : {std::pair{0u, false}, {2u, false}, {2u, true}}) {
    std::vector<LocalFolder> folders = {{"\\", {"data.bin"}}};
    if (others) folders.push_back({"\\more\\", many});
    std::string local = LocalFiles(folders);
    local.insert(local.find("</d>"), "<f f_text='nameless'/>");
    SwitchedCompare compare(true, std::make_unique<NamedFiles>(), false);
    compare.Asynchronous(false);
    compare.ReadThreads(threads);
    std::string results = compare.Start(nullptr, Parse(local), Parse(OneFileFingerprint("2/x/8")));
    SCOPED_TRACE(std::to_string(threads) + (others ? " with other files" : ""));
    EXPECT_EQ(Summary(results), "c=localhost d=\\ a=1^1 v 1/1/1");
    std::vector<std::string> where;
    for (const ReportedEvent& e : EventsIn(*Parse(results))) where.push_back(e.procedure);
    EXPECT_THAT(where, ElementsAre("UpgradeFingerprintData", "FillRecordset", "MatchFile"));
  }
}

// The local files are indexed at an asynchronous Start, for only the names the fingerprint then
// has when they far outnumber its files; a client may still change either document before the
// run, which matches them as they are then.
TEST_F(CompareTest, DocumentsChangedAfterAnAsynchronousStartAreMatchedAsTheyAreThen) {
  std::vector<std::string> others;
  for (int i = 0; i < 8; ++i) others.push_back("other" + std::to_string(i) + ".txt");
  for (bool renamedInFingerprint : {false, true}) {
    SCOPED_TRACE(renamedInFingerprint ? "fingerprint file renamed" : "local file added");
    Compare compare(std::make_unique<NamedFiles>());
    compare.ReadThreads(2);
    std::string results;
    compare.OnStatusUpdate([&](const std::string&, const std::string& text) {
      if (!text.empty()) results = text;
    });
    auto local = Parse(LocalFiles({{"\\p\\", {"two.exe"}}, {"\\q\\", others}}));
    auto fingerprint = Parse("<fp><a a_id='1'>" +
                             Version("v_id='1' v_name='v' v_seq='1'", "one.exe:1") + "</a></fp>");
    EXPECT_EQ(compare.Start(nullptr, local, fingerprint), "");
    if (renamedInFingerprint) {
      fingerprint->AsNode().SelectSingleNode("//f").SetAttribute("f_name", "two.exe");
    } else {
      xml::Node f = local->CreateElement("f");
      f.SetAttribute("f_text", "one.exe");
      f.SetAttribute("f_name", "one.exe");
      local->AsNode().SelectSingleNode("//d").AppendChild(f);
    }
    ASSERT_TRUE(EventLoop::Current().RunUntil([&] { return compare.Status() == kStatusComplete; },
                                              std::chrono::seconds(10)));
    EXPECT_EQ(Summary(results), "c=localhost d=\\p\\ a=1^1 v 1/1/1");
  }
}

TEST_F(CompareTest, CandidatesAreTestedOnTheirOwnComputerAndOnlyWhereTheFolderFits) {
  std::string localFiles =
      "<trl_applicationdata>" +
      Computer("localhost", "c_local='1'", "/mnt",
               {{"\\Acme\\Bin\\", {"acme.exe"}}, {"\\Other\\", {"acme.exe"}}}) +
      Computer("fileserver", "", "apps", {{"\\acme\\bin\\", {"ACME.EXE"}}}) +
      Computer("elsewhere", "c_local='0'", "apps", {{"\\bin\\", {"acme.exe"}}}) +
      "</trl_applicationdata>";
  std::vector<std::string> tested;
  std::string results =
      Run(R"(<fp><a a_id="1"><v v_id="1" v_name="v" v_seq="1"><f f_id="1" f_name="Acme.exe" )"
          R"(f_relpath="bin" f_weight="1"/></v></a></fp>)",
          localFiles, true, std::make_unique<NamedFiles>(&tested));
  EXPECT_THAT(tested,
              ElementsAre("/mnt\\Acme\\Bin\\acme.exe", "\\\\fileserver\\apps\\acme\\bin\\ACME.EXE",
                          "\\\\elsewhere\\apps\\bin\\acme.exe"));
  EXPECT_EQ(Summary(results),
            "c=localhost d=\\acme\\ a=1^1 v 1/1/1 c=fileserver d=\\acme\\ a=1^1 v 1/1/1 "
            "c=elsewhere d=\\ a=1^1 v 1/1/1");
}

// Whole scenarios, drafting on and off.
TEST_F(CompareTest, VersionsAreFiledUnderEachFolderAndPrunedWhenAWeightedFileIsMissing) {
  // Rows: fingerprint, local files, summary.
  const std::tuple<std::string, std::string, std::string> cases[] = {
      // Only files of weight above 0 (as a number, fractions too) make a version incomplete; the
      // highest v_seq is taken over every version, found or not.
      {"<a a_id='1'>" + Version("v_id='1' v_name='v1' v_seq='1'", "a.exe:1 x.dll:2") +
           Version("v_id='2' v_name='v2' v_seq='2'", "a.exe:1 optional.dll:0") +
           Version("v_id='3' v_name='v3' v_seq='5'", "never.exe:1") +
           Version("v_id='4' v_name='v4' v_seq='1'", "a.exe:1 half.dll:0.5") + "</a><a a_id='2'>" +
           Version("v_id='1' v_name='w' v_seq='1'", "a.exe:1 gone.dll:1") + "</a>",
       LocalFiles({{"\\p\\", {"a.exe", "gone.dll"}}}), "c=localhost d=\\p\\ a=1^5 v2 1/2/1"},
      // Every copy the pruning empties goes with its folder; the copy between them and the next
      // application's copies stay.
      {"<a a_id='1'>" + Version("v_id='1' v_name='v' v_seq='1'", "a.exe:1 x.dll:1") +
           "</a><a a_id='2'>" + Version("v_id='1' v_name='t' v_seq='1'", "t.exe:1") + "</a>",
       LocalFiles({{"\\one\\", {"a.exe"}},
                   {"\\three\\", {"a.exe", "t.exe"}},
                   {"\\two\\", {"a.exe", "x.dll"}}}),
       "c=localhost d=\\two\\ a=1^1 v 2/2/2 d=\\three\\ a=2^1 t 1/1/1"},
      // The only computer goes with its last drive; with another computer only the drive goes.
      {"<a a_id='1'>" + Version("v_id='1' v_name='v' v_seq='1'", "a.exe:1 x.dll:1") + "</a>",
       LocalFiles({{"\\p\\", {"a.exe"}}}), ""},
      {"<a a_id='2'>" + Version("v_id='1' v_name='t' v_seq='1'", "t.exe:1") + "</a><a a_id='1'>" +
           Version("v_id='1' v_name='v' v_seq='1'", "a.exe:1 x.dll:1") + "</a>",
       "<trl_applicationdata>" + Computer("fileserver", "", "apps", {{"\\", {"t.exe"}}}) +
           Computer("localhost", "c_local='1'", "", {{"\\p\\", {"a.exe"}}}) +
           "</trl_applicationdata>",
       "c=fileserver d=\\ a=2^1 t 1/1/1 c=localhost"},
      // Without a v_id, no find reaches the copy an earlier one made.
      {"<a a_id='1'>" + Version("v_name='v' v_seq='1'", "a.exe:0 b.dll:0") + "</a>",
       LocalFiles({{"\\p\\", {"a.exe", "b.dll"}}}), "c=localhost d=\\p\\ a=1^1 v 1/2/0 v 1/2/0"},
      // Nor an application copy, without an a_id.
      {"<a>" + Version("v_id='1' v_name='v' v_seq='1'", "a.exe:0 b.dll:0") + "</a>",
       LocalFiles({{"\\p\\", {"a.exe", "b.dll"}}}),
       "c=localhost d=\\p\\ a=-^- v 1/2/0 a=-^- v 1/2/0"},
      // A nested application with the same a_id files its version in the same copy, which its
      // find completes.
      {"<a a_id='1'>" + Version("v_id='1' v_name='outer' v_seq='1'", "a.exe:1 gone.dll:1") +
           "<a a_id='1'><v v_id='1' v_name='inner' v_seq='1'>"
           "<f f_id='2' f_name='b.dll' f_weight='1'/></v></a></a>",
       LocalFiles({{"\\p\\", {"a.exe", "b.dll"}}}), "c=localhost d=\\p\\ a=1^1 outer 2/2/2"},
  };
  for (const auto& [fingerprint, localFiles, summary] : cases) {
    for (bool draft : {true, false}) {
      EXPECT_EQ(Summary(Run("<fp>" + fingerprint + "</fp>", localFiles, draft)), summary)
          << fingerprint << (draft ? " drafted" : "");
    }
  }
}

// Notes what a run reports, in order: "S<e_status>" and "P<a_id>:<e_matched>:<e_match_count>".
class CompareRunTest : public CompareTest {
 protected:
  CompareRunTest() {
    compare_.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      update_ = Parse(update);
      reports_.push_back("S" + Attribute("e_status"));
      results_ = Parse(results);
    });
    compare_.OnProgressUpdate([this](const std::string& update) {
      auto e = Parse(update);
      xml::Node root = e->DocumentElement();
      reports_.push_back("P" + *root.FirstChild().GetAttribute("a_id") + ":" +
                         *root.GetAttribute("e_matched") + ":" +
                         *root.GetAttribute("e_match_count"));
      if (reports_.back() == cancelAt_) compare_.Cancel();
    });
  }

  std::string Attribute(std::string_view name) const {
    return update_->DocumentElement().GetAttribute(name).value_or("<absent>");
  }

  void RunToEnd(std::string_view fingerprint, std::string_view localFiles,
                xml::DocumentPtr options = nullptr) {
    EXPECT_EQ(compare_.Start(std::move(options), Parse(localFiles), Parse(fingerprint)), "");
    ASSERT_TRUE(EventLoop::Current().RunUntil(
        [&] {
          return compare_.Status() == kStatusComplete || compare_.Status() == kStatusCancelled;
        },
        std::chrono::seconds(10)));
  }

  Compare compare_{std::make_unique<NamedFiles>()};
  std::vector<std::string> reports_;
  xml::DocumentPtr update_, results_;
  std::string cancelAt_;
};

TEST_F(CompareRunTest, RejectedApplicationsLeaveNoTraceAndCancelEndsBeforeTheNextApplication) {
  const char* const files[] = {"one.exe:1", "two.exe:1 two.dll:1", "three.exe:1", "four.exe:1"};
  std::string fingerprint = "<fp>";
  for (int i = 0; i < 4; ++i) {
    fingerprint += "<a a_id='" + std::to_string(i + 1) + "'>" +
                   Version("v_id='1' v_seq='1'", files[i]) + "</a>";
  }
  cancelAt_ = "P3:1:1";
  RunToEnd(fingerprint + "</fp>",
           LocalFiles({{"\\", {"one.exe", "two.exe", "three.exe", "four.exe"}}}),
           Parse("<options><a a_id='1' a_selected='0'/></options>"));
  EXPECT_THAT(reports_, ElementsAre("S1", "S2", "P2:0:0", "P3:0:0", "P3:1:1", "S255"));
  EXPECT_EQ(Attribute("e_a_count"), "2");
  EXPECT_EQ(Attribute("e_match_count"), "1");
  EXPECT_EQ(results_->DocumentElement().GetAttribute("cancelled"), "1");
  EXPECT_THAT(ValuesOf(*results_, "//d/a", "a_id"), ElementsAre("3"));
}

// Generated fingerprints (missing, repeated and differently written ids, nested applications,
// shared file names) and local files (one name in several folders, listed twice or not on disk)
// give the same results with copies drafted as with copies made at every find.
// Sized 5 to 7 by their names; "gone.ocx" is listed but on no disk.
const char* const kNames[] = {"a.exe", "bb.dll", "ccc.txt", "gone.ocx"};

// The results text without the times a run takes.
std::string Timeless(const std::string& text) {
  static const std::regex times(R"( (compare_start|compare_end|time)="[^"]*")");
  return std::regex_replace(text, times, "");
}

// The results without what a run that explains keeps besides them.
std::string WithoutReasons(const std::string& results) {
  auto document = Parse(results);
  // Last first: a version taken back holds files with their own.
  auto kept = document->AsNode().SelectNodes("//taken_back | //p_local");
  for (auto at = kept.rbegin(); at != kept.rend(); ++at) at->ParentNode().RemoveChild(*at);
  return document->Xml();
}

// A fingerprint and a local-files document drawn from `draw`.
std::pair<std::string, std::string> Draw(uint32_t draw) {
  std::mt19937 rng(draw);
  auto below = [&](int n) { return static_cast<int>(rng() % static_cast<uint32_t>(n)); };
  // Absent, empty or one of two numbers, the one also written otherwise: ids go missing and
  // repeat.
  auto id = [&](const char* name) {
    const char* const values[] = {nullptr, "", "1", "1", "10", "01", "1 "};
    const char* value = values[below(7)];
    return value ? std::string(" ") + name + "='" + value + "'" : "";
  };
  int versionNames = 0;
  auto version = [&] {
    std::string text = "<v" + id("v_id") + " v_name='v" + std::to_string(++versionNames) +
                       "' v_seq='" + std::to_string(below(3)) + "'>";
    for (int n = 1 + below(3); n > 0; --n) {
      text += "<f" + id("f_id") + " f_name='" + kNames[below(4)] + "' f_relpath='" +
              (below(3) == 0 ? "bin" : "") + "' f_weight='" + std::to_string(below(3)) + "'>" +
              (below(3) == 0 ? "<p p_type='2' p_weight='1' p_value='" +
                                   std::to_string(5 + below(3)) + "'/></f>"
                             : "</f>");
    }
    return text + "</v>";
  };
  // Some applications hold another one among their versions.
  std::function<std::string(bool)> application = [&](bool outer) {
    std::string text = "<a" + id("a_id") + ">";
    int versions = 1 + below(2), nested = outer && below(5) < 2 ? below(versions + 1) : -1;
    for (int i = 0; i <= versions; ++i) {
      if (i == nested) text += application(false);
      if (i < versions) text += version();
    }
    return text + "</a>";
  };
  std::string fingerprint = "<fp>";
  for (int n = 1 + below(3); n > 0; --n) fingerprint += application(true);
  std::vector<LocalFolder> folders;
  for (const char* folder : {"\\p\\", "\\p\\bin\\", "\\q\\", "\\q\\bin\\"}) {
    if (below(10) < 3) continue;
    LocalFolder& listed = folders.emplace_back(LocalFolder{folder, {}});
    for (const char* name : kNames) {
      if (below(5) < 3) listed.files.insert(listed.files.end(), below(5) == 0 ? 2 : 1, name);
    }
  }
  return {fingerprint + "</fp>", LocalFiles(folders)};
}

TEST_F(CompareTest, DraftedCopiesGiveTheResultsOfCopiesMadeAtEveryFind) {
  int found = 0, empty = 0, takenBack = 0;
  for (uint32_t draw = 1; draw <= 3000; ++draw) {
    auto [fingerprint, localFiles] = Draw(draw);
    std::string literal = Timeless(Run(fingerprint, localFiles, false));
    ASSERT_EQ(Timeless(Run(fingerprint, localFiles, true)), literal) << "draw " << draw << "\n"
                                                                     << fingerprint << "\n"
                                                                     << localFiles;
    std::string explained = Run(fingerprint, localFiles, true, nullptr, true);
    ASSERT_EQ(Timeless(WithoutReasons(explained)), literal) << "draw " << draw;
    takenBack += explained.find("<taken_back") != std::string::npos;
    ++(literal.find("<v ") != std::string::npos ? found : empty);
  }
  EXPECT_GT(found, 1500);
  EXPECT_GT(empty, 500);
  EXPECT_GT(takenBack, 500);
}

// Explaining keeps each version taken back, with its place, and of each found file the weighted
// properties that disagreed, with the values expected (none when unreadable) and found.
TEST_F(CompareTest, ExplainingKeepsWhatWasTakenBackAndWhatDisagreed) {
  std::string fingerprint =
      "<fp><a a_id='1' a_name='A'><v v_id='1' v_name='one' v_seq='1'><f f_id='1' f_name='a.exe' "
      "f_relpath='' f_weight='1'><p p_type='2' p_weight='1' p_value='9'/><p p_type='3' "
      "p_weight='0' p_value='x'/><p p_type='4' p_weight='2' p_value='2024-05-06 07:08:09'/><p "
      "p_type='3' p_weight='3' p_value='AB'/><p p_type='1' p_weight='4' p_value='1.0'/><p "
      "p_type='2' p_weight='5' p_value='eight'/></f>"
      "</v>" +
      Version("v_id='2' v_name='two' v_seq='2'", "a.exe:1 gone.dll:2") + "</a></fp>";
  auto results =
      Parse(Run(fingerprint, LocalFiles({{"\\p\\", {"a.exe", "gone.dll"}}}), true, nullptr, true));
  EXPECT_THAT(ValuesOf(*results, "//p_local", "p_expected"),
              ElementsAre("9", "ab", "1.0", "<absent>"));
  EXPECT_THAT(ValuesOf(*results, "//a/v/f/p_local", "p_value"),
              ElementsAre("5", "2c3ccd32927839768639b88829a5c04a", "", "5"));
  EXPECT_THAT(ValuesOf(*results, "/*/taken_back", "d_text"), ElementsAre("\\p\\"));
  EXPECT_THAT(ValuesOf(*results, "/*/taken_back/v/f[@f_exists='0']", "f_name"),
              ElementsAre("gone.dll"));
}

}  // namespace
}  // namespace trl::testing
