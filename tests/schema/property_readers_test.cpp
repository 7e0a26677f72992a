#include <gtest/gtest.h>
#include <utime.h>

#include <algorithm>
#include <string>

#include "platform/failure.h"
#include "platform/fs/posix/posix_file_system.h"
#include "schema/schema.h"
#include "support/memory_file.h"
#include "support/temp_tree.h"

namespace trl {
namespace {

using testing::MemoryFile;

// 12289 rounds of the bytes 0..255: more than three read chunks and not a multiple of one.
std::string AllBytesRepeated() {
  std::string content;
  for (int i = 0; i < 12289 * 256; ++i) content.push_back(static_cast<char>(i));
  return content;
}

struct Sample {
  const char* name;
  std::string content;
  const char* md5;  // from an independent tool
};

const std::vector<Sample>& Samples() {
  static const std::vector<Sample> samples = {
      {"empty", "", "d41d8cd98f00b204e9800998ecf8427e"},
      {"abc", "abc", "900150983cd24fb0d6963f7d28e17f72"},
      {"million", std::string(1000000, 'a'), "7707d6ae4e027c70eea2a935c2296f21"},
      {"all_bytes", AllBytesRepeated(), "87655cb9e87a968c3f7254e28db408de"},
  };
  return samples;
}

TEST(PropertyReadersTest, ReadFromMemory) {
  Schema schema;
  const DateTime modified{2021, 3, 4, 5, 6, 7};
  for (const Sample& sample : Samples()) {
    for (size_t maxRead : {SIZE_MAX, size_t{4093}}) {  // short reads must be continued
      MemoryFile file(sample.name, sample.content, modified);
      file.SetMaxRead(maxRead);
      EXPECT_EQ(schema.ReadPropertyType1(file), "") << sample.name;
      EXPECT_EQ(schema.ReadPropertyType2(file), std::ssize(sample.content)) << sample.name;
      EXPECT_EQ(schema.ReadPropertyType3(file), sample.md5) << sample.name << " " << maxRead;
      EXPECT_EQ(schema.ReadPropertyType4(file), modified) << sample.name;
    }
  }
}

TEST(PropertyReadersTest, ReadFailuresPassThrough) {
  Schema schema;
  MemoryFile file("broken", std::string(5000, 'x'));
  file.FailReadsFrom(0, kDeviceIoError);
  for (auto read : {+[](Schema&s, MemoryFile&f) { s.ReadPropertyType1(f); },
                    +[](Schema&s, MemoryFile&f) { s.ReadPropertyType3(f); }}) {
    try {
      read(schema, file);
      ADD_FAILURE() << "no failure";
    } catch (const Failure& failure) {
      EXPECT_EQ(failure.number, kDeviceIoError);
    }
  }
}

TEST(PropertyReadersTest, ReadFromRealFiles) {
  testing::TempTree tree;
  auto files = fs::CreatePosixFileSystem({});
  Schema schema;
  const std::time_t stamp = 1600000000;
  const utimbuf times{stamp, stamp};
  for (const Sample& sample : Samples()) {
    tree.AddFile(sample.name, sample.content);
    ASSERT_EQ(utime(tree.Native(sample.name).c_str(), &times), 0);
    auto file = files->GetFile(tree.Path(sample.name));
    EXPECT_EQ(schema.ReadPropertyType1(*file), "") << sample.name;
    EXPECT_EQ(schema.ReadPropertyType2(*file), std::ssize(sample.content)) << sample.name;
    EXPECT_EQ(schema.ReadPropertyType3(*file), sample.md5) << sample.name;
    EXPECT_EQ(schema.ReadPropertyType4(*file), FromTimeT(stamp)) << sample.name;
  }
  std::string fixture = TRL_TEST_DATA "/versioned64.exe";
  std::replace(fixture.begin(), fixture.end(), '/', '\\');
  EXPECT_EQ(schema.ReadPropertyType1(*files->GetFile(fixture)), "1.2.3.4");
}

}  // namespace
}  // namespace trl
