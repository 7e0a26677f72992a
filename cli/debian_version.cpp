#include "debian_version.h"

#include <cctype>
#include <cstdint>

namespace trl::cli {
namespace {

struct Parts {
  uint64_t epoch = 0;
  std::string_view upstream, revision;
};

Parts Split(std::string_view version) {
  Parts parts;
  if (size_t colon = version.find(':'); colon != std::string_view::npos) {
    for (char c : version.substr(0, colon)) {
      if (std::isdigit(static_cast<unsigned char>(c))) parts.epoch = parts.epoch * 10 + (c - '0');
    }
    version.remove_prefix(colon + 1);
  }
  size_t hyphen = version.rfind('-');
  parts.upstream = version.substr(0, hyphen);
  if (hyphen != std::string_view::npos) parts.revision = version.substr(hyphen + 1);
  return parts;
}

bool IsDigit(char c) { return std::isdigit(static_cast<unsigned char>(c)) != 0; }

// The weight of one character in a non-digit run; 0 stands for the end of the run.
int Order(char c) {
  if (c == '\0' || IsDigit(c)) return 0;
  if (std::isalpha(static_cast<unsigned char>(c))) return static_cast<unsigned char>(c);
  if (c == '~') return -1;
  return static_cast<unsigned char>(c) + 256;
}

int CompareRuns(std::string_view a, std::string_view b) {
  size_t i = 0, j = 0;
  auto at = [](std::string_view text, size_t k) { return k < text.size() ? text[k] : '\0'; };
  while (i < a.size() || j < b.size()) {
    while ((i < a.size() && !IsDigit(a[i])) || (j < b.size() && !IsDigit(b[j]))) {
      int x = Order(at(a, i)), y = Order(at(b, j));
      if (x != y) return x - y;
      ++i, ++j;
    }
    while (at(a, i) == '0') ++i;
    while (at(b, j) == '0') ++j;
    int firstDifference = 0;
    for (; IsDigit(at(a, i)) && IsDigit(at(b, j)); ++i, ++j) {
      if (firstDifference == 0) firstDifference = at(a, i) - at(b, j);
    }
    if (IsDigit(at(a, i))) return 1;
    if (IsDigit(at(b, j))) return -1;
    if (firstDifference != 0) return firstDifference;
  }
  return 0;
}

}  // namespace

int CompareDebianVersions(std::string_view a, std::string_view b) {
  Parts x = Split(a), y = Split(b);
  if (x.epoch != y.epoch) return x.epoch < y.epoch ? -1 : 1;
  if (int upstream = CompareRuns(x.upstream, y.upstream); upstream != 0) return upstream;
  return CompareRuns(x.revision, y.revision);
}

}  // namespace trl::cli
