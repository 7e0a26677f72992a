#include "platform/fs/component_path.h"

namespace trl::fs {

std::vector<std::string> SplitComponents(std::string_view text) {
  std::vector<std::string> components;
  size_t start = 0;
  for (size_t i = 0; i <= text.size(); ++i) {
    if (i < text.size() && !IsSeparator(text[i])) continue;
    if (i > start) components.emplace_back(text.substr(start, i - start));
    start = i + 1;
  }
  return components;
}

ComponentPath ParseComponentPath(std::string_view text) {
  ComponentPath path;
  path.network = text.starts_with("\\\\");
  path.absolute = !text.empty() && IsSeparator(text.front());
  path.trailingSeparator = text.size() > 1 && IsSeparator(text.back());
  for (auto& component : SplitComponents(text)) {
    if (component == ".") continue;
    if (component == ".." && !path.components.empty() && path.components.back() != "..") {
      path.components.pop_back();
      continue;
    }
    if (component == ".." && path.absolute) continue;  // the root's parent is the root
    path.components.push_back(std::move(component));
  }
  return path;
}

std::string ComponentPath::Text() const {
  std::string text = network ? "\\\\" : absolute ? "\\" : "";
  for (size_t i = 0; i < components.size(); ++i) {
    if (i > 0) text += '\\';
    text += components[i];
  }
  return text;
}

std::string JoinPath(std::string_view parent, std::string_view name, char separator) {
  std::string path(parent);
  if (!path.empty() && path.back() != separator) path += separator;
  path += name;
  return path;
}

}  // namespace trl::fs
