#pragma once

#include <windows.h>

#include <msxml2.h>

#include <cstdint>
#include <vector>

#include "trl/xml.h"

namespace trl::server::windows {

// The client's documents of one run, each lent to the workers as a document of the component's
// own, whose changes are written back into the client's document when the run ends: the client
// then holds what the run made of its documents, as when the workers change them in place.
class ClientDocuments {
 public:
  ClientDocuments() = default;
  ~ClientDocuments();
  ClientDocuments(const ClientDocuments&) = delete;
  ClientDocuments& operator=(const ClientDocuments&) = delete;
  ClientDocuments(ClientDocuments&& other) noexcept;
  ClientDocuments& operator=(ClientDocuments&& other) noexcept;

  // The component's copy of `client`; null for no document.
  xml::DocumentPtr Lend(IXMLDOMDocument2* client);
  // The same for a document passed by reference (`slot` or `*slot` may be null).
  xml::DocumentPtr Lend(IXMLDOMDocument2** slot);
  // A document the run made where the client passed none by reference: a new platform document in
  // the client's variable, filled when the run ends. Nothing when `made` is what was lent there.
  HRESULT Return(IXMLDOMDocument2** slot, const xml::DocumentPtr& made);

  // Writes each document the run changed back into the client's; a document written back once
  // is written again only after further changes.
  HRESULT WriteBack();

 private:
  struct Lent {
    IXMLDOMDocument2* client;  // one reference held
    xml::DocumentPtr document;
    uint64_t written;  // the document's modification count when the client's was last made equal
  };
  void Clear();

  std::vector<Lent> lent_;
};

}  // namespace trl::server::windows
