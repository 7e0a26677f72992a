#pragma once

#include <cstddef>
#include <string>
#include <unordered_map>
#include <vector>

namespace trl {

// A place where a folder also stands because a link to a folder leads to it (or to a folder above
// it): the folder's path through the links, and where the deepest link in it ends, so that a fit
// can tell whether a link lies in the part of the path the fingerprint names.
struct FolderAlias {
  std::string folder;
  size_t linkEnd;
};

// The links to folders of one drive (paths below the drive, lower-cased, each ending with "\"),
// and the aliases they give a folder. A link into itself or a folder above it would give endless
// aliases and gives none; a chain of links gives one alias per way through it, each link used
// once, and at most kMaxAliases in all.
class FolderLinks {
 public:
  static constexpr size_t kMaxAliases = 16;

  void Add(std::string link, std::string target);
  bool empty() const { return byTarget_.empty(); }
  std::vector<FolderAlias> AliasesOf(const std::string& folder) const;

 private:
  void Extend(FolderAlias from, std::vector<const std::string*>& used,
              std::vector<FolderAlias>& out) const;

  std::unordered_map<std::string, std::vector<std::string>> byTarget_;  // target -> links
};

}  // namespace trl
