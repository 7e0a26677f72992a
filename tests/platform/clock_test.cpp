#include "platform/clock.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>

#include "platform/failure.h"
#include "support/failure_of.h"

namespace trl {
namespace {

using testing::FailureOf;

TEST(ClockTest, ReadsTheAcceptedFormsAndWritesOne) {
  const std::pair<const char*, const char*> cases[] = {
      {"2023-01-05 10:30:15", "2023-01-05 10:30:15"},
      {"2023/01/05T10:30", "2023-01-05 10:30:00"},
      {"  2024-02-29 23:59:59 ", "2024-02-29 23:59:59"},
      {"2000-02-29", "2000-02-29 00:00:00"},
      {"0987-6-5 4:3:2", "0987-06-05 04:03:02"},
  };
  for (const auto& [text, written] : cases) {
    std::string read;
    EXPECT_NO_THROW(read = FormatDateTime(ToDateTime(text))) << text;
    EXPECT_EQ(read, written);
  }
}

TEST(ClockTest, RejectsEverythingElse) {
  for (const char* text :
       {"2023-02-29", "1900-02-29", "2023-04-31", "2023-13-01", "2023-01-00", "2023-01-05 24:00:00",
        "2023-01-05 10:60", "2023-01-05 10:30:60", "yesterday", "", "2023-01-05 10", "2023-01/05",
        "23-01-05", "0099-01-01", "2023-01-05T", "2023-01-05 10:30:15x", "2023-001-05",
        "2023-01-05 10:30:"}) {
    EXPECT_EQ(FailureOf([&] { ToDateTime(text); }), kTypeMismatch) << text;
  }
}

TEST(ClockTest, FromTimeTGivesLocalTime) {
  setenv("TZ", "<+02>-2", 1);  // a POSIX rule: no zone database needed
  tzset();
  EXPECT_EQ(FormatDateTime(FromTimeT(951782400)), "2000-02-29 02:00:00");
}

}  // namespace
}  // namespace trl
