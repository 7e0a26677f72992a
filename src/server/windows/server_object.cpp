#include "server/windows/server_object.h"

#include <olectl.h>

#include <cstring>
#include <new>

#include "server/module.h"
#include "server/windows/com_text.h"
#include "server/windows/type_library.h"

namespace trl::server::windows {

HRESULT Call(const std::function<HRESULT()>& body) {
  CallScope scope;
  return Guarded([&] { return static_cast<TrlResult>(body()); });
}

GUID ToGuid(const TrlGuid& guid) {
  static_assert(sizeof(GUID) == sizeof(TrlGuid));
  GUID converted;
  std::memcpy(&converted, &guid, sizeof converted);
  return converted;
}

// The connection point of the class's event interface: a face of its object, whose lifetime it
// shares.
class ServerObjectBase::Point : public IConnectionPoint {
 public:
  explicit Point(ServerObjectBase& owner) : owner_(owner) {}

  STDMETHODIMP QueryInterface(REFIID iid, void** object) override {
    if (object == nullptr) return E_POINTER;
    *object = nullptr;
    if (!IsEqualIID(iid, IID_IUnknown) && !IsEqualIID(iid, IID_IConnectionPoint)) {
      return E_NOINTERFACE;
    }
    AddRef();
    *object = static_cast<IConnectionPoint*>(this);
    return S_OK;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return owner_.AddRef(); }
  STDMETHODIMP_(ULONG) Release() override { return owner_.Release(); }

  STDMETHODIMP GetConnectionInterface(IID* iid) override {
    if (iid == nullptr) return E_POINTER;
    *iid = ToGuid(owner_.identity_.eventInterfaceId);
    return S_OK;
  }
  STDMETHODIMP GetConnectionPointContainer(IConnectionPointContainer** container) override {
    if (container == nullptr) return E_POINTER;
    owner_.AddRef();
    *container = &owner_;
    return S_OK;
  }
  STDMETHODIMP Advise(IUnknown* sink, DWORD* cookie) override {
    if (sink == nullptr || cookie == nullptr) return E_POINTER;
    *cookie = 0;
    IDispatch* events = nullptr;
    // The sink implements the event interface, or late binding on which it is based.
    if (FAILED(sink->QueryInterface(ToGuid(owner_.identity_.eventInterfaceId),
                                    reinterpret_cast<void**>(&events))) &&
        FAILED(sink->QueryInterface(IID_IDispatch, reinterpret_cast<void**>(&events)))) {
      return CONNECT_E_CANNOTCONNECT;
    }
    owner_.sinks_.emplace_back(++owner_.lastCookie_, events);
    *cookie = owner_.lastCookie_;
    return S_OK;
  }
  STDMETHODIMP Unadvise(DWORD cookie) override {
    for (auto it = owner_.sinks_.begin(); it != owner_.sinks_.end(); ++it) {
      if (it->first == cookie) {
        IDispatch* sink = it->second;
        owner_.sinks_.erase(it);
        sink->Release();
        return S_OK;
      }
    }
    return CONNECT_E_NOCONNECTION;
  }
  STDMETHODIMP EnumConnections(IEnumConnections** connections) override {
    if (connections != nullptr) *connections = nullptr;
    return E_NOTIMPL;
  }

 private:
  ServerObjectBase& owner_;
};

ServerObjectBase::ServerObjectBase(const ClassIdentity& identity, std::unique_ptr<Worker> worker)
    : identity_(identity), worker_(std::move(worker)), point_(std::make_unique<Point>(*this)) {
  ObjectCreated();
  worker_->OnStatusUpdate([this](const std::string& update, const std::string& results) {
    // The client's documents hold the run's changes before it hears of the end. A failure to
    // write them cannot stop the run's end; the client still hears of it.
    if (worker_->Status() == kStatusComplete || worker_->Status() == kStatusCancelled) {
      run_.WriteBack();
    }
    Raise(1, {&update, &results});
  });
  worker_->OnProgressUpdate([this](const std::string& update) { Raise(2, {&update}); });
  TypeInfoOf(ToGuid(identity.defaultInterfaceId), &dispatchInfo_);
  InterfaceTypeInfoOf(ToGuid(identity.defaultInterfaceId), &interfaceInfo_);
}

ServerObjectBase::~ServerObjectBase() {
  worker_.reset();
  for (auto& [cookie, sink] : sinks_) sink->Release();
  if (dispatchInfo_ != nullptr) dispatchInfo_->Release();
  if (interfaceInfo_ != nullptr) interfaceInfo_->Release();
  ObjectDestroyed();
}

STDMETHODIMP ServerObjectBase::QueryInterface(REFIID iid, void** object) {
  if (object == nullptr) return E_POINTER;
  *object = nullptr;
  if (IsEqualIID(iid, IID_IUnknown) || IsEqualIID(iid, IID_IDispatch) ||
      IsEqualIID(iid, ToGuid(identity_.defaultInterfaceId))) {
    *object = Dispatch();
  } else if (IsEqualIID(iid, IID_IProvideClassInfo) || IsEqualIID(iid, IID_IProvideClassInfo2)) {
    *object = static_cast<IProvideClassInfo2*>(this);
  } else if (IsEqualIID(iid, IID_IConnectionPointContainer)) {
    *object = static_cast<IConnectionPointContainer*>(this);
  } else {
    return E_NOINTERFACE;
  }
  AddRef();
  return S_OK;
}

STDMETHODIMP_(ULONG) ServerObjectBase::Release() {
  ULONG left = --references_;
  if (left == 0) DestroyOutsideCalls([this] { delete this; });
  return left;
}

STDMETHODIMP ServerObjectBase::GetClassInfo(ITypeInfo** info) {
  if (info == nullptr) return E_POINTER;
  return TypeInfoOf(ToGuid(identity_.classId), info);
}

STDMETHODIMP ServerObjectBase::GetGUID(DWORD kind, GUID* guid) {
  if (guid == nullptr) return E_POINTER;
  if (kind != GUIDKIND_DEFAULT_SOURCE_DISP_IID) return E_INVALIDARG;
  *guid = ToGuid(identity_.eventInterfaceId);
  return S_OK;
}

STDMETHODIMP ServerObjectBase::EnumConnectionPoints(IEnumConnectionPoints** points) {
  if (points != nullptr) *points = nullptr;
  return E_NOTIMPL;
}

STDMETHODIMP ServerObjectBase::FindConnectionPoint(REFIID iid, IConnectionPoint** point) {
  if (point == nullptr) return E_POINTER;
  *point = nullptr;
  if (!IsEqualIID(iid, ToGuid(identity_.eventInterfaceId))) return CONNECT_E_NOCONNECTION;
  point_->AddRef();
  *point = point_.get();
  return S_OK;
}

HRESULT ServerObjectBase::GetAsynchronous(VARIANT_BOOL* result) {
  if (result == nullptr) return E_POINTER;
  *result = worker_->Asynchronous() ? VARIANT_TRUE : VARIANT_FALSE;
  return S_OK;
}

HRESULT ServerObjectBase::PutAsynchronous(VARIANT_BOOL asynchronous) {
  worker_->Asynchronous(asynchronous != VARIANT_FALSE);
  return S_OK;
}

HRESULT ServerObjectBase::DoCancel() {
  return Call([&] {
    worker_->Cancel();
    return S_OK;
  });
}

HRESULT ServerObjectBase::TypeInfoCount(UINT* count) {
  if (count == nullptr) return E_POINTER;
  *count = dispatchInfo_ == nullptr ? 0 : 1;
  return S_OK;
}

HRESULT ServerObjectBase::TypeInfo(UINT index, ITypeInfo** info) {
  if (info == nullptr) return E_POINTER;
  *info = nullptr;
  if (index != 0 || dispatchInfo_ == nullptr) return DISP_E_BADINDEX;
  dispatchInfo_->AddRef();
  *info = dispatchInfo_;
  return S_OK;
}

HRESULT ServerObjectBase::IdsOfNames(REFIID iid, LPOLESTR* names, UINT count, DISPID* ids) {
  if (!IsEqualIID(iid, IID_NULL)) return DISP_E_UNKNOWNINTERFACE;
  if (interfaceInfo_ == nullptr) return E_UNEXPECTED;
  return DispGetIDsOfNames(interfaceInfo_, names, count, ids);
}

HRESULT ServerObjectBase::InvokeMember(DISPID id, REFIID iid, WORD flags, DISPPARAMS* params,
                                       VARIANT* result, EXCEPINFO* exception, UINT* argError) {
  if (!IsEqualIID(iid, IID_NULL)) return DISP_E_UNKNOWNINTERFACE;
  if (interfaceInfo_ == nullptr) return E_UNEXPECTED;
  return DispInvoke(Dispatch(), interfaceInfo_, id, flags, params, result, exception, argError);
}

HRESULT ServerObjectBase::RunStart(const std::function<std::string(ClientDocuments&)>& start,
                                   BSTR* result) {
  if (result == nullptr) return E_POINTER;
  *result = nullptr;
  return Call([&] {
    int16_t before = worker_->Status();
    bool busy = before == kStatusStarted || before == kStatusRunning;
    ClientDocuments documents;
    std::string text = start(documents);
    HRESULT written = S_OK;
    if (!busy) {
      run_ = std::move(documents);
      if (!worker_->Asynchronous()) written = run_.WriteBack();
    }
    if (FAILED(written)) return written;
    *result = NewBstr(text);
    return S_OK;
  });
}

void ServerObjectBase::Raise(DISPID event, std::initializer_list<const std::string*> texts) {
  if (sinks_.empty()) return;
  std::vector<VARIANT> arguments(texts.size());
  // Last argument first, as the platform passes them.
  size_t at = texts.size();
  for (const std::string* text : texts) {
    --at;
    VariantInit(&arguments[at]);
    V_VT(&arguments[at]) = VT_BSTR;
    V_BSTR(&arguments[at]) = NewBstr(*text);
  }
  DISPPARAMS params{arguments.data(), nullptr, static_cast<UINT>(arguments.size()), 0};
  std::vector<IDispatch*> sinks;
  for (auto& [cookie, sink] : sinks_) {
    sink->AddRef();
    sinks.push_back(sink);
  }
  for (IDispatch* sink : sinks) {
    sink->Invoke(event, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_METHOD, &params, nullptr, nullptr,
                 nullptr);
    sink->Release();
  }
  for (VARIANT& argument : arguments) VariantClear(&argument);
}

}  // namespace trl::server::windows
