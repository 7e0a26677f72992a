#include "filter_replay.h"

#include <memory>

#include "filter_names.h"
#include "trl/filter.h"

namespace trl::cli {

FilterReplay::FilterReplay(const xml::Document& matches, int16_t filterOptions) {
  const std::string text = matches.Xml();
  int16_t applied = None;
  auto run = [&](const std::string& rule) {
    auto copy = std::make_shared<xml::Document>();
    copy->LoadXml(text);
    Filter filter;
    filter.Asynchronous(false);
    filter.Start(applied, copy);
    steps_.push_back(copy);
    rules_.push_back(rule);
  };
  run("");
  for (int16_t bit : kFilterOrder) {
    if ((filterOptions & bit) == 0) continue;
    applied = static_cast<int16_t>(applied | bit);
    run(std::string(FilterName(bit)));
  }
}

}  // namespace trl::cli
