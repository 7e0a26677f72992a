#pragma once

#include <windows.h>

#include <oaidl.h>

#include <string>

namespace trl::server::windows {

// This module, as DllMain was told it.
HMODULE Module();
void Module(HMODULE module);
// The path of this module's file.
std::wstring ModulePath();

// Type information of the component's type library, which is embedded in this module (the
// schema library's, which its Mode and Status refer to, is its second type library). The
// library is loaded once and kept for the life of the module. Null when it cannot be loaded.
ITypeLib* EmbeddedTypeLibrary();
// The type information `iid` or `clsid` names; the caller releases it.
HRESULT TypeInfoOf(REFGUID guid, ITypeInfo** info);
// The vtable face of a dual interface, which DispInvoke calls through.
HRESULT InterfaceTypeInfoOf(REFIID dual, ITypeInfo** info);

}  // namespace trl::server::windows
