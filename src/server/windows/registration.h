#pragma once

#include <windows.h>

namespace trl::server::windows {

// Registers the five classes (class ids, programmatic names, this module as their apartment-
// threaded in-process server) and the module's two type libraries; Unregister removes exactly
// what Register writes.
HRESULT Register();
HRESULT Unregister();

}  // namespace trl::server::windows
