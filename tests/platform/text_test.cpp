#include "platform/text.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

namespace trl {
namespace {

using namespace std::string_view_literals;

TEST(TextTest, LowerCase) {
  struct Case {
    std::string_view text;
    std::string_view expected;
  };
  const Case cases[] = {
      {"ABC xyz 09_", "abc xyz 09_"},
      {"\xC3\x84\xC3\x96\xC3\x9C", "\xC3\xA4\xC3\xB6\xC3\xBC"},  // ÄÖÜ
      {"\xC4\xB0", "i"},                                         // dotted capital I
      {"\xCE\xA3\xCE\x91\xCE\xA3", "\xCF\x83\xCE\xB1\xCF\x83"},  // Greek, no final-sigma rule
      {"\xE2\x84\xAA", "k"},                                     // Kelvin sign shrinks to a byte
      {"\xE1\xBA\x9E", "\xC3\x9F"},                              // capital sharp s
      {"\xF0\x90\x90\x80", "\xF0\x90\x90\xA8"},                  // Deseret, four bytes
      {"Q\xFFZ", "q\xFFz"},                                      // invalid byte kept
      {"\xC3", "\xC3"},                                          // truncated sequence kept
      {"X\xC0\x80Y", "x\xC0\x80y"},                              // overlong form kept
  };
  for (const auto& c : cases) EXPECT_EQ(LowerCase(c.text), c.expected) << c.text;
}

TEST(TextTest, Utf8AndXmlValidity) {
  struct Case {
    std::string_view text;
    bool validUtf8;
    bool xmlSafe;
  };
  const Case cases[] = {
      {"", true, true},
      {"plain\ttext\r\n", true, true},
      {"\xC3\xA4\xF0\x9F\x98\x80", true, true},
      {"\xEF\x9C\x80", true, true},  // private use
      {"\x01", true, false},
      {"\xEF\xBF\xBE", true, false},  // U+FFFE
      {"\xFF", false, false},
      {"\xC0\xAF", false, false},          // overlong "/"
      {"\xED\xA0\x80", false, false},      // encoded surrogate
      {"\xF4\x90\x80\x80", false, false},  // beyond U+10FFFF
      {"\xE2\x82", false, false},          // truncated
  };
  for (const auto& c : cases) {
    EXPECT_EQ(IsValidUtf8(c.text), c.validUtf8) << testing::PrintToString(std::string(c.text));
    EXPECT_EQ(IsXmlSafe(c.text), c.xmlSafe) << testing::PrintToString(std::string(c.text));
  }
}

TEST(TextTest, NameFromNativeEscapesWhatXmlOrPathsCannotCarry) {
  struct Case {
    std::string_view native;
    std::string_view name;
  };
  const Case cases[] = {
      {"Setup.exe", "Setup.exe"},
      {"\xC3\xA4rger \xE2\x82\xAC", "\xC3\xA4rger \xE2\x82\xAC"},
      {"a\\z", "a\xEF\x9D\x9Cz"},                                // "\" is the component's separator
      {"\x01\t", "\xEF\x9C\x81\xEF\x9C\x89"},                    // control characters
      {"x\xFFy", "x\xEF\x9F\xBFy"},                              // undecodable byte
      {"\xC3", "\xEF\x9F\x83"},                                  // truncated sequence
      {"\xEF\xBF\xBE", "\xEF\x9F\xAF\xEF\x9E\xBF\xEF\x9E\xBE"},  // U+FFFE, byte by byte
      {"\xEF\x9C\x80", "\xEF\x9F\xAF\xEF\x9E\x9C\xEF\x9E\x80"},  // a literal escape character
  };
  for (const auto& c : cases) {
    EXPECT_EQ(NameFromNative(c.native), c.name) << testing::PrintToString(std::string(c.native));
    EXPECT_EQ(NameToNative(c.name), c.native) << testing::PrintToString(std::string(c.name));
  }
}

// Random names built from pieces that stress the escaping: ASCII, separators, control bytes,
// valid multi-byte characters, escape-block characters, noncharacters and stray bytes.
std::string RandomName(std::mt19937& random) {
  static const std::string_view kPieces[] = {
      "a"sv,
      "\\"sv,
      "\0"sv,
      "\x1F"sv,
      "\xC3\xA4"sv,
      "\xE2\x82\xAC"sv,
      "\xF0\x9F\x98\x80"sv,
      "\xEF\x9C\x80"sv,
      "\xEF\x9F\xBF"sv,
      "\xEF\xBF\xBE"sv,
      "\xED\xA0\x80"sv,
      "\xC3"sv,
      "\x80"sv,
      "\xFF"sv,
  };
  std::uniform_int_distribution<int> length(0, 16);
  std::uniform_int_distribution<size_t> piece(0, std::size(kPieces));
  std::uniform_int_distribution<int> byte(0, 255);
  std::string name;
  for (int i = length(random); i > 0; --i) {
    size_t pick = piece(random);
    if (pick == std::size(kPieces)) {
      name.push_back(static_cast<char>(byte(random)));
    } else {
      name.append(kPieces[pick]);
    }
  }
  return name;
}

TEST(TextTest, NativeNamesRoundTripAsXmlSafeText) {
  std::mt19937 random(20240611);
  for (int i = 0; i < 5000; ++i) {
    std::string native = RandomName(random);
    std::string name = NameFromNative(native);
    auto shown = testing::PrintToString(native);
    ASSERT_TRUE(IsValidUtf8(name)) << shown;
    ASSERT_TRUE(IsXmlSafe(name)) << shown;
    ASSERT_EQ(name.find('\\'), std::string::npos) << shown;
    ASSERT_EQ(NameToNative(name), native) << shown;
  }
}

}  // namespace
}  // namespace trl
