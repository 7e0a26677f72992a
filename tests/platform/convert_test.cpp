#include "platform/convert.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>

#include "platform/failure.h"

namespace trl {
namespace {

constexpr int kOk = 0;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();

// Passes when `convert` raises `failure`, or, for kOk, returns `expected`.
template <typename F, typename T>
testing::AssertionResult Converts(F convert, int failure, T expected) {
  try {
    auto value = convert();
    if (failure == kOk && value == expected) return testing::AssertionSuccess();
    return testing::AssertionFailure() << "returned " << value;
  } catch (const Failure& raised) {
    if (raised.number == failure) return testing::AssertionSuccess();
    return testing::AssertionFailure() << "failed with " << raised.number;
  }
}

TEST(ConvertTest, IntegersFromText) {
  struct Case {
    const char* text;
    int64_t expected;
    int failure16;
    int failure32;
  };
  const Case cases[] = {
      {"  42  ", 42, kOk, kOk},
      {"\t-7 \r\n", -7, kOk, kOk},
      {"+5", 5, kOk, kOk},
      {"2.5", 2, kOk, kOk},
      {"3.5", 4, kOk, kOk},
      {"-2.5", -2, kOk, kOk},
      {"2.51", 3, kOk, kOk},
      {".5", 0, kOk, kOk},
      {"5.", 5, kOk, kOk},
      {"1.5E1", 15, kOk, kOk},
      {"25e-1", 2, kOk, kOk},
      {"&H1F", 31, kOk, kOk},
      {"&HFFFF", -1, kOk, kOk},
      {"&H10000", 65536, kOverflow, kOk},
      {"&HFFFFFFFF", -1, kOk, kOk},
      {"&H100000000", 0, kOverflow, kOverflow},
      {"32767", 32767, kOk, kOk},
      {"32767.5", 32768, kOverflow, kOk},
      {"-32768.5", -32768, kOk, kOk},
      {"-32769", -32769, kOverflow, kOk},
      {"2147483647", 2147483647, kOverflow, kOk},
      {"2147483646.5", 2147483646, kOverflow, kOk},
      {"2147483647.5", 0, kOverflow, kOverflow},
      {"2147483648", 0, kOverflow, kOverflow},
      {"-2147483648", -2147483648LL, kOverflow, kOk},
      {"1e999", 0, kOverflow, kOverflow},
  };
  const char* notNumbers[] = {"",    "   ", "abc",   "1 2",   "--1", "+",    ".",
                              "1e",  "1e+", "0x1F",  "&H",    "&HG", "&H-1", "1,000",
                              "inf", "nan", "12abc", "1.2.3", "- 1", "True"};
  for (const auto& c : cases) {
    EXPECT_TRUE(Converts([&] { return ToInt16(c.text); }, c.failure16, c.expected)) << c.text;
    EXPECT_TRUE(Converts([&] { return ToInt32(c.text); }, c.failure32, c.expected)) << c.text;
  }
  for (const char* text : notNumbers) {
    EXPECT_TRUE(Converts([&] { return ToInt16(text); }, kTypeMismatch, 0)) << text;
    EXPECT_TRUE(Converts([&] { return ToInt32(text); }, kTypeMismatch, 0)) << text;
    EXPECT_TRUE(Converts([&] { return ToDouble(text); }, kTypeMismatch, 0.0)) << text;
  }
}

TEST(ConvertTest, IntegersFromDouble) {
  struct Case {
    double value;
    int64_t expected;
    int failure16;
    int failure32;
  };
  const Case cases[] = {
      {2.5, 2, kOk, kOk},
      {-2.5, -2, kOk, kOk},
      {-0.4, 0, kOk, kOk},
      {32767.49, 32767, kOk, kOk},
      {32767.5, 32768, kOverflow, kOk},
      {-32768.5, -32768, kOk, kOk},
      {-32768.51, -32769, kOverflow, kOk},
      {2147483647.5, 0, kOverflow, kOverflow},
      {-2147483648.5, -2147483648LL, kOverflow, kOk},
      {kNaN, 0, kOverflow, kOverflow},
      {kInf, 0, kOverflow, kOverflow},
      {-kInf, 0, kOverflow, kOverflow},
  };
  for (const auto& c : cases) {
    EXPECT_TRUE(Converts([&] { return ToInt16(c.value); }, c.failure16, c.expected)) << c.value;
    EXPECT_TRUE(Converts([&] { return ToInt32(c.value); }, c.failure32, c.expected)) << c.value;
  }
}

TEST(ConvertTest, ToDouble) {
  struct Case {
    std::string text;
    double expected;
    int failure;
  };
  const Case cases[] = {
      {"1.25", 1.25, kOk},
      {" -0.5 ", -0.5, kOk},
      {"+.125", 0.125, kOk},
      {"&H10", 16, kOk},
      {" -007 ", -7, kOk},
      {"999999999999999", 999999999999999.0, kOk},
      // Past 2^53 whole numbers round like any other: 2^53 + 1 reads as 2^53.
      {"9007199254740993", 9007199254740992.0, kOk},
      {"12345678901234567890", 12345678901234567890.0, kOk},
      {"1.7976931348623157e308", std::numeric_limits<double>::max(), kOk},
      {"1e-400", 0, kOk},
      {"1e309", 0, kOverflow},
      {"-1e309", 0, kOverflow},
      // Out of range either way: the digits' magnitude decides, not the exponent's sign.
      {"0." + std::string(400, '0') + "1e5", 0, kOk},
      {"1" + std::string(400, '0') + "e-10", 0, kOverflow},
  };
  for (const auto& c : cases) {
    EXPECT_TRUE(Converts([&] { return ToDouble(c.text); }, c.failure, c.expected)) << c.text;
  }
}

TEST(ConvertTest, Booleans) {
  struct Case {
    const char* text;
    bool expected;
    int failure;
  };
  const Case cases[] = {
      {"True", true, kOk},           {"TRUE", true, kOk},        {" false ", false, kOk},
      {"FaLsE", false, kOk},         {"-1", true, kOk},          {"0", false, kOk},
      {"0.0", false, kOk},           {"0.5", true, kOk},         {"&H0", false, kOk},
      {"yes", false, kTypeMismatch}, {"", false, kTypeMismatch}, {"truex", false, kTypeMismatch},
      {"1e999", false, kOverflow},
  };
  for (const auto& c : cases) {
    EXPECT_TRUE(Converts([&] { return ToBool(c.text); }, c.failure, c.expected)) << c.text;
  }
  EXPECT_EQ(BoolToText(true) + BoolToText(false), "TrueFalse");
}

TEST(ConvertTest, DoubleToText) {
  struct Case {
    double value;
    const char* expected;
  };
  const Case cases[] = {
      {0.0, "0"},
      {-0.0, "0"},
      {1.0 / 3, "0.333333333333333"},
      {2.0 / 3, "0.666666666666667"},
      {100, "100"},
      {0.1 + 0.2, "0.3"},
      {0.0001, "0.0001"},
      {1e-5, "1E-05"},
      {1e-7, "1E-07"},
      {1.5e20, "1.5E+20"},
      {-2.5e-10, "-2.5E-10"},
      {123456789012345.0, "123456789012345"},
      {1e15, "1E+15"},
      {1234567890123456.0, "1.23456789012346E+15"},
  };
  for (const auto& c : cases) EXPECT_EQ(DoubleToText(c.value), c.expected) << c.value;
}

TEST(ConvertTest, CheckedAdditions) {
  constexpr int32_t kMax = std::numeric_limits<int32_t>::max();
  constexpr int32_t kMin = std::numeric_limits<int32_t>::min();
  struct Case {
    int32_t a;
    int32_t b;
    int64_t expected;
    int failure;
  };
  const Case cases32[] = {
      {1, 2, 3, kOk},          {kMax, 0, kMax, kOk},     {kMin, kMax, -1, kOk},
      {kMax, 1, 0, kOverflow}, {kMin, -1, 0, kOverflow}, {kMax, kMax, 0, kOverflow},
  };
  const Case cases16[] = {
      {32000, 767, 32767, kOk},   {-32768, 32767, -1, kOk},     {32767, 1, 0, kOverflow},
      {-32768, -1, 0, kOverflow}, {20000, 20000, 0, kOverflow},
  };
  for (const auto& c : cases32) {
    EXPECT_TRUE(Converts([&] { return CheckedAdd(c.a, c.b); }, c.failure, c.expected)) << c.a;
  }
  for (const auto& c : cases16) {
    auto a = static_cast<int16_t>(c.a);
    auto b = static_cast<int16_t>(c.b);
    EXPECT_TRUE(Converts([&] { return CheckedAdd16(a, b); }, c.failure, c.expected)) << a;
  }
}

}  // namespace
}  // namespace trl
