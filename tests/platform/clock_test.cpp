#include "platform/clock.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <optional>
#include <string>

#include "platform/failure.h"

namespace trl {
namespace {

TEST(ClockTest, FormatDateTime) {
  struct Case {
    DateTime value;
    const char* expected;
  };
  const Case cases[] = {
      {{2023, 1, 5, 9, 3, 7}, "2023-01-05 09:03:07"},
      {{1999, 12, 31, 23, 59, 59}, "1999-12-31 23:59:59"},
      {{987, 6, 5, 4, 3, 2}, "0987-06-05 04:03:02"},
      {{}, "1899-12-30 00:00:00"},
  };
  for (const auto& c : cases) EXPECT_EQ(FormatDateTime(c.value), c.expected);
}

TEST(ClockTest, ToDateTimeReadsTheAcceptedForms) {
  struct Case {
    const char* text;
    DateTime expected;
  };
  const Case cases[] = {
      {"2023-01-05 10:30:15", {2023, 1, 5, 10, 30, 15}},
      {"2023-01-05 10:30", {2023, 1, 5, 10, 30, 0}},
      {"2023-01-05", {2023, 1, 5, 0, 0, 0}},
      {"2023/01/05 10:30:15", {2023, 1, 5, 10, 30, 15}},
      {"2023-01-05T10:30:15", {2023, 1, 5, 10, 30, 15}},
      {"2023-1-5 1:2:3", {2023, 1, 5, 1, 2, 3}},
      {"  2024-02-29 23:59:59 ", {2024, 2, 29, 23, 59, 59}},
      {"2000-02-29", {2000, 2, 29, 0, 0, 0}},
  };
  for (const auto& c : cases) {
    std::optional<DateTime> read;
    EXPECT_NO_THROW(read = ToDateTime(c.text)) << c.text;
    if (read) {
      EXPECT_EQ(FormatDateTime(*read), FormatDateTime(c.expected)) << c.text;
    }
  }
}

TEST(ClockTest, ToDateTimeRejectsEverythingElse) {
  const char* rejected[] = {"2023-02-29",       "1900-02-29",
                            "2023-04-31",       "2023-13-01",
                            "2023-01-00",       "2023-01-05 24:00:00",
                            "2023-01-05 10:60", "2023-01-05 10:30:60",
                            "yesterday",        "",
                            "2023-01-05 10",    "2023-01/05",
                            "23-01-05",         "0099-01-01",
                            "2023-01-05T",      "2023-01-05 10:30:15x",
                            "2023-001-05",      "2023-01-05 10:30:"};
  for (const char* text : rejected) {
    try {
      auto value = ToDateTime(text);
      ADD_FAILURE() << '"' << text << "\" read as " << FormatDateTime(value);
    } catch (const Failure& failure) {
      EXPECT_EQ(failure.number, kTypeMismatch) << text;
    }
  }
}

// Sets TZ for the life of the object; POSIX rule strings need no zone database.
class ScopedTimeZone {
 public:
  explicit ScopedTimeZone(const char* zone) {
    if (const char* old = std::getenv("TZ")) old_ = old;
    setenv("TZ", zone, 1);
    tzset();
  }
  ~ScopedTimeZone() {
    if (old_) {
      setenv("TZ", old_->c_str(), 1);
    } else {
      unsetenv("TZ");
    }
    tzset();
  }
  ScopedTimeZone(const ScopedTimeZone&) = delete;
  ScopedTimeZone& operator=(const ScopedTimeZone&) = delete;

 private:
  std::optional<std::string> old_;
};

TEST(ClockTest, FromTimeTGivesLocalTime) {
  struct Case {
    const char* zone;
    std::time_t time;
    const char* expected;
  };
  const Case cases[] = {
      {"UTC0", 0, "1970-01-01 00:00:00"},
      {"UTC0", 951782400, "2000-02-29 00:00:00"},
      {"<+02>-2", 0, "1970-01-01 02:00:00"},
      {"<-05>5", 0, "1969-12-31 19:00:00"},
      {"CET-1CEST,M3.5.0,M10.5.0/3", 1688212800, "2023-07-01 14:00:00"},  // summer time
      {"CET-1CEST,M3.5.0,M10.5.0/3", 1704110400, "2024-01-01 13:00:00"},
  };
  for (const auto& c : cases) {
    ScopedTimeZone zone(c.zone);
    EXPECT_EQ(FormatDateTime(FromTimeT(c.time)), c.expected) << c.zone << " " << c.time;
  }
}

TEST(ClockTest, FromTimeTAgreesWithTheCLibrary) {
  ScopedTimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
  // Every 7 hours 13 minutes over about eight years crosses many month ends and DST changes.
  for (std::time_t time = 1600000000; time < 1850000000; time += 7 * 3600 + 13 * 60) {
    std::tm parts{};
    ASSERT_NE(localtime_r(&time, &parts), nullptr);
    DateTime expected{parts.tm_year + 1900, parts.tm_mon + 1, parts.tm_mday,
                      parts.tm_hour,        parts.tm_min,     parts.tm_sec};
    ASSERT_EQ(FromTimeT(time), expected) << time;
  }
}

}  // namespace
}  // namespace trl
