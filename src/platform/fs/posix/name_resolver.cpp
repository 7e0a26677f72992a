#include "platform/fs/posix/name_resolver.h"

#include <algorithm>
#include <cerrno>

#include "platform/fs/component_path.h"
#include "platform/fs/posix/folder_entries.h"
#include "platform/fs/posix/sys_calls.h"
#include "platform/text.h"

namespace trl::fs::posix {

int NameResolver::Resolve(bool absolute, const std::vector<std::string>& components,
                          std::string& resolved) {
  std::string path = absolute ? "/" : "";
  for (const auto& component : components) {
    const std::string* chosen = &component;
    if (component != "." && component != "..") {
      const Listing& listing = ListingOf(path);
      if (listing.error != 0) return listing.error;
      if (!std::binary_search(listing.names.begin(), listing.names.end(), component)) {
        auto match = listing.firstByLowerName.find(LowerCase(component));
        if (match == listing.firstByLowerName.end()) return ENOENT;
        chosen = &listing.names[match->second];
      }
    }
    path = JoinPath(path, *chosen, '/');
  }
  resolved = std::move(path);
  return 0;
}

const NameResolver::Listing& NameResolver::ListingOf(const std::string& directory) {
  auto [entry, added] = listings_.try_emplace(directory);
  Listing& listing = entry->second;
  if (!added) return listing;
  FolderEntries entries(directory);
  std::string_view name;
  unsigned char type = 0;
  while (entries.Next(name, type)) listing.names.emplace_back(name);
  listing.error = entries.Error();
  std::sort(listing.names.begin(), listing.names.end());
  for (size_t i = 0; i < listing.names.size(); ++i) {
    listing.firstByLowerName.try_emplace(LowerCase(listing.names[i]), i);
  }
  return listing;
}

}  // namespace trl::fs::posix
