#pragma once

#include <string>
#include <unordered_map>
#include <vector>

namespace trl::fs::posix {

// Finds what a path names regardless of case, component by component: the exact spelling first,
// else the first name in byte order that lower-cases the same. Each folder is listed once and its
// names kept for the resolver's lifetime (a run), so a walk that misses many names in one folder
// reads that folder once.
class NameResolver {
 public:
  // Resolves `components` (native names) below "/" or, when not `absolute`, the working
  // directory. Returns 0 and the native path in `resolved`, or an errno value.
  int Resolve(bool absolute, const std::vector<std::string>& components, std::string& resolved);

 private:
  struct Listing {
    int error = 0;
    std::vector<std::string> names;  // byte order
    std::unordered_map<std::string, size_t> firstByLowerName;
  };

  const Listing& ListingOf(const std::string& directory);

  std::unordered_map<std::string, Listing> listings_;
};

}  // namespace trl::fs::posix
