#include "platform/convert.h"

#include <fmt/format.h>
#include <gtest/gtest.h>

#include <climits>
#include <cstdlib>
#include <ctime>
#include <limits>
#include <string>

#include "platform/clock.h"
#include "platform/failure.h"

namespace trl {
namespace {

// What a conversion gives: its value as text, or "#" and the number of the failure it raised.
template <typename F>
std::string Result(F convert) {
  try {
    return fmt::format("{}", convert());
  } catch (const Failure& failure) {
    return "#" + std::to_string(failure.number);
  }
}

TEST(ConvertTest, Numbers) {
  // Text, then what ToInt16, ToInt32 and ToDouble make of it. Fractions round half to even.
  const char* const cases[][4] = {{"\t -7 \r\n", "-7", "-7", "-7"},
                                  {"+5", "5", "5", "5"},
                                  {".5", "0", "0", "0.5"},
                                  {"5.", "5", "5", "5"},
                                  {"1.5E1", "15", "15", "15"},
                                  {"25e-1", "2", "2", "2.5"},
                                  {"+.125", "0", "0", "0.125"},
                                  {"&hFFFF", "-1", "-1", "-1"},
                                  {"&H10000", "#6", "65536", "65536"},
                                  {"&H100000000", "#6", "#6", "#6"},
                                  {"32767.5", "#6", "32768", "32767.5"},
                                  {"-32769", "#6", "-32769", "-32769"},
                                  {"2147483647.5", "#6", "#6", "2147483647.5"},
                                  {"-2147483648", "#6", "-2147483648", "-2147483648"},
                                  {"1e999", "#6", "#6", "#6"},
                                  {"-1e-400", "0", "0", "-0"},
                                  {"12345678901234567890", "#6", "#6", "1.2345678901234567e+19"}};
  for (const auto& c : cases) {
    EXPECT_EQ(Result([&] { return ToInt16(c[0]); }), c[1]) << c[0];
    EXPECT_EQ(Result([&] { return ToInt32(c[0]); }), c[2]) << c[0];
    EXPECT_EQ(Result([&] { return ToDouble(c[0]); }), c[3]) << c[0];
  }
  for (const char* text : {"", "  ", "+", "- 1", ".", "1e", "1e+", "&H", "&HG", "1.2.3", "12abc"}) {
    EXPECT_EQ(Result([&] { return ToDouble(text); }), "#13") << text;
  }
  // Out of range either way: the digits' magnitude decides, not the exponent's sign.
  EXPECT_EQ(Result([] { return ToDouble("0." + std::string(400, '0') + "1e5"); }), "0");
  EXPECT_EQ(Result([] { return ToDouble("1" + std::string(400, '0') + "e-10"); }), "#6");
  EXPECT_EQ(Result([] { return ToInt32(std::numeric_limits<double>::quiet_NaN()); }), "#6");
}

TEST(ConvertTest, Booleans) {
  const std::pair<const char*, const char*> cases[] = {{" TRUE ", "true"}, {"FaLsE", "false"},
                                                       {"-1", "true"},     {"0.0", "false"},
                                                       {"truex", "#13"},   {"1e999", "#6"}};
  for (const auto& [text, result] : cases)
    EXPECT_EQ(Result([&] { return ToBool(text); }), result) << text;
  EXPECT_EQ(BoolToText(true) + BoolToText(false), "TrueFalse");
}

TEST(ConvertTest, DoubleToText) {
  const std::pair<double, const char*> cases[] = {{-0.0, "0"},
                                                  {1.0 / 3, "0.333333333333333"},
                                                  {1e-5, "1E-05"},
                                                  {1234567890123456.0, "1.23456789012346E+15"}};
  for (const auto& [value, text] : cases) EXPECT_EQ(DoubleToText(value), text) << value;
}

TEST(ConvertTest, CheckedAdditions) {
  EXPECT_EQ(Result([] { return CheckedAdd(INT32_MIN, INT32_MAX); }), "-1");
  EXPECT_EQ(Result([] { return CheckedAdd(INT32_MAX, 1); }), "#6");
  EXPECT_EQ(Result([] { return CheckedAdd16(-32768, -1); }), "#6");
}

// The accepted forms are written in one; anything else is a type mismatch.
TEST(ClockTest, ReadsTheAcceptedFormsOnlyAndWritesOne) {
  const auto written = [](const char* text) {
    return Result([&] { return FormatDateTime(ToDateTime(text)); });
  };
  const std::pair<const char*, const char*> cases[] = {
      {"2023-01-05 10:30:15", "2023-01-05 10:30:15"},
      {"2023/01/05T10:30", "2023-01-05 10:30:00"},
      {"  2024-02-29 23:59:59 ", "2024-02-29 23:59:59"},
      {"2000-02-29", "2000-02-29 00:00:00"},
      {"0987-6-5 4:3:2", "0987-06-05 04:03:02"}};
  for (const auto& [text, expected] : cases) EXPECT_EQ(written(text), expected) << text;
  for (const char* text :
       {"2023-02-29", "1900-02-29", "2023-04-31", "2023-13-01", "2023-01-00", "2023-01-05 24:00:00",
        "2023-01-05 10:60", "2023-01-05 10:30:60", "yesterday", "", "2023-01-05 10", "2023-01/05",
        "23-01-05", "0099-01-01", "2023-01-05T", "2023-01-05 10:30:15x", "2023-001-05",
        "2023-01-05 10:30:"}) {
    EXPECT_EQ(written(text), "#13") << text;
  }
  setenv("TZ", "<+02>-2", 1);  // a POSIX rule: no zone database needed
  tzset();
  EXPECT_EQ(FormatDateTime(FromTimeT(951782400)), "2000-02-29 02:00:00");
}

}  // namespace
}  // namespace trl
