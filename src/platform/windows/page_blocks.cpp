#include "platform/page_blocks.h"

#include <windows.h>

#include <new>

namespace trl {

void* MapPages(size_t size) {
  void* pages = VirtualAlloc(nullptr, size, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE);
  if (pages == nullptr) throw std::bad_alloc();
  return pages;
}

void UnmapPages(void* pages, size_t /*size*/) { VirtualFree(pages, 0, MEM_RELEASE); }

}  // namespace trl
