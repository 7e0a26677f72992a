#pragma once

#include <cstddef>

namespace trl {

// Memory taken from the system in whole pages and given back to it at once, never kept by an
// allocator. MapPages throws std::bad_alloc when the system has none.
void* MapPages(size_t size);
void UnmapPages(void* pages, size_t size);

}  // namespace trl
