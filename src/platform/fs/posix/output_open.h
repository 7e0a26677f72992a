#pragma once

#include <sys/types.h>

#include <string>

namespace trl::fs {

// Opens `path` for writing (O_WRONLY plus `flags`, O_CLOEXEC always) without following a link
// planted in its place: a link is refused with ELOOP, unless it leads to a stream (a terminal, a
// pipe, a device such as /dev/stderr), which is opened through it. Answers the descriptor, or -1
// with errno set.
int OpenForWriting(const std::string& path, int flags, mode_t mode = 0666);

}  // namespace trl::fs
