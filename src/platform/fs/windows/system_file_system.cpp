#include "platform/fs/system_file_system.h"

#include "platform/fs/windows/windows_file_system.h"

namespace trl::fs {

std::unique_ptr<FileSystem> CreateSystemFileSystem() { return CreateWindowsFileSystem(); }

}  // namespace trl::fs
