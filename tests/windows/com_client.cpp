// A client of trllocator.dll as a Windows program would be one: it finds the classes by their
// programmatic names, binds late, hands the platform's documents, follows events through
// connection points while pumping its messages, and checks the registry.
//   com_client check EXAMPLE-FOLDER RESULTS-FILE   the registered component, end to end
//   com_client clean                               nothing of it left in the registry
#include <windows.h>

#include <msxml2.h>
#include <ocidl.h>
#include <oleauto.h>

#include <chrono>
#include <cstdio>
#include <cstring>
#include <cwchar>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "server/guid.h"
#include "server/identities.h"

namespace {

using trl::server::ClassIdentity;
using trl::server::MemberKind;

int failures = 0;

void Expect(bool condition, const std::string& what) {
  if (!condition) {
    ++failures;
    std::fprintf(stderr, "FAILED: %s\n", what.c_str());
  }
}

std::wstring Wide(std::string_view text) { return {text.begin(), text.end()}; }

std::string Narrow(BSTR text) {
  if (text == nullptr) return {};
  int size =
      WideCharToMultiByte(CP_UTF8, 0, text, SysStringLen(text), nullptr, 0, nullptr, nullptr);
  std::string utf8(size, '\0');
  WideCharToMultiByte(CP_UTF8, 0, text, SysStringLen(text), utf8.data(), size, nullptr, nullptr);
  return utf8;
}

GUID ToGuid(const TrlGuid& guid) {
  GUID converted;
  std::memcpy(&converted, &guid, sizeof converted);
  return converted;
}

// Late binding by name, as a script calls.
HRESULT Call(IDispatch* object, const wchar_t* name, WORD flags, std::vector<VARIANT> arguments,
             VARIANT* result) {
  DISPID id = 0;
  LPOLESTR names[] = {const_cast<LPOLESTR>(name)};
  HRESULT found = object->GetIDsOfNames(IID_NULL, names, 1, LOCALE_USER_DEFAULT, &id);
  if (FAILED(found)) return found;
  std::vector<VARIANT> reversed(arguments.rbegin(), arguments.rend());
  DISPID named = DISPID_PROPERTYPUT;
  DISPPARAMS params{reversed.data(), nullptr, static_cast<UINT>(reversed.size()), 0};
  if (flags == DISPATCH_PROPERTYPUT) {
    params.rgdispidNamedArgs = &named;
    params.cNamedArgs = 1;
  }
  if (result != nullptr) VariantInit(result);
  return object->Invoke(id, IID_NULL, LOCALE_USER_DEFAULT, flags, &params, result, nullptr,
                        nullptr);
}

VARIANT Object(IDispatch* object) {
  VARIANT v;
  VariantInit(&v);
  V_VT(&v) = VT_DISPATCH;
  V_DISPATCH(&v) = object;
  return v;
}

VARIANT ObjectByReference(IDispatch** slot) {
  VARIANT v;
  VariantInit(&v);
  V_VT(&v) = VT_DISPATCH | VT_BYREF;
  V_DISPATCHREF(&v) = slot;
  return v;
}

VARIANT Short(short value) {
  VARIANT v;
  VariantInit(&v);
  V_VT(&v) = VT_I2;
  V_I2(&v) = value;
  return v;
}

VARIANT Boolean(bool value) {
  VARIANT v;
  VariantInit(&v);
  V_VT(&v) = VT_BOOL;
  V_BOOL(&v) = value ? VARIANT_TRUE : VARIANT_FALSE;
  return v;
}

IDispatch* Create(std::string_view progId) {
  CLSID classId;
  if (FAILED(CLSIDFromProgID(Wide(progId).c_str(), &classId))) return nullptr;
  IDispatch* object = nullptr;
  CoCreateInstance(classId, nullptr, CLSCTX_INPROC_SERVER, IID_IDispatch,
                   reinterpret_cast<void**>(&object));
  return object;
}

IXMLDOMDocument2* NewDocument() {
  IXMLDOMDocument2* document = nullptr;
  CoCreateInstance(CLSID_DOMDocument30, nullptr, CLSCTX_INPROC_SERVER, IID_IXMLDOMDocument2,
                   reinterpret_cast<void**>(&document));
  return document;
}

IXMLDOMDocument2* LoadDocument(const std::wstring& path) {
  IXMLDOMDocument2* document = NewDocument();
  VARIANT source;
  VariantInit(&source);
  V_VT(&source) = VT_BSTR;
  V_BSTR(&source) = SysAllocString(path.c_str());
  VARIANT_BOOL loaded = VARIANT_FALSE;
  document->put_async(VARIANT_FALSE);
  document->load(source, &loaded);
  VariantClear(&source);
  Expect(loaded == VARIANT_TRUE, "load " + std::string(path.begin(), path.end()));
  return document;
}

long Count(IXMLDOMDocument2* document, const wchar_t* selection) {
  IXMLDOMNodeList* nodes = nullptr;
  BSTR query = SysAllocString(selection);
  long length = -1;
  if (SUCCEEDED(document->selectNodes(query, &nodes)) && nodes != nullptr) {
    nodes->get_length(&length);
    nodes->Release();
  }
  SysFreeString(query);
  return length;
}

void PumpUntil(const std::function<bool()>& done, std::chrono::seconds limit) {
  auto deadline = std::chrono::steady_clock::now() + limit;
  while (!done() && std::chrono::steady_clock::now() < deadline) {
    MsgWaitForMultipleObjects(0, nullptr, FALSE, 20, QS_ALLINPUT);
    MSG message;
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) {
      TranslateMessage(&message);
      DispatchMessageW(&message);
    }
  }
}

// The sink of a class's events: what arrived, in order.
class Sink : public IDispatch {
 public:
  std::vector<std::string> statusUpdates;  // e_status of each StatusUpdate
  std::string lastResults;
  int progressUpdates = 0;
  std::function<void()> onProgress;

  STDMETHODIMP QueryInterface(REFIID iid, void** object) override {
    if (!IsEqualIID(iid, IID_IUnknown) && !IsEqualIID(iid, IID_IDispatch)) {
      *object = nullptr;
      return E_NOINTERFACE;
    }
    *object = this;
    return S_OK;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return 2; }
  STDMETHODIMP_(ULONG) Release() override { return 1; }
  STDMETHODIMP GetTypeInfoCount(UINT* count) override {
    *count = 0;
    return S_OK;
  }
  STDMETHODIMP GetTypeInfo(UINT, LCID, ITypeInfo**) override { return E_NOTIMPL; }
  STDMETHODIMP GetIDsOfNames(REFIID, LPOLESTR*, UINT, LCID, DISPID*) override { return E_NOTIMPL; }
  STDMETHODIMP Invoke(DISPID id, REFIID, LCID, WORD, DISPPARAMS* params, VARIANT*, EXCEPINFO*,
                      UINT*) override {
    // Arguments arrive last first.
    std::string update = Narrow(V_BSTR(&params->rgvarg[params->cArgs - 1]));
    size_t at = update.find("e_status=\"");
    std::string status =
        at == std::string::npos ? "?" : update.substr(at + 10, update.find('"', at + 10) - at - 10);
    if (id == 1 && params->cArgs == 2) {
      statusUpdates.push_back(status);
      lastResults = Narrow(V_BSTR(&params->rgvarg[0]));
    } else if (id == 2 && params->cArgs == 1) {
      ++progressUpdates;
      if (onProgress) onProgress();
    } else {
      Expect(false, "an event with id " + std::to_string(id));
    }
    return S_OK;
  }
};

DWORD Advise(IDispatch* object, const TrlGuid& events, Sink& sink) {
  IConnectionPointContainer* container = nullptr;
  IConnectionPoint* point = nullptr;
  DWORD cookie = 0;
  object->QueryInterface(IID_IConnectionPointContainer, reinterpret_cast<void**>(&container));
  Expect(container != nullptr, "connection point container");
  if (container == nullptr) return 0;
  container->FindConnectionPoint(ToGuid(events), &point);
  Expect(point != nullptr, "the event interface's connection point");
  if (point != nullptr) {
    Expect(SUCCEEDED(point->Advise(&sink, &cookie)), "Advise");
    point->Release();
  }
  container->Release();
  return cookie;
}

// The registered type library says what the identities say: the library, each class, its
// interfaces, each member's slot, kind and dispatch id, and the events.
void CheckTypeLibrary(IDispatch* object, const ClassIdentity& identity) {
  const std::string name(identity.name);
  ITypeInfo* info = nullptr;
  Expect(SUCCEEDED(object->GetTypeInfo(0, LOCALE_USER_DEFAULT, &info)) && info != nullptr,
         name + ": type information");
  if (info == nullptr) return;
  ITypeLib* library = nullptr;
  UINT index = 0;
  info->GetContainingTypeLib(&library, &index);
  TLIBATTR* libraryAttributes = nullptr;
  library->GetLibAttr(&libraryAttributes);
  const auto& expected = trl::server::ComponentTypeLibrary();
  Expect(IsEqualGUID(libraryAttributes->guid, ToGuid(expected.id)) &&
             libraryAttributes->wMajorVerNum == expected.majorVersion &&
             libraryAttributes->wMinorVerNum == expected.minorVersion &&
             libraryAttributes->lcid == expected.lcid,
         name + ": library identity, version and locale");
  library->ReleaseTLibAttr(libraryAttributes);
  BSTR libraryName = nullptr, help = nullptr;
  library->GetDocumentation(-1, &libraryName, &help, nullptr, nullptr);
  Expect(Narrow(libraryName) == expected.name && Narrow(help) == expected.helpText,
         name + ": library name and help text");
  SysFreeString(libraryName);
  SysFreeString(help);

  ITypeInfo* coclass = nullptr;
  library->GetTypeInfoOfGuid(ToGuid(identity.classId), &coclass);
  Expect(coclass != nullptr, name + ": class in the library");
  if (coclass != nullptr) {
    TYPEATTR* attributes = nullptr;
    coclass->GetTypeAttr(&attributes);
    bool sawDefault = false, sawEvents = false;
    for (UINT i = 0; i < attributes->cImplTypes; ++i) {
      INT flags = 0;
      HREFTYPE reference = 0;
      ITypeInfo* implemented = nullptr;
      coclass->GetImplTypeFlags(i, &flags);
      coclass->GetRefTypeOfImplType(i, &reference);
      coclass->GetRefTypeInfo(reference, &implemented);
      TYPEATTR* implementedAttributes = nullptr;
      implemented->GetTypeAttr(&implementedAttributes);
      if (flags == (IMPLTYPEFLAG_FDEFAULT | IMPLTYPEFLAG_FSOURCE)) {
        sawEvents = IsEqualGUID(implementedAttributes->guid, ToGuid(identity.eventInterfaceId)) &&
                    implementedAttributes->typekind == TKIND_DISPATCH &&
                    (implementedAttributes->wTypeFlags & TYPEFLAG_FHIDDEN);
      } else if (flags == IMPLTYPEFLAG_FDEFAULT) {
        sawDefault =
            IsEqualGUID(implementedAttributes->guid, ToGuid(identity.defaultInterfaceId)) &&
            (implementedAttributes->wTypeFlags & TYPEFLAG_FDUAL) &&
            (implementedAttributes->wTypeFlags & TYPEFLAG_FHIDDEN);
      }
      implemented->ReleaseTypeAttr(implementedAttributes);
      implemented->Release();
    }
    Expect(sawDefault, name + ": hidden dual default interface");
    Expect(sawEvents, name + ": hidden event interface");
    coclass->ReleaseTypeAttr(attributes);
    coclass->Release();
  }

  // The default interface's vtable face: slots after IDispatch's seven.
  HREFTYPE vtableReference = 0;
  ITypeInfo* vtable = nullptr;
  info->GetRefTypeOfImplType(-1, &vtableReference);
  info->GetRefTypeInfo(vtableReference, &vtable);
  Expect(vtable != nullptr, name + ": the dual interface's vtable face");
  for (const trl::server::Member& member : identity.members) {
    std::string what =
        name + "." + std::string(member.name) + " in slot " + std::to_string(member.slot);
    FUNCDESC* function = nullptr;
    if (vtable == nullptr || FAILED(vtable->GetFuncDesc(member.slot - 1, &function))) {
      Expect(false, what);
      continue;
    }
    BSTR memberName = nullptr;
    UINT got = 0;
    vtable->GetNames(function->memid, &memberName, 1, &got);
    INVOKEKIND kind = member.kind == MemberKind::kPropertyGet   ? INVOKE_PROPERTYGET
                      : member.kind == MemberKind::kPropertyPut ? INVOKE_PROPERTYPUT
                                                                : INVOKE_FUNC;
    Expect(function->memid == member.id && function->invkind == kind &&
               Narrow(memberName) == member.name &&
               function->oVft == static_cast<SHORT>((7 + member.slot - 1) * sizeof(void*)),
           what + " (found " + Narrow(memberName) + " id " + std::to_string(function->memid) +
               " kind " + std::to_string(function->invkind) + " offset " +
               std::to_string(function->oVft) + ")");
    SysFreeString(memberName);
    vtable->ReleaseFuncDesc(function);

    DISPID id = 0;
    std::wstring wideName = Wide(member.name);
    LPOLESTR names[] = {wideName.data()};
    Expect(SUCCEEDED(object->GetIDsOfNames(IID_NULL, names, 1, LOCALE_USER_DEFAULT, &id)) &&
               id == member.id,
           what + ": dispatch id by name");
  }
  if (vtable != nullptr) vtable->Release();
  library->Release();
  info->Release();
}

std::wstring Join(const std::wstring& folder, const wchar_t* name) { return folder + L"\\" + name; }

// The example's documents, its drives made the Windows path of the same folders.
struct Example {
  IXMLDOMDocument2* searchOptions;
  IXMLDOMDocument2* applicationOptions;
  IXMLDOMDocument2* fingerprint;
};

Example LoadExample(const std::wstring& folder) {
  Example example{LoadDocument(Join(folder, L"search-options.xml")),
                  LoadDocument(Join(folder, L"application-options.xml")),
                  LoadDocument(Join(folder, L"fingerprint.xml"))};
  IXMLDOMNodeList* drives = nullptr;
  BSTR query = SysAllocString(L"//m");
  example.searchOptions->selectNodes(query, &drives);
  SysFreeString(query);
  long count = 0;
  drives->get_length(&count);
  for (long i = 0; i < count; ++i) {
    IXMLDOMNode* node = nullptr;
    IXMLDOMElement* drive = nullptr;
    drives->get_item(i, &node);
    node->QueryInterface(IID_IXMLDOMElement, reinterpret_cast<void**>(&drive));
    BSTR attribute = SysAllocString(L"m_text");
    VARIANT value;
    VariantInit(&value);
    V_VT(&value) = VT_BSTR;
    V_BSTR(&value) = SysAllocString(L"Z:");
    drive->setAttribute(attribute, value);
    VariantClear(&value);
    SysFreeString(attribute);
    drive->Release();
    node->Release();
  }
  drives->Release();
  return example;
}

constexpr short kAllFilters = 63;

std::vector<VARIANT> LocateArguments(const Example& example) {
  return {Object(example.searchOptions), Object(example.applicationOptions), Short(kAllFilters),
          Object(example.fingerprint)};
}

VARIANT Get(IDispatch* object, const wchar_t* name) {
  VARIANT value;
  Expect(SUCCEEDED(Call(object, name, DISPATCH_PROPERTYGET, {}, &value)),
         "get " + std::string(name, name + wcslen(name)));
  return value;
}

int Check(const std::wstring& exampleFolder, const std::wstring& resultsFile) {
  for (const ClassIdentity& identity : trl::server::Classes()) {
    IDispatch* object = Create(identity.progId);
    Expect(object != nullptr, "create " + std::string(identity.progId));
    if (object == nullptr) continue;
    CheckTypeLibrary(object, identity);
    VARIANT asynchronous = Get(object, L"Asynchronous");
    Expect(V_VT(&asynchronous) == VT_BOOL && V_BOOL(&asynchronous) == VARIANT_TRUE,
           std::string(identity.name) + " is asynchronous when created");
    object->Release();
  }

  Example example = LoadExample(exampleFolder);

  // Synchronous: Start gives the merged results; they go to the file the verdicts are compared in.
  IDispatch* locate = Create("trlLocator.Locate");
  Expect(SUCCEEDED(Call(locate, L"Asynchronous", DISPATCH_PROPERTYPUT, {Boolean(false)}, nullptr)),
         "Locate.Asynchronous = False");
  VARIANT results;
  Expect(SUCCEEDED(Call(locate, L"Start", DISPATCH_METHOD, LocateArguments(example), &results)) &&
             V_VT(&results) == VT_BSTR,
         "synchronous Locate.Start");
  std::string resultsText = Narrow(V_BSTR(&results));
  VariantClear(&results);
  Expect(resultsText.find("<a ") != std::string::npos, "the synchronous run found applications");
  std::ofstream(std::string(resultsFile.begin(), resultsFile.end()), std::ios::binary)
      << resultsText;
  VARIANT status = Get(locate, L"Status");
  Expect(V_I4(&status) == 3, "Locate.Status is 3 after a synchronous run");

  // Asynchronous: Start returns at once, the run comes with the message pump.
  Sink sink;
  Advise(locate, trl::server::FindClass("trlLocator.Locate")->eventInterfaceId, sink);
  Call(locate, L"Asynchronous", DISPATCH_PROPERTYPUT, {Boolean(true)}, nullptr);
  VARIANT empty;
  Expect(SUCCEEDED(Call(locate, L"Start", DISPATCH_METHOD, LocateArguments(example), &empty)) &&
             Narrow(V_BSTR(&empty)).empty(),
         "asynchronous Locate.Start returns \"\" at once");
  VariantClear(&empty);
  auto statusIs = [&](int wanted) {
    return [=] {
      VARIANT now = Get(locate, L"Status");
      return V_I4(&now) == wanted;
    };
  };
  PumpUntil(statusIs(3), std::chrono::seconds(120));
  Expect(statusIs(3)(), "the asynchronous run ends with status 3");
  Expect(!sink.statusUpdates.empty() && sink.statusUpdates.back() == "3",
         "the last StatusUpdate reports status 3");
  Expect(sink.progressUpdates > 0, "ProgressUpdate events arrived");
  auto applications = [](const std::string& text) {
    size_t count = 0;
    for (size_t at = text.find("<a "); at != std::string::npos; at = text.find("<a ", at + 1))
      ++count;
    return count;
  };
  Expect(applications(sink.lastResults) == applications(resultsText),
         "the last StatusUpdate carries the results, as many applications as the synchronous run");

  // Cancelled from inside an event, as a client's button would.
  Sink cancelling;
  DWORD cookie =
      Advise(locate, trl::server::FindClass("trlLocator.Locate")->eventInterfaceId, cancelling);
  sink.statusUpdates.clear();
  cancelling.onProgress = [&] {
    if (cancelling.progressUpdates == 1) Call(locate, L"Cancel", DISPATCH_METHOD, {}, nullptr);
  };
  Call(locate, L"Start", DISPATCH_METHOD, LocateArguments(example), &empty);
  VariantClear(&empty);
  PumpUntil(statusIs(255), std::chrono::seconds(120));
  Expect(statusIs(255)(), "a cancelled run ends with status 255");
  Expect(!cancelling.statusUpdates.empty() && cancelling.statusUpdates.back() == "255",
         "the last StatusUpdate reports status 255");
  (void)cookie;
  locate->Release();

  // Let go of from inside its own event, in the middle of a run: the client goes on.
  IDispatch* dropped = Create("trlLocator.Locate");
  Sink dropping;
  Advise(dropped, trl::server::FindClass("trlLocator.Locate")->eventInterfaceId, dropping);
  dropping.onProgress = [&] {
    if (dropped != nullptr) {
      dropped->Release();
      dropped = nullptr;
    }
  };
  Call(dropped, L"Start", DISPATCH_METHOD, LocateArguments(example), &empty);
  VariantClear(&empty);
  PumpUntil([] { return false; }, std::chrono::seconds(2));
  Expect(dropped == nullptr, "the object let go of inside its event was running");

  // The stages change the client's documents in place: Search fills the results variable it was
  // given empty, and Filter writes its verdicts into the client's matches.
  IDispatch* search = Create("trlLocator.Search");
  IDispatch* compare = Create("trlLocator.Compare");
  IDispatch* filter = Create("trlLocator.Filter");
  for (IDispatch* stage : {search, compare, filter}) {
    Call(stage, L"Asynchronous", DISPATCH_PROPERTYPUT, {Boolean(false)}, nullptr);
  }
  IDispatch* searchOptions = example.searchOptions;
  IDispatch* applicationOptions = example.applicationOptions;
  IDispatch* fingerprint = example.fingerprint;
  IDispatch* localFiles = nullptr;
  VARIANT ignored;
  Expect(SUCCEEDED(Call(search, L"Start", DISPATCH_METHOD,
                        {ObjectByReference(&searchOptions), ObjectByReference(&applicationOptions),
                         ObjectByReference(&fingerprint), ObjectByReference(&localFiles)},
                        &ignored)),
         "Search.Start");
  Expect(localFiles != nullptr,
         "Search put a document into the results variable it was given without one");
  IXMLDOMDocument2* localFilesDocument = NewDocument();
  VARIANT_BOOL loaded = VARIANT_FALSE;
  localFilesDocument->loadXML(V_BSTR(&ignored), &loaded);
  VariantClear(&ignored);
  Expect(loaded == VARIANT_TRUE && Count(localFilesDocument, L"//f") > 0,
         "Search gave the files it found");
  VARIANT matchesText;
  IDispatch* files = localFilesDocument;
  Expect(SUCCEEDED(Call(compare, L"Start", DISPATCH_METHOD,
                        {ObjectByReference(&applicationOptions), ObjectByReference(&files),
                         ObjectByReference(&fingerprint)},
                        &matchesText)),
         "Compare.Start");
  IXMLDOMDocument2* matches = NewDocument();
  matches->loadXML(V_BSTR(&matchesText), &loaded);
  VariantClear(&matchesText);
  Expect(loaded == VARIANT_TRUE && Count(matches, L"//a[@v_name]") == 0,
         "Compare's matches carry no verdict yet");
  IDispatch* matchesSlot = matches;
  Expect(SUCCEEDED(Call(filter, L"Start", DISPATCH_METHOD,
                        {Short(kAllFilters), ObjectByReference(&matchesSlot)}, &ignored)),
         "Filter.Start");
  VariantClear(&ignored);
  Expect(Count(matches, L"//a") > 0 && Count(matches, L"//a[@v_name]") == Count(matches, L"//a"),
         "Filter wrote a verdict on every application of the client's document");
  matches->Release();
  localFilesDocument->Release();
  if (localFiles != nullptr) localFiles->Release();
  for (IDispatch* stage : {search, compare, filter}) stage->Release();
  example.searchOptions->Release();
  example.applicationOptions->Release();
  example.fingerprint->Release();
  return failures == 0 ? 0 : 1;
}

bool KeyExists(const std::wstring& key) {
  HKEY handle = nullptr;
  if (RegOpenKeyExW(HKEY_CLASSES_ROOT, key.c_str(), 0, KEY_READ, &handle) != ERROR_SUCCESS) {
    return false;
  }
  RegCloseKey(handle);
  return true;
}

std::wstring GuidKey(const TrlGuid& guid) {
  std::string text = trl::server::GuidText(guid);
  return {text.begin(), text.end()};
}

int Clean() {
  std::vector<std::wstring> keys = {
      L"TypeLib\\" + GuidKey(trl::server::ComponentTypeLibrary().id),
      L"TypeLib\\" + GuidKey(trl::server::Foreign().schemaTypeLibrary)};
  for (const ClassIdentity& identity : trl::server::Classes()) {
    keys.push_back(L"CLSID\\" + GuidKey(identity.classId));
    keys.push_back(Wide(identity.progId));
    keys.push_back(L"Interface\\" + GuidKey(identity.defaultInterfaceId));
    keys.push_back(L"Interface\\" + GuidKey(identity.eventInterfaceId));
  }
  for (const std::wstring& key : keys) {
    Expect(!KeyExists(key), "left in the registry: " + std::string(key.begin(), key.end()));
  }
  return failures == 0 ? 0 : 1;
}

}  // namespace

int wmain(int argc, wchar_t** argv) {
  CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED);
  int result = 2;
  std::wstring command = argc > 1 ? argv[1] : L"";
  if (command == L"check" && argc == 4) {
    result = Check(argv[2], argv[3]);
  } else if (command == L"clean" && argc == 2) {
    result = Clean();
  } else {
    std::fprintf(stderr, "usage: com_client check EXAMPLE-FOLDER RESULTS-FILE | clean\n");
  }
  CoUninitialize();
  std::printf("%s\n", result == 0 ? "passed" : "failed");
  return result;
}
