#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "trl/xml.h"

namespace trl::cli {

// The filter run again on copies of a matches document, with the selected rules added one at a
// time in the order it applies them. Each rule acts on what the rules before it left, and every
// threshold is taken before the first rule runs, so what a step changed is its rule's doing.
class FilterReplay {
 public:
  FilterReplay(const xml::Document& matches, int16_t filterOptions);

  // The document after each step: step 0 weighs the versions and applies no rule, step i the
  // first i rules; the last is what the filter gives.
  size_t Steps() const { return steps_.size(); }
  xml::Document& After(size_t step) const { return *steps_[step]; }
  // The rule step i (1 or more) added, by its command-line name.
  const std::string& Rule(size_t step) const { return rules_[step]; }

 private:
  std::vector<xml::DocumentPtr> steps_;
  std::vector<std::string> rules_;
};

}  // namespace trl::cli
