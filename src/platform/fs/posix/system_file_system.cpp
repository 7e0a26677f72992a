#include "platform/fs/system_file_system.h"

#include "platform/fs/posix/posix_file_system.h"
#include "platform/fs/share_table.h"

namespace trl::fs {

std::unique_ptr<FileSystem> CreateSystemFileSystem() {
  ShareTable shares;
  shares.AddSystemMounts();
  return CreatePosixFileSystem(std::move(shares));
}

}  // namespace trl::fs
