#include "server/windows/client_documents.h"

#include <stdexcept>
#include <utility>

#include "server/windows/com_text.h"

namespace trl::server::windows {
namespace {

HRESULT Load(IXMLDOMDocument2* client, const std::string& xml) {
  Bstr text(xml);
  VARIANT_BOOL loaded = VARIANT_FALSE;
  HRESULT result = client->loadXML(text.get(), &loaded);
  if (FAILED(result)) return result;
  return loaded == VARIANT_TRUE ? S_OK : E_FAIL;
}

// The platform's document cannot load nothing: a document the run emptied (a lent root element
// moved to another document) loses its root element instead.
HRESULT Empty(IXMLDOMDocument2* client) {
  IXMLDOMElement* root = nullptr;
  HRESULT result = client->get_documentElement(&root);
  if (FAILED(result) || root == nullptr) return result;
  IXMLDOMNode* removed = nullptr;
  result = client->removeChild(root, &removed);
  if (removed != nullptr) removed->Release();
  root->Release();
  return result;
}

}  // namespace

ClientDocuments::~ClientDocuments() { Clear(); }

ClientDocuments::ClientDocuments(ClientDocuments&& other) noexcept
    : lent_(std::exchange(other.lent_, {})) {}

ClientDocuments& ClientDocuments::operator=(ClientDocuments&& other) noexcept {
  if (this != &other) {
    Clear();
    lent_ = std::exchange(other.lent_, {});
  }
  return *this;
}

void ClientDocuments::Clear() {
  for (Lent& lent : lent_) lent.client->Release();
  lent_.clear();
}

xml::DocumentPtr ClientDocuments::Lend(IXMLDOMDocument2* client) {
  if (client == nullptr) return nullptr;
  for (const Lent& lent : lent_) {
    if (lent.client == client) return lent.document;  // one document passed twice stays one
  }
  Bstr text;
  HRESULT result = client->get_xml(text.out());
  if (FAILED(result)) throw std::runtime_error("the client's document cannot be read");
  auto document = std::make_shared<xml::Document>();
  std::string utf8 = Utf8(text.get());
  // A document the client has not loaded is lent empty, as it is.
  if (!utf8.empty() && !document->LoadXml(utf8)) {
    throw std::runtime_error("the client's document cannot be parsed");
  }
  client->AddRef();
  lent_.push_back({client, document, document->ModificationCount()});
  return document;
}

xml::DocumentPtr ClientDocuments::Lend(IXMLDOMDocument2** slot) {
  return slot == nullptr ? nullptr : Lend(*slot);
}

HRESULT ClientDocuments::Return(IXMLDOMDocument2** slot, const xml::DocumentPtr& made) {
  if (slot == nullptr || !made) return S_OK;
  for (const Lent& lent : lent_) {
    if (lent.document == made) return S_OK;
  }
  IXMLDOMDocument2* client = nullptr;
  HRESULT result = CoCreateInstance(CLSID_DOMDocument30, nullptr, CLSCTX_INPROC_SERVER,
                                    IID_IXMLDOMDocument2, reinterpret_cast<void**>(&client));
  if (FAILED(result)) return result;
  // Written back at the end even when the run leaves it as it began.
  lent_.push_back({client, made, ~uint64_t{0}});
  if (*slot != nullptr) (*slot)->Release();
  client->AddRef();
  *slot = client;
  return S_OK;
}

HRESULT ClientDocuments::WriteBack() {
  for (Lent& lent : lent_) {
    uint64_t count = lent.document->ModificationCount();
    if (count == lent.written) continue;
    std::string xml = lent.document->Xml();
    HRESULT result = xml.empty() ? Empty(lent.client) : Load(lent.client, xml);
    if (FAILED(result)) return result;
    lent.written = count;
  }
  return S_OK;
}

}  // namespace trl::server::windows
