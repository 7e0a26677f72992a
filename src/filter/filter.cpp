#include "trl/filter.h"

#include <string>
#include <vector>

#include "filter/filter_names.h"
#include "filter/filter_versions.h"
#include "filter/version_values.h"
#include "frame/error_handler.h"
#include "frame/every_element.h"
#include "frame/general.h"
#include "frame/use_object.h"
#include "frame/vocabulary.h"
#include "platform/convert.h"

namespace trl {

using filter::kClass;
using filter::kFilterLabel;

namespace {

constexpr int32_t kFilterMode = 3;

// The `tag` children of `parent`, or none when they cannot be read.
std::vector<xml::Node> ChildrenOf(const OnError& on, const xml::Node& parent,
                                  std::string_view tag) {
  std::vector<xml::Node> children;
  on([&] { children = parent.ChildElements(tag); });
  return children;
}

}  // namespace

Filter::Filter() : Worker(kClass, kFilterMode) {}

Filter::~Filter() = default;

std::string Filter::Start(int16_t intFilterOptions, xml::DocumentPtr matches) {
  return StartFrame([&] {
    intFilterOptions_ = intFilterOptions;
    objMatchesDOM = matches ? std::move(matches) : std::make_shared<xml::Document>();
    e_match_total = e_match_count = 0;
  });
}

void Filter::RunBody() {
  OnError on{kClass, kFilterLabel};
  on([&] {
    e_match_total = ToInt32(static_cast<double>(CountEveryElement(Use(objMatchesDOM), vocab::a)));
  });
  BeginRun(on);
  WalkApplications();
  SettleStatus();
  EndRun(on);
}

void Filter::WalkApplications() {
  OnError on{kClass, kFilterLabel};
  std::vector<xml::Node> computers;
  on([&] { computers = EveryElement(Use(objMatchesDOM), vocab::c); });
  // A computer can stand inside a version that the rules remove.
  VisitRemaining(computers, vocab::c, [&](const xml::Node& c) {
    for (const xml::Node& m : ChildrenOf(on, c, vocab::m)) {
      for (const xml::Node& d : ChildrenOf(on, m, vocab::d)) {
        for (const xml::Node& a : ChildrenOf(on, d, vocab::a)) {
          if (!FilterApplication(a)) return false;
        }
      }
    }
    return true;
  });
}

bool Filter::FilterApplication(xml::Node a) {
  OnError on{kClass, kFilterLabel};
  for (xml::Node& v : ChildrenOf(on, a, vocab::v)) {
    double weight = 0;  // what a version gets whose weight cannot be computed
    on([&] { weight = filter::VersionWeight(v); });
    on([&] { v.SetAttribute(vocab::v_weight, DoubleToText(weight)); });
  }
  on([&] { filter::FilterVersions(a, intFilterOptions_); });
  bool matched = false;
  on([&] { matched = a.CountChildElements(vocab::v, 1) > 0; });
  if (matched) {
    on([&] { e_match_count = CheckedAdd(e_match_count, 1); });
    Progress(on, [&](xml::Node e) {
      e.SetAttribute(vocab::a_name, FixNulls<std::string>(a.GetAttribute(vocab::a_name), ""));
      e.SetAttribute(vocab::e_match_total, std::to_string(e_match_total));
      e.SetAttribute(vocab::e_match_count, std::to_string(e_match_count));
    });
  }
  return status_ != kStatusCancelled;
}

std::string Filter::ResultText() { return Use(objMatchesDOM).DocumentElement().Xml(); }

xml::DocumentPtr Filter::ResultsDocument() { return objMatchesDOM; }

void Filter::AddStatusCounters(xml::Node e) {
  e.SetAttribute(vocab::e_match_total, std::to_string(e_match_total));
  e.SetAttribute(vocab::e_match_count, std::to_string(e_match_count));
}

void Filter::ReleaseDocuments() { objMatchesDOM.reset(); }

}  // namespace trl
