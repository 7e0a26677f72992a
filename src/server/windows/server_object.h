#pragma once

#include <windows.h>

#include <ocidl.h>

#include <atomic>
#include <functional>
#include <initializer_list>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "server/identities.h"
#include "server/windows/client_documents.h"
#include "trl/worker.h"

namespace trl::server::windows {

// Runs `body` as a call into the component: exceptions become result codes, and an object the
// client releases from inside an event of the call is destroyed only after it.
HRESULT Call(const std::function<HRESULT()>& body);

GUID ToGuid(const TrlGuid& guid);

// What the five classes share as objects of the platform: reference counting, late binding
// through the type library, class information, and the connection point of the class's event
// interface, whose sinks receive StatusUpdate and ProgressUpdate on the creating thread.
class ServerObjectBase : public IProvideClassInfo2, public IConnectionPointContainer {
 public:
  // IUnknown, for every face of the object.
  STDMETHODIMP QueryInterface(REFIID iid, void** object) override;
  STDMETHODIMP_(ULONG) AddRef() override { return ++references_; }
  STDMETHODIMP_(ULONG) Release() override;

  // IProvideClassInfo2
  STDMETHODIMP GetClassInfo(ITypeInfo** info) override;
  STDMETHODIMP GetGUID(DWORD kind, GUID* guid) override;

  // IConnectionPointContainer: one point, found by the event interface's identifier.
  STDMETHODIMP EnumConnectionPoints(IEnumConnectionPoints** points) override;
  STDMETHODIMP FindConnectionPoint(REFIID iid, IConnectionPoint** point) override;

 protected:
  ServerObjectBase(const ClassIdentity& identity, std::unique_ptr<Worker> worker);
  virtual ~ServerObjectBase();

  // The default interface's face.
  virtual IDispatch* Dispatch() = 0;

  // The common members of the default interfaces.
  HRESULT GetAsynchronous(VARIANT_BOOL* result);
  HRESULT PutAsynchronous(VARIANT_BOOL asynchronous);
  HRESULT DoCancel();
  // The members of IDispatch, bound through the type library.
  HRESULT TypeInfoCount(UINT* count);
  HRESULT TypeInfo(UINT index, ITypeInfo** info);
  HRESULT IdsOfNames(REFIID iid, LPOLESTR* names, UINT count, DISPID* ids);
  HRESULT InvokeMember(DISPID id, REFIID iid, WORD flags, DISPPARAMS* params, VARIANT* result,
                       EXCEPINFO* exception, UINT* argError);

  // Start with the client's documents: `start` lends them to the worker and calls its Start. A
  // Start the worker refuses (a run is under way) keeps the documents of the run under way.
  HRESULT RunStart(const std::function<std::string(ClientDocuments&)>& start, BSTR* result);

  template <class T>
  T& worker() {
    return static_cast<T&>(*worker_);
  }

 private:
  class Point;
  void Raise(DISPID event, std::initializer_list<const std::string*> texts);

  const ClassIdentity& identity_;
  std::atomic<ULONG> references_{0};
  std::unique_ptr<Worker> worker_;
  std::unique_ptr<Point> point_;
  std::vector<std::pair<DWORD, IDispatch*>> sinks_;
  DWORD lastCookie_ = 0;
  ClientDocuments run_;  // the documents of the run under way or last ended
  ITypeInfo* dispatchInfo_ = nullptr;
  ITypeInfo* interfaceInfo_ = nullptr;
};

// An object of one class, `Interface` its dual default interface.
template <class Interface>
class ServerObject : public Interface, public ServerObjectBase {
 public:
  using ServerObjectBase::ServerObjectBase;

  STDMETHODIMP QueryInterface(REFIID iid, void** object) override {
    return ServerObjectBase::QueryInterface(iid, object);
  }
  STDMETHODIMP_(ULONG) AddRef() override { return ServerObjectBase::AddRef(); }
  STDMETHODIMP_(ULONG) Release() override { return ServerObjectBase::Release(); }

  STDMETHODIMP GetTypeInfoCount(UINT* count) override { return TypeInfoCount(count); }
  STDMETHODIMP GetTypeInfo(UINT index, LCID, ITypeInfo** info) override {
    return TypeInfo(index, info);
  }
  STDMETHODIMP GetIDsOfNames(REFIID iid, LPOLESTR* names, UINT count, LCID, DISPID* ids) override {
    return IdsOfNames(iid, names, count, ids);
  }
  STDMETHODIMP Invoke(DISPID id, REFIID iid, LCID, WORD flags, DISPPARAMS* params, VARIANT* result,
                      EXCEPINFO* exception, UINT* argError) override {
    return InvokeMember(id, iid, flags, params, result, exception, argError);
  }

  STDMETHODIMP get_Asynchronous(VARIANT_BOOL* result) override { return GetAsynchronous(result); }
  STDMETHODIMP put_Asynchronous(VARIANT_BOOL asynchronous) override {
    return PutAsynchronous(asynchronous);
  }
  STDMETHODIMP Cancel() override { return DoCancel(); }

 protected:
  IDispatch* Dispatch() override { return static_cast<Interface*>(this); }
};

// Creates an object of the class and answers its interface `iid`.
HRESULT CreateServerObject(const ClassIdentity& identity, REFIID iid, void** object);

}  // namespace trl::server::windows
