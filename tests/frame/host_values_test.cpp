#include "frame/host_values.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>

#include "frame/host_services.h"
#include "host_strings.h"
#include "object_model.h"
#include "support/every_store.h"

namespace picturezor {
namespace {

class HostValues : public testing::Test {
 protected:
  void SetUp() override {
    zor::SetResolver([](const char* name) { return model::ServiceNamed(name); });
  }
};

/// What a program of the host gets to see; "nil" for no string.
std::string Built(const void* bytes, std::int32_t length, std::uint32_t encoding, std::uint32_t& tagged) {
  auto* string = reinterpret_cast<model::StringRecord*>(zor::BuildHostString(bytes, length, encoding));
  if (!string) return "nil";
  tagged = string->Encoding;
  const std::string text = model::TextOf(*string);
  model::UnlockString(string);
  return text;
}

TEST_F(HostValues, StringsOfWideUnitsBecomeUTF8) {
  constexpr std::uint32_t ASCII = 1536, UTF32 = 0x0C000100, Raw = 0xFFFF;
  const char16_t units[] = u"a\u00E9\U0001F600";
  const char32_t wide[] = U"a\u00E9\U0001F600";
  struct {
    const void* Bytes;
    std::int32_t Length;
    std::uint32_t Encoding;
    std::string Text;
    std::uint32_t Tagged;
  } cases[] = {
      {"RGB", 3, ASCII, "RGB", ASCII},
      {"\xFF\x00\x01", 3, Raw, std::string("\xFF\x00\x01", 3), Raw},
      {units, 8, model::UTF16, "a\xC3\xA9\xF0\x9F\x98\x80", model::UTF8},
      {wide, 8, UTF32, "a\xC3\xA9", model::UTF8},
      {wide, 12, UTF32, "a\xC3\xA9\xEF\x98\x80", model::UTF8},  // only the low 16 bits of a unit count
      {wide, 3, UTF32, "", model::UTF8},                        // no whole unit
      {"RGB", 0, ASCII, "nil", 0},
      {nullptr, 3, ASCII, "nil", 0},
  };
  for (const auto& [bytes, length, encoding, text, tagged] : cases) {
    std::uint32_t seen = 0;
    EXPECT_EQ(Built(bytes, length, encoding, seen), text);
    EXPECT_EQ(seen, tagged);
  }
  // Short texts are narrowed in place, long ones in memory of their own.
  for (const std::size_t count : {198u, 199u, 200u, 201u, 5000u}) {
    std::u32string text;
    std::string narrow;
    for (std::size_t i = 0; i < count; ++i) {
      text += char32_t('a' + i % 26);
      narrow += char('a' + i % 26);
    }
    std::uint32_t seen = 0;
    EXPECT_EQ(Built(text.data(), std::int32_t(count) * 4, UTF32, seen), narrow);
  }
  for (int successes = 0; successes < 2; ++successes) {
    std::uint32_t seen = 0;
    Host::FailCreationsAfter(successes);
    EXPECT_EQ(Built(units, 8, model::UTF16, seen), "nil");
    Host::FailCreationsAfter(-1);
  }
}

TEST_F(HostValues, BlocksHoldCopies) {
  const std::uint8_t bytes[] = {1, 2, 3};
  for (const int size : {1, 3}) {
    const MemoryBlock block{Object::Adopt(zor::MemoryBlockFromBytes(bytes, size))};
    EXPECT_EQ(Samples(block.Data().begin(), block.Data().end()), Samples(bytes, bytes + size));
  }
  EXPECT_EQ(zor::MemoryBlockFromBytes(nullptr, 3), nullptr);
  EXPECT_EQ(zor::MemoryBlockFromBytes(bytes, 0), nullptr);
  EXPECT_EQ(zor::MemoryBlockFromBytes(bytes, -1), nullptr);
}

std::string PathOf(const FolderItem& item) {
  char* path = zor::FolderItemToPath(static_cast<zor::FolderItem*>(item.Address()));
  const std::string text = path ? path : "nil";
  std::free(path);
  return text;
}

// Catches a name that is changed on its way, so that the file would be another one.
TEST_F(HostValues, PathsAreThoseOfTheItem) {
  const TemporaryFile folder;
  std::filesystem::create_directory(folder.Path());
  const std::string at = folder.Path().string() + "/";
  // Composed and decomposed forms of one letter are two names; a name may have 255 units.
  for (const std::string& name :
       {std::string("plain name"), std::string("\xC3\xA9"), std::string("e\xCC\x81"),
        std::string("\xF0\x9F\x98\x80.raw"), std::string(255, 'n')}) {
    EXPECT_EQ(PathOf(FolderItem(at + name)), at + name) << "of one that isn't there";
    std::ofstream(at + name) << "there";
    EXPECT_EQ(PathOf(FolderItem(at + name)), at + name);
    std::filesystem::remove(at + name);
  }
  EXPECT_EQ(PathOf(FolderItem("/no item of the root")), "/no item of the root");
  EXPECT_EQ(PathOf(FolderItem(at + "no folder/file")), "nil");
  EXPECT_EQ(PathOf(FolderItem(at + std::string(256, 'n'))), "nil");
  EXPECT_EQ(PathOf(FolderItem()), "nil");
}

}
}
