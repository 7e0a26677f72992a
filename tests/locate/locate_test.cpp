#include "trl/locate.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "platform/failure.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/reported_events.h"
#include "support/temp_tree.h"
#include "trl/compare.h"
#include "trl/filter.h"
#include "trl/merge.h"
#include "trl/search.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::StartsWith;

constexpr int16_t kAllRules = 63;

// One status report as the client saw it.
struct Report {
  int mode, status;
  bool operator==(const Report&) const = default;
};

std::ostream& operator<<(std::ostream& out, const Report& report) {
  return out << "(" << report.mode << "," << report.status << ")";
}

Report ReadReport(const std::string& update) {
  auto document = Parse(update);
  auto e = document->DocumentElement();
  return {std::stoi(*e.GetAttribute("e_mode")), std::stoi(*e.GetAttribute("e_status"))};
}

// The procedure and message of each line of a run log (time, kind, class.procedure, number,
// description, tab-separated).
std::vector<std::pair<std::string, std::string>> LogEntries(const std::string& path) {
  std::vector<std::pair<std::string, std::string>> entries;
  std::ifstream in(path);
  for (std::string line; std::getline(in, line);) {
    std::vector<std::string> fields;
    for (size_t start = 0, end; start <= line.size(); start = end + 1) {
      end = std::min(line.find('\t', start), line.size());
      fields.push_back(line.substr(start, end - start));
    }
    entries.emplace_back(fields.at(2), fields.at(4));
  }
  return entries;
}

class LocateTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ReleaseSharedReporter();
    for (const char* folder : {"Apps/Alpha", "Apps/Beta"}) tree_.AddFolder(folder);
    tree_.AddFile("Apps/Alpha/alpha.exe", "alpha one");
    tree_.AddFile("Apps/Alpha/readme.txt", "read me");
    tree_.AddFile("Apps/Beta/beta.exe", "beta");
  }
  void TearDown() override { ReleaseSharedReporter(); }

  // Alpha in two releases told apart by the size of alpha.exe, and Beta in one.
  static xml::DocumentPtr Fingerprint() {
    auto file = [](const char* name, int size) {
      return std::string(R"(<f f_id="1" f_name=")") + name +
             R"(" f_relpath="" f_weight="1"><p p_type="2" p_weight="1" p_value=")" +
             std::to_string(size) + R"("/></f>)";
    };
    return Parse(R"(<fp><a a_id="1" a_name="Alpha"><v v_id="1" v_name="1.0" v_seq="1">)" +
                 file("alpha.exe", 9) + R"(</v><v v_id="2" v_name="2.0" v_seq="2">)" +
                 file("alpha.exe", 11) + R"(</v></a><a a_id="2" a_name="Beta">)" +
                 R"(<v v_id="5" v_name="5.0" v_seq="1">)" + file("beta.exe", 4) + "</v></a></fp>");
  }

  // The search options: the Apps folder and everything below it, plus `managed` entries.
  std::string SearchOptions(const std::string& managed = "") const {
    return R"(<trl_searchoptions><c c_id="1" c_text="localhost" c_name="localhost" c_local="1">)"
           R"(<m m_id="1" m_text="" m_name="" m_type="3"><d d_id="1" d_text=")" +
           tree_.Path("Apps") + R"(" d_search="1" d_search_recurse="1"><d_search_mask/></d>)" +
           managed + "</m></c></trl_searchoptions>";
  }

  std::unique_ptr<Locate> NewLocate(bool asynchronous) {
    auto locate =
        std::make_unique<Locate>(fs::CreatePosixFileSystem({}), fs::CreatePosixFileSystem({}));
    locate->Asynchronous(asynchronous);
    return locate;
  }

  // Runs asynchronously to the end, noting every status report; `onReport` may act on each.
  std::vector<Report> RunAsync(Locate& locate, const std::string& options,
                               xml::DocumentPtr userData,
                               const std::function<void(const Report&)>& onReport = {}) {
    std::vector<Report> reports;
    bool ended = false;
    locate.OnStatusUpdate([&](const std::string& update, const std::string& results) {
      Report report = ReadReport(update);
      reports.push_back(report);
      // The relay passes a stage's text on as a load and a new serialisation would give it.
      if (!results.empty()) EXPECT_EQ(Parse(results)->Xml(), results);
      if (report.mode == Locate::kFinished) lastResults_ = results;
      if (onReport) onReport(report);
      ended = report.status == kStatusCancelled || report.mode == Locate::kFinished;
    });
    EXPECT_EQ(locate.Start(Parse(options), nullptr, kAllRules, Fingerprint(), userData), "");
    EXPECT_TRUE(EventLoop::Current().RunUntil([&] { return ended; }, std::chrono::seconds(20)));
    return reports;
  }

  TempTree tree_;
  std::string lastResults_;
};

TEST_F(LocateTest, SynchronousAndAsynchronousRunsMergeTheSameInventory) {
  auto syncData = Parse("<trl_applicationdata/>");
  std::string result =
      NewLocate(false)->Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint(), syncData);
  // The synchronous result is the merged inventory closed by an empty events element.
  EXPECT_THAT(result, StartsWith("<trl_applicationdata"));
  EXPECT_THAT(result, HasSubstr("<events/></trl_applicationdata>"));

  auto asyncData = Parse("<trl_applicationdata/>");
  auto locate = NewLocate(true);
  RunAsync(*locate, SearchOptions(), asyncData);
  EXPECT_EQ(asyncData->Xml(), syncData->Xml());
  EXPECT_THAT(ValuesOf(*syncData, "//d/a", "a_name"), ElementsAre("Alpha", "Beta"));
  EXPECT_THAT(ValuesOf(*syncData, "//d/a", "v_name"), ElementsAre("1.0", "5.0"));
  EXPECT_EQ(locate->Mode(), Locate::kFinished);
  EXPECT_EQ(locate->Status(), kStatusComplete);
}

TEST_F(LocateTest, StageReportsAreRelayedInOrderAndEachStagesEventsGathered) {
  auto locate = NewLocate(true);
  std::vector<int> progressModes;
  std::string again = "not called";
  std::string order;
  RunAsync(*locate, SearchOptions(), nullptr, [&](const Report& report) {
    order += "(" + std::to_string(report.mode) + "," + std::to_string(report.status) + ")";
    // Progress may be followed from any report on, and a run under way refuses another Start.
    if (report.mode == 0) {
      locate->OnProgressUpdate(
          [&](const std::string& update) { progressModes.push_back(ReadReport(update).mode); });
    }
    if (report.mode == 2 && report.status == 2) {
      again = locate->Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint(), nullptr);
    }
  });
  EXPECT_EQ(again, "");
  // Each stage's progress reports reach the client as the stage made them, stage after stage.
  EXPECT_TRUE(std::is_sorted(progressModes.begin(), progressModes.end()));
  EXPECT_THAT(std::set<int>(progressModes.begin(), progressModes.end()), ElementsAre(1, 2, 3, 4));
  // A finished stage's last report comes before the next stage's first one.
  EXPECT_EQ(order, "(0,1)(1,1)(1,2)(1,3)(2,1)(2,2)(2,3)(3,1)(3,2)(3,3)(4,1)(4,2)(4,3)(5,3)");
  auto results = Parse(lastResults_);
  std::vector<std::string> lists;
  for (const xml::Node& list : results->AsNode().SelectNodes("/trl_applicationdata/events/*")) {
    lists.push_back(list.NodeName());
  }
  EXPECT_THAT(lists, ElementsAre("search", "compare", "filter", "merge"));
}

// "<list>:<number>" for each event gathered in the last events element of the results.
std::vector<std::string> Gathered(const std::string& results) {
  std::vector<std::string> gathered;
  auto document = Parse(results);
  for (const xml::Node& e : document->AsNode().SelectNodes("/*/events[last()]/*/event")) {
    gathered.push_back(e.ParentNode().NodeName() + ":" + e.GetAttribute("number").value_or("?"));
  }
  return gathered;
}

TEST_F(LocateTest, EachStagesEventsAreGatheredFromItsOwnResults) {
  // The search misses a folder, the compare meets a property kind it does not know, the filter
  // passes on the matches with the compare's events, and the merge's results are the user data.
  std::string missing =
      R"(<d d_id="2" d_text=")" + tree_.Path("Gone") + R"(" d_search="1"><d_search_mask/></d>)";
  auto fingerprint = Fingerprint();
  fingerprint->AsNode().SelectSingleNode("//f").AppendChild(
      Parse(R"(<p p_type="5" p_weight="1" p_value="x"/>)")->DocumentElement());
  auto userData = Parse(R"(<trl_applicationdata><events><merge><event number="7"/></merge>)"
                        R"(</events></trl_applicationdata>)");
  auto locate = NewLocate(true);
  bool ended = false;
  locate->OnStatusUpdate([&](const std::string& update, const std::string& results) {
    if (ReadReport(update).mode == Locate::kFinished) {
      lastResults_ = results;
      ended = true;
    }
  });
  locate->Start(Parse(SearchOptions(missing)), nullptr, kAllRules, fingerprint, userData);
  ASSERT_TRUE(EventLoop::Current().RunUntil([&] { return ended; }, std::chrono::seconds(20)));
  const std::string notFound = std::to_string(kObjectErrorBase + 20201);
  const std::string unknownKind = std::to_string(kObjectErrorBase + 20203);
  EXPECT_THAT(Gathered(lastResults_), ElementsAre("search:" + notFound, "compare:" + unknownKind,
                                                  "filter:" + unknownKind, "merge:7"));
}

// A Search that raises one report of its own before its run, and may answer results that are not
// XML: what a faulty stage would send.
class FaultySearch : public Search {
 public:
  FaultySearch(std::string update, std::string results)
      : Search(fs::CreatePosixFileSystem({})),
        update_(std::move(update)),
        results_(std::move(results)) {}

 protected:
  void RunBody() override {
    if (!update_.empty()) RaiseStatusUpdate(update_, Search::ResultsXml());
    Search::RunBody();
  }
  std::string ResultsXml() override { return results_.empty() ? Search::ResultsXml() : results_; }

 private:
  std::string update_, results_;
};

TEST_F(LocateTest, AFaultyStageReportIsRelayedAndTheRunGoesOn) {
  struct Case {
    const char *update, *results;
    int16_t status;        // Locate's status as the client sees the faulty report
    const char* gathered;  // the list and number of each event the fault gave
  } cases[] = {
      {R"(<e e_mode="1" e_status="x"/>)", "", 1, "search:13"},
      {R"(<e e_mode="1"/>)", "", 1, "search:94"},
      {"not XML", "", 0, "search:91"},
      // The unloadable list and the selection in it, then the compare of a search that is empty.
      {"", "not XML", -1,
       "compare:-2147220991 compare:91 compare:91 filter:-2147220991 filter:91 filter:91"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.update) + c.results);
    Locate locate(std::make_unique<FaultySearch>(c.update, c.results),
                  std::make_unique<Compare>(fs::CreatePosixFileSystem({})),
                  std::make_unique<Filter>(), std::make_unique<Merge>());
    std::vector<int16_t> statuses;
    bool ended = false;
    locate.OnStatusUpdate([&](const std::string& update, const std::string& results) {
      statuses.push_back(locate.Status());
      auto document = std::make_shared<xml::Document>();
      if (document->LoadXml(update) && document->DocumentElement().GetAttribute("e_mode") == "5") {
        lastResults_ = results;
        ended = true;
      }
    });
    locate.Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint(), nullptr);
    ASSERT_TRUE(EventLoop::Current().RunUntil([&] { return ended; }, std::chrono::seconds(20)));
    if (c.status >= 0) EXPECT_EQ(statuses.at(2), c.status);
    EXPECT_EQ(Gathered(lastResults_), Words(c.gathered));
    EXPECT_EQ(locate.Status(), kStatusComplete);
  }
}

TEST_F(LocateTest, RunLogHoldsEveryStepInOrderRunAfterRun) {
  std::string log = tree_.Native("run.log");
  auto locate = NewLocate(false);
  locate->LogFile(log);
  size_t before = 0;
  for (bool asynchronous : {false, true}) {
    SCOPED_TRACE(asynchronous ? "asynchronous" : "synchronous");
    locate->Asynchronous(asynchronous);
    if (asynchronous) {
      RunAsync(*locate, SearchOptions(), nullptr);
    } else {
      locate->Start(Parse(SearchOptions()), nullptr, 12, Fingerprint());
    }
    std::string end = asynchronous ? "End" : "Begin";
    std::vector<std::pair<std::string, std::string>> expected{
        {"Locate.Start", "Created XML DOM objects"},
        {"Locate.Start", "Assigned XML DOM data"},
        {"Locate.Start", "Created new results XML DOM"},
        {"Locate.Start", "Assigned options"}};
    if (asynchronous) expected.emplace_back("Locate.Start", "Timer started...");
    for (auto [stage, verb] : {std::pair{"Search", "search"},
                               {"Compare", "compare"},
                               {"Filter", "filter"},
                               {"Merge", "merge"}}) {
      expected.emplace_back(std::string("Locate.") + stage + "Begin",
                            std::string("About to ") + verb + "...");
      expected.emplace_back("Locate." + std::string(stage) + end, std::string(stage) + " complete");
    }
    expected.emplace_back("Locate.Finalise", "Locate process complete");

    auto entries = LogEntries(log);
    ASSERT_GT(entries.size(), before);
    entries.erase(entries.begin(), entries.begin() + before);  // the run before stays
    before += entries.size();
    EXPECT_EQ(entries.front().first, "Locate.Start");
    EXPECT_THAT(entries.front().second,
                StartsWith(std::string("<options  asynchronous=\"") + (asynchronous ? "1" : "0") +
                           "\" filter=\"" + (asynchronous ? "63" : "12") + "\"><options_search>"));
    entries.erase(entries.begin());
    EXPECT_THAT(entries, ElementsAreArray(expected));
  }
  // Without a log file nothing is written, not even to the file the run before named.
  locate->LogFile("");
  locate->Asynchronous(false);
  locate->Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint());
  EXPECT_EQ(LogEntries(log).size(), before);
}

TEST_F(LocateTest, SecondRunRecordsTheUpgradeAndTheManagedApplicationThatWentMissing) {
  auto userData = Parse("<trl_applicationdata/>");
  NewLocate(false)->Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint(), userData);
  std::string betaFolder = ValuesOf(*userData, "//d[a/@a_id='2']", "d_name").at(0);
  std::string betaText = ValuesOf(*userData, "//d[a/@a_id='2']", "d_text").at(0);

  tree_.AddFile("Apps/Alpha/alpha.exe", "alpha two!!");
  std::filesystem::remove_all(tree_.Native("Apps/Beta"));
  std::string managed = R"(<d d_id="2" d_text=")" + betaText + R"(" d_name=")" + betaFolder +
                        R"(" d_search="0"><a a_id="2" a_manage="1"/></d>)";
  auto locate = NewLocate(true);
  RunAsync(*locate, SearchOptions(managed), userData);

  EXPECT_THAT(ValuesOf(*userData, "//d/a", "a_name"), ElementsAre("Alpha"));
  EXPECT_THAT(ValuesOf(*userData, "//d/a", "v_name"), ElementsAre("2.0"));
  EXPECT_THAT(ValuesOf(*userData, "//d/a/v_history/v", "v_name"), ElementsAre("1.0"));
  EXPECT_THAT(ValuesOf(*userData, "//d/a/v_history/v", "v_update_q"), ElementsAre("1"));
  EXPECT_THAT(ValuesOf(*userData, "/trl_applicationdata/a_missing/a", "a_id"), ElementsAre("2"));
  EXPECT_THAT(ValuesOf(*userData, "/trl_applicationdata/a_missing/a", "a_missing"),
              ElementsAre("1"));
}

TEST_F(LocateTest, CancelEndsTheChainInTheRunningStageWithoutFinalising) {
  struct Case {
    int mode, status;  // the report during which the client cancels
    bool cancelled;
  };
  for (Case c : {Case{1, 2, true}, Case{2, 2, true}, Case{3, 2, true}, Case{4, 2, true},
                 Case{1, 1, false}}) {
    SCOPED_TRACE("cancel at (" + std::to_string(c.mode) + "," + std::to_string(c.status) + ")");
    std::string log = tree_.Native("cancel.log");
    std::filesystem::remove(log);
    auto locate = NewLocate(true);
    locate->LogFile(log);
    std::vector<Report> reports =
        RunAsync(*locate, SearchOptions(), nullptr, [&](const Report& report) {
          if (report.mode == c.mode && report.status == c.status) locate->Cancel();
        });
    if (!c.cancelled) {  // before the stage runs, a cancel has nothing to stop
      EXPECT_EQ(reports.back(), (Report{5, 3}));
      continue;
    }
    EXPECT_EQ(reports.back(), (Report{c.mode, kStatusCancelled}));
    EXPECT_EQ(locate->Status(), kStatusCancelled);
    EXPECT_EQ(locate->Mode(), c.mode);
    auto entries = LogEntries(log);
    ASSERT_FALSE(entries.empty());
    EXPECT_THAT(entries.back().second, StartsWith("About to "));
    EXPECT_THAT(entries.back().first, HasSubstr("Begin"));
  }
}

TEST(OptionsHeaderTest, LongSearchOptionsAreLeftOutFromTenThousandCharacters) {
  ReleaseSharedReporter();
  auto applications = Parse("<apps x=\"1\"/>");
  for (size_t length : {9999u, 10000u}) {
    // A root whose text is `length` characters long, two of them multi-byte.
    std::string text = "<s>" + std::string(length - 2 - 7, 'x') + "\xC3\xA9\xC3\xA9</s>";
    auto search = Parse(text);
    std::string header = Locate::OptionsHeader(true, 12, *search, *applications);
    std::string expectedSearch =
        length < 10000
            ? "<options_search>" + text + "</options_search>"
            : "<options_search><![CDATA[Search options too long to include]]></options_search>";
    EXPECT_EQ(header, "<options  asynchronous=\"1\" filter=\"12\">" + expectedSearch +
                          "<options_applications><apps x=\"1\"/></options_applications></options>");
  }
  // Search options without a root are reported, and leave their part of the header empty.
  TakeReportedEvents();
  xml::Document none;
  EXPECT_EQ(Locate::OptionsHeader(false, 0, none, *applications),
            "<options  asynchronous=\"0\" filter=\"0\"><options_search></options_search>"
            "<options_applications><apps x=\"1\"/></options_applications></options>");
  auto events = TakeReportedEvents();
  ASSERT_EQ(events.size(), 1u);
  EXPECT_EQ(events[0].number, kObjectNotSet);
  EXPECT_EQ(events[0].procedure, "Start");
  ReleaseSharedReporter();
}

}  // namespace
}  // namespace trl::testing
