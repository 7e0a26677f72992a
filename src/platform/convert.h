#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace trl {

// Conversions of document text the way the platform converts variant text. Each fails with
// kTypeMismatch (13) for text that is not a number (or Boolean, or date) and with kOverflow (6) for
// a value out of the target's range. Numbers may carry surrounding blanks, a sign, a fraction and
// an exponent; fractions round half to even ("2.5" -> 2).
int16_t ToInt16(std::string_view text);
int32_t ToInt32(std::string_view text);
int16_t ToInt16(double value);
int32_t ToInt32(double value);
double ToDouble(std::string_view text);

// "True"/"False" in any letter case, or a number (0 is false, anything else true).
bool ToBool(std::string_view text);
std::string BoolToText(bool value);  // "True" or "False"

// 15 significant digits, trailing zeros dropped, "." as separator; exponent form ("1E-07") only
// where fixed notation would need more than 15 digits.
std::string DoubleToText(double value);

// Additions that fail with kOverflow instead of wrapping.
int32_t CheckedAdd(int32_t a, int32_t b);
int16_t CheckedAdd16(int16_t a, int16_t b);

}  // namespace trl
