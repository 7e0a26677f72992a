#include "platform/glob_match.h"

#include <string_view>

// The system has no shell-pattern match with the same syntax; this one follows the POSIX rules.
namespace trl {
namespace {

// Matches the bracket expression starting after "[" at `glob[at]` against `c`; sets `end` past
// the closing "]". Answers nothing (end = npos) when the bracket is not closed.
bool BracketMatches(std::string_view glob, size_t at, char c, bool pathName, size_t& end) {
  bool negated = at < glob.size() && (glob[at] == '!' || glob[at] == '^');
  if (negated) ++at;
  bool matched = false;
  bool first = true;
  while (at < glob.size() && (glob[at] != ']' || first)) {
    first = false;
    char low = glob[at];
    if (low == '\\' && at + 1 < glob.size()) low = glob[++at];
    if (pathName && low == '/') break;  // a "/" ends the bracket: it is no bracket then
    char high = low;
    if (at + 2 < glob.size() && glob[at + 1] == '-' && glob[at + 2] != ']') {
      at += 2;
      high = glob[at];
      if (high == '\\' && at + 1 < glob.size()) high = glob[++at];
    }
    if (static_cast<unsigned char>(low) <= static_cast<unsigned char>(c) &&
        static_cast<unsigned char>(c) <= static_cast<unsigned char>(high)) {
      matched = true;
    }
    ++at;
  }
  if (at >= glob.size() || glob[at] != ']') {
    end = std::string_view::npos;
    return false;
  }
  end = at + 1;
  return matched != negated;
}

bool Match(std::string_view glob, std::string_view text, bool pathName) {
  size_t g = 0;
  size_t t = 0;
  // Where the last "*" was and how much text it took, to backtrack into.
  size_t starGlob = std::string_view::npos;
  size_t starText = 0;
  while (t < text.size()) {
    if (g < glob.size()) {
      char p = glob[g];
      if (p == '*') {
        starGlob = ++g;
        starText = t;
        continue;
      }
      if (p == '?' && !(pathName && text[t] == '/')) {
        ++g;
        ++t;
        continue;
      }
      if (p == '[' && !(pathName && text[t] == '/')) {
        size_t end = 0;
        bool hit = BracketMatches(glob, g + 1, text[t], pathName, end);
        if (end != std::string_view::npos) {
          if (hit) {
            g = end;
            ++t;
            continue;
          }
        } else if (text[t] == '[') {  // an unclosed "[" is itself
          ++g;
          ++t;
          continue;
        }
      } else if (p == '\\' && g + 1 < glob.size()) {
        if (glob[g + 1] == text[t]) {
          g += 2;
          ++t;
          continue;
        }
      } else if (p != '?' && p != '[' && p == text[t]) {
        ++g;
        ++t;
        continue;
      }
    }
    // A mismatch: let the last "*" take one more character, unless it would cross a "/".
    if (starGlob == std::string_view::npos || (pathName && text[starText] == '/')) return false;
    g = starGlob;
    t = ++starText;
  }
  while (g < glob.size() && glob[g] == '*') ++g;
  return g == glob.size();
}

}  // namespace

bool GlobMatches(const std::string& glob, const std::string& text, bool pathName) {
  return Match(glob, text, pathName);
}

}  // namespace trl
