#include "server/windows/registration.h"

#include <oleauto.h>
#include <olectl.h>

#include <string>

#include "platform/windows/wide_text.h"
#include "server/guid.h"
#include "server/identities.h"
#include "server/windows/server_object.h"
#include "server/windows/type_library.h"

namespace trl::server::windows {
namespace {

// The schema library's type library is the module's second.
constexpr wchar_t kSchemaLibraryIndex[] = L"\\2";

// Writes the default value of HKEY_CLASSES_ROOT\key, and `name` = `value` beside it when given.
bool SetKey(const std::wstring& key, const std::wstring& value, const wchar_t* name = nullptr,
            const std::wstring& namedValue = {}) {
  HKEY handle = nullptr;
  if (RegCreateKeyExW(HKEY_CLASSES_ROOT, key.c_str(), 0, nullptr, REG_OPTION_NON_VOLATILE,
                      KEY_WRITE, nullptr, &handle, nullptr) != ERROR_SUCCESS) {
    return false;
  }
  auto set = [&](const wchar_t* valueName, const std::wstring& text) {
    return RegSetValueExW(handle, valueName, 0, REG_SZ, reinterpret_cast<const BYTE*>(text.c_str()),
                          static_cast<DWORD>((text.size() + 1) * sizeof(wchar_t))) == ERROR_SUCCESS;
  };
  bool written = set(nullptr, value) && (name == nullptr || set(name, namedValue));
  RegCloseKey(handle);
  return written;
}

// Removes HKEY_CLASSES_ROOT\key with everything under it; a key that is not there is removed.
bool DeleteTree(const std::wstring& key) {
  auto gone = [](LSTATUS status) {
    return status == ERROR_SUCCESS || status == ERROR_FILE_NOT_FOUND;
  };
  // The tree's deletion takes the key itself on some systems and leaves it on others.
  return gone(RegDeleteTreeW(HKEY_CLASSES_ROOT, key.c_str())) &&
         gone(RegDeleteKeyW(HKEY_CLASSES_ROOT, key.c_str()));
}

std::wstring Text(const TrlGuid& guid) { return ToWide(GuidText(guid)); }

HRESULT RegisterTypeLibraryAt(const std::wstring& path) {
  ITypeLib* library = nullptr;
  HRESULT result = LoadTypeLibEx(path.c_str(), REGKIND_NONE, &library);
  if (FAILED(result)) return result;
  std::wstring registered = path;  // the call takes a writable string
  result = RegisterTypeLib(library, registered.data(), nullptr);
  library->Release();
  return result;
}

// Unregistration may be run twice: a type library that is not registered is left as it is.
bool UnregisterTypeLibrary(const GUID& id, WORD major, WORD minor, LCID locale) {
  BSTR path = nullptr;
  if (FAILED(QueryPathOfRegTypeLib(id, major, minor, locale, &path))) return true;
  SysFreeString(path);
  return SUCCEEDED(UnRegisterTypeLib(id, major, minor, locale, SYS_WIN64));
}

}  // namespace

HRESULT Register() {
  const std::wstring path = ModulePath();
  const TypeLibrary& library = ComponentTypeLibrary();
  for (const ClassIdentity& identity : Classes()) {
    std::wstring progId = ToWide(identity.progId);
    std::wstring classKey = L"CLSID\\" + Text(identity.classId);
    bool written = SetKey(classKey, progId) &&
                   SetKey(classKey + L"\\InprocServer32", path, L"ThreadingModel", L"Apartment") &&
                   SetKey(classKey + L"\\ProgID", progId) &&
                   SetKey(classKey + L"\\VERSION", L"1.0") &&
                   SetKey(classKey + L"\\TypeLib", Text(library.id)) &&
                   SetKey(classKey + L"\\Programmable", L"") && SetKey(progId, progId) &&
                   SetKey(progId + L"\\Clsid", Text(identity.classId));
    if (!written) return SELFREG_E_CLASS;
  }
  if (FAILED(RegisterTypeLibraryAt(path + kSchemaLibraryIndex)) ||
      FAILED(RegisterTypeLibraryAt(path))) {
    return SELFREG_E_TYPELIB;
  }
  return S_OK;
}

HRESULT Unregister() {
  bool removed = true;
  for (const ClassIdentity& identity : Classes()) {
    removed = DeleteTree(L"CLSID\\" + Text(identity.classId)) && removed;
    removed = DeleteTree(ToWide(identity.progId)) && removed;
  }
  if (!removed) return SELFREG_E_CLASS;
  const TypeLibrary& library = ComponentTypeLibrary();
  return UnregisterTypeLibrary(ToGuid(library.id), library.majorVersion, library.minorVersion,
                               library.lcid) &&
                 UnregisterTypeLibrary(ToGuid(Foreign().schemaTypeLibrary), 1, 0, library.lcid)
             ? S_OK
             : SELFREG_E_TYPELIB;
}

}  // namespace trl::server::windows
