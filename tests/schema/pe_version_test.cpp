#include "schema/pe_version.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <string>

#include "support/memory_file.h"

namespace trl {
namespace {

using testing::MemoryFile;

std::string Fixture(const std::string& name) {
  std::ifstream in(std::string(TRL_TEST_DATA) + "/" + name, std::ios::binary);
  EXPECT_TRUE(in) << name;
  return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

// Short reads (at most `maxRead` bytes) must be continued.
std::string VersionOf(std::string content, size_t maxRead = SIZE_MAX) {
  MemoryFile file("x", std::move(content));
  file.SetMaxRead(maxRead);
  return ReadPeFileVersion(*file.Open());
}

uint32_t Get32(const std::string& bytes, size_t at) {
  uint32_t value = 0;
  for (size_t i = 4; i-- > 0;) value = value << 8 | static_cast<unsigned char>(bytes[at + i]);
  return value;
}

void Put(std::string& bytes, size_t at, uint32_t value, size_t width) {
  for (size_t i = 0; i < width; ++i) bytes[at + i] = static_cast<char>(value >> (8 * i));
}

TEST(PeVersionTest, ReadsTheFileVersionOrNothing) {
  const std::pair<const char*, const char*> cases[] = {{"versioned64.exe", "1.2.3.4"},
                                                       {"versioned32.exe", "65535.0.258.40000"},
                                                       {"unversioned64.exe", "none"},
                                                       {"versioned.rc", "none"}};
  for (auto [name, expected] : cases) {
    for (size_t maxRead : {SIZE_MAX, size_t{7}}) {
      std::string version = VersionOf(Fixture(name), maxRead);
      EXPECT_EQ(version.empty() ? "none" : version, expected) << name << " " << maxRead;
    }
  }
}

TEST(PeVersionTest, EveryTruncationGivesNothingUntilTheVersionIsWhole) {
  const std::string whole = Fixture("versioned64.exe");
  bool found = false;
  for (size_t length = 0; length <= whole.size(); ++length) {
    std::string version = VersionOf(whole.substr(0, length));
    ASSERT_TRUE(version.empty() ? !found : version == "1.2.3.4") << length;
    found = !version.empty();
  }
  EXPECT_TRUE(found);
}

// Damage at a place the test locates in the fixture itself, so that the cases stay right when the
// fixture is rebuilt.
TEST(PeVersionTest, DamagedStructures) {
  const std::string whole = Fixture("versioned64.exe");
  const size_t peHeader = Get32(whole, 0x3C);
  const size_t rsrcHeader = whole.find(std::string(".rsrc\0\0\0", 8));
  ASSERT_NE(rsrcHeader, std::string::npos);
  const size_t resourceRoot = Get32(whole, rsrcHeader + 20);
  const std::u16string key = u"VS_VERSION_INFO";
  const size_t versionBlock =
      whole.find(std::string(reinterpret_cast<const char*>(key.data()), key.size() * 2)) - 6;

  struct Case {
    const char* what;
    size_t at;
    uint32_t value;
    size_t width;
    std::string expected;
  };
  const Case cases[] = {
      {"e_lfanew beyond the file", 0x3C, 0xFFFFFFF0, 4, ""},
      {"no PE signature", peHeader, 0x00004551, 4, ""},
      {"no sections", peHeader + 6, 0, 2, ""},
      {"unknown optional header magic", peHeader + 24, 0x10C, 2, ""},
      {"no resource data directory", peHeader + 24 + 108, 2, 4, ""},
      {"resource RVA in no section", peHeader + 24 + 128, 0x7FFFFF00, 4, ""},
      {"huge entry counts", resourceRoot + 12, 0xFFFFFFFF, 4, ""},
      {"no version type", resourceRoot + 16, 15, 4, ""},
      {"named type with the version's bits", resourceRoot + 16, 0x80000010, 4, ""},
      {"type points back at the root", resourceRoot + 20, 0x80000000, 4, ""},
      {"type points outside", resourceRoot + 20, 0xFFFFFFF0, 4, ""},
      {"type entry is data", resourceRoot + 20, 0x18, 4, ""},
      {"block shorter than its header", versionBlock, 20, 2, ""},
      {"no fixed information", versionBlock + 2, 0, 2, ""},
      {"wrong key", versionBlock + 6, 'W', 2, ""},
      {"wrong signature", versionBlock + 40, 0xFEEF04BC, 4, ""},
      {"other major and minor", versionBlock + 48, 0x00090008, 4, "9.8.3.4"},
      {"other build and revision", versionBlock + 52, 0xFFFF0001, 4, "1.2.65535.1"},
  };
  for (const Case& c : cases) {
    std::string damaged = whole;
    Put(damaged, c.at, c.value, c.width);
    EXPECT_EQ(VersionOf(damaged), c.expected) << c.what;
  }
}

TEST(PeVersionTest, AnyDamagedByteIsSurvived) {
  const std::string whole = Fixture("versioned64.exe");
  for (size_t at = 0; at < whole.size(); ++at) {
    for (char value : {'\x00', '\x80', '\xFF'}) {
      std::string damaged = whole;
      damaged[at] = value;
      ASSERT_NO_THROW(VersionOf(damaged)) << at;
    }
  }
}

}  // namespace
}  // namespace trl
