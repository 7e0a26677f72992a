#include "compare/version_draft.h"

#include <cctype>
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

}  // namespace

bool CarriesWeight(const xml::Node& f) {
  auto weight = f.GetAttribute(vocab::f_weight);
  return weight && XPathNumber(*weight) > 0;
}

VersionFiles::VersionFiles(const std::vector<xml::Node>& files)
    : files_(files), weighted_(files.size(), -1) {
  for (size_t i = 0; i < files.size(); ++i) {
    if (auto id = files[i].GetAttribute(vocab::f_id)) byId.try_emplace(*id, i);
  }
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
