#include "platform/xml/text_builder.h"

#include <gtest/gtest.h>

#include <string>

namespace trl::xml {
namespace {

// Pieces of all lengths, across the end of the start and the ends of blocks, come out whole and
// in order; a builder is empty once its text is taken.
TEST(TextBuilderTest, HandsOverEveryPieceInOrder) {
  const std::pair<size_t, size_t> sizes[] = {{0, 1}, {5, 7}, {100, 4096}, {64 << 10, 4 << 20}};
  for (const auto& [startSize, blockSize] : sizes) {
    SCOPED_TRACE(std::to_string(startSize) + " then blocks of " + std::to_string(blockSize));
    TextBuilder builder(startSize, blockSize);
    std::string expected;
    for (size_t n = 0; n < 300; ++n) {
      std::string piece(n % 23, static_cast<char>('a' + n % 26));
      builder.write(piece.data(), piece.size());
      expected += piece;
    }
    EXPECT_EQ(builder.Take(), expected);
    builder.write("again", 5);
    EXPECT_EQ(builder.Take(), "again");
  }
}

}  // namespace
}  // namespace trl::xml
