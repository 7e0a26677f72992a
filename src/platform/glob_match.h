#pragma once

#include <string>

namespace trl {

// Whether `text` matches the shell pattern `glob` ("*", "?", "[...]", "\" escaping the next
// character). With `pathName`, no wildcard matches a "/": each stands within one component.
bool GlobMatches(const std::string& glob, const std::string& text, bool pathName);

}  // namespace trl
