#pragma once

#include <memory>

#include "platform/fs/file_system.h"

namespace trl::fs {

// The Windows file system behind the component's view of it, through the wide Win32 API: paths
// are native already ("C:\dir\file", "\\host\share\dir"), names match regardless of case as the
// system matches them, attributes are the system's own, and a junction or symbolic link to a
// folder is a folder link, never a subfolder.
std::unique_ptr<FileSystem> CreateWindowsFileSystem();

}  // namespace trl::fs
