#pragma once

namespace trl::cli {

// A run at scale holds gigabytes of documents in small blocks. Taken in huge pages they are
// mapped and given back many times faster: a cancelled run of a million files ends in a fifth of
// the time, most of which went on returning memory to the system. The C library takes that
// setting only as a program starts, so the program starts again with it, once; settings the user
// gave the library stand, and nothing changes where the exec fails.
void StartWithHugePages(char** argv);

}  // namespace trl::cli
