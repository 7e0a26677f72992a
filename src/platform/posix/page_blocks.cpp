#include "platform/page_blocks.h"

#include <sys/mman.h>

#include <new>

namespace trl {

void* MapPages(size_t size) {
  void* pages = mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (pages == MAP_FAILED) throw std::bad_alloc();
  return pages;
}

void UnmapPages(void* pages, size_t size) { munmap(pages, size); }

}  // namespace trl
