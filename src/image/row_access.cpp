#include <cstring>
#include <limits>

#include "frame/host_services.h"
#include "image/conversion.h"
#include "image/formats.h"
#include "image/image.h"
#include "image/lifecycle.h"
#include "image/walk.h"

namespace zor {
namespace {

constexpr FamilyPair RowPairs[] = {
    Pair<Family::RGB, Family::RGB, Same<3>>,        Pair<Family::RGB, Family::Gray, Luma>,
    Pair<Family::Gray, Family::RGB, GrayToAll>,     Pair<Family::Gray, Family::Gray, Same<1>>,
    Pair<Family::Gray, Family::CMYK, GrayToPlates>, Pair<Family::CMYK, Family::Gray, BlackToGray>,
    Pair<Family::CMYK, Family::CMYK, Same<4>>,
};

bool CanBeRead(const PictureData& data) { return data.Valid && data.RowGetter; }

/// Whether the picture has the row; raises if it doesn't.
bool HasRow(const PictureData& data, Integer index) {
  if (index >= 0 && index < data.Height) return true;
  RaiseHostException("OutOfBoundsException", "Index is out of bounds.");
  return false;
}

template <class Value>
bool IsGiven(const Value* value) {
  if (value) return true;
  RaiseHostException("NilObjectException", "Memoryblock is nil");
  return false;
}

/// The loop from one layout to the other. Null where there is no way; raises between RGB and CMYK.
RowConversion ConversionFor(const PictureData& from, const PictureData& into, bool invertAlpha) {
  if (from.IsRGB && into.IsCMYK)
    RaiseHostException("OutOfBoundsException", "Conversion from RGB to CMYK is not supported.");
  if (from.IsCMYK && into.IsRGB)
    RaiseHostException("OutOfBoundsException", "Conversion from CMYK to RGB is not supported.");
  return Find(RowPairs, from, into, invertAlpha);
}

/// A number of rows as packed pixels of a format, in the caller's memory: what a conversion reads or writes
/// on the other side.
struct PackedRows {
  PictureData Layout{};
  std::int64_t RowBytes = 0, Bytes = 0;

  PackedRows(const PictureData& picture, std::int32_t rows, Integer format) {
    if (!InitImageLayout(&Layout, picture.Width, rows, std::uint32_t(format))) return;
    RowBytes = PackedRowBytes(Layout);
    if (RowBytes <= std::numeric_limits<std::int32_t>::max()) Bytes = RowBytes * rows;
  }
  /// False for a format without a layout, and for more bytes than the host can count.
  explicit operator bool() const { return Bytes > 0 && Bytes <= std::numeric_limits<std::int32_t>::max(); }
};

bool ReadRows(PictureData& picture, std::int32_t first, const PackedRows& packed,
              const RowConversion& convert, Sample* into) {
  return Walk(From(picture, first)).Rows(packed.Layout.Height, [&](std::int32_t y, Sample* row) {
    convert.IntoNew(row, into + y * packed.RowBytes, picture.Width);
  });
}

void WriteRows(PictureData& picture, std::int32_t first, const PackedRows& packed, bool invertAlpha,
               const Sample* from) {
  RowConversion convert;
  Walk(Into(picture, first)).Rows(packed.Layout.Height, [&](std::int32_t y, Sample* row) {
    // After the first row has been reached: a picture without rows raises nothing.
    if (y == 0) convert = ConversionFor(packed.Layout, picture, invertAlpha);
    if (convert) convert(from + y * packed.RowBytes, row, picture.Width);
  });
}

MemoryBlock* BlockOfRow(PictureData& data, Integer index, Integer format, bool invertAlpha) {
  if (!CanBeRead(data) || !HasRow(data, index)) return nullptr;
  if (!WithRow(data, index, [](Sample*) {})) return nullptr;
  const PackedRows packed(data, 1, format);
  const RowConversion convert = packed ? ConversionFor(data, packed.Layout, invertAlpha) : RowConversion();
  if (!convert) return nullptr;
  MemoryBlock* block = newMemoryBlock(std::int32_t(packed.Bytes));
  void* bytes = block ? memoryBlockGetPtr(block) : nullptr;
  if (bytes && ReadRows(data, index, packed, convert, static_cast<Sample*>(bytes))) return block;
  Unlock(block);
  return nullptr;
}

HostString* StringOfRows(PictureData& data, std::int32_t first, const PackedRows& packed) {
  const RowConversion convert = packed ? ConversionFor(data, packed.Layout, false) : RowConversion();
  if (!convert) return nullptr;
  const Buffer bytes = NewBuffer(std::size_t(packed.Bytes));
  if (!bytes || !ReadRows(data, first, packed, convert, bytes.get())) return nullptr;
  return BuildHostString(bytes.get(), std::int32_t(packed.Bytes), EncodingBytes);
}

/// What all assignments with a format share, once the address of the value's bytes is known.
void SetOneRow(PictureData& data, Integer index, Integer format, bool invertAlpha, const Sample* bytes) {
  if (!bytes) return;
  if (const PackedRows packed(data, 1, format); packed) WriteRows(data, index, packed, invertAlpha, bytes);
}

void SetBlockOfRow(PictureData& data, Integer index, Integer format, bool invertAlpha, MemoryBlock* value) {
  if (!IsGiven(value) || !CanBeRead(data) || !HasRow(data, index)) return;
  SetOneRow(data, index, format, invertAlpha, static_cast<const Sample*>(memoryBlockGetPtr(value)));
}

}

MemoryBlock* RawRow(PictureZOR* self, Integer index) {
  PictureData& data = DataOf(self);
  MemoryBlock* block = nullptr;
  if (CanBeRead(data) && HasRow(data, index))
    WithRow(data, index, [&](Sample* row) { block = PtrToMemoryBlock(row); });
  return block;
}

MemoryBlock* Row(PictureZOR* self, Integer index) {
  PictureData& data = DataOf(self);
  MemoryBlock* block = nullptr;
  if (CanBeRead(data) && HasRow(data, index))
    WithRow(data, index, [&](Sample* row) { block = MemoryBlockFromBytes(row, data.RowSize); });
  return block;
}

void SetRow(PictureZOR* self, Integer index, MemoryBlock* value) {
  PictureData& data = DataOf(self);
  if (!HasRow(data, index) || !IsGiven(value) || !data.RowGetter) return;
  if (const void* bytes = memoryBlockGetPtr(value))
    WithRow(data, index, [&](Sample* row) { std::memmove(row, bytes, std::size_t(data.RowSize)); });
}

MemoryBlock* RowInFormat(PictureZOR* self, Integer index, Integer format) {
  return BlockOfRow(DataOf(self), index, format, false);
}

MemoryBlock* RowInFormat(PictureZOR* self, Integer index, Integer format, Boolean invertAlpha) {
  return BlockOfRow(DataOf(self), index, format, invertAlpha != 0);
}

void SetRowInFormat(PictureZOR* self, Integer index, Integer format, MemoryBlock* value) {
  SetBlockOfRow(DataOf(self), index, format, false, value);
}

void SetRowInFormat(PictureZOR* self, Integer index, Integer format, Boolean invertAlpha,
                    MemoryBlock* value) {
  SetBlockOfRow(DataOf(self), index, format, invertAlpha != 0, value);
}

HostString* RowStringInFormat(PictureZOR* self, Integer index, Integer format) {
  PictureData& data = DataOf(self);
  if (!CanBeRead(data) || !HasRow(data, index)) return nullptr;
  if (!WithRow(data, index, [](Sample*) {})) return nullptr;
  return StringOfRows(data, index, PackedRows(data, 1, format));
}

void SetRowStringInFormat(PictureZOR* self, Integer index, Integer format, HostString* value) {
  PictureData& data = DataOf(self);
  if (!IsGiven(value) || !CanBeRead(data) || !HasRow(data, index)) return;
  SetOneRow(data, index, format, false, BytesOf(value));
}

HostString* DataStringInFormat(PictureZOR* self, Integer format) {
  PictureData& data = DataOf(self);
  return CanBeRead(data) ? StringOfRows(data, 0, PackedRows(data, data.Height, format)) : nullptr;
}

void SetDataStringInFormat(PictureZOR* self, Integer format, HostString* value) {
  PictureData& data = DataOf(self);
  if (!IsGiven(value) || !CanBeRead(data)) return;
  const PackedRows packed(data, data.Height, format);
  if (const Sample* bytes = BytesOf(value); bytes && packed) WriteRows(data, 0, packed, false, bytes);
}

}
