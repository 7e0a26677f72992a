// The versions a synchronous run keeps, their labels, and each application's verdict.
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>

#include "filter/filter_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAreArray;
using ::testing::IsEmpty;

using FilterRulesTest = FilterTest;

// "left v_ids|their v_guess (_: absent)|a_manage[ v_id v_seq|v_name]" of the only application.
std::string Outcome(xml::Document& d, bool verdict = true) {
  auto a = [&](const char* name) { return ValuesOf(d, "//a", name)[0]; };
  std::string text = fmt::format("{}|{}|{}", fmt::join(ValuesOf(d, "//a/v", "v_id"), " "),
                                 fmt::join(ValuesOf(d, "//a/v", "v_guess"), " "), a("a_manage"));
  text = std::regex_replace(text, std::regex("<absent>"), "_");
  return verdict ? text + " " + a("v_id") + " " + a("v_seq") + "|" + a("v_name") : text;
}

TEST_F(FilterRulesTest, RulesKeepAndLabelVersionsAndTheApplicationTakesTheVerdict) {
  constexpr int16_t kAll = 63;
  const std::string kU = "|1 -1 -1|Unsupported Version";
  struct Case {
    int16_t options;
    const char* versions;  // "v_id v_act v_max f_act f_max|..."
    std::string outcome;
  } cases[] = {
      // Within 0.00001 of the best weight, ties included, wherever the best stands.
      {LowWeights, "1 900000 1000000 1 1|2 899995 1000000 1 1", "1 2|_ _" + kU},
      {LowWeights, "1 900000 1000000 1 1|2 89 100 1 1", "1|_|1 1 1|V1"},
      {LowWeights, "1 89 100 1 1|2 9 10 1 1|3 90 100 1 1", "2 3|_ _" + kU},
      {MissingFiles, "1 1 1 4 5|2 1 1 3 5|3 1 1 2 3", "1 3|_ _" + kU},
      {LowFileCount, "1 1 1 4 5|2 1 1 3 4|3 1 1 5 5", "1 3|_ _" + kU},
      // The fewest missing files belong to a version the weight rule removes: nothing is left.
      {LowWeights | MissingFiles, "1 10 10 3 5|2 10 10 4 5|3 5 10 5 5", "||1 0 0|N/A"},
      {LowWeights | LowFileCount, "1 10 10 3 3|2 10 10 4 4|3 5 10 5 5", "||1 0 0|N/A"},
      {None, "1 1 2 1 1|2 0 2 1 1", "1 2|_ _" + kU},
      {kAll, "1 3 3 1 2|2 3 3 1 2|3 2 3 1 2", "-1|1|0 -1 -1|Multiple Matches"},
      // The first of the versions left is kept, named by whether it matched fully.
      {DuplicateMatches, "1 3 3 1 1|2 3 3 1 1", "-1|1|1 -1 -1|Multiple Matches"},
      {DuplicateMatches, "1 2 3 1 1|2 3 3 1 1", "-1|1" + kU},
      {LowWeights | DuplicateMatches, "1 2 3 1 1|2 3 3 1 1|3 3 3 1 1",
       "-1|2|1 -1 -1|Multiple Matches"},
      {DuplicateMatches, "5 3 3 1 1|6 3 3 1 1|-1 1 3 1 1", "-1 -1|5 _" + kU},
      {DuplicateMatches | FlagUnknowns, "1 2 3 1 1|2 3 3 1 1", "-1|1" + kU},
      {FlagUnknowns, "4 2 3 1 1", "-1|4" + kU},
      {FlagUnknowns, "4 3 3 1 1", "4|_|1 4 4|V4"},
      {FlagUnmanaged, "", "||1 0 0|N/A"},
      {FlagUnmanaged, "1 3 3 2 2|2 3 3 1 2", "1 2|_ _|0 -1 -1|Unsupported Version"},
      {FlagUnmanaged, "1 3 3 3 2", "1|_|0 1 1|V1"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.versions) + " options " + std::to_string(c.options));
    EXPECT_EQ(Outcome(*Run(c.options, Matches({Application("A", c.versions)}))), c.outcome);
  }
  EXPECT_THAT(TakeReportedEvents(), IsEmpty());
}

TEST_F(FilterRulesTest, TheOnlyVersionLeftHandsItsNotesToTheApplication) {
  const std::string kNotes = R"(<f f_id="1"/><n k="1"/><o k="2"/><n k="3"/>)";
  auto document =
      Run(LowWeights, Matches({Application("A", Version("1 1 3 1 1", R"(<n k="0"/>)") + "|" +
                                                    Version("2 3 3 1 1", kNotes))}));
  EXPECT_EQ(document->AsNode().SelectSingleNode("//a").Xml(),
            R"(<a a_id="1" a_name="A" a_manage="1" v_id="2" v_name="V2" v_seq="2">)"
            R"(<n k="1"/><n k="3"/><o k="2"/>)" +
                Version("2 3 3 1 1", R"(<f f_id="1"/>)", R"( v_weight="1")") + "</a>");
}

TEST_F(FilterRulesTest, AWeightThatCannotBeComputedIsReportedAndWrittenAsZero) {
  struct Case {
    const char* act;
    const char* max;  // nullptr: absent
    const char* weight;
    int32_t failure;  // 0: none
  } cases[] = {
      {"1", "3", "0.333333333333333", 0},
      {"899995", "1000000", "0.899995", 0},
      {"7", "7", "1", 0},
      {"0", "5", "0", 0},
      {"1", "0", "0", kDivisionByZero},
      {"0", "0", "0", kOverflow},
      {"x", "5", "0", kTypeMismatch},
      {"1", nullptr, "0", kInvalidUseOfNull},
      {"1E300", "1E-10", "0", kOverflow},
  };
  std::vector<std::string> applications, weights;
  std::vector<ReportedEvent> failures;
  for (const Case& c : cases) {
    std::string max = c.max ? std::string(" v_max=\"") + c.max + "\"" : "";
    applications.push_back(Application("A", "<v v_id=\"1\" v_name=\"V1\" v_seq=\"1\"" + max +
                                                " v_act=\"" + c.act +
                                                "\" f_max=\"1\" f_act=\"1\"/>"));
    weights.push_back(c.weight);
    if (c.failure != 0) {
      failures.push_back(
          {c.failure, 1, "Filter", "Filter", StandardDescription(c.failure), "trlLocator"});
    }
  }
  auto document = Run(None, Matches(applications));
  EXPECT_THAT(ValuesOf(*document, "//a/v", "v_weight"), ElementsAreArray(weights));
  EXPECT_THAT(ValuesOf(*document, "//a", "v_id"),
              ElementsAreArray(std::vector<std::string>(std::size(cases), "1")));
  EXPECT_EQ(TakeReportedEvents(), failures);
}

TEST_F(FilterRulesTest, AVersionThatCannotBeReadIsJudgedByTheValueReadBeforeIt) {
  struct Case {
    int16_t options;
    std::string versions;
    const char* outcome;     // left|guesses|a_manage
    const char* procedures;  // each reporting the unreadable value
  } cases[] = {
      // After a removal the scan starts again, and the version is read and reported again.
      {LowFileCount, "1 3 3 2 2|2 3 3 2 x|3 3 3 1 1", "1 2|_ _|1",
       "FilterVersions FilterVersions RemoveLowestFileCount RemoveLowestFileCount"},
      {FlagUnmanaged, "1 3 3 2 x|2 3 3 2 2", "1 2|_ _|0",
       "FilterVersions FilterVersions FlagAsUnmanaged"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.versions);
    auto document = Run(c.options, Matches({Application("A", c.versions)}));
    EXPECT_EQ(Outcome(*document, false), c.outcome);
    std::string reported;
    for (const ReportedEvent& event : TakeReportedEvents()) {
      // A procedure reporting another failure is marked with '?'.
      reported += (reported.empty() ? "" : " ") + event.procedure +
                  (event.number == kTypeMismatch ? "" : "?");
    }
    EXPECT_EQ(reported, c.procedures);
  }
}

}  // namespace
}  // namespace trl::testing
