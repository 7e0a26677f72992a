#pragma once

#include <windows.h>

#include <cstdint>
#include <string>

namespace trl {

// The system's own description of a Win32 error code, one line, in UTF-8.
std::string SystemMessage(DWORD error);

// The runtime failure number a Win32 error code stands for, as the file system layers raise it:
// `notFound` for an item that is not there, kPermissionDenied (70) for one that cannot be
// reached, kDeviceIoError (57), else kPathFileAccessError (75).
int32_t FailureNumberOf(DWORD error, int32_t notFound);

}  // namespace trl
