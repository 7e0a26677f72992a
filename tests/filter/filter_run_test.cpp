// Asynchronous runs: what they report, in which order, and a cancel between applications.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>

#include "filter/filter_fixture.h"
#include "platform/event_loop.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using namespace std::chrono_literals;

// What an asynchronous run reports: "S<e_status>:<e_match_total>/<e_match_count>" and
// "P<a_name>:<e_match_total>/<e_match_count>", in order.
class FilterRunTest : public FilterTest {
 protected:
  FilterRunTest() {
    filter_.OnStatusUpdate([this](const std::string& update, const std::string& results) {
      events_.push_back("S" + Counters(update, "e_status"));
      lastResults_ = results;
    });
    filter_.OnProgressUpdate([this](const std::string& update) {
      events_.push_back("P" + Counters(update, "a_name"));
      lastProgress_ = update;
    });
  }

  static std::string Counters(const std::string& update, std::string_view first) {
    auto document = Parse(update);
    xml::Node e = document->DocumentElement();
    return e.GetAttribute(first).value_or("?") + ":" +
           e.GetAttribute("e_match_total").value_or("?") + "/" +
           e.GetAttribute("e_match_count").value_or("?");
  }

  void RunToEnd(int16_t options, xml::DocumentPtr matches) {
    EXPECT_EQ(filter_.Start(options, std::move(matches)), "");
    ASSERT_TRUE(EventLoop::Current().RunUntil(
        [&] { return filter_.Status() == kStatusComplete || filter_.Status() == kStatusCancelled; },
        10s));
  }

  std::vector<std::string> events_;
  std::string lastProgress_, lastResults_;
};

const std::string kOutside = Application("Outside", "5 1 2 1 1|6 1 2 1 1");

std::string ThreeApplications() {
  return Matches(
      {Application("A", "1 3 3 1 1|2 1 3 1 1"), Application("B"), Application("C", "3 3 3 1 1")},
      kOutside);
}

TEST_F(FilterRunTest, ReportsEachApplicationLeftWithAVersionAndCountsEveryApplication) {
  auto matches = Parse(ThreeApplications());
  RunToEnd(LowWeights, matches);
  EXPECT_THAT(events_, ElementsAre("S1:0/0", "S2:4/0", "PA:4/1", "PC:4/2", "S3:4/2"));
  EXPECT_EQ(lastProgress_,
            R"(<e e_mode="3" e_status="2" a_name="C" e_match_total="4" e_match_count="2"/>)");
  EXPECT_EQ(filter_.Status(), kStatusComplete);
  // Filtered in place; the application outside a computer, drive and folder is never visited.
  EXPECT_EQ(lastResults_, matches->Xml());
  EXPECT_THAT(ValuesOf(*matches, "//a", "v_id"), ElementsAre("1", "0", "3", "<absent>"));
  EXPECT_EQ(matches->AsNode().SelectSingleNode("/*/a").Xml(), kOutside);
}

// A computer can stand anywhere, even inside a version; one inside a version that the rules remove
// goes with it, and is not walked any more.
TEST_F(FilterRunTest, AComputerInsideARemovedVersionGoesWithIt) {
  const std::string inner = R"(<c c_id="2"><m m_id="1"><d d_id="1">)" +
                            Application("Inner", "3 2 2 1 1") + "</d></m></c>";
  RunToEnd(LowWeights,
           Parse(Matches({Application("Outer", "1 2 2 1 1|" + Version("2 1 2 1 1", inner))})));
  EXPECT_THAT(events_, ElementsAre("S1:0/0", "S2:2/0", "POuter:2/1", "S3:2/1"));
}

}  // namespace
}  // namespace trl::testing
