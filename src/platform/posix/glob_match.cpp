#include "platform/glob_match.h"

#include <fnmatch.h>

namespace trl {

bool GlobMatches(const std::string& glob, const std::string& text, bool pathName) {
  return fnmatch(glob.c_str(), text.c_str(), pathName ? FNM_PATHNAME : 0) == 0;
}

}  // namespace trl
