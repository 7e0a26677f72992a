#include "server/windows/class_factory.h"

#include <atomic>

#include "server/module.h"
#include "server/windows/server_object.h"

namespace trl::server::windows {
namespace {

// Makes the objects of one class; it keeps the module loaded while it lives.
class ClassFactory final : public IClassFactory {
 public:
  explicit ClassFactory(const ClassIdentity& identity) : identity_(identity) { ObjectCreated(); }
  ~ClassFactory() { ObjectDestroyed(); }
  ClassFactory(const ClassFactory&) = delete;
  ClassFactory& operator=(const ClassFactory&) = delete;

  STDMETHODIMP QueryInterface(REFIID iid, void** object) override {
    if (object == nullptr) return E_POINTER;
    *object = nullptr;
    if (!IsEqualIID(iid, IID_IUnknown) && !IsEqualIID(iid, IID_IClassFactory)) {
      return E_NOINTERFACE;
    }
    AddRef();
    *object = static_cast<IClassFactory*>(this);
    return S_OK;
  }
  STDMETHODIMP_(ULONG) AddRef() override { return ++references_; }
  STDMETHODIMP_(ULONG) Release() override {
    ULONG left = --references_;
    if (left == 0) delete this;
    return left;
  }

  STDMETHODIMP CreateInstance(IUnknown* outer, REFIID iid, void** object) override {
    if (object == nullptr) return E_POINTER;
    *object = nullptr;
    if (outer != nullptr) return CLASS_E_NOAGGREGATION;
    return Call([&] { return CreateServerObject(identity_, iid, object); });
  }
  STDMETHODIMP LockServer(BOOL lock) override {
    LockModule(lock != FALSE);
    return S_OK;
  }

 private:
  const ClassIdentity& identity_;
  std::atomic<ULONG> references_{0};
};

}  // namespace

HRESULT GetClassObject(REFCLSID classId, REFIID iid, void** object) {
  if (object == nullptr) return E_POINTER;
  *object = nullptr;
  for (const ClassIdentity& identity : Classes()) {
    if (!IsEqualCLSID(classId, ToGuid(identity.classId))) continue;
    return Call([&] {
      auto* factory = new ClassFactory(identity);
      factory->AddRef();
      HRESULT result = factory->QueryInterface(iid, object);
      factory->Release();
      return result;
    });
  }
  return CLASS_E_CLASSNOTAVAILABLE;
}

}  // namespace trl::server::windows
