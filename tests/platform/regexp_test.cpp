#include "platform/regexp.h"

#include <gtest/gtest.h>

#include "platform/failure.h"

namespace trl {
namespace {

TEST(RegExpTest, MatchesLikeTheClientsPatterns) {
  struct Case {
    const char* pattern;
    std::string_view text;
    bool expected;
  };
  const Case cases[] = {
      // Case-sensitive, unanchored.
      {"abc", "xabcx", true},
      {"abc", "ABC", false},
      {"^abc$", "abc", true},
      {"^abc$", "xabc", false},
      {"\\.exe$", "setup.exe.bak", false},
      {"a", "", false},
      {"^$", "", true},
      // Characters, not bytes, beyond ASCII; no folding of their case either.
      {"^\xC3\xA4.\xC3\xB6$", "\xC3\xA4\xE2\x82\xAC\xC3\xB6", true},
      {"^\xC3\xA4.\xC3\xB6$", "\xC3\xA4xx\xC3\xB6", false},
      {"\xC3\x84", "\xC3\xA4", false},
      // Escape-block characters that stand for undecodable bytes of a name.
      {"^lib.\\.dll$", "lib\xEF\x9F\xBF.dll", true},
      {"^\xEF\x9E\x80",
       "\xEF\x9E\x80"
       "abc",
       true},
      {"^\\uF780", "\xEF\x9E\x80", true},
      // Raw invalid bytes never match a character but do not stop the search.
      {"a.b",
       "a\xFF"
       "b",
       false},
      {"b$",
       "a\xFF"
       "b",
       true},
      // JavaScript-like escapes.
      {"\\u00e4", "\xC3\xA4", true},
      {"^\\x41$", "A", true},
      {"\\d", "\xD9\xA3", false},  // Arabic-Indic digit: \d is ASCII only
  };
  for (const auto& c : cases) {
    RegExp regExp;
    regExp.Pattern(c.pattern);
    EXPECT_EQ(regExp.Test(c.text), c.expected) << c.pattern << " on " << c.text;
  }
}

TEST(RegExpTest, EmptyPatternMatchesEverything) {
  RegExp regExp;
  for (std::string_view text :
       {std::string_view{}, std::string_view{"anything"}, std::string_view{"\xFF\xFE"}}) {
    EXPECT_TRUE(regExp.Test(text));
  }
  regExp.Pattern("x");
  EXPECT_FALSE(regExp.Test("abc"));
  regExp.Pattern("");
  EXPECT_TRUE(regExp.Test("abc"));
}

TEST(RegExpTest, NewPatternReplacesTheCompiledOne) {
  RegExp regExp;
  regExp.Pattern("^a");
  EXPECT_TRUE(regExp.Test("abc"));
  regExp.Pattern("^b");
  EXPECT_EQ(regExp.Pattern(), "^b");
  EXPECT_FALSE(regExp.Test("abc"));
  EXPECT_TRUE(regExp.Test("bcd"));
}

TEST(RegExpTest, InvalidPatternFailsEveryTestUntilReplaced) {
  for (const char* invalid : {"(abc", "a{2,1}", "[z-a]", "*x", "\\"}) {
    RegExp regExp;
    regExp.Pattern(invalid);
    EXPECT_EQ(regExp.Pattern(), invalid);
    for (int attempt = 0; attempt < 2; ++attempt) {
      try {
        regExp.Test("abc");
        ADD_FAILURE() << invalid << " matched instead of failing";
      } catch (const Failure& failure) {
        EXPECT_EQ(failure.number, kRegExpSyntax) << invalid;
        EXPECT_NE(failure.description.find(" at offset "), std::string::npos)
            << failure.description;
      }
    }
    regExp.Pattern("b");
    EXPECT_TRUE(regExp.Test("abc")) << "after " << invalid;
  }
}

TEST(RegExpTest, SyntaxFailureNamesTheProblemAndItsOffset) {
  RegExp regExp;
  regExp.Pattern("ab(c");
  try {
    regExp.Test("abc");
    FAIL() << "an unbalanced pattern matched";
  } catch (const Failure& failure) {
    EXPECT_NE(failure.description.find("missing closing parenthesis"), std::string::npos)
        << failure.description;
    EXPECT_NE(failure.description.find("offset 4"), std::string::npos) << failure.description;
  }
}

}  // namespace
}  // namespace trl
