#pragma once

#include <atomic>
#include <cstdint>

#include "trl/server.h"
#include "trl/xml.h"

// The document a client holds: the component's own document, shared with the workers that hold
// it during a run, so that a stage's changes land in the caller's document.
struct TrlDocument {
  explicit TrlDocument(trl::xml::DocumentPtr held);
  ~TrlDocument();
  TrlDocument(const TrlDocument&) = delete;
  TrlDocument& operator=(const TrlDocument&) = delete;

  trl::xml::DocumentPtr document;
  std::atomic<uint32_t> references{1};
};

namespace trl::server {

// The text of `text` in memory of the library's allocator, for TrlStringFree; throws bad_alloc.
char* AllocText(std::string_view text);

}  // namespace trl::server
