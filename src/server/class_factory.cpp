#include "server/class_factory.h"

#include <atomic>

#include "server/guid.h"
#include "server/module.h"
#include "server/server_object.h"

namespace trl::server {
namespace {

constexpr TrlGuid kUnknown = TRL_IID_UNKNOWN;
constexpr TrlGuid kClassFactory = TRL_IID_CLASSFACTORY;

class ClassFactory {
 public:
  explicit ClassFactory(const ClassIdentity& identity);
  ~ClassFactory() { ObjectDestroyed(); }
  ClassFactory(const ClassFactory&) = delete;
  ClassFactory& operator=(const ClassFactory&) = delete;

  static ClassFactory& Of(TrlClassFactory* face) { return *reinterpret_cast<Face*>(face)->owner; }

  TrlResult QueryInterface(const TrlGuid* iid, void** object) {
    if (iid == nullptr || object == nullptr) return TRL_E_POINTER;
    *object = nullptr;
    if (!SameGuid(*iid, kUnknown) && !SameGuid(*iid, kClassFactory)) return TRL_E_NOINTERFACE;
    AddRef();
    *object = &face_;
    return TRL_S_OK;
  }
  uint32_t AddRef() { return ++references_; }
  uint32_t Release() {
    uint32_t left = --references_;
    if (left == 0) delete this;
    return left;
  }

  TrlResult CreateInstance(TrlUnknown* outer, const TrlGuid* iid, void** object) {
    if (iid == nullptr || object == nullptr) return TRL_E_POINTER;
    *object = nullptr;
    if (outer != nullptr) return TRL_CLASS_E_NOAGGREGATION;
    return Guarded([&] { return CreateServerObject(identity_, *iid, object); });
  }

 private:
  struct Face {
    const TrlClassFactoryVtbl* vtbl;
    ClassFactory* owner;
  };
  static const TrlClassFactoryVtbl kVtbl;

  const ClassIdentity& identity_;
  std::atomic<uint32_t> references_{0};
  Face face_;
};

const TrlClassFactoryVtbl ClassFactory::kVtbl = {
    [](TrlClassFactory* self, const TrlGuid* iid, void** object) {
      return Of(self).QueryInterface(iid, object);
    },
    [](TrlClassFactory* self) { return Of(self).AddRef(); },
    [](TrlClassFactory* self) { return Of(self).Release(); },
    [](TrlClassFactory* self, TrlUnknown* outer, const TrlGuid* iid, void** object) {
      return Of(self).CreateInstance(outer, iid, object);
    },
    [](TrlClassFactory*, int32_t lock) {
      LockModule(lock != 0);
      return TRL_S_OK;
    }};

ClassFactory::ClassFactory(const ClassIdentity& identity)
    : identity_(identity), face_{&kVtbl, this} {
  ObjectCreated();
}

}  // namespace

TrlResult CreateClassFactory(const ClassIdentity& identity, const TrlGuid& iid, void** object) {
  auto* factory = new ClassFactory(identity);
  factory->AddRef();
  TrlResult answered = factory->QueryInterface(&iid, object);
  factory->Release();
  return answered;
}

}  // namespace trl::server
