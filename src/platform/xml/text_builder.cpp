#include "platform/xml/text_builder.h"

#include <algorithm>
#include <cstring>

#include "platform/page_blocks.h"

namespace trl::xml {

TextBuilder::~TextBuilder() { Release(); }

void TextBuilder::write(const void* data, size_t size) {
  const char* bytes = static_cast<const char*>(data);
  size_ += size;
  if (blocks_.empty() && start_.size() + size <= startSize_) {
    start_.append(bytes, size);
    return;
  }
  while (size > 0) {
    if (blocks_.empty() || blocks_.back().used == blockSize_) {
      // Mapped, not allocated: the allocator might keep a freed block instead of returning it.
      void* block = MapPages(blockSize_);
      blocks_.push_back({static_cast<char*>(block), 0});
    }
    Block& block = blocks_.back();
    size_t part = std::min(size, blockSize_ - block.used);
    std::memcpy(block.data + block.used, bytes, part);
    block.used += part;
    bytes += part;
    size -= part;
  }
}

std::string TextBuilder::Take() {
  std::string text;
  if (blocks_.empty()) {
    text = std::move(start_);
  } else {
    text.reserve(size_);
    text.append(start_);
    for (Block& block : blocks_) {
      text.append(block.data, block.used);
      UnmapPages(block.data, blockSize_);
      block.data = nullptr;
    }
  }
  Release();
  return text;
}

void TextBuilder::Release() {
  for (const Block& block : blocks_) {
    if (block.data != nullptr) UnmapPages(block.data, blockSize_);
  }
  blocks_.clear();
  start_ = std::string();
  size_ = 0;
}

}  // namespace trl::xml
