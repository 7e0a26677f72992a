#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "platform/fs/file_system.h"

namespace trl::fuzz {

// A small folder tree, made on first use under the temporary folder and kept for the process:
// files in several letter cases, a hidden one, one whose name is not UTF-8, a PE image with a
// version, a fifo, a link to a folder and a dangling link. The path in the component's form.
const std::string& TreeRoot();

// `text` with each "{root}" replaced by TreeRoot(), so that fuzzed documents can name the tree.
std::string WithTreeRoot(std::string_view text);

// This machine's file system, seen only within the tree: any other path, or one that climbs with
// "..", is not there. Fuzzed documents can name any folder, and a walk of "\" would never end.
std::unique_ptr<fs::FileSystem> TreeFileSystem();

}  // namespace trl::fuzz
