#pragma once

#include <memory>

#include "platform/fs/file_system.h"

namespace trl::fs {

// The file system of the machine the component runs on, as the stages use it by default.
std::unique_ptr<FileSystem> CreateSystemFileSystem();

}  // namespace trl::fs
