#include "compare/fingerprint_file.h"

#include <cmath>

#include "frame/attributes.h"
#include "frame/vocabulary.h"
#include "platform/clock.h"
#include "platform/convert.h"
#include "platform/text.h"

namespace trl {
namespace {

// Runs `read`; its failure is added to `failures` instead of leaving.
template <class Read>
void Try(std::vector<std::exception_ptr>& failures, Read read) {
  try {
    read();
  } catch (...) {
    failures.push_back(std::current_exception());
  }
}

}  // namespace

const std::vector<FingerprintFile::Property>& FingerprintFile::Properties() const {
  if (properties_) return *properties_;
  std::vector<Property>& read = properties_.emplace();
  std::vector<xml::Node> properties = f_.GetElementsByTagName(vocab::p);
  read.reserve(properties.size());
  int16_t kind = 0, weight = 0, bit = 0;
  for (const xml::Node& p : properties) {
    Property& property = read.emplace_back();
    Try(property.readFailures, [&] { kind = ToInt16(TextViewOf(p, vocab::p_type)); });
    Try(property.readFailures, [&] { weight = ToInt16(TextViewOf(p, vocab::p_weight)); });
    Try(property.readFailures, [&] { bit = ToInt16(std::pow(2.0, weight - 1)); });
    property.kind = kind;
    property.bit = bit;
    std::string expected;
    try {
      expected = TextOf(p, vocab::p_value);
    } catch (...) {
      property.expectedFailure = std::current_exception();
      continue;
    }
    try {
      if (kind == 1 || kind == 3) property.expectedText = LowerCase(expected);
      if (kind == 2) property.expectedNumber = ToInt32(expected);
      if (kind == 4) property.expectedText = FormatDateTime(ToDateTime(expected));
    } catch (...) {
      property.conversionFailure = std::current_exception();
    }
  }
  return read;
}

const FingerprintFile::Details& FingerprintFile::FindDetails() const {
  if (details_) return *details_;
  Details& details = details_.emplace(Details{});
  Try(details.readFailures, [&] { details.id = ToInt32(TextViewOf(f_, vocab::f_id)); });
  Try(details.readFailures, [&] { details.maxMask = ToInt16(TextViewOf(f_, vocab::p_max)); });
  Try(details.readFailures, [&] { details.fileBit = ToInt16(TextViewOf(f_, vocab::f_bitmask)); });
  return details;
}

}  // namespace trl
