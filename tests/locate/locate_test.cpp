#include "trl/locate.h"

#include <fmt/format.h>
#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <regex>
#include <sstream>

#include "frame/error_handler.h"
#include "platform/event_loop.h"
#include "platform/fs/posix/posix_file_system.h"
#include "support/documents.h"
#include "support/temp_tree.h"
#include "trl/compare.h"
#include "trl/filter.h"
#include "trl/merge.h"
#include "trl/search.h"

namespace trl::testing {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::Field;
using ::testing::HasSubstr;

constexpr int16_t kAllRules = 63;
using Report = std::pair<int, int>;  // e_mode and e_status, -1 where unreadable

Report ReadReport(const std::string& update) {
  xml::Document document;
  if (!document.LoadXml(update)) return {-1, -1};
  auto number = [&](const char* name) {
    return std::atoi(document.DocumentElement().GetAttribute(name).value_or("-1").c_str());
  };
  return {number("e_mode"), number("e_status")};
}

// A run log (time, kind, class.procedure, number and description, tab-separated, on each line) as
// "class.procedure: description" lines.
std::string LogSteps(const std::string& path) {
  std::stringstream text;
  text << std::ifstream(path).rdbuf();
  return std::regex_replace(text.str(), std::regex("[^\t\n]*\t[^\t\n]*\t([^\t\n]*)\t[^\t\n]*\t"),
                            "$1: ");
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

class LocateTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ReleaseSharedReporter();
    for (const char* folder : {"Apps/Alpha", "Apps/Beta"}) tree_.AddFolder(folder);
    tree_.AddFile("Apps/Alpha/alpha.exe", "alpha one");
    tree_.AddFile("Apps/Beta/beta.exe", "beta");
  }

  // Alpha in two releases told apart by the size of alpha.exe, and Beta in one; `more` joins the
  // properties of Alpha 2.0's file.
  static xml::DocumentPtr Fingerprint(const std::string& more = "") {
    constexpr const char* kVersion =
        R"(<v v_id="{0}" v_name="{1}" v_seq="{0}"><f f_id="1" f_name="{2}" f_relpath="" )"
        R"(f_weight="1"><p p_type="2" p_weight="1" p_value="{3}"/>{4}</f></v>)";
    return Parse(fmt::format(R"(<fp><a a_id="1" a_name="Alpha">{}{}</a><a a_id="2" a_name="Beta">)"
                             "{}</a></fp>",
                             fmt::format(kVersion, 1, "1.0", "alpha.exe", 9, ""),
                             fmt::format(kVersion, 2, "2.0", "alpha.exe", 11, more),
                             fmt::format(kVersion, 1, "5.0", "beta.exe", 4, "")));
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

  // Runs asynchronously to the end and answers each status report as "(mode, status)";
  // `onReport` may act on each.
  std::string RunAsync(Locate& locate, const std::string& options, xml::DocumentPtr userData,
                       const std::function<void(const Report&)>& onReport = {},
                       xml::DocumentPtr fingerprint = Fingerprint()) {
    std::string reports;
    bool ended = false;
    locate.OnStatusUpdate([&](const std::string& update, const std::string& results) {
      Report report = ReadReport(update);
      reports += ::testing::PrintToString(report);
      // The relay passes a stage's text on as a load and a new serialisation would give it.
      EXPECT_EQ(results.empty() ? results : Parse(results)->Xml(), results);
      if (report.first == Locate::kFinished) lastResults_ = results;
      if (onReport) onReport(report);
      ended = report.second == kStatusCancelled || report.first == Locate::kFinished;
    });
    EXPECT_EQ(locate.Start(Parse(options), nullptr, kAllRules, fingerprint, userData), "");
    EXPECT_TRUE(EventLoop::Current().RunUntil([&] { return ended; }, std::chrono::seconds(20)));
    return reports;
  }

  TempTree tree_;
  std::string lastResults_;
};

TEST_F(LocateTest, StagesRelayInOrderGatherTheirEventsAndMergeAsASynchronousRunDoes) {
  // The search misses a folder, the compare meets a property kind it does not know, the filter
  // passes on the matches with the compare's events, and the merge's results are the user data,
  // where a managed application is no longer found.
  std::string options = SearchOptions(
      R"(<d d_id="2" d_text=")" + tree_.Path("Gone") +
      R"(" d_search="1"><d_search_mask/></d><d d_id="3" d_text="/gone" d_name="\gone\")"
      R"( d_search="0"><a a_id="2" a_manage="1"/></d>)");
  auto fingerprint = Fingerprint(R"(<p p_type="5" p_weight="1" p_value="x"/>)");
  const char* data =
      R"(<trl_applicationdata><events><merge><event number="7"/></merge></events>)"
      R"(<c c_name="localhost"><m m_name=""><d d_name="\gone\"><a a_id="2"/></d></m>)"
      R"(</c></trl_applicationdata>)";
  auto syncData = Parse(data);
  // The synchronous result is the merged inventory closed by an empty events element.
  EXPECT_THAT(NewLocate(false)->Start(Parse(options), nullptr, kAllRules, fingerprint, syncData),
              EndsWith("<events/></trl_applicationdata>"));

  auto userData = Parse(data);
  auto locate = NewLocate(true);
  std::vector<int> progressModes;
  std::string again = "not called";
  auto onReport = [&](const Report& report) {
    // Progress may be followed from any report on, and a run under way refuses another Start.
    if (report.first == 0) {
      locate->OnProgressUpdate(
          [&](const std::string& update) { progressModes.push_back(ReadReport(update).first); });
    }
    if (report == Report{2, 2}) {
      again = locate->Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint(), nullptr);
    }
  };
  // A finished stage's last report comes before the next stage's first one.
  EXPECT_EQ(RunAsync(*locate, options, userData, onReport, fingerprint),
            "(0, 1)(1, 1)(1, 2)(1, 3)(2, 1)(2, 2)(2, 3)(3, 1)(3, 2)(3, 3)(4, 1)(4, 2)(4, 3)(5, 3)");
  EXPECT_EQ(again, "");
  // Each stage's progress reports reach the client as the stage made them, stage after stage.
  progressModes.erase(std::unique(progressModes.begin(), progressModes.end()), progressModes.end());
  EXPECT_THAT(progressModes, ElementsAre(1, 2, 3, 4));
  // A folder not found, then a property kind not known.
  EXPECT_EQ(Gathered(lastResults_),
            Words("search:-2147201303 compare:-2147201301 filter:-2147201301 merge:7"));
  EXPECT_EQ(userData->Xml(), syncData->Xml());
  EXPECT_THAT(ValuesOf(*userData, "//d/a", "a_name"), ElementsAre("Alpha", "Beta"));
  EXPECT_THAT(ValuesOf(*userData, "//d/a", "v_name"), ElementsAre("1.0", "5.0"));
  EXPECT_THAT(ValuesOf(*userData, "//a_missing/a", "a_id"), ElementsAre("2"));
}

// A Search that raises one report of its own before its run, and may answer results without
// content: what a faulty stage would send.
struct FaultySearch : Search {
  FaultySearch(std::string faultyUpdate, bool noResults)
      : Search(fs::CreatePosixFileSystem({})), update(faultyUpdate), empty(noResults) {}
  void RunBody() override {
    if (!update.empty()) RaiseStatusUpdate(update, Search::ResultsDocument());
    Search::RunBody();
  }
  xml::DocumentPtr ResultsDocument() override {
    return empty ? std::make_shared<xml::Document>() : Search::ResultsDocument();
  }
  std::string update;
  bool empty;
};

TEST_F(LocateTest, AFaultyStageReportIsRelayedAndTheRunGoesOn) {
  // The faulty report and whether the results are empty, Locate's status as the client sees the
  // third report (the faulty one, when there is one), and the list and number of each event the
  // fault gave.
  for (auto [update, results, status, gathered] :
       std::initializer_list<std::tuple<const char*, bool, int, const char*>>{
           {R"(<e e_mode="1" e_status="x"/>)", false, 1, "search:13"},
           {R"(<e e_mode="1"/>)", false, 1, "search:94"},
           {"not XML", false, 0, "search:91"},
           // The unloadable list and the selection in it, then the compare of a search that is
           // empty.
           {"", true, 2,
            "compare:-2147220991 compare:91 compare:91 filter:-2147220991 filter:91 filter:91"}}) {
    SCOPED_TRACE(std::string(update) + (results ? " without results" : ""));
    Locate locate(std::make_unique<FaultySearch>(update, results),
                  std::make_unique<Compare>(fs::CreatePosixFileSystem({})),
                  std::make_unique<Filter>(), std::make_unique<Merge>());
    std::vector<int16_t> statuses;
    RunAsync(locate, SearchOptions(), nullptr,
             [&](const Report&) { statuses.push_back(locate.Status()); });
    EXPECT_EQ(statuses.at(2), status);
    EXPECT_EQ(Gathered(lastResults_), Words(gathered));
  }
}

TEST_F(LocateTest, RunLogHoldsEveryStepInOrderRunAfterRun) {
  auto locate = NewLocate(true);
  locate->LogFile(tree_.Native("run.log"));
  std::string expected;
  for (bool asynchronous : {true, false}) {
    locate->Asynchronous(asynchronous);
    asynchronous ? RunAsync(*locate, SearchOptions(), nullptr)
                 : locate->Start(Parse(SearchOptions()), nullptr, 12, Fingerprint(), Parse("<d/>"));
    expected += std::string("Locate.Start: <options  asynchronous=\"") +
                (asynchronous ? "1\" filter=\"63" : "0\" filter=\"12") + "\"><options_search>" +
                Parse(SearchOptions())->DocumentElement().Xml() +
                "</options_search><options_applications></options_applications></options>\n";
    for (std::string step :
         {"Created XML DOM objects", "Assigned XML DOM data",
          asynchronous ? "Created new results XML DOM" : "Assigned results XML DOM data",
          "Assigned options", "Timer started..."}) {
      if (asynchronous || step[0] != 'T') expected += "Locate.Start: " + step + "\n";
    }
    for (std::string stage : {"Search", "Compare", "Filter", "Merge"}) {
      expected += "Locate." + stage + "Begin: About to " + Lower(stage) + "...\nLocate." + stage +
                  (asynchronous ? "End: " : "Begin: ") + stage + " complete\n";
    }
    expected += "Locate.Finalise: Locate process complete\n";
  }
  // Without a log file nothing is written, not even to the file the run before named.
  locate->LogFile("");
  locate->Start(Parse(SearchOptions()), nullptr, kAllRules, Fingerprint());
  EXPECT_EQ(LogSteps(tree_.Native("run.log")), expected);
}

TEST_F(LocateTest, CancelEndsTheChainInTheRunningStageWithoutFinalising) {
  // The report during which the client cancels; before a stage runs, a cancel has nothing to stop.
  for (Report at : {Report{1, 2}, Report{2, 2}, Report{3, 2}, Report{4, 2}, Report{1, 1}}) {
    SCOPED_TRACE(::testing::PrintToString(at));
    auto locate = NewLocate(true);
    std::string reports = RunAsync(*locate, SearchOptions(), nullptr, [&](const Report& report) {
      if (report == at) locate->Cancel();
    });
    Report last = at.second == 2 ? Report{at.first, kStatusCancelled} : Report{5, 3};
    EXPECT_THAT(reports, EndsWith(::testing::PrintToString(last)));
    EXPECT_EQ(Report(locate->Mode(), locate->Status()), last);
  }
}

TEST(OptionsHeaderTest, LongSearchOptionsAreLeftOutFromTenThousandCharacters) {
  ReleaseSharedReporter();
  xml::Document none;
  for (size_t length : {9999u, 10000u}) {
    // A root whose text is `length` characters long, two of them multi-byte.
    std::string text = "<s>" + std::string(length - 9, 'x') + "\xC3\xA9\xC3\xA9</s>";
    EXPECT_THAT(
        Locate::OptionsHeader(true, 12, *Parse(text), none),
        HasSubstr("<options_search>" +
                  (length < 10000 ? text : "<![CDATA[Search options too long to include]]>") +
                  "</options_search><options_applications></options_applications>"));
  }
  // Search options without a root are reported, and leave their part of the header empty.
  TakeReportedEvents();
  EXPECT_THAT(Locate::OptionsHeader(false, 0, none, *Parse("<apps/>")),
              HasSubstr("<options_search></options_search><options_applications><apps/>"));
  EXPECT_THAT(TakeReportedEvents(), ElementsAre(AllOf(Field(&ReportedEvent::number, kObjectNotSet),
                                                      Field(&ReportedEvent::procedure, "Start"))));
}

}  // namespace
}  // namespace trl::testing
