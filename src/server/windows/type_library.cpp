#include "server/windows/type_library.h"

#include <mutex>

namespace trl::server::windows {
namespace {

HMODULE module = nullptr;

}  // namespace

HMODULE Module() { return module; }

void Module(HMODULE handle) { module = handle; }

std::wstring ModulePath() {
  std::wstring path(MAX_PATH, L'\0');
  for (;;) {
    DWORD length = GetModuleFileNameW(module, path.data(), static_cast<DWORD>(path.size()));
    if (length < path.size()) {
      path.resize(length);
      return path;
    }
    path.resize(path.size() * 2);
  }
}

ITypeLib* EmbeddedTypeLibrary() {
  static std::once_flag once;
  static ITypeLib* library = nullptr;
  std::call_once(once, [] {
    if (FAILED(LoadTypeLibEx(ModulePath().c_str(), REGKIND_NONE, &library))) library = nullptr;
  });
  return library;
}

HRESULT TypeInfoOf(REFGUID guid, ITypeInfo** info) {
  *info = nullptr;
  ITypeLib* library = EmbeddedTypeLibrary();
  if (library == nullptr) return TYPE_E_CANTLOADLIBRARY;
  return library->GetTypeInfoOfGuid(guid, info);
}

HRESULT InterfaceTypeInfoOf(REFIID dual, ITypeInfo** info) {
  *info = nullptr;
  ITypeInfo* dispatch = nullptr;
  HRESULT result = TypeInfoOf(dual, &dispatch);
  if (FAILED(result)) return result;
  HREFTYPE vtable = 0;
  result = dispatch->GetRefTypeOfImplType(-1, &vtable);
  if (SUCCEEDED(result)) result = dispatch->GetRefTypeInfo(vtable, info);
  dispatch->Release();
  return result;
}

}  // namespace trl::server::windows
