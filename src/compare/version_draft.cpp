#include "compare/version_draft.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cmath>
#include <string_view>

#include "frame/vocabulary.h"

namespace trl {
namespace {

// An XPath 1.0 number: optional blanks, an optional minus, digits with an optional fraction,
// optional blanks; anything else is NaN.
double XPathNumber(std::string_view text) {
  auto blank = [](char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; };
  while (!text.empty() && blank(text.front())) text.remove_prefix(1);
  while (!text.empty() && blank(text.back())) text.remove_suffix(1);
  bool negative = !text.empty() && text.front() == '-';
  if (negative) text.remove_prefix(1);
  double value = 0, scale = 0;
  bool digits = false;
  for (char c : text) {
    if (c == '.' && scale == 0) {
      scale = 1;
    } else if (std::isdigit(static_cast<unsigned char>(c))) {
      digits = true;
      if (scale == 0) {
        value = value * 10 + (c - '0');
      } else {
        value += (c - '0') * (scale /= 10);
      }
    } else {
      return std::nan("");
    }
  }
  if (!digits) return std::nan("");
  return negative ? -value : value;
}

// The number `text` writes in the form std::to_string gives it, or none when it is written any
// other way ("007", "+7", " 7", "-0") or is not a 32-bit number.
std::optional<int32_t> PlainNumber(std::string_view text) {
  std::string_view digits = text.starts_with('-') ? text.substr(1) : text;
  if (digits.empty() || (digits.front() == '0' && text.size() > 1)) return std::nullopt;
  int32_t value = 0;
  auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return value;
}

}  // namespace

bool CarriesWeight(const xml::Node& f) {
  auto weight = f.GetAttribute(vocab::f_weight);
  return weight && XPathNumber(*weight) > 0;
}

VersionFiles::VersionFiles(const std::vector<xml::Node>& files)
    : files_(files), weighted_(files.size(), -1) {
  byId_.reserve(files.size());
  for (size_t i = 0; i < files.size(); ++i) {
    auto text = files[i].GetAttribute(vocab::f_id);
    if (auto id = text ? PlainNumber(*text) : std::nullopt) byId_.emplace_back(*id, i);
  }
  std::sort(byId_.begin(), byId_.end());
}

std::optional<size_t> VersionFiles::IndexOf(int32_t id) const {
  auto at = std::lower_bound(byId_.begin(), byId_.end(), std::make_pair(id, size_t{0}));
  if (at == byId_.end() || at->first != id) return std::nullopt;
  return at->second;
}

bool VersionFiles::Weighted(size_t i) const {
  if (weighted_[i] < 0) weighted_[i] = CarriesWeight(files_[i]) ? 1 : 0;
  return weighted_[i] == 1;
}

bool VersionDraft::Incomplete(const VersionFiles& files) const {
  if (static_cast<size_t>(filesFound) >= found.size()) return false;
  for (size_t i = 0; i < found.size(); ++i) {
    if (!found[i] && files.Weighted(i)) return true;
  }
  return false;
}

}  // namespace trl
