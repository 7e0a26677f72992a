#pragma once

#include <compare>
#include <ctime>
#include <string>
#include <string_view>

namespace trl {

// A local date and time to the second, as documents carry it.
struct DateTime {
  int year = 1899;
  int month = 12;
  int day = 30;
  int hour = 0;
  int minute = 0;
  int second = 0;

  auto operator<=>(const DateTime&) const = default;
};

DateTime Now();
DateTime FromTimeT(std::time_t time);  // local time

// "yyyy-mm-dd hh:nn:ss" (24-hour clock, "nn" minutes).
std::string FormatDateTime(const DateTime& value);

// Reads "yyyy-mm-dd hh:nn:ss", "yyyy-mm-dd hh:nn", "yyyy-mm-dd", with "/" for "-" or "T" for the
// blank also accepted. Fails with kTypeMismatch (13) for anything else, impossible dates included.
DateTime ToDateTime(std::string_view text);

}  // namespace trl
