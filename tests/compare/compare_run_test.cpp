// Whole asynchronous runs: their reports, selection and cancel.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>

#include "compare/compare_fixture.h"
#include "platform/event_loop.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;

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

TEST_F(CompareRunTest, LocalFilesWithoutFilesExamineNothing) {
  RunToEnd(R"(<fp><a a_id="1"><v v_id="1"><f f_id="1" f_name="x"/></v></a><a a_id="2"/></fp>)",
           R"(<trl_applicationdata search_end="e"><c c_text="h"/></trl_applicationdata>)");
  EXPECT_THAT(reports_, ElementsAre("S1", "S3"));
  EXPECT_EQ(Attribute("e_a_total"), "2");
  EXPECT_EQ(Attribute("e_a_count"), "0");
  std::vector<std::string> names;
  for (const auto& [name, value] : results_->DocumentElement().Attributes()) names.push_back(name);
  EXPECT_THAT(names, ElementsAre("search_start", "search_end", "compare_start", "compare_end"));
  EXPECT_EQ(results_->DocumentElement().GetAttribute("search_start"), "");
  EXPECT_EQ(results_->AsNode().CountNodes("/*/c"), 0u);
}

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
  EXPECT_EQ(compare_.Status(), kStatusCancelled);
  EXPECT_EQ(Attribute("e_a_count"), "2");
  EXPECT_EQ(Attribute("e_match_count"), "1");
  EXPECT_EQ(results_->DocumentElement().GetAttribute("cancelled"), "1");
  EXPECT_THAT(ValuesOf(*results_, "//d/a", "a_id"), ElementsAre("3"));
}

}  // namespace
}  // namespace trl::testing
