// Version copies kept aside until their version is matched, against copies made at every find:
// generated fingerprints (missing, repeated and differently written ids, nested applications,
// shared file names) and local files (one name in several folders, listed twice or not on disk)
// give the same results.
#include <gtest/gtest.h>

#include <functional>
#include <random>
#include <regex>
#include <utility>

#include "compare/compare_fixture.h"

namespace trl::testing {
namespace {

// Sized 5 to 7 by their names; "gone.ocx" is listed but on no disk.
const char* const kNames[] = {"a.exe", "bb.dll", "ccc.txt", "gone.ocx"};

// The results text without the times a run takes.
std::string Timeless(const std::string& text) {
  static const std::regex times(R"( (compare_start|compare_end|time)="[^"]*")");
  return std::regex_replace(text, times, "");
}

// A fingerprint and a local-files document drawn from `seed`.
std::pair<std::string, std::string> Draw(uint32_t seed) {
  std::mt19937 rng(seed);
  auto below = [&](int n) { return static_cast<int>(rng() % static_cast<uint32_t>(n)); };
  // Absent, empty or one of two numbers, the one also written otherwise: ids go missing and
  // repeat.
  auto id = [&](const char* name) {
    const char* const values[] = {nullptr, "", "1", "1", "10", "01", "1 "};
    const char* value = values[below(7)];
    return value ? std::string(" ") + name + "='" + value + "'" : "";
  };
  int versionNames = 0;
  auto version = [&] {
    std::string text = "<v" + id("v_id") + " v_name='v" + std::to_string(++versionNames) +
                       "' v_seq='" + std::to_string(below(3)) + "'>";
    for (int n = 1 + below(3); n > 0; --n) {
      text += "<f" + id("f_id") + " f_name='" + kNames[below(4)] + "' f_relpath='" +
              (below(3) == 0 ? "bin" : "") + "' f_weight='" + std::to_string(below(3)) + "'>" +
              (below(3) == 0 ? "<p p_type='2' p_weight='1' p_value='" +
                                   std::to_string(5 + below(3)) + "'/></f>"
                             : "</f>");
    }
    return text + "</v>";
  };
  // Some applications hold another one among their versions.
  std::function<std::string(bool)> application = [&](bool outer) {
    std::string text = "<a" + id("a_id") + ">";
    int versions = 1 + below(2), nested = outer && below(5) < 2 ? below(versions + 1) : -1;
    for (int i = 0; i <= versions; ++i) {
      if (i == nested) text += application(false);
      if (i < versions) text += version();
    }
    return text + "</a>";
  };
  std::string fingerprint = "<fp>";
  for (int n = 1 + below(3); n > 0; --n) fingerprint += application(true);
  std::vector<LocalFolder> folders;
  for (const char* folder : {"\\p\\", "\\p\\bin\\", "\\q\\", "\\q\\bin\\"}) {
    if (below(10) < 3) continue;
    LocalFolder& listed = folders.emplace_back(LocalFolder{folder, {}});
    for (const char* name : kNames) {
      if (below(5) < 3) listed.files.insert(listed.files.end(), below(5) == 0 ? 2 : 1, name);
    }
  }
  return {fingerprint + "</fp>", LocalFiles(folders)};
}

TEST_F(CompareTest, DraftedCopiesGiveTheResultsOfCopiesMadeAtEveryFind) {
  int found = 0, empty = 0;
  for (uint32_t seed = 1; seed <= 3000; ++seed) {
    auto [fingerprint, localFiles] = Draw(seed);
    std::string literal = Timeless(Run(fingerprint, localFiles, false));
    ASSERT_EQ(Timeless(Run(fingerprint, localFiles, true)), literal) << "seed " << seed << "\n"
                                                                     << fingerprint << "\n"
                                                                     << localFiles;
    ++(literal.find("<v ") != std::string::npos ? found : empty);
  }
  EXPECT_GT(found, 1500);
  EXPECT_GT(empty, 500);
}

}  // namespace
}  // namespace trl::testing
