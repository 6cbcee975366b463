#pragma once
#include <cstdint>
#include <string>

#include "picturezor/object.h"

namespace picturezor::model {

inline constexpr std::uint32_t UTF16 = 0x0100, UTF8 = 0x08000100;

/// A string as the module sees it: the second word plus 1 is the address of the first byte.
struct StringRecord {
  std::uintptr_t References;
  std::uintptr_t BeforeBytes;
  std::uint32_t Encoding;
  picturezor::Bytes Bytes;
};

/// A new string with one reference. An empty one has no bytes to point at.
StringRecord* NewString(Bytes bytes, std::uint32_t encoding);
void UnlockString(StringRecord* string);
std::string TextOf(const StringRecord& string);
/// A new string with the text in another encoding; only UTF-16 to UTF-8 changes the bytes, a lone surrogate
/// becoming U+FFFD.
StringRecord* Converted(const StringRecord& string, std::uint32_t encoding);

/// UTF-16 units in the machine's byte order; false for bytes that aren't UTF-8.
bool ToUTF16(const std::string& text, std::u16string& units);

}
