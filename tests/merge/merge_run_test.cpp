// Whole runs: numbering of what is added, asynchronous reports in order, and cancel.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>

#include "merge/merge_fixture.h"
#include "platform/event_loop.h"
#include "platform/failure.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using namespace std::chrono_literals;

std::string App(std::string_view id) {
  return "<a a_id='" + std::string(id) + "' a_name='App" + std::string(id) +
         "' v_id='1'><v v_id='1'/></a>";
}

struct CounterCase {
  const char* name;
  std::string oldBody;
  const char* added;  // c_id m_id d_id of the place the merge adds
};

const CounterCase kCounterCases[] = {
    {"EmptyRootStartsAtOne", "", "1 1 1"},
    {"AfterTheHighestIdsWhereverTheyStand",
     Place("A", "C:", "\\X\\", App("1"), "3 4 6") + Place("B", "C:", "\\X\\", App("1"), "9 2 8") +
         Place("C", "C:", "\\X\\", App("1"), "5 7 1"),
     "10 8 9"},
    {"TheFirstAttributeIsTheIdWhateverItsName",
     "<c c_no='6' c_text='A' c_name='a'><m m_no='3' m_text='C:' m_name='c:'>"
     "<d d_no='8' d_text='\\X\\' d_name='\\x\\'/></m></c>",
     "7 4 9"},
};

class MergeCounterTest : public ::testing::TestWithParam<CounterCase> {};

TEST_P(MergeCounterTest, NumbersWhatItAddsAfterTheIdsInUse) {
  auto old = Parse(Results(GetParam().oldBody));
  auto run =
      MergeNow(Parse("<o/>"), nullptr, old, Parse(Results(Place("New", "E:", "\\Y\\", App("2")))));
  for (const ReportedEvent& event : run.events) EXPECT_NE(event.className, "Merge");
  auto c = old->AsNode().SelectSingleNode("//c[@c_name='new']");
  ASSERT_TRUE(c);
  auto m = c.SelectSingleNode("m");
  auto d = m.SelectSingleNode("d");
  EXPECT_EQ(*c.GetAttribute("c_id") + " " + *m.GetAttribute("m_id") + " " + *d.GetAttribute("d_id"),
            GetParam().added);
}

INSTANTIATE_TEST_SUITE_P(Cases, MergeCounterTest, ::testing::ValuesIn(kCounterCases),
                         [](const auto& info) { return std::string(info.param.name); });

// What an asynchronous run reports: "S<status>" and "P<a_name>" in order.
struct Recorder {
  explicit Recorder(Merge& merge) {
    merge.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      last = Parse(update);
      events.push_back("S" + Attribute("e_status"));
      lastResults = results;
    });
    merge.OnProgressUpdate([this](const std::string& update) {
      last = Parse(update);
      events.push_back("P" + Attribute("a_name"));
      if (onProgress) onProgress(events.back());
    });
  }
  std::string Attribute(std::string_view name) const {
    return last->DocumentElement().GetAttribute(name).value_or("<absent>");
  }
  std::vector<std::string> Names() const {
    std::vector<std::string> names;
    for (const auto& [name, value] : last->DocumentElement().Attributes()) names.push_back(name);
    return names;
  }

  std::vector<std::string> events;
  xml::DocumentPtr last;
  std::string lastResults;
  std::function<void(const std::string&)> onProgress;
};

class MergeRunTest : public ::testing::Test {
 protected:
  void RunToEnd(const xml::DocumentPtr& searchOptions, const xml::DocumentPtr& old,
                const xml::DocumentPtr& fresh) {
    EXPECT_EQ(merge_.Start(searchOptions, nullptr, old, fresh), "");
    ASSERT_TRUE(EventLoop::Current().RunUntil(
        [&] { return merge_.Status() == kStatusComplete || merge_.Status() == kStatusCancelled; },
        10s));
  }

  Merge merge_;
  Recorder recorder_{merge_};
};

TEST_F(MergeRunTest, ReportsTheMissingThenEachMergedApplication) {
  auto old = Parse(Results(Place("Host", "C:", "\\App\\", App("7") + App("8")) +
                           "<a_missing><a a_id='3'/></a_missing>"));
  auto fresh = Parse(Results(Place("Host", "C:", "\\App\\", App("8") + App("9"))));
  std::vector<std::string> progress;
  recorder_.onProgress = [&](const std::string&) {
    progress.push_back(recorder_.Attribute("e_match_merged") + "/" +
                       recorder_.Attribute("e_match_missing"));
  };
  RunToEnd(Parse("<o>" + Managed("host", "c:", "\\app\\", "7") + "</o>"), old, fresh);
  EXPECT_THAT(recorder_.events, ElementsAre("S1", "S2", "PApp7", "PApp8", "PApp9", "S3"));
  EXPECT_THAT(progress, ElementsAre("0/1", "1/1", "2/1"));
  EXPECT_THAT(recorder_.Names(),
              ElementsAre("e_mode", "e_status", "e_match_total_new", "e_match_total_old",
                          "e_match_merged", "e_match_missing"));
  EXPECT_EQ(recorder_.Attribute("e_mode"), "4");
  EXPECT_EQ(recorder_.Attribute("e_match_total_new"), "2");
  EXPECT_EQ(recorder_.Attribute("e_match_total_old"), "3");  // the list's copy counts
  EXPECT_EQ(Shape(Parse(recorder_.lastResults)->DocumentElement()),
            "c1(m1(d1(a8 a9))) missing(3 7)");
  EXPECT_THAT(TakeReportedEvents(), IsEmpty());
}

TEST_F(MergeRunTest, ProgressCarriesTheApplicationNameBeforeTheCounters) {
  auto fresh = Parse(Results(Place("Host", "C:", "\\App\\", App("8"))));
  std::vector<std::string> names;
  recorder_.onProgress = [&](const std::string&) { names = recorder_.Names(); };
  RunToEnd(nullptr, Parse(Results("")), fresh);
  EXPECT_THAT(names, ElementsAre("e_mode", "e_status", "a_name", "e_match_total_new",
                                 "e_match_total_old", "e_match_merged", "e_match_missing"));
}

TEST_F(MergeRunTest, TheNameIsReadOnlyForTheProgressOfAnAsynchronousRun) {
  const std::string nameless = Place("Host", "C:", "\\App\\", "<a a_id='8' v_id='1'/>");
  EXPECT_THAT(MergeNow(Parse("<o/>"), nullptr, Parse(Results("")), Parse(Results(nameless))).events,
              IsEmpty());
  RunToEnd(Parse("<o/>"), Parse(Results("")), Parse(Results(nameless)));
  auto events = TakeReportedEvents();
  ASSERT_EQ(events.size(), 1u);
  EXPECT_EQ(events[0].number, kInvalidUseOfNull);
  EXPECT_EQ(events[0].procedure, "Merge");
}

TEST_F(MergeRunTest, CancelCompletesTheApplicationInProgressAndLeavesTheRest) {
  auto old = Parse(Results(""));
  auto fresh = Parse(Results(Place("Host", "C:", "\\App\\", App("1") + App("2")) +
                             Place("Host", "D:", "\\App\\", App("3"), "1 2 2")));
  recorder_.onProgress = [&](const std::string& event) {
    if (event == "PApp1") merge_.Cancel();
  };
  RunToEnd(nullptr, old, fresh);
  EXPECT_THAT(recorder_.events, ElementsAre("S1", "S2", "PApp1", "S255"));
  EXPECT_EQ(merge_.Status(), kStatusCancelled);
  EXPECT_EQ(Shape(old->DocumentElement()), "c1(m1(d1(a1)))");
  EXPECT_THAT(ValuesOf(*old, "//a", "a_update_q"), ElementsAre("1"));
  EXPECT_THAT(ValuesOf(*fresh, "//a", "a_id"), ElementsAre("2", "3"));
}

}  // namespace
}  // namespace trl::testing
