#include <gtest/gtest.h>

#include <string>

#include "platform/failure.h"
#include "schema/schema.h"
#include "support/failure_of.h"
#include "support/memory_file.h"

namespace trl {
namespace {

using testing::FailureOf;
using testing::MemoryFile;

TEST(PropertyReadersTest, ReadFromMemory) {
  std::string allBytes;  // more than three read chunks, and not a multiple of one
  for (int i = 0; i < 12289 * 256; ++i) allBytes.push_back(static_cast<char>(i));
  const std::pair<std::string, const char*> samples[] = {
      {"", "d41d8cd98f00b204e9800998ecf8427e"},
      {"abc", "900150983cd24fb0d6963f7d28e17f72"},
      {allBytes, "87655cb9e87a968c3f7254e28db408de"},  // digests from an independent tool
  };
  Schema schema;
  const DateTime modified{2021, 3, 4, 5, 6, 7};
  for (const auto& [content, md5] : samples) {
    for (size_t maxRead : {SIZE_MAX, size_t{4093}}) {  // short reads must be continued
      MemoryFile file("x", content, modified);
      file.SetMaxRead(maxRead);
      EXPECT_EQ(schema.ReadPropertyType1(file), "");
      EXPECT_EQ(schema.ReadPropertyType2(file), std::ssize(content));
      EXPECT_EQ(schema.ReadPropertyType3(file), md5) << maxRead;
      EXPECT_EQ(schema.ReadPropertyType4(file), modified);
    }
  }
  MemoryFile broken("broken", std::string(5000, 'x'));
  broken.FailReadsFrom(0, kDeviceIoError);
  EXPECT_EQ(FailureOf([&] { schema.ReadPropertyType1(broken); }), kDeviceIoError);
  EXPECT_EQ(FailureOf([&] { schema.ReadPropertyType3(broken); }), kDeviceIoError);
}

}  // namespace
}  // namespace trl
