#include "compare/folder_links.h"

#include <algorithm>

namespace trl {

void FolderLinks::Add(std::string link, std::string target) {
  if (link.starts_with(target)) return;  // a loop
  auto& links = byTarget_[std::move(target)];
  if (std::find(links.begin(), links.end(), link) == links.end()) links.push_back(std::move(link));
}

std::vector<FolderAlias> FolderLinks::AliasesOf(const std::string& folder) const {
  std::vector<FolderAlias> aliases;
  if (byTarget_.empty()) return aliases;
  std::vector<const std::string*> used;
  Extend({folder, 0}, used, aliases);
  return aliases;
}

// Each folder above `from` (itself included) that is a link's target gives the alias that puts
// the link in its place; each such alias is extended in turn.
void FolderLinks::Extend(FolderAlias from, std::vector<const std::string*>& used,
                         std::vector<FolderAlias>& out) const {
  for (size_t end = from.folder.find('\\'); end != std::string::npos;
       end = from.folder.find('\\', end + 1)) {
    auto links = byTarget_.find(from.folder.substr(0, end + 1));
    if (links == byTarget_.end()) continue;
    const std::string& target = links->first;
    for (const std::string& link : links->second) {
      if (out.size() >= kMaxAliases) return;
      if (std::find(used.begin(), used.end(), &link) != used.end()) continue;
      FolderAlias alias{link + from.folder.substr(target.size()), link.size()};
      // A link deeper in `from` than the target moves with the rest of the path.
      if (from.linkEnd > target.size()) {
        alias.linkEnd = std::max(alias.linkEnd, from.linkEnd - target.size() + link.size());
      }
      bool known = std::any_of(out.begin(), out.end(), [&](const FolderAlias& other) {
        return other.folder == alias.folder;
      });
      if (known) continue;
      out.push_back(alias);
      used.push_back(&link);
      Extend(alias, used, out);
      used.pop_back();
    }
  }
}

}  // namespace trl
