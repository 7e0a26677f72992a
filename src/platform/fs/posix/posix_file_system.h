#pragma once

#include <memory>

#include "platform/fs/file_system.h"
#include "platform/fs/share_table.h"

namespace trl::fs {

// The file system of a POSIX machine behind the component's view of it: "\" paths become "/"
// paths (a drive's text is a directory prefix, "" for "/"), names resolve regardless of case
// (an exact hit costs one stat; a miss resolves each component against cached listings, exact
// spelling first, then the first case-insensitive match in byte order), network paths go through
// the share table, and attributes come from DOS attributes where a network file system exposes
// them, otherwise from the mode and the name.
std::unique_ptr<FileSystem> CreatePosixFileSystem(ShareTable shares);

}  // namespace trl::fs
