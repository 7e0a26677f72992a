#include "server/server_object.h"

#include <atomic>
#include <initializer_list>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "server/arguments.h"
#include "server/bindings.h"
#include "server/guid.h"
#include "server/module.h"
#include "trl/worker.h"

namespace trl::server {
namespace {

constexpr TrlGuid kNull = TRL_IID_NULL;
constexpr TrlGuid kUnknown = TRL_IID_UNKNOWN;
constexpr TrlGuid kDispatch = TRL_IID_DISPATCH;
constexpr TrlGuid kProvideClassInfo = TRL_IID_PROVIDECLASSINFO;
constexpr TrlGuid kProvideClassInfo2 = TRL_IID_PROVIDECLASSINFO2;
constexpr TrlGuid kConnectionPointContainer = TRL_IID_CONNECTIONPOINTCONTAINER;
constexpr TrlGuid kConnectionPoint = TRL_IID_CONNECTIONPOINT;

constexpr TrlDispId kStatusUpdate = 1;
constexpr TrlDispId kProgressUpdate = 2;

// One worker seen as an object of the platform's model: the late-bound default interface, its
// class information and one connection point for its event interface. Each interface pointer is
// a face of this object: its table, then the object it belongs to.
class ServerObject {
 public:
  struct Face {
    const void* vtbl;
    ServerObject* owner;
  };
  static ServerObject& Of(void* face) { return *static_cast<Face*>(face)->owner; }

  explicit ServerObject(const ClassIdentity& identity);
  ~ServerObject();
  ServerObject(const ServerObject&) = delete;
  ServerObject& operator=(const ServerObject&) = delete;

  TrlResult QueryInterface(const TrlGuid* iid, void** object);
  uint32_t AddRef() { return ++references_; }
  uint32_t Release();
  TrlResult Invoke(TrlDispId id, const TrlGuid* iid, uint16_t flags, TrlParams* params,
                   TrlValue* result, uint32_t* argError);
  TrlResult Advise(TrlUnknown* sink, uint32_t* cookie);
  TrlResult Unadvise(uint32_t cookie);
  void Raise(TrlDispId event, std::initializer_list<const std::string*> texts);
  bool OnOwnThread() const { return std::this_thread::get_id() == thread_; }

  const ClassIdentity& identity_;
  const std::thread::id thread_;
  std::atomic<uint32_t> references_{0};
  Face dispatch_, classInfo_, container_, point_;
  std::unique_ptr<Worker> worker_;
  std::vector<std::pair<uint32_t, TrlDispatch*>> sinks_;
  uint32_t lastCookie_ = 0;
};

template <class T>
TrlResult Answer(T* face, void** object) {
  ServerObject::Of(face).AddRef();
  *object = face;
  return TRL_S_OK;
}

bool IsNullOrEmpty(const TrlGuid* iid) { return iid == nullptr || SameGuid(*iid, kNull); }

const TrlDispatchVtbl kDispatchVtbl = {
    [](TrlDispatch* self, const TrlGuid* iid, void** object) {
      return ServerObject::Of(self).QueryInterface(iid, object);
    },
    [](TrlDispatch* self) { return ServerObject::Of(self).AddRef(); },
    [](TrlDispatch* self) { return ServerObject::Of(self).Release(); },
    [](TrlDispatch*, uint32_t* count) {
      if (count == nullptr) return TRL_E_POINTER;
      *count = 0;
      return TRL_S_OK;
    },
    [](TrlDispatch*, uint32_t, uint32_t, void** typeInfo) {
      if (typeInfo != nullptr) *typeInfo = nullptr;
      return TRL_DISP_E_BADINDEX;
    },
    [](TrlDispatch* self, const TrlGuid* iid, const char* const* names, uint32_t count, uint32_t,
       TrlDispId* ids) {
      if (!IsNullOrEmpty(iid)) return TRL_DISP_E_UNKNOWNINTERFACE;
      return IdsOfNames(ServerObject::Of(self).identity_, names, count, ids);
    },
    [](TrlDispatch* self, TrlDispId id, const TrlGuid* iid, uint32_t, uint16_t flags,
       TrlParams* params, TrlValue* result, void*, uint32_t* argError) {
      return ServerObject::Of(self).Invoke(id, iid, flags, params, result, argError);
    }};

const TrlProvideClassInfo2Vtbl kClassInfoVtbl = {
    [](TrlProvideClassInfo2* self, const TrlGuid* iid, void** object) {
      return ServerObject::Of(self).QueryInterface(iid, object);
    },
    [](TrlProvideClassInfo2* self) { return ServerObject::Of(self).AddRef(); },
    [](TrlProvideClassInfo2* self) { return ServerObject::Of(self).Release(); },
    [](TrlProvideClassInfo2*, void** typeInfo) {
      if (typeInfo != nullptr) *typeInfo = nullptr;
      return TRL_E_NOTIMPL;
    },
    [](TrlProvideClassInfo2* self, uint32_t kind, TrlGuid* guid) {
      if (guid == nullptr) return TRL_E_POINTER;
      if (kind != TRL_GUIDKIND_DEFAULT_SOURCE_DISPIID) return TRL_E_INVALIDARG;
      *guid = ServerObject::Of(self).identity_.eventInterfaceId;
      return TRL_S_OK;
    }};

const TrlConnectionPointContainerVtbl kContainerVtbl = {
    [](TrlConnectionPointContainer* self, const TrlGuid* iid, void** object) {
      return ServerObject::Of(self).QueryInterface(iid, object);
    },
    [](TrlConnectionPointContainer* self) { return ServerObject::Of(self).AddRef(); },
    [](TrlConnectionPointContainer* self) { return ServerObject::Of(self).Release(); },
    [](TrlConnectionPointContainer*, void** enumerator) {
      if (enumerator != nullptr) *enumerator = nullptr;
      return TRL_E_NOTIMPL;
    },
    [](TrlConnectionPointContainer* self, const TrlGuid* iid, TrlConnectionPoint** point) {
      if (iid == nullptr || point == nullptr) return TRL_E_POINTER;
      *point = nullptr;
      ServerObject& owner = ServerObject::Of(self);
      if (!SameGuid(*iid, owner.identity_.eventInterfaceId)) return TRL_CONNECT_E_NOCONNECTION;
      return Answer(&owner.point_, reinterpret_cast<void**>(point));
    }};

const TrlConnectionPointVtbl kPointVtbl = {
    // The point is an object of its own: it answers only for itself.
    [](TrlConnectionPoint* self, const TrlGuid* iid, void** object) {
      if (iid == nullptr || object == nullptr) return TRL_E_POINTER;
      *object = nullptr;
      if (!SameGuid(*iid, kUnknown) && !SameGuid(*iid, kConnectionPoint)) return TRL_E_NOINTERFACE;
      return Answer(self, object);
    },
    [](TrlConnectionPoint* self) { return ServerObject::Of(self).AddRef(); },
    [](TrlConnectionPoint* self) { return ServerObject::Of(self).Release(); },
    [](TrlConnectionPoint* self, TrlGuid* iid) {
      if (iid == nullptr) return TRL_E_POINTER;
      *iid = ServerObject::Of(self).identity_.eventInterfaceId;
      return TRL_S_OK;
    },
    [](TrlConnectionPoint* self, TrlConnectionPointContainer** container) {
      if (container == nullptr) return TRL_E_POINTER;
      return Answer(&ServerObject::Of(self).container_, reinterpret_cast<void**>(container));
    },
    [](TrlConnectionPoint* self, TrlUnknown* sink, uint32_t* cookie) {
      return ServerObject::Of(self).Advise(sink, cookie);
    },
    [](TrlConnectionPoint* self, uint32_t cookie) {
      return ServerObject::Of(self).Unadvise(cookie);
    },
    [](TrlConnectionPoint*, void** enumerator) {
      if (enumerator != nullptr) *enumerator = nullptr;
      return TRL_E_NOTIMPL;
    }};

ServerObject::ServerObject(const ClassIdentity& identity)
    : identity_(identity),
      thread_(std::this_thread::get_id()),
      dispatch_{&kDispatchVtbl, this},
      classInfo_{&kClassInfoVtbl, this},
      container_{&kContainerVtbl, this},
      point_{&kPointVtbl, this},
      worker_(CreateWorker(identity)) {
  ObjectCreated();
  worker_->OnStatusUpdate([this](const std::string& update, const std::string& results) {
    Raise(kStatusUpdate, {&update, &results});
  });
  // Progress reports are built only while a sink follows them.
  worker_->OnProgressUpdate(
      [this](const std::string& update) { Raise(kProgressUpdate, {&update}); },
      [this] { return !sinks_.empty(); });
}

ServerObject::~ServerObject() {
  worker_.reset();
  for (auto& [cookie, sink] : sinks_) sink->vtbl->Release(sink);
  ObjectDestroyed();
}

TrlResult ServerObject::QueryInterface(const TrlGuid* iid, void** object) {
  if (iid == nullptr || object == nullptr) return TRL_E_POINTER;
  *object = nullptr;
  if (SameGuid(*iid, kUnknown) || SameGuid(*iid, kDispatch) ||
      SameGuid(*iid, identity_.defaultInterfaceId)) {
    return Answer(&dispatch_, object);
  }
  if (SameGuid(*iid, kProvideClassInfo) || SameGuid(*iid, kProvideClassInfo2)) {
    return Answer(&classInfo_, object);
  }
  if (SameGuid(*iid, kConnectionPointContainer)) return Answer(&container_, object);
  return TRL_E_NOINTERFACE;
}

uint32_t ServerObject::Release() {
  uint32_t left = --references_;
  if (left == 0) DestroyOutsideCalls([this] { delete this; });
  return left;
}

TrlResult ServerObject::Invoke(TrlDispId id, const TrlGuid* iid, uint16_t flags, TrlParams* params,
                               TrlValue* result, uint32_t* argError) {
  if (!IsNullOrEmpty(iid)) return TRL_DISP_E_UNKNOWNINTERFACE;
  if (!OnOwnThread()) return TRL_E_WRONG_THREAD;
  if (params == nullptr) return TRL_E_POINTER;
  return Guarded([&] {
    // Declared first, so that an object released from inside an event of this call is destroyed
    // only after everything else here is done.
    CallScope scope;
    const Member* member = SelectMember(identity_, id, flags);
    if (member == nullptr) return TRL_DISP_E_MEMBERNOTFOUND;
    Arguments arguments;
    TrlResult converted = ConvertArguments(*member, *params, arguments, argError);
    if (converted != TRL_S_OK) return converted;
    Outcome outcome = Perform(*worker_, identity_, *member, arguments);
    WriteBack(*member, arguments);
    if (result != nullptr) WriteOutcome(outcome, *result);
    return TRL_S_OK;
  });
}

TrlResult ServerObject::Advise(TrlUnknown* sink, uint32_t* cookie) {
  if (sink == nullptr || cookie == nullptr) return TRL_E_POINTER;
  *cookie = 0;
  if (!OnOwnThread()) return TRL_E_WRONG_THREAD;
  return Guarded([&] {
    void* dispatch = nullptr;
    if (sink->vtbl->QueryInterface(sink, &identity_.eventInterfaceId, &dispatch) != TRL_S_OK &&
        sink->vtbl->QueryInterface(sink, &kDispatch, &dispatch) != TRL_S_OK) {
      return TRL_CONNECT_E_CANNOTCONNECT;
    }
    auto* held = static_cast<TrlDispatch*>(dispatch);
    try {
      sinks_.emplace_back(lastCookie_ + 1, held);
    } catch (...) {
      held->vtbl->Release(held);
      throw;
    }
    *cookie = ++lastCookie_;
    return TRL_S_OK;
  });
}

TrlResult ServerObject::Unadvise(uint32_t cookie) {
  if (!OnOwnThread()) return TRL_E_WRONG_THREAD;
  for (auto it = sinks_.begin(); it != sinks_.end(); ++it) {
    if (it->first != cookie) continue;
    TrlDispatch* sink = it->second;
    sinks_.erase(it);
    sink->vtbl->Release(sink);
    return TRL_S_OK;
  }
  return TRL_CONNECT_E_NOCONNECTION;
}

void ServerObject::Raise(TrlDispId event, std::initializer_list<const std::string*> texts) {
  // A sink may disconnect itself or another one from inside the event: each sink connected now
  // gets it, held until it has.
  std::vector<TrlDispatch*> sinks;
  for (auto& [cookie, sink] : sinks_) sinks.push_back(sink);
  for (TrlDispatch* sink : sinks) sink->vtbl->AddRef(sink);

  std::vector<TrlValue> args(texts.size());
  size_t last = texts.size() - 1;
  for (const std::string* text : texts) {
    args[last].type = TRL_VT_TEXT;
    args[last].u.text = const_cast<char*>(text->c_str());
    --last;
  }
  TrlParams params{args.data(), nullptr, static_cast<uint32_t>(args.size()), 0};
  for (TrlDispatch* sink : sinks) {
    sink->vtbl->Invoke(sink, event, &kNull, 0, TRL_DISPATCH_METHOD, &params, nullptr, nullptr,
                       nullptr);
  }
  for (TrlDispatch* sink : sinks) sink->vtbl->Release(sink);
}

}  // namespace

TrlResult CreateServerObject(const ClassIdentity& identity, const TrlGuid& iid, void** object) {
  auto* created = new ServerObject(identity);
  created->AddRef();
  TrlResult answered = created->QueryInterface(&iid, object);
  created->Release();
  return answered;
}

}  // namespace trl::server
