#include "picturezor/picture.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <memory>

#include "invoke.h"

// The object itself: constructors, properties, rows, views.

namespace picturezor {

using namespace model;

namespace {

constexpr const char* ClassName = "PictureZOR";

Object NewPictureObject() { return Object::Adopt(NewObject(ClassNamed(ClassName))); }

/// The bytes of a block that the module has just made, and that nobody else has.
Bytes BytesOf(const MemoryBlock& block) {
  auto* payload = HeldBy<BlockPayload>(block.Address());
  return payload ? std::move(payload->Own) : Bytes();
}

/// Takes the string over.
Bytes BytesOf(StringRecord* string) {
  if (!string) return {};
  Bytes bytes = string->References == 1 ? std::move(string->Bytes) : string->Bytes;
  UnlockString(string);
  return bytes;
}

/// A string for the length of a call.
class HostText {
 public:
  explicit HostText(std::span<const std::uint8_t> bytes)
      : Of(NewString(Bytes(bytes.begin(), bytes.end()), 0xFFFF)) {}
  HostText(const HostText&) = delete;
  ~HostText() { UnlockString(Of); }
  operator StringRecord*() const { return Of; }

 private:
  StringRecord* Of;
};

/// The module trusts its caller with the length.
void RequireBytes(std::span<const std::uint8_t> bytes, std::int64_t needed) {
  if (std::int64_t(bytes.size()) < needed)
    throw std::invalid_argument(std::to_string(needed) + " bytes needed, " + std::to_string(bytes.size()) +
                                " given");
}

std::int64_t PackedRow(const Picture& picture, Format format) {
  return std::int64_t{picture.Width()} * BytesPerPixel(format);
}

MemoryBlock Limited(MemoryBlock block, std::size_t size) {
  block.Limit(size);
  return block;
}

std::int32_t Code(Format format) { return std::int32_t(format); }

}

int BytesPerPixel(Format format) {
  constexpr std::uint8_t sizes[] = {0, 3, 4, 4, 4, 4, 3, 4, 4, 4, 4, 1, 2, 2, 0, 3, 3, 3, 4, 4, 4,
                                    4, 1, 4, 5, 5, 5, 5, 4, 5, 5, 5, 5, 1, 2, 3, 4, 5, 6, 7, 8};
  const auto code = std::uint32_t(format);
  return code < std::size(sizes) ? sizes[code] : 0;
}

Picture::Picture(std::int32_t width, std::int32_t height, Format format) : Object(NewPictureObject()) {
  Invoke<void>(*this, "Constructor", width, height, Code(format));
}

Picture::Picture(const MemoryBlock& block, std::int32_t width, std::int32_t height, Format format,
                 std::int32_t rowSize)
    : Object(NewPictureObject()) {
  // Rows are read whole, the last one too, and pixels may reach beyond a row that is too short for them.
  if (block && width > 0 && height > 0)
    RequireBytes(block.Data(),
                 std::int64_t{rowSize} * (height - 1) +
                     std::max(std::int64_t{rowSize}, std::int64_t{width} * BytesPerPixel(format)));
  Invoke<void>(*this, "Constructor", block, width, height, Code(format), rowSize);
}

Picture Picture::InBlock(std::int32_t width, std::int32_t height, Format format) {
  const std::int64_t bytes = CalculateMemory(width, height, format);
  MemoryBlock block;
  try {
    if (bytes > 0 && bytes <= std::numeric_limits<std::uint32_t>::max())
      block = MemoryBlock::OfPages(std::size_t(bytes));
  } catch (const std::bad_alloc&) {
    // The constructor refuses nil.
  }
  return Picture(block, width, height, format, block ? std::int32_t(bytes / height) : 0);
}

Picture Picture::ToBeFilled(std::int32_t width, std::int32_t height, Format format) {
  // Of so much the system hands out pages that it has cleared already.
  constexpr std::int64_t fresh = 32 << 20;
  const std::int64_t bytes = CalculateMemory(width, height, format);
  if (bytes <= 0 || bytes >= fresh) return Picture(width, height, format);
  const auto size = std::size_t(bytes), stride = size / std::size_t(height);
  std::shared_ptr<std::uint8_t[]> memory;
  try {
    memory = std::make_shared_for_overwrite<std::uint8_t[]>(size);
  } catch (const std::bad_alloc&) {
    return Picture(width, height, format);
  }
  const std::size_t used = std::size_t(width) * std::size_t(BytesPerPixel(format));
  for (std::size_t at = used; at < size && used < stride; at += stride)
    std::memset(&memory[at], 0, stride - used);
  return Picture(MemoryBlock::Over({memory.get(), size}, memory), width, height, format,
                 std::int32_t(stride));
}

Picture::Picture(const HostPicture& picture, bool useAlpha) : Object(NewPictureObject()) {
  Invoke<void>(*this, "Constructor", picture, useAlpha);
}

Picture Picture::Mapped(const std::filesystem::path& file, std::int32_t width, std::int32_t height,
                        Format format, std::int32_t blockSize) {
  Picture picture{NewPictureObject()};
  Invoke<void>(picture, "Constructor", width, height, Code(format), blockSize, FolderItem(file));
  return picture;
}

Picture Picture::Create(std::int32_t width, std::int32_t height, Format format) {
  return InvokeShared<Picture>(ClassName, "CreatePictureZOR", width, height, Code(format));
}
Picture Picture::CreatePicture(std::int32_t width, std::int32_t height, Format format) const {
  return Invoke<Picture>(*this, "CreatePictureZOR", width, height, Code(format));
}
std::int64_t Picture::CalculateMemory(std::int32_t width, std::int32_t height, Format format) {
  return InvokeShared<std::int64_t>(ClassName, "CalculateMemory", width, height, Code(format));
}
bool Picture::CanAllocate(std::int32_t width, std::int32_t height, Format format) {
  return InvokeShared<bool>(ClassName, "CanAllocateImage", width, height, Code(format));
}

void Picture::Close() const { Invoke<void>(*this, "Close"); }
Picture Picture::Clone() const { return Invoke<Picture>(*this, "Clone"); }

bool Picture::Valid() const { return *this && Get<bool>(*this, "Valid"); }
std::int32_t Picture::Width() const { return IntegerProperty("Width"); }
std::int32_t Picture::Height() const { return IntegerProperty("Height"); }
Format Picture::ImageFormat() const { return Format(IntegerProperty("ImageFormat")); }
std::string Picture::ImageFormatString() const {
  const Bytes text = BytesOf(Get<StringRecord*>(*this, "ImageFormatString"));
  return {text.begin(), text.end()};
}
std::int32_t Picture::PixelSize() const { return IntegerProperty("PixelSize"); }
std::int32_t Picture::RowSize() const { return IntegerProperty("RowSize"); }
std::int32_t Picture::RowOffset() const { return IntegerProperty("RowOffset"); }
std::int64_t Picture::TotalSize() const { return Get<std::int64_t>(*this, "TotalSize"); }
std::int32_t Picture::ChannelCount() const { return IntegerProperty("ChannelCount"); }
bool Picture::IsGray() const { return BooleanProperty("IsGray"); }
bool Picture::IsRGB() const { return BooleanProperty("IsRGB"); }
bool Picture::IsCMYK() const { return BooleanProperty("IsCMYK"); }
bool Picture::IsMapping() const { return BooleanProperty("IsMapping"); }
bool Picture::HasRed() const { return BooleanProperty("HasRed"); }
bool Picture::HasGreen() const { return BooleanProperty("HasGreen"); }
bool Picture::HasBlue() const { return BooleanProperty("HasBlue"); }
bool Picture::HasGray() const { return BooleanProperty("HasGray"); }
bool Picture::HasAlpha() const { return BooleanProperty("HasAlpha"); }
bool Picture::HasCyan() const { return BooleanProperty("HasCyan"); }
bool Picture::HasMagenta() const { return BooleanProperty("HasMagenta"); }
bool Picture::HasYellow() const { return BooleanProperty("HasYellow"); }
bool Picture::HasBlack() const { return BooleanProperty("HasBlack"); }
std::int32_t Picture::RedOffset() const { return IntegerProperty("RedOffset"); }
std::int32_t Picture::GreenOffset() const { return IntegerProperty("GreenOffset"); }
std::int32_t Picture::BlueOffset() const { return IntegerProperty("BlueOffset"); }
std::int32_t Picture::GrayOffset() const { return IntegerProperty("GrayOffset"); }
std::int32_t Picture::AlphaOffset() const { return IntegerProperty("AlphaOffset"); }
std::int32_t Picture::CyanOffset() const { return IntegerProperty("CyanOffset"); }
std::int32_t Picture::MagentaOffset() const { return IntegerProperty("MagentaOffset"); }
std::int32_t Picture::YellowOffset() const { return IntegerProperty("YellowOffset"); }
std::int32_t Picture::BlackOffset() const { return IntegerProperty("BlackOffset"); }
std::int32_t Picture::IntegerProperty(std::string_view name) const { return Get<std::int32_t>(*this, name); }
bool Picture::BooleanProperty(std::string_view name) const { return Get<bool>(*this, name); }
std::int32_t Picture::MappingBlockSize() const { return IntegerProperty("MappingBlockSize"); }
void Picture::SetMappingBlockSize(std::int32_t bytes) const { Set(*this, "MappingBlockSize", bytes); }
std::int32_t Picture::YieldTicks() const { return IntegerProperty("YieldTicks"); }
void Picture::SetYieldTicks(std::int32_t ticks) const { Set(*this, "YieldTicks", ticks); }
PictureFactory Picture::Factory() const { return Get<PictureFactory>(*this, "Factory"); }
void Picture::SetFactory(const PictureFactory& factory) const { Set(*this, "Factory", factory); }
Picture Picture::Parent() const { return Get<Picture>(*this, "Parent"); }
MemoryBlock Picture::MemoryTarget() const { return Get<MemoryBlock>(*this, "MemoryTarget"); }
HostPicture Picture::Target() const { return Get<HostPicture>(*this, "Target"); }
HostPicture Picture::DebugPicture() const { return Get<HostPicture>(*this, "DebugPicture"); }
bool Picture::DebugPictureEnabled() const { return BooleanProperty("DebugPictureEnabled"); }
void Picture::SetDebugPictureEnabled(bool enabled) const { Set(*this, "DebugPictureEnabled", enabled); }
MemoryBlock Picture::Memory() const { return Get<MemoryBlock>(*this, "Memory"); }

MemoryBlock Picture::RawRow(std::int32_t index) const {
  return Limited(Invoke<MemoryBlock>(*this, "RawRow", index), std::size_t(RowSize()));
}
Bytes Picture::Row(std::int32_t index) const { return BytesOf(Invoke<MemoryBlock>(*this, "Row", index)); }
void Picture::SetRow(std::int32_t index, std::span<const std::uint8_t> bytes) const {
  RequireBytes(bytes, RowSize());
  Assign(*this, "Row", MemoryBlock(bytes), index);
}
Bytes Picture::RowInFormat(std::int32_t index, Format format) const {
  return BytesOf(Invoke<MemoryBlock>(*this, "RowInFormat", index, Code(format)));
}
Bytes Picture::RowInFormat(std::int32_t index, Format format, bool invertAlpha) const {
  return BytesOf(Invoke<MemoryBlock>(*this, "RowInFormat", index, Code(format), invertAlpha));
}
void Picture::SetRowInFormat(std::int32_t index, Format format, std::span<const std::uint8_t> bytes) const {
  RequireBytes(bytes, PackedRow(*this, format));
  Assign(*this, "RowInFormat", MemoryBlock(bytes), index, Code(format));
}
void Picture::SetRowInFormat(std::int32_t index, Format format, bool invertAlpha,
                             std::span<const std::uint8_t> bytes) const {
  RequireBytes(bytes, PackedRow(*this, format));
  Assign(*this, "RowInFormat", MemoryBlock(bytes), index, Code(format), invertAlpha);
}
Bytes Picture::RowStringInFormat(std::int32_t index, Format format) const {
  return BytesOf(Invoke<StringRecord*>(*this, "RowStringInFormat", index, Code(format)));
}
void Picture::SetRowStringInFormat(std::int32_t index, Format format,
                                   std::span<const std::uint8_t> bytes) const {
  RequireBytes(bytes, PackedRow(*this, format));
  const HostText text(bytes);
  Assign<StringRecord*>(*this, "RowStringInFormat", text, index, Code(format));
}
Bytes Picture::DataStringInFormat(Format format) const {
  return BytesOf(Invoke<StringRecord*>(*this, "DataStringInFormat", Code(format)));
}
void Picture::SetDataStringInFormat(Format format, std::span<const std::uint8_t> bytes) const {
  RequireBytes(bytes, PackedRow(*this, format) * Height());
  const HostText text(bytes);
  Assign<StringRecord*>(*this, "DataStringInFormat", text, Code(format));
}

Picture Picture::AlphaChannel() const { return Invoke<Picture>(*this, "AlphaChannel"); }
Picture Picture::RedChannel() const { return Invoke<Picture>(*this, "RedChannel"); }
Picture Picture::GreenChannel() const { return Invoke<Picture>(*this, "GreenChannel"); }
Picture Picture::BlueChannel() const { return Invoke<Picture>(*this, "BlueChannel"); }
Picture Picture::GrayChannel() const { return Invoke<Picture>(*this, "GrayChannel"); }
Picture Picture::CyanChannel() const { return Invoke<Picture>(*this, "CyanChannel"); }
Picture Picture::MagentaChannel() const { return Invoke<Picture>(*this, "MagentaChannel"); }
Picture Picture::YellowChannel() const { return Invoke<Picture>(*this, "YellowChannel"); }
Picture Picture::BlackChannel() const { return Invoke<Picture>(*this, "BlackChannel"); }
Picture Picture::Channel(std::int32_t index) const { return Invoke<Picture>(*this, "Channel", index); }
Picture Picture::RGBChannels() const { return Invoke<Picture>(*this, "RGBChannels"); }
Picture Picture::CMYKChannels() const { return Invoke<Picture>(*this, "CMYKChannels"); }
Picture Picture::ClipImage() const { return Invoke<Picture>(*this, "ClipImage"); }
Picture Picture::ClipImage(const Rect& r) const {
  return Invoke<Picture>(*this, "ClipImage", r.X, r.Y, r.Width, r.Height);
}
Picture Picture::MirroredView() const { return Invoke<Picture>(*this, "MirroredView"); }

PictureFactory::PictureFactory(Handler handler) {
  auto payload = std::make_unique<FactoryPayload>();
  payload->NewPicture = [handler = std::move(handler)](std::int32_t width, std::int32_t height,
                                                       std::int32_t format) {
    const Picture picture = handler ? handler(width, height, Format(format)) : Picture();
    Lock(picture.Address());
    return picture.Address();
  };
  static_cast<Object&>(*this) = Adopt(NewObject(ClassNamed("PictureFactoryZOR"), std::move(payload)));
}

void PictureFactory::SetFactory(const PictureFactory& factory) {
  InvokeShared<void>("PictureFactoryZOR", "SetFactory", factory);
}

}
