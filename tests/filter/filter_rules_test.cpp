// The versions a synchronous run keeps, their labels, and each application's verdict.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "filter/filter_fixture.h"

namespace trl::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;

using FilterRulesTest = FilterTest;

std::string Joined(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

TEST_F(FilterRulesTest, RulesKeepAndLabelVersionsAndTheApplicationTakesTheVerdict) {
  constexpr int16_t kAll = 63;
  struct Case {
    int16_t options;
    std::vector<std::string> versions;  // "v_id v_act v_max f_act f_max"
    const char* left;                   // v_id of the versions left
    const char* guesses;                // their v_guess
    const char* verdict;                // a_manage, v_id and v_seq of the application
    const char* name;                   // its v_name
  } cases[] = {
      // Within 0.00001 of the best weight, ties included, wherever the best stands.
      {LowWeights,
       {"1 900000 1000000 1 1", "2 899995 1000000 1 1"},
       "1 2",
       "",
       "1 -1 -1",
       "Unsupported Version"},
      {LowWeights, {"1 900000 1000000 1 1", "2 89 100 1 1"}, "1", "", "1 1 1", "V1"},
      {LowWeights,
       {"1 89 100 1 1", "2 9 10 1 1", "3 90 100 1 1"},
       "2 3",
       "",
       "1 -1 -1",
       "Unsupported Version"},
      {MissingFiles,
       {"1 1 1 4 5", "2 1 1 3 5", "3 1 1 2 3"},
       "1 3",
       "",
       "1 -1 -1",
       "Unsupported Version"},
      {LowFileCount,
       {"1 1 1 4 5", "2 1 1 3 4", "3 1 1 5 5"},
       "1 3",
       "",
       "1 -1 -1",
       "Unsupported Version"},
      // The fewest missing files belong to a version the weight rule removes: nothing is left.
      {LowWeights | MissingFiles,
       {"1 10 10 3 5", "2 10 10 4 5", "3 5 10 5 5"},
       "",
       "",
       "1 0 0",
       "N/A"},
      {LowWeights | LowFileCount,
       {"1 10 10 3 3", "2 10 10 4 4", "3 5 10 5 5"},
       "",
       "",
       "1 0 0",
       "N/A"},
      {None, {"1 1 2 1 1", "2 0 2 1 1"}, "1 2", "", "1 -1 -1", "Unsupported Version"},
      {kAll, {"1 3 3 1 2", "2 3 3 1 2", "3 2 3 1 2"}, "-1", "1", "0 -1 -1", "Multiple Matches"},
      // The first of the versions left is kept, named by whether it matched fully.
      {DuplicateMatches, {"1 3 3 1 1", "2 3 3 1 1"}, "-1", "1", "1 -1 -1", "Multiple Matches"},
      {DuplicateMatches, {"1 2 3 1 1", "2 3 3 1 1"}, "-1", "1", "1 -1 -1", "Unsupported Version"},
      {LowWeights | DuplicateMatches,
       {"1 2 3 1 1", "2 3 3 1 1", "3 3 3 1 1"},
       "-1",
       "2",
       "1 -1 -1",
       "Multiple Matches"},
      {DuplicateMatches,
       {"5 3 3 1 1", "6 3 3 1 1", "-1 1 3 1 1"},
       "-1 -1",
       "5 <absent>",
       "1 -1 -1",
       "Unsupported Version"},
      {DuplicateMatches | FlagUnknowns,
       {"1 2 3 1 1", "2 3 3 1 1"},
       "-1",
       "1",
       "1 -1 -1",
       "Unsupported Version"},
      {FlagUnknowns, {"4 2 3 1 1"}, "-1", "4", "1 -1 -1", "Unsupported Version"},
      {FlagUnknowns, {"4 3 3 1 1"}, "4", "", "1 4 4", "V4"},
      {FlagUnmanaged, {}, "", "", "1 0 0", "N/A"},
      {FlagUnmanaged, {"1 3 3 2 2", "2 3 3 1 2"}, "1 2", "", "0 -1 -1", "Unsupported Version"},
      {FlagUnmanaged, {"1 3 3 3 2"}, "1", "", "0 1 1", "V1"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(Joined(c.versions) + " options " + std::to_string(c.options));
    std::vector<std::string> versions;
    for (const std::string& text : c.versions) versions.push_back(Version(text));
    auto document = Run(c.options, Matches({Application("A", versions)}));
    EXPECT_EQ(Joined(ValuesOf(*document, "//a/v", "v_id")), c.left);
    std::string guesses = c.guesses;
    if (guesses.empty()) {
      for (size_t i = 0; i < Words(c.left).size(); ++i) guesses += " <absent>";
    }
    EXPECT_EQ(Joined(ValuesOf(*document, "//a/v", "v_guess")), Joined(Words(guesses)));
    EXPECT_EQ(
        Joined({ValuesOf(*document, "//a", "a_manage")[0], ValuesOf(*document, "//a", "v_id")[0],
                ValuesOf(*document, "//a", "v_seq")[0]}),
        c.verdict);
    EXPECT_THAT(ValuesOf(*document, "//a", "v_name"), ElementsAre(c.name));
  }
  EXPECT_THAT(TakeReportedEvents(), IsEmpty());
}

TEST_F(FilterRulesTest, TheOnlyVersionLeftHandsItsNotesToTheApplication) {
  const std::string children = R"(<f f_id="1"/><n k="1"/><o k="2"/><n k="3"/>)";
  struct Case {
    int16_t options;
    std::vector<std::string> versions;
    std::string application;
  } cases[] = {
      {None,
       {Version("3 3 3 1 1", children)},
       R"(<a a_id="1" a_name="A" a_manage="1" v_id="3" v_name="V3" v_seq="3"><n k="1"/><n k="3"/>)"
       R"(<o k="2"/><v v_id="3" v_name="V3" v_seq="3" v_max="3" v_act="3" f_max="1" f_act="1" )"
       R"(v_weight="1"><f f_id="1"/></v></a>)"},
      {LowWeights,
       {Version("1 1 3 1 1", R"(<n k="0"/>)"), Version("2 3 3 1 1", children)},
       R"(<a a_id="1" a_name="A" a_manage="1" v_id="2" v_name="V2" v_seq="2"><n k="1"/><n k="3"/>)"
       R"(<o k="2"/><v v_id="2" v_name="V2" v_seq="2" v_max="3" v_act="3" f_max="1" f_act="1" )"
       R"(v_weight="1"><f f_id="1"/></v></a>)"},
      {None,
       {Version("1 3 3 1 1", R"(<n k="0"/>)"), Version("2 1 3 1 1")},
       R"(<a a_id="1" a_name="A" a_manage="1" v_id="-1" v_name="Unsupported Version" v_seq="-1">)"
       R"(<v v_id="1" v_name="V1" v_seq="1" v_max="3" v_act="3" f_max="1" f_act="1" v_weight="1">)"
       R"(<n k="0"/></v><v v_id="2" v_name="V2" v_seq="2" v_max="3" v_act="1" f_max="1" )"
       R"(f_act="1" v_weight="0.333333333333333"/></a>)"},
  };
  for (const Case& c : cases) {
    auto document = Run(c.options, Matches({Application("A", c.versions)}));
    EXPECT_EQ(document->AsNode().SelectSingleNode("//a").Xml(), c.application);
  }
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
  std::vector<std::string> applications;
  std::vector<std::string> weights;
  std::vector<ReportedEvent> failures;
  for (const Case& c : cases) {
    std::string max = c.max ? std::string(" v_max=\"") + c.max + "\"" : "";
    applications.push_back(
        Application("A", {std::string("<v v_id=\"1\" v_name=\"V1\" v_seq=\"1\"") + max +
                          " v_act=\"" + c.act + "\" f_max=\"1\" f_act=\"1\"/>"}));
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
    std::vector<std::string> versions;
    const char* left;     // v_id of the versions left
    const char* guesses;  // their v_guess
    const char* manage;
    std::vector<std::pair<int32_t, const char*>> failures;
  } cases[] = {
      // Read first, nothing stands before it: 0 files, fewer than the most.
      {LowFileCount,
       {Version("1 3 3 2 x"), Version("2 3 3 2 2")},
       "2",
       "<absent>",
       "1",
       {{kTypeMismatch, "FilterVersions"},
        {kTypeMismatch, "FilterVersions"},
        {kTypeMismatch, "RemoveLowestFileCount"}}},
      // After a removal the scan starts again, and the version is read and reported again.
      {LowFileCount,
       {Version("1 3 3 2 2"), Version("2 3 3 2 x"), Version("3 3 3 1 1")},
       "1 2",
       "<absent> <absent>",
       "1",
       {{kTypeMismatch, "FilterVersions"},
        {kTypeMismatch, "FilterVersions"},
        {kTypeMismatch, "RemoveLowestFileCount"},
        {kTypeMismatch, "RemoveLowestFileCount"}}},
      {FlagUnmanaged,
       {Version("1 3 3 2 x"), Version("2 3 3 2 2")},
       "1 2",
       "<absent> <absent>",
       "0",
       {{kTypeMismatch, "FilterVersions"},
        {kTypeMismatch, "FilterVersions"},
        {kTypeMismatch, "FlagAsUnmanaged"}}},
      {FlagUnknowns,
       {Version("1 3 x 2 2"), Version("2 3 3 2 2")},
       "-1 2",
       "1 <absent>",
       "1",
       {{kTypeMismatch, "Filter"}, {kTypeMismatch, "FlagAsUnknown"}}},
      // A v_id that cannot be read leaves the text before it, here none, as the guess.
      {FlagUnknowns,
       {R"(<v v_max="3" v_act="1" f_max="1" f_act="1"/>)"},
       "-1",
       "",
       "1",
       {{kInvalidUseOfNull, "FlagAsUnknown"}}},
      {DuplicateMatches,
       {R"(<v v_max="3" v_act="3" f_max="1" f_act="1"/>)", Version("2 3 3 1 1")},
       "-1",
       "",
       "1",
       {{kInvalidUseOfNull, "RemoveDuplicateMatches"}}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(Joined(c.versions));
    auto document = Run(c.options, Matches({Application("A", c.versions)}));
    EXPECT_EQ(Joined(ValuesOf(*document, "//a/v", "v_id")), c.left);
    EXPECT_EQ(Joined(ValuesOf(*document, "//a/v", "v_guess")), c.guesses);
    EXPECT_THAT(ValuesOf(*document, "//a", "a_manage"), ElementsAre(c.manage));
    std::vector<std::pair<int32_t, std::string>> reported;
    for (const ReportedEvent& event : TakeReportedEvents()) {
      reported.emplace_back(event.number, event.procedure);
    }
    EXPECT_THAT(reported, ElementsAreArray(std::vector<std::pair<int32_t, std::string>>(
                              c.failures.begin(), c.failures.end())));
  }
}

}  // namespace
}  // namespace trl::testing
