#include "host_strings.h"

#include <cstring>
#include <utility>

#include "object_model.h"

namespace picturezor::model {
namespace {

bool IsHigh(std::uint32_t unit) { return unit >= 0xD800 && unit < 0xDC00; }
bool IsLow(std::uint32_t unit) { return unit >= 0xDC00 && unit < 0xE000; }

void AppendUTF8(Bytes& text, std::uint32_t code) {
  if (code < 0x80) {
    text.push_back(std::uint8_t(code));
    return;
  }
  const int more = code < 0x800 ? 1 : code < 0x10000 ? 2 : 3;
  constexpr unsigned Lead[] = {0, 0xC0, 0xE0, 0xF0};
  text.push_back(std::uint8_t(Lead[more] | code >> (6 * more)));
  for (int part = more - 1; part >= 0; --part)
    text.push_back(std::uint8_t(0x80 | ((code >> (6 * part)) & 0x3F)));
}

Bytes UTF8FromUTF16(const Bytes& bytes) {
  Bytes text;
  const auto unit = [&](std::size_t i) {
    std::uint16_t value;
    std::memcpy(&value, bytes.data() + 2 * i, 2);
    return std::uint32_t{value};
  };
  const std::size_t count = bytes.size() / 2;
  for (std::size_t i = 0; i < count; ++i) {
    std::uint32_t code = unit(i);
    if (IsHigh(code) && i + 1 < count && IsLow(unit(i + 1)))
      code = 0x10000 + ((code - 0xD800) << 10) + (unit(++i) - 0xDC00);
    else if (IsHigh(code) || IsLow(code))
      code = 0xFFFD;
    AppendUTF8(text, code);
  }
  return text;
}

}

StringRecord* NewString(Bytes bytes, std::uint32_t encoding) {
  ++TheRuntime().Alive.Strings;
  auto* string = new StringRecord{1, 0, encoding, std::move(bytes)};
  if (!string->Bytes.empty())
    string->BeforeBytes = reinterpret_cast<std::uintptr_t>(string->Bytes.data()) - 1;
  return string;
}

void UnlockString(StringRecord* string) {
  if (!string || --string->References > 0) return;
  delete string;
  --TheRuntime().Alive.Strings;
}

std::string TextOf(const StringRecord& string) { return {string.Bytes.begin(), string.Bytes.end()}; }

StringRecord* Converted(const StringRecord& string, std::uint32_t encoding) {
  const bool transcodes = string.Encoding == UTF16 && encoding == UTF8;
  return NewString(transcodes ? UTF8FromUTF16(string.Bytes) : string.Bytes, encoding);
}

bool ToUTF16(const std::string& text, std::u16string& units) {
  units.clear();
  for (std::size_t i = 0; i < text.size();) {
    const auto first = static_cast<unsigned char>(text[i++]);
    const int more = first < 0x80 ? 0 : first >= 0xF0 ? 3 : first >= 0xE0 ? 2 : first >= 0xC0 ? 1 : -1;
    if (more < 0 || first >= 0xF8 || i + std::size_t(more) > text.size()) return false;
    std::uint32_t code = more == 0 ? first : first & (0x3Fu >> more);
    for (int part = 0; part < more; ++part) {
      const auto next = static_cast<unsigned char>(text[i++]);
      if ((next & 0xC0) != 0x80) return false;
      code = code << 6 | (next & 0x3F);
    }
    constexpr std::uint32_t Least[] = {0, 0x80, 0x800, 0x10000};
    if (code < Least[more] || code > 0x10FFFF || IsHigh(code) || IsLow(code)) return false;
    if (code >= 0x10000) {
      units += char16_t(0xD800 + ((code - 0x10000) >> 10));
      code = 0xDC00 + ((code - 0x10000) & 0x3FF);
    }
    units += char16_t(code);
  }
  return true;
}

}
