#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <map>
#include <string_view>

#include "frame/error_handler.h"
#include "trl/xml.h"

namespace trl::merge {

// The ids in use among the computers, drives and folders of a results document, read as
// HighestId reads them (each c, m and d element's first attribute, wherever it stands), and kept
// in step as elements come and go: the highest of each level is known at any moment without a
// walk of the whole document.
class IdLedger {
 public:
  // Reads every id below `root`; one that is missing or not a whole number is reported under
  // `on` and passed over.
  IdLedger(const OnError& on, const xml::Node& root);

  // `node` and everything below it joined the document, or is about to leave it.
  void Added(const xml::Node& node);
  void Removing(const xml::Node& node);

  // The highest id of the `tag` elements (c, m or d) in use; 0 when there is none.
  int32_t Highest(std::string_view tag) const;

 private:
  using Counts = std::map<int32_t, size_t>;  // each id, and how many elements hold it
  Counts* LevelOf(std::string_view tag);
  // Visits `node` and its descendants that stand for a level, with their level's counts.
  template <class Visit>
  void ForEachIn(const xml::Node& node, Visit visit);

  std::array<Counts, 3> levels_;  // c, m, d
};

}  // namespace trl::merge
