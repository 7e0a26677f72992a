#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/fs/file_system.h"
#include "platform/fs/posix/folder_entries.h"
#include "platform/fs/posix/folder_place.h"

namespace trl::fs::posix {

// One folder's entries as one pass over them finds them, in the order it finds them.
struct FolderListing {
  struct SubFolder {
    std::shared_ptr<FolderPlace> place;
    std::string nativeName;
    bool caseSibling = false;
  };
  int error = 0;  // the errno value that stopped the listing, 0 when it is complete
  Collection<File> files;
  std::vector<SubFolder> subFolders;
  std::vector<std::string> folderLinks;  // native names of the links to folders
};

// Sorts the entries by d_type, so a plain file or folder costs no call; links and entries of
// unknown type cost one stat each. A link to a folder is kept apart from the subfolders (a walk
// never loops); a dangling link is left out. Marks the files, and the subfolders, whose names
// differ from another's only in letter case. Touches nothing but `folder`'s fixed location, so any
// thread may list.
FolderListing ListFolder(const std::shared_ptr<const FolderPlace>& folder);
// The same from `entries`, opened on `folder` already.
FolderListing ListFolder(const std::shared_ptr<const FolderPlace>& folder, FolderEntries& entries);

}  // namespace trl::fs::posix
