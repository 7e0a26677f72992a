#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>

#include "trl/xml.h"

namespace trl {

// Answers whether the application options select an application, from an index a_id ->
// a_selected of the options document last asked about; the index is rebuilt only when another
// document is asked about or that document has changed.
class ApplicationSelection {
 public:
  bool IsSelected(std::string_view applicationId, xml::Document& options);

 private:
  void Rebuild(xml::Document& options);

  std::optional<uint64_t> serial_;  // of the indexed document; none before the first build
  uint64_t modificationCount_ = 0;
  std::unordered_map<std::string, std::optional<std::string>> selected_;  // first `a` per a_id
  std::optional<std::string> rootDefault_;
};

}  // namespace trl
