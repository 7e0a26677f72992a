#pragma once

#include <string>

namespace trl {

// This machine's host name as the system gives it (the DNS name where there is one); "" when it
// cannot be read.
std::string HostName();

}  // namespace trl
