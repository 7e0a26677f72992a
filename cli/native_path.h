#pragma once

#include <string>
#include <string_view>

namespace trl::cli {

// The native path of a folder in the component's "\" form, as a person on this system reads it:
// "/" separators, names in their own bytes, and each name in the letter case it has on disk where
// the folder exists (the documents may hold it lower-cased).
std::string NativePath(std::string_view componentPath);

}  // namespace trl::cli
