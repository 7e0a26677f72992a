#include "schema/application_selection.h"

namespace trl {

bool ApplicationSelection::IsSelected(std::string_view applicationId, xml::Document& options) {
  if (serial_ != options.Serial() || modificationCount_ != options.ModificationCount()) {
    Rebuild(options);
  }
  auto listed = selected_.find(std::string(applicationId));
  const std::optional<std::string>& value =
      listed != selected_.end() ? listed->second : rootDefault_;
  return value != "0";
}

void ApplicationSelection::Rebuild(xml::Document& options) {
  serial_.reset();  // a build that fails half-way must not be taken for a finished one
  selected_.clear();
  rootDefault_.reset();
  if (xml::Node root = options.DocumentElement()) {
    rootDefault_ = root.GetAttribute("a_selected");
    for (const xml::Node& application : options.AsNode().GetElementsByTagName("a")) {
      if (auto id = application.GetAttribute("a_id")) {
        selected_.try_emplace(*id, application.GetAttribute("a_selected"));
      }
    }
  }
  serial_ = options.Serial();
  modificationCount_ = options.ModificationCount();
}

}  // namespace trl
