#include "server/document.h"

#include <cstdlib>
#include <cstring>
#include <new>
#include <string_view>

#include "server/module.h"

using trl::server::Guarded;

TrlDocument::TrlDocument(trl::xml::DocumentPtr held) : document(std::move(held)) {
  trl::server::ObjectCreated();
}

TrlDocument::~TrlDocument() { trl::server::ObjectDestroyed(); }

namespace trl::server {

char* AllocText(std::string_view text) {
  auto* copy = static_cast<char*>(std::malloc(text.size() + 1));
  if (copy == nullptr) throw std::bad_alloc();
  std::memcpy(copy, text.data(), text.size());
  copy[text.size()] = '\0';
  return copy;
}

}  // namespace trl::server

extern "C" {

char* TrlStringAlloc(const char* text) {
  if (text == nullptr) return nullptr;
  char* copy = nullptr;
  Guarded([&] {
    copy = trl::server::AllocText(text);
    return TRL_S_OK;
  });
  return copy;
}

void TrlStringFree(char* text) { std::free(text); }

void TrlValueClear(TrlValue* value) {
  if (value == nullptr) return;
  if (value->type == TRL_VT_TEXT) TrlStringFree(value->u.text);
  if (value->type == TRL_VT_DOCUMENT) TrlDocumentRelease(value->u.document);
  value->type = TRL_VT_EMPTY;
  value->u.i4 = 0;
}

TrlResult TrlDocumentCreate(TrlDocument** document) {
  if (document == nullptr) return TRL_E_POINTER;
  *document = nullptr;
  return Guarded([&] {
    *document = new TrlDocument(std::make_shared<trl::xml::Document>());
    return TRL_S_OK;
  });
}

uint32_t TrlDocumentAddRef(TrlDocument* document) {
  return document == nullptr ? 0 : ++document->references;
}

uint32_t TrlDocumentRelease(TrlDocument* document) {
  if (document == nullptr) return 0;
  uint32_t left = --document->references;
  if (left == 0) delete document;
  return left;
}

TrlResult TrlDocumentLoadXml(TrlDocument* document, const char* text) {
  if (document == nullptr || text == nullptr) return TRL_E_POINTER;
  return Guarded([&] { return document->document->LoadXml(text) ? TRL_S_OK : TRL_S_FALSE; });
}

TrlResult TrlDocumentXml(TrlDocument* document, char** text) {
  if (document == nullptr || text == nullptr) return TRL_E_POINTER;
  *text = nullptr;
  return Guarded([&] {
    *text = trl::server::AllocText(document->document->Xml());
    return TRL_S_OK;
  });
}

}  // extern "C"
