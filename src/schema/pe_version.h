#pragma once

#include <string>

#include "platform/fs/file_system.h"

namespace trl {

// The file version of a Windows executable or library, "a.b.c.d", from the fixed part of its
// version resource; "" when the content is not such an image or has no readable version resource.
// Damaged content never leads to reads outside the file; failures of the reader itself pass
// through.
std::string ReadPeFileVersion(fs::FileReader& reader);

}  // namespace trl
