#include "platform/text.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

#include "platform/failure.h"
#include "platform/regexp.h"
#include "support/failure_of.h"

namespace trl {
namespace {

using testing::FailureOf;

std::string Shown(std::string_view text) { return ::testing::PrintToString(std::string(text)); }

// Lower-cased by character beyond ASCII too (the Kelvin sign shrinks to a byte, Deseret takes
// four), also after the fast ASCII start; invalid and truncated bytes kept.
TEST(TextTest, LowerCase) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {"ABC xyz @[`{ 09_", "abc xyz @[`{ 09_"},
      {"\xC3\x84Z\xC3\x96", "\xC3\xA4z\xC3\xB6"},
      {"\xE2\x84\xAA", "k"},
      {"\xF0\x90\x90\x80", "\xF0\x90\x90\xA8"},
      {"Q\xFFZ", "q\xFFz"},
      {"\xC3", "\xC3"}};
  for (const auto& [text, lower] : cases) EXPECT_EQ(LowerCase(text), lower) << Shown(text);
}

// Native names, whether they are valid UTF-8 and XML-safe, and the names made of them.
TEST(TextTest, NameFromNativeEscapesWhatXmlOrPathsCannotCarry) {
  struct Case {
    std::string_view native;
    bool validUtf8, xmlSafe;
    std::string_view name;
  };
  const Case cases[] = {
      {"", true, true, ""},
      {"Setup.exe", true, true, "Setup.exe"},
      {"\xC3\xA4rger \xF0\x9F\x98\x80", true, true, "\xC3\xA4rger \xF0\x9F\x98\x80"},
      {"a\\z", true, true, "a\xEF\x9D\x9Cz"},  // "\" is the component's separator
      {"\t\r\n", true, true, "\xEF\x9C\x89\xEF\x9C\x8D\xEF\x9C\x8A"},  // so are control characters
      {"a\x01", true, false, "a\xEF\x9C\x81"},
      {"\xC3\xA4\x01", true, false, "\xC3\xA4\xEF\x9C\x81"},
      {"x\xFFy", false, false, "x\xEF\x9F\xBFy"},  // undecodable byte
      {"\xE2\x82", false, false, "\xEF\x9F\xA2\xEF\x9E\x82"},
      {"\xEF\xBF\xBE", true, false,
       "\xEF\x9F\xAF\xEF\x9E\xBF\xEF\x9E\xBE"},  // U+FFFE, byte by byte
      {"\xEF\xBF\xBF", true, false, "\xEF\x9F\xAF\xEF\x9E\xBF\xEF\x9E\xBF"},
      {"\xEF\x9C\x80", true, true, "\xEF\x9F\xAF\xEF\x9E\x9C\xEF\x9E\x80"},  // an escape character
  };
  for (const auto& c : cases) {
    EXPECT_EQ(IsValidUtf8(c.native), c.validUtf8) << Shown(c.native);
    EXPECT_EQ(IsXmlSafe(c.native), c.xmlSafe) << Shown(c.native);
    EXPECT_EQ(NameFromNative(c.native), c.name) << Shown(c.native);
    EXPECT_EQ(NameToNative(c.name), c.native) << Shown(c.name);
  }
}

// Long names are scanned eight bytes at a time: what needs a change is seen wherever it stands.
TEST(TextTest, EveryByteOfALongNameCounts) {
  const std::string plain(19, 'a');
  for (size_t at = 0; at < plain.size(); ++at) {
    auto with = [&](std::string_view piece) {
      return plain.substr(0, at) + std::string(piece) + plain.substr(at + 1);
    };
    SCOPED_TRACE(at);
    EXPECT_TRUE(IsXmlSafe(with("\x7F")));
    EXPECT_FALSE(IsXmlSafe(with("\x01")));
    EXPECT_FALSE(IsXmlSafe(with("\xFF")));
    EXPECT_EQ(NameFromNative(with("\\")), with("\xEF\x9D\x9C"));
    EXPECT_EQ(NameFromNative(with("\x1F")), with("\xEF\x9C\x9F"));
    EXPECT_EQ(NameFromNative(with("\xC3\x84")), with("\xC3\x84"));
    EXPECT_EQ(LowerCase(with("Q")), with("q"));
    EXPECT_EQ(LowerCase(with("\xC3\x84")), with("\xC3\xA4"));
  }
}

// Random names made of pieces of a text rich in what needs escaping (separator, control byte,
// multi-byte and escape-block characters, a noncharacter, a stray byte) and of random bytes.
TEST(TextTest, NativeNamesRoundTripAsXmlSafeText) {
  const std::string_view kSource =
      "a\\\x1F\xC3\xA4\xE2\x82\xAC\xEF\x9C\x80\xEF\x9F\xBF\xEF\xBF\xBE\xC3\x80";
  std::mt19937 random(20240611);
  for (int i = 0; i < 5000; ++i) {
    std::string native;
    for (int n = random() % 9; n > 0; --n) {
      native += random() % 8
                    ? std::string(kSource.substr(random() % kSource.size(), 1 + random() % 4))
                    : std::string(1, static_cast<char>(random()));
    }
    std::string name = NameFromNative(native);
    ASSERT_TRUE(IsValidUtf8(name) && IsXmlSafe(name)) << Shown(native);
    ASSERT_EQ(name.find('\\'), std::string::npos) << Shown(native);
    ASSERT_EQ(NameToNative(name), native) << Shown(native);
  }
}

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
