#include "platform/clock.h"

#include <fmt/format.h>

#include <cctype>

#include "platform/failure.h"

namespace trl {
namespace {

bool IsLeapYear(int year) { return (year % 4 == 0 && year % 100 != 0) || year % 400 == 0; }

int DaysInMonth(int year, int month) {
  static constexpr int kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  return month == 2 && IsLeapYear(year) ? 29 : kDays[month - 1];
}

// Reads exactly `digits` (or, with `atMost`, 1 to `digits`) decimal digits at `pos`.
bool ReadNumber(std::string_view text, size_t& pos, int digits, bool atMost, int& out) {
  int value = 0;
  int count = 0;
  while (pos < text.size() && count < digits &&
         std::isdigit(static_cast<unsigned char>(text[pos]))) {
    value = value * 10 + (text[pos] - '0');
    ++pos;
    ++count;
  }
  out = value;
  return atMost ? count > 0 : count == digits;
}

[[noreturn]] void NotADate() { Fail(kTypeMismatch); }

}  // namespace

DateTime FromTimeT(std::time_t time) {
  std::tm parts{};
#ifdef _WIN32
  if (localtime_s(&parts, &time) != 0) Fail(kOverflow);
#else
  if (localtime_r(&time, &parts) == nullptr) Fail(kOverflow);
#endif
  return DateTime{parts.tm_year + 1900, parts.tm_mon + 1, parts.tm_mday,
                  parts.tm_hour,        parts.tm_min,     parts.tm_sec};
}

DateTime Now() { return FromTimeT(std::time(nullptr)); }

std::string FormatDateTime(const DateTime& v) {
  return fmt::format("{:04}-{:02}-{:02} {:02}:{:02}:{:02}", v.year, v.month, v.day, v.hour,
                     v.minute, v.second);
}

DateTime ToDateTime(std::string_view text) {
  while (!text.empty() && std::isspace(static_cast<unsigned char>(text.front()))) {
    text.remove_prefix(1);
  }
  while (!text.empty() && std::isspace(static_cast<unsigned char>(text.back()))) {
    text.remove_suffix(1);
  }
  DateTime v;
  v.hour = v.minute = v.second = 0;
  size_t pos = 0;
  if (!ReadNumber(text, pos, 4, false, v.year)) NotADate();
  if (pos >= text.size() || (text[pos] != '-' && text[pos] != '/')) NotADate();
  char separator = text[pos++];
  if (!ReadNumber(text, pos, 2, true, v.month)) NotADate();
  if (pos >= text.size() || text[pos] != separator) NotADate();
  ++pos;
  if (!ReadNumber(text, pos, 2, true, v.day)) NotADate();
  if (pos < text.size()) {
    if (text[pos] != ' ' && text[pos] != 'T') NotADate();
    ++pos;
    if (!ReadNumber(text, pos, 2, true, v.hour)) NotADate();
    if (pos >= text.size() || text[pos] != ':') NotADate();
    ++pos;
    if (!ReadNumber(text, pos, 2, true, v.minute)) NotADate();
    if (pos < text.size()) {
      if (text[pos] != ':') NotADate();
      ++pos;
      if (!ReadNumber(text, pos, 2, true, v.second)) NotADate();
    }
    if (pos != text.size()) NotADate();
  }
  if (v.year < 100 || v.month < 1 || v.month > 12 || v.day < 1 ||
      v.day > DaysInMonth(v.year, v.month) || v.hour > 23 || v.minute > 59 || v.second > 59) {
    NotADate();
  }
  return v;
}

}  // namespace trl
