#include "frame/host_values.h"

#include <cstdlib>
#include <cstring>

#include "frame/host_services.h"

namespace zor {
namespace {

HostString* UTF8FromUTF16(const void* units, std::int32_t length) {
  HostString* string = REALBuildString(units, length);
  if (!string) return nullptr;
  REALSetStringEncoding(string, EncodingUTF16);
  HostString* converted = REALConvertString(string, EncodingUTF8);
  REALUnlockString(string);
  return converted;
}

HostString* UTF8FromUTF32(const void* bytes, std::int32_t length) {
  constexpr std::int32_t UnitsOnStack = 199;
  const std::int32_t count = length / 4;
  std::uint16_t onStack[UnitsOnStack + 1] = {};
  std::uint16_t* units = onStack;
  if (count > UnitsOnStack) units = static_cast<std::uint16_t*>(std::calloc(std::size_t(count) + 2, 2));
  if (!units) return nullptr;
  for (std::int32_t i = 0; i < count; ++i) {
    std::uint32_t unit;
    std::memcpy(&unit, static_cast<const char*>(bytes) + std::ptrdiff_t{i} * 4, 4);
    units[i] = std::uint16_t(unit);
  }
  HostString* string = UTF8FromUTF16(units, count * 2);
  if (units != onStack) std::free(units);
  return string;
}

// A reference to a file, as REALFSRefFromFolderItem fills it: a NUL-terminated UTF-8 path.
constexpr std::size_t ReferenceSize = 4096;

/// The name of an item as the host hands it over.
struct ItemName {
  std::uint16_t Length;
  std::uint16_t Units[255];
};

/// Writes the name's UTF-16 as UTF-8, with its end; a lone surrogate becomes U+FFFD.
/// `into` has room for 3 bytes a unit and 1.
void WriteUTF8(const ItemName& name, char* into) {
  const std::uint32_t length = name.Length < 255 ? name.Length : 255;
  for (std::uint32_t i = 0; i < length; ++i) {
    std::uint32_t code = name.Units[i];
    const bool high = code >= 0xD800 && code < 0xDC00, low = code >= 0xDC00 && code < 0xE000;
    if (high && i + 1 < length && name.Units[i + 1] >= 0xDC00 && name.Units[i + 1] < 0xE000)
      code = 0x10000 + ((code - 0xD800) << 10) + (name.Units[++i] - 0xDC00u);
    else if (high || low)
      code = 0xFFFD;
    const int more = code < 0x80 ? 0 : code < 0x800 ? 1 : code < 0x10000 ? 2 : 3;
    constexpr unsigned Lead[] = {0, 0xC0, 0xE0, 0xF0};
    *into++ = char(Lead[more] | code >> (6 * more));
    for (int part = more - 1; part >= 0; --part) *into++ = char(0x80 | ((code >> (6 * part)) & 0x3F));
  }
  *into = 0;
}

}

void RaiseHostException(const char* className, const char* message) {
  void* exception = PluginNewInstance(className);
  if (!exception) exception = PluginNewInstance("NilObjectException");
  if (!exception) return;
  HostString* text =
      message ? BuildHostString(message, std::int32_t(std::strlen(message)), EncodingASCII) : nullptr;
  RuntimeRaiseException(exception);
  REALSetPropValueString(exception, "Message", text);
  if (text) REALUnlockString(text);
}

HostString* BuildHostString(const void* bytes, std::int32_t length, std::uint32_t encoding) {
  if (!bytes || length == 0) return nullptr;
  if (encoding == EncodingUTF16) return UTF8FromUTF16(bytes, length);
  if (encoding == EncodingUTF32) return UTF8FromUTF32(bytes, length);
  HostString* string = REALBuildString(bytes, length);
  if (string) REALSetStringEncoding(string, encoding);
  return string;
}

const unsigned char* BytesOf(const HostString* string) {
  Word words[2];
  std::memcpy(words, string, sizeof words);
  return words[1] ? reinterpret_cast<const unsigned char*>(words[1] + 1) : nullptr;
}

MemoryBlock* MemoryBlockFromBytes(const void* bytes, std::int32_t size) {
  if (!bytes || size < 1) return nullptr;
  MemoryBlock* block = newMemoryBlock(size);
  if (!block) return nullptr;
  void* data = memoryBlockGetPtr(block);
  if (!data) {
    REALUnlockObject(block);
    return nullptr;
  }
  std::memcpy(data, bytes, std::size_t(size));
  return block;
}

char* FolderItemToPath(FolderItem* item) {
  if (!item) return nullptr;
  char reference[ReferenceSize] = {};
  char name[3 * 255 + 1] = {};
  if (!REALFSRefFromFolderItem(item, reference, nullptr)) {
    ItemName units{};
    if (!REALFSRefFromFolderItem(item, reference, &units) || units.Length == 0) return nullptr;
    WriteUTF8(units, name);
  }
  reference[ReferenceSize - 1] = 0;
  const std::size_t folder = std::strlen(reference), file = std::strlen(name);
  if (folder == 0) return nullptr;
  auto* path = static_cast<char*>(std::calloc(1, folder + file + 2));
  if (!path) return nullptr;
  std::memcpy(path, reference, folder);
  if (file == 0) return path;
  std::size_t end = folder;
  if (path[end - 1] != '/') path[end++] = '/';
  std::memcpy(path + end, name, file);
  return path;
}

}
