// Whole runs: numbering of what is added, asynchronous reports in order, and cancel.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>

#include "merge/merge_fixture.h"
#include "platform/event_loop.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::IsEmpty;
using namespace std::chrono_literals;

TEST(MergeCounterTest, NumbersWhatItAddsAfterTheIdsInUse) {
  struct Case {
    std::string oldBody;
    const char* added;  // the place the merge adds, by its ids
  } cases[] = {
      // After the highest ids wherever they stand.
      {Place("A", "C:", "\\X\\", Application("1"), "3 4 6") +
           Place("B", "C:", "\\X\\", Application("1"), "9 2 8") +
           Place("C", "C:", "\\X\\", Application("1"), "5 7 1"),
       " c10(m8(d9(a2)))"},
      // The first attribute is the id, whatever its name.
      {"<c c_no='6' c_text='A' c_name='a'><m m_no='3' m_text='C:' m_name='c:'>"
       "<d d_no='8' d_text='\\X\\' d_name='\\x\\'/></m></c>",
       " c7(m4(d9(a2)))"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.added);
    auto old = Parse(Results(c.oldBody));
    auto run = MergeNow(Parse("<o/>"), nullptr, old,
                        Parse(Results(Place("New", "E:", "\\Y\\", Application("2")))));
    for (const ReportedEvent& event : run.events) EXPECT_NE(event.className, "Merge");
    EXPECT_THAT(Shape(old->DocumentElement()), EndsWith(c.added));
  }
}

// A computer can stand anywhere, even inside an application; one inside an application that is
// merged goes with it into the user data, and is not merged again on its own.
TEST(MergeWalkTest, AComputerInsideAMergedApplicationGoesWithIt) {
  const std::string inner = Place("Inner", "D:", "\\Z\\", Application("3"));
  auto old = Parse(Results(""));
  MergeNow(Parse("<o/>"), nullptr, old,
           Parse(Results(Place("New", "E:", "\\Y\\",
                               "<a a_id='2' v_id='1'><v v_id='1'>" + inner + "</v></a>"))));
  EXPECT_EQ(Shape(old->DocumentElement()), "c1(m1(d1(a2)))");
}

// Records what an asynchronous run reports: "S<status>" and "P<a_name>" in order.
class MergeRunTest : public ::testing::Test {
 protected:
  MergeRunTest() {
    merge_.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      last_ = Parse(update);
      events_.push_back("S" + Attribute("e_status"));
      lastResults_ = results;
    });
    merge_.OnProgressUpdate([this](const std::string& update) {
      last_ = Parse(update);
      events_.push_back("P" + Attribute("a_name"));
      if (onProgress_) onProgress_(events_.back());
    });
  }

  std::string Attribute(std::string_view name) const {
    return last_->DocumentElement().GetAttribute(name).value_or("<absent>");
  }
  // Every attribute of the last report, as "name=value" in order.
  std::string All() const {
    std::string text;
    for (const auto& [name, value] : last_->DocumentElement().Attributes())
      text += (text.empty() ? "" : " ") + name + "=" + value;
    return text;
  }

  void RunToEnd(const xml::DocumentPtr& searchOptions, const xml::DocumentPtr& old,
                const xml::DocumentPtr& fresh) {
    EXPECT_EQ(merge_.Start(searchOptions, nullptr, old, fresh), "");
    ASSERT_TRUE(EventLoop::Current().RunUntil(
        [&] { return merge_.Status() == kStatusComplete || merge_.Status() == kStatusCancelled; },
        10s));
  }

  Merge merge_;
  std::vector<std::string> events_;
  xml::DocumentPtr last_;
  std::string lastResults_;
  std::function<void(const std::string&)> onProgress_;
};

TEST_F(MergeRunTest, ReportsTheMissingThenEachMergedApplication) {
  auto old = Parse(Results(Place("Host", "C:", "\\App\\", Application("7") + Application("8")) +
                           "<a_missing><a a_id='3'/></a_missing>"));
  auto fresh = Parse(Results(Place("Host", "C:", "\\App\\", Application("8") + Application("9"))));
  std::vector<std::string> progress;
  onProgress_ = [&](const std::string&) { progress.push_back(All()); };
  RunToEnd(Parse("<o>" + Managed("host", "c:", "\\app\\", "7") + "</o>"), old, fresh);
  EXPECT_THAT(events_, ElementsAre("S1", "S2", "PApp7", "PApp8", "PApp9", "S3"));
  // The list's copy counts among the old; the progress names the application before the counters.
  const std::string kCounts = "e_match_total_new=2 e_match_total_old=3 e_match_merged=";
  EXPECT_THAT(progress,
              ElementsAre("e_mode=4 e_status=2 a_name=App7 " + kCounts + "0 e_match_missing=1",
                          "e_mode=4 e_status=2 a_name=App8 " + kCounts + "1 e_match_missing=1",
                          "e_mode=4 e_status=2 a_name=App9 " + kCounts + "2 e_match_missing=1"));
  EXPECT_EQ(All(), "e_mode=4 e_status=3 " + kCounts + "2 e_match_missing=1");
  EXPECT_EQ(Shape(Parse(lastResults_)->DocumentElement()), "c1(m1(d1(a8 a9))) missing(3 7)");
  EXPECT_THAT(TakeReportedEvents(), IsEmpty());
}

TEST_F(MergeRunTest, CancelCompletesTheApplicationInProgressAndLeavesTheRest) {
  auto old = Parse(Results(""));
  auto fresh = Parse(Results(Place("Host", "C:", "\\App\\", Application("1") + Application("2")) +
                             Place("Host", "D:", "\\App\\", Application("3"), "1 2 2")));
  onProgress_ = [&](const std::string& event) {
    if (event == "PApp1") merge_.Cancel();
  };
  RunToEnd(nullptr, old, fresh);
  EXPECT_THAT(events_, ElementsAre("S1", "S2", "PApp1", "S255"));
  EXPECT_EQ(merge_.Status(), kStatusCancelled);
  EXPECT_EQ(Shape(old->DocumentElement()), "c1(m1(d1(a1)))");
  EXPECT_THAT(ValuesOf(*old, "//a", "a_update_q"), ElementsAre("1"));
  EXPECT_THAT(ValuesOf(*fresh, "//a", "a_id"), ElementsAre("2", "3"));
}

}  // namespace
}  // namespace trl::testing
