// The five creatable classes: each default interface's own members over its worker.
#include <msxml2.h>

#include "server/windows/com_text.h"
#include "server/windows/server_object.h"
#include "trl/compare.h"
#include "trl/filter.h"
#include "trl/locate.h"
#include "trl/merge.h"
#include "trl/search.h"
#include "trllocator.h"

namespace trl::server::windows {
namespace {

using Slot = IXMLDOMDocument2**;

// Status of the four stages, a 16-bit number.
template <class Interface>
class StageObject : public ServerObject<Interface> {
 public:
  using ServerObject<Interface>::ServerObject;

  STDMETHODIMP get_Status(short* result) override {
    if (result == nullptr) return E_POINTER;
    *result = this->template worker<Worker>().Status();
    return S_OK;
  }
};

class SearchObject final : public StageObject<_Search> {
 public:
  explicit SearchObject(const ClassIdentity& identity)
      : StageObject(identity, std::make_unique<Search>()) {}

  STDMETHODIMP Start(Slot searchOptions, Slot applicationOptions, Slot fingerprint, Slot results,
                     BSTR* result) override {
    return RunStart(
        [&](ClientDocuments& documents) {
          xml::DocumentPtr lentResults = documents.Lend(results);
          std::string text = worker<Search>().Start(documents.Lend(searchOptions),
                                                    documents.Lend(applicationOptions),
                                                    documents.Lend(fingerprint), lentResults);
          // A run given no results document makes one, which the caller's variable receives.
          if (FAILED(documents.Return(results, lentResults))) {
            throw std::runtime_error("no document can be made for the results");
          }
          return text;
        },
        result);
  }
};

class CompareObject final : public StageObject<_Compare> {
 public:
  explicit CompareObject(const ClassIdentity& identity)
      : StageObject(identity, std::make_unique<Compare>()) {}

  STDMETHODIMP Start(Slot applicationOptions, Slot localFiles, Slot fingerprint,
                     BSTR* result) override {
    return RunStart(
        [&](ClientDocuments& documents) {
          return worker<Compare>().Start(documents.Lend(applicationOptions),
                                         documents.Lend(localFiles), documents.Lend(fingerprint));
        },
        result);
  }
};

class FilterObject final : public StageObject<_Filter> {
 public:
  explicit FilterObject(const ClassIdentity& identity)
      : StageObject(identity, std::make_unique<Filter>()) {}

  STDMETHODIMP Start(short filterOptions, Slot matches, BSTR* result) override {
    return RunStart(
        [&](ClientDocuments& documents) {
          return worker<Filter>().Start(filterOptions, documents.Lend(matches));
        },
        result);
  }
};

class MergeObject final : public StageObject<_Merge> {
 public:
  explicit MergeObject(const ClassIdentity& identity)
      : StageObject(identity, std::make_unique<Merge>()) {}

  STDMETHODIMP Start(Slot searchOptions, Slot applicationOptions, Slot oldResults, Slot newResults,
                     BSTR* result) override {
    return RunStart(
        [&](ClientDocuments& documents) {
          return worker<Merge>().Start(documents.Lend(searchOptions),
                                       documents.Lend(applicationOptions),
                                       documents.Lend(oldResults), documents.Lend(newResults));
        },
        result);
  }
};

class LocateObject final : public ServerObject<_Locate> {
 public:
  explicit LocateObject(const ClassIdentity& identity)
      : ServerObject(identity, std::make_unique<Locate>()) {}

  STDMETHODIMP put_LogFile(BSTR fileName) override {
    return Call([&] {
      worker<Locate>().LogFile(Utf8(fileName));
      return S_OK;
    });
  }
  STDMETHODIMP get_LogFile(BSTR* result) override {
    if (result == nullptr) return E_POINTER;
    *result = nullptr;
    return Call([&] {
      *result = NewBstr(worker<Locate>().LogFile());
      return S_OK;
    });
  }
  STDMETHODIMP get_Mode(trlMode* result) override {
    if (result == nullptr) return E_POINTER;
    *result = static_cast<trlMode>(worker<Locate>().Mode());
    return S_OK;
  }
  STDMETHODIMP get_Status(trlStatus* result) override {
    if (result == nullptr) return E_POINTER;
    *result = static_cast<trlStatus>(worker<Locate>().Status());
    return S_OK;
  }
  STDMETHODIMP Start(IXMLDOMDocument2* searchOptions, IXMLDOMDocument2* applicationOptions,
                     short filterOptions, IXMLDOMDocument2* fingerprint, IXMLDOMDocument2* userData,
                     BSTR* result) override {
    return RunStart(
        [&](ClientDocuments& documents) {
          return worker<Locate>().Start(documents.Lend(searchOptions),
                                        documents.Lend(applicationOptions), filterOptions,
                                        documents.Lend(fingerprint), documents.Lend(userData));
        },
        result);
  }
};

template <class Object>
HRESULT Answer(const ClassIdentity& identity, REFIID iid, void** object) {
  auto* made = new Object(identity);
  made->AddRef();
  HRESULT result = made->QueryInterface(iid, object);
  made->Release();
  return result;
}

}  // namespace

HRESULT CreateServerObject(const ClassIdentity& identity, REFIID iid, void** object) {
  std::string_view name = identity.name;
  if (name == "Search") return Answer<SearchObject>(identity, iid, object);
  if (name == "Compare") return Answer<CompareObject>(identity, iid, object);
  if (name == "Filter") return Answer<FilterObject>(identity, iid, object);
  if (name == "Merge") return Answer<MergeObject>(identity, iid, object);
  return Answer<LocateObject>(identity, iid, object);
}

}  // namespace trl::server::windows
