#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace trl::fs {

inline bool IsSeparator(char c) { return c == '\\' || c == '/'; }

// The non-empty components of `text` split at "\" and "/".
std::vector<std::string> SplitComponents(std::string_view text);

// A path in the component's form taken apart the way its home platform reads one: "\" or "/"
// separators, doubled ones collapsed, "." dropped and ".." taking back the previous component.
struct ComponentPath {
  // Began with "\\": the first components are a host and a share. Only two backslashes start a
  // network path, so a drive prefix "/" written in front of "\folder" stays local.
  bool network = false;
  bool absolute = false;           // began with a separator
  bool trailingSeparator = false;  // ended with one: the item must be a folder
  std::vector<std::string> components;

  // The canonical "\" form: "\\host\share\a", "\a\b", "a\b", "\" for the root.
  std::string Text() const;
};

ComponentPath ParseComponentPath(std::string_view text);

// `parent` and `name` joined with `separator`, never doubling it after a root.
std::string JoinPath(std::string_view parent, std::string_view name, char separator);

}  // namespace trl::fs
