#pragma once

#include <string>

#include "trl/server.h"

namespace trl::server {

// Registration in the registry file: one line per class, "<programmatic name>\t{<class id>}\t<path
// of the library>". Writing takes a lock beside the file, then replaces the file by a complete new
// one, so a reader never sees half of it and two registrations never lose each other's lines.

// Adds this library's lines, in place of earlier ones for the same programmatic names.
TrlResult RegisterClasses(const std::string& libraryPath);
// Removes exactly the lines RegisterClasses writes for `libraryPath`; the file goes when nothing
// is left in it.
TrlResult UnregisterClasses(const std::string& libraryPath);

}  // namespace trl::server
