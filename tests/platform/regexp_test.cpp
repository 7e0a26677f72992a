#include "platform/regexp.h"

#include <gtest/gtest.h>

#include "platform/failure.h"
#include "support/failure_of.h"

namespace trl {
namespace {

using testing::FailureOf;

// Case-sensitive and unanchored, on characters (not bytes) with JavaScript-like escapes; a raw
// invalid byte is no character but stops no search.
TEST(RegExpTest, Matches) {
  struct Case {
    const char* pattern;
    const char* text;
    bool expected;
  };
  const Case cases[] = {
      {"abc", "xabcx", true},        {"abc", "ABC", false},
      {"^abc$", "abc", true},        {"^\xC3\xA4.\xC3\xB6$", "\xC3\xA4\xE2\x82\xAC\xC3\xB6", true},
      {"\\u00e4", "\xC3\xA4", true}, {"a.b", "a\xFF\x62", false},
      {"b$", "a\xFF\x62", true}};
  for (const auto& c : cases) {
    RegExp regExp;
    regExp.Pattern(c.pattern);
    EXPECT_EQ(regExp.Test(c.text), c.expected) << c.pattern << " on " << c.text;
  }
}

TEST(RegExpTest, EachPatternTakesEffect) {
  RegExp regExp;
  EXPECT_TRUE(regExp.Test(std::string_view{}));  // no pattern matches everything
  regExp.Pattern("ab(c");
  std::string failure;
  try {
    regExp.Test("abc");
  } catch (const Failure& raised) {
    failure = std::to_string(raised.number) + " " + raised.description;
  }
  EXPECT_EQ(failure,
            "5017 Syntax error in regular expression: missing closing parenthesis at offset 4");
  EXPECT_EQ(FailureOf([&] { regExp.Test("abc"); }), kRegExpSyntax) << "and again";
  regExp.Pattern("^b");
  EXPECT_EQ(regExp.Pattern(), "^b");
  EXPECT_FALSE(regExp.Test("abc"));
  EXPECT_TRUE(regExp.Test("bcd"));
}

}  // namespace
}  // namespace trl
