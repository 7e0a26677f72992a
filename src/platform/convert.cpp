#include "platform/convert.h"

#include <fmt/format.h>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>
#include <system_error>

#include "platform/failure.h"

namespace trl {
namespace {

bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

bool IsDigit(char c) { return c >= '0' && c <= '9'; }

std::string_view Trim(std::string_view text) {
  while (!text.empty() && IsBlank(text.front())) text.remove_prefix(1);
  while (!text.empty() && IsBlank(text.back())) text.remove_suffix(1);
  return text;
}

size_t SkipDigits(std::string_view text, size_t pos) {
  while (pos < text.size() && IsDigit(text[pos])) ++pos;
  return pos;
}

// "&H..." text. As in the platform's hexadecimal literals, a value that fits 16 bits is a 16-bit
// two's-complement number and one that fits 32 bits a 32-bit one ("&HFFFF" is -1).
double ParseHex(std::string_view digits) {
  if (digits.empty()) Fail(kTypeMismatch);
  uint64_t value = 0;
  auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value, 16);
  if (end != digits.data() + digits.size()) Fail(kTypeMismatch);
  if (error == std::errc::result_out_of_range || value > 0xFFFFFFFFu) Fail(kOverflow);
  if (value <= 0xFFFFu) return static_cast<int16_t>(static_cast<uint16_t>(value));
  return static_cast<int32_t>(static_cast<uint32_t>(value));
}

// Decimal magnitude of the number whose mantissa is `mantissa` (digits with at most one ".")
// times 10^exponent: negative when it is below 1. Only its sign matters, to tell an underflow
// from an overflow.
int64_t Magnitude(std::string_view mantissa, int64_t exponent) {
  auto point = std::min(mantissa.find('.'), mantissa.size());
  auto first = mantissa.find_first_of("123456789");
  if (first == std::string_view::npos) return 0;
  int64_t position = first < point ? static_cast<int64_t>(point - first) - 1
                                   : -static_cast<int64_t>(first - point);
  return position + exponent;
}

// Reads the exponent digits, saturating: any exponent beyond this bound is out of range anyway.
int64_t ReadExponent(std::string_view digits) {
  int64_t value = 0;
  for (char c : digits) value = std::min<int64_t>(value * 10 + (c - '0'), 1'000'000);
  return value;
}

// Blanks, a sign, digits with an optional fraction, an optional exponent; or "&H" hex digits.
double ParseNumber(std::string_view text) {
  text = Trim(text);
  if (text.size() >= 2 && text[0] == '&' && (text[1] == 'H' || text[1] == 'h')) {
    return ParseHex(text.substr(2));
  }
  size_t pos = 0;
  bool negative = false;
  if (pos < text.size() && (text[pos] == '+' || text[pos] == '-')) negative = text[pos++] == '-';
  size_t mantissaStart = pos;
  size_t intEnd = SkipDigits(text, pos);
  // Whole numbers of up to 15 digits, nearly every number read, are exact in a double: they skip
  // the general parse.
  if (intEnd == text.size() && intEnd > pos && intEnd - pos <= 15) {
    int64_t whole = 0;
    for (char c : text.substr(pos)) whole = whole * 10 + (c - '0');
    auto value = static_cast<double>(whole);
    return negative ? -value : value;
  }
  bool hasDigits = intEnd > pos;
  pos = intEnd;
  if (pos < text.size() && text[pos] == '.') {
    size_t fractionEnd = SkipDigits(text, pos + 1);
    hasDigits = hasDigits || fractionEnd > pos + 1;
    pos = fractionEnd;
  }
  if (!hasDigits) Fail(kTypeMismatch);
  std::string_view mantissa = text.substr(mantissaStart, pos - mantissaStart);
  int64_t exponent = 0;
  if (pos < text.size() && (text[pos] == 'e' || text[pos] == 'E')) {
    size_t digitsStart = pos + 1;
    bool negativeExponent = false;
    if (digitsStart < text.size() && (text[digitsStart] == '+' || text[digitsStart] == '-')) {
      negativeExponent = text[digitsStart++] == '-';
    }
    size_t digitsEnd = SkipDigits(text, digitsStart);
    if (digitsEnd == digitsStart) Fail(kTypeMismatch);
    exponent = ReadExponent(text.substr(digitsStart, digitsEnd - digitsStart));
    if (negativeExponent) exponent = -exponent;
    pos = digitsEnd;
  }
  if (pos != text.size()) Fail(kTypeMismatch);

  // from_chars takes no leading "+", so parse from after the sign.
  double value = 0;
  auto [end, error] = std::from_chars(text.data() + mantissaStart, text.data() + pos, value);
  if (error == std::errc::result_out_of_range) {
    if (Magnitude(mantissa, exponent) >= 0) Fail(kOverflow);
    value = 0;  // too small for a double: it is zero
  } else if (error != std::errc() || end != text.data() + pos) {
    Fail(kTypeMismatch);
  }
  return negative ? -value : value;
}

// Rounds half to even and checks the range of the integer type T.
template <typename T>
T RoundTo(double value) {
  if (std::isnan(value)) Fail(kOverflow);
  double rounded = std::nearbyint(value);
  if (rounded < static_cast<double>(std::numeric_limits<T>::min()) ||
      rounded > static_cast<double>(std::numeric_limits<T>::max())) {
    Fail(kOverflow);
  }
  return static_cast<T>(rounded);
}

template <typename T>
T CheckedSum(T a, T b) {
  int64_t sum = int64_t{a} + int64_t{b};
  if (sum < std::numeric_limits<T>::min() || sum > std::numeric_limits<T>::max()) Fail(kOverflow);
  return static_cast<T>(sum);
}

bool EqualsIgnoringCase(std::string_view text, std::string_view lowerWord) {
  return std::equal(text.begin(), text.end(), lowerWord.begin(), lowerWord.end(),
                    [](char a, char b) { return (a >= 'A' && a <= 'Z' ? a + 32 : a) == b; });
}

}  // namespace

int16_t ToInt16(std::string_view text) { return RoundTo<int16_t>(ParseNumber(text)); }
int32_t ToInt32(std::string_view text) { return RoundTo<int32_t>(ParseNumber(text)); }
int16_t ToInt16(double value) { return RoundTo<int16_t>(value); }
int32_t ToInt32(double value) { return RoundTo<int32_t>(value); }
double ToDouble(std::string_view text) { return ParseNumber(text); }

bool ToBool(std::string_view text) {
  auto trimmed = Trim(text);
  if (EqualsIgnoringCase(trimmed, "true")) return true;
  if (EqualsIgnoringCase(trimmed, "false")) return false;
  return ParseNumber(trimmed) != 0;
}

std::string BoolToText(bool value) { return value ? "True" : "False"; }

std::string DoubleToText(double value) {
  if (value == 0) return "0";  // also for -0
  return fmt::format("{:.15G}", value);
}

int32_t CheckedAdd(int32_t a, int32_t b) { return CheckedSum(a, b); }
int16_t CheckedAdd16(int16_t a, int16_t b) { return CheckedSum(a, b); }

}  // namespace trl
