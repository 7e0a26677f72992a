#include "filter/version_values.h"

#include <cmath>

#include "filter/filter_names.h"
#include "frame/attributes.h"
#include "frame/vocabulary.h"
#include "platform/convert.h"
#include "platform/failure.h"

namespace trl::filter {

double VersionWeight(const xml::Node& v) {
  double act = ToDouble(TextOf(v, vocab::v_act));
  double max = ToDouble(TextOf(v, vocab::v_max));
  // As the platform's division fails: 0/0 overflows, anything else over 0 divides by zero.
  if (max == 0) Fail(act == 0 ? kOverflow : kDivisionByZero);
  double weight = act / max;
  if (!std::isfinite(weight)) Fail(kOverflow);
  return weight;
}

double WeightOf(const xml::Node& v) { return ToDouble(TextOf(v, vocab::v_weight)); }

int32_t MissingFilesOf(const xml::Node& v) {
  int64_t missing =
      int64_t{ToInt32(TextViewOf(v, vocab::f_max))} - ToInt32(TextViewOf(v, vocab::f_act));
  if (missing < INT32_MIN || missing > INT32_MAX) Fail(kOverflow);
  return static_cast<int32_t>(missing);
}

int32_t FileCountOf(const xml::Node& v) { return Int32Of(v, vocab::f_max); }

int32_t Int32Of(const xml::Node& v, std::string_view attribute) {
  return ToInt32(TextViewOf(v, attribute));
}

int16_t CountVersions(const xml::Node& a) {
  // Counting stops where a 16-bit number does.
  return ToInt16(static_cast<double>(a.CountChildElements(vocab::v, INT16_MAX + 1)));
}

void Relabel(const OnError& on, xml::Node v, std::string_view name) {
  on([&] { v.SetAttribute(vocab::v_id, kUnidentified); });
  on([&] { v.SetAttribute(vocab::v_name, name); });
  on([&] { v.SetAttribute(vocab::v_seq, kUnidentified); });
}

}  // namespace trl::filter
