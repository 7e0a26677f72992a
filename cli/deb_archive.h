#pragma once

#include <string>

#include "dpkg_database.h"

namespace trl::cli {

// The version a .deb file holds, read with dpkg-deb without installing it: its control fields,
// its files with the MD5 sums of its md5sums member and the sizes of its data listing, and its
// conffiles. A file dpkg-deb cannot read is a CommandError that gives dpkg-deb's own message.
PackageVersion ReadDebArchive(const std::string& path);

}  // namespace trl::cli
