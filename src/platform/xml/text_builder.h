#pragma once

#include <cstddef>
#include <pugixml.hpp>
#include <string>
#include <vector>

namespace trl::xml {

// Collects text of unknown length in one pass and hands it over as one string that, at the peak,
// takes little more memory than its own size. Past a small start the text goes into blocks mapped
// from the system; Take copies them into a string reserved at the final size, whose pages are
// only touched by that copy, and gives each block back as soon as it is copied.
class TextBuilder final : public pugi::xml_writer {
 public:
  explicit TextBuilder(size_t startSize = 64 << 10, size_t blockSize = 256 << 10)
      : startSize_(startSize), blockSize_(blockSize) {}
  ~TextBuilder() override;
  TextBuilder(const TextBuilder&) = delete;
  TextBuilder& operator=(const TextBuilder&) = delete;

  void write(const void* data, size_t size) override;
  // The text written so far; the builder is empty afterwards.
  std::string Take();

 private:
  struct Block {
    char* data;
    size_t used;
  };

  void Release();

  const size_t startSize_;
  const size_t blockSize_;
  std::string start_;
  std::vector<Block> blocks_;
  size_t size_ = 0;
};

}  // namespace trl::xml
