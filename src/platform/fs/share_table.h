#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace trl::fs {

struct Mount;

// Where network paths "\\host\share\rest" lead on this machine: mappings the caller gives first,
// then the network mounts (cifs, smb3, nfs, nfs4) of the system's mount table. Host and share names
// compare regardless of case; the longest share path that fits wins.
class ShareTable {
 public:
  // `share` may hold several components ("exports\data"); `directory` is a local directory.
  void Add(std::string_view host, std::string_view share, std::string directory);
  // Parses "\\HOST\SHARE=DIR" (as given on a command line); fails with kInvalidArgument (5).
  void AddMapping(std::string_view mapping);
  // Adds the network mounts of a mount table in the format of /proc/self/mounts.
  void AddMounts(std::string_view mountTable);
  void AddMounts(const std::vector<Mount>& mounts);
  void AddSystemMounts();  // reads /proc/self/mounts; no failure when it cannot be read

  // The local directory and remaining components for a "\\host\share\rest" path ("/" separators,
  // names still in the component's encoding), or nothing when no entry fits.
  std::optional<std::string> Resolve(std::string_view uncPath) const;

 private:
  struct Entry {
    std::string host;                // lower-cased
    std::vector<std::string> share;  // lower-cased components
    std::string directory;
    bool given;
  };
  std::vector<Entry> entries_;
};

}  // namespace trl::fs
