#include "rows.h"

#include <algorithm>
#include <cstring>
#include <mutex>

#include "failure.h"

namespace picturezor::flow {

namespace {

class RowsOfFile final : public Rows {
 public:
  RowsOfFile(std::unique_ptr<files::ImageReader> reader, const Shape& shape, const Rect& part)
      : Rows(shape), Reader(std::move(reader)) {
    const files::ImageInfo& info = Reader->Info();
    const bool toTheEnd = part.Width == info.Width && part.Y + part.Height == info.Height;
    Left = part.Height;
    if (toTheEnd && (part.Y == 0 || !Reader->StartsAnywhere())) {
      // Its end is looked at, too.
      Finishes = true;
      Bytes dropped(RowBytes());
      for (std::int32_t y = 0; y < part.Y; ++y) Reader->ReadRow(dropped.data());
    } else {
      Reader = files::PartOf(std::move(Reader), part);
    }
  }

  RowBlock Next(std::uint8_t* room, std::ptrdiff_t stride, std::int32_t most) override {
    Reader->ReadRows(room, stride, most);
    if (Reader->Info().Orientation == 2)
      for (std::int32_t y = 0; y < most; ++y) Mirror(room + y * stride);
    Left -= most;
    if (Left == 0 && Finishes) Reader->Finish();
    return {room, stride, most};
  }

 private:
  void Mirror(std::uint8_t* row) const {
    const int channels = files::ChannelsOf(About().Of);
    for (std::uint8_t *left = row, *right = row + RowBytes() - channels; left < right;
         left += channels, right -= channels)
      std::swap_ranges(left, left + channels, right);
  }

  std::unique_ptr<files::ImageReader> Reader;
  std::int32_t Left;
  bool Finishes = false;
};

class RowsOfPicture final : public Rows {
 public:
  RowsOfPicture(const Picture& picture, const Shape& shape, std::int64_t first)
      : Rows(shape), Of(picture), Done(std::int32_t(first)) {
    Packed = !picture.Parent() && picture.ImageFormat() == shape.Of;
    // A window shows a few rows only.
    if (Packed && !picture.IsMapping()) Samples = RowOf(picture, 0);
  }

  RowBlock Next(std::uint8_t* room, std::ptrdiff_t stride, std::int32_t most) override {
    if (Samples) {
      const RowBlock block{Samples + std::ptrdiff_t{Of.RowSize()} * Done, Of.RowSize(), most};
      Done += most;
      return block;
    }
    if (Packed) return {RowOf(Of, Done++), 0, 1};
    const Bytes row = Of.RowInFormat(Done++, About().Of);
    if (row.empty()) throw files::Failure("a row of a picture can't be converted");
    std::memcpy(room, row.data(), row.size());
    return {room, stride, 1};
  }

 private:
  Picture Of;
  std::int32_t Done;
  bool Packed;
  const std::uint8_t* Samples = nullptr;
};

Shape StoredShapeOf(const OpenFile& file) {
  const files::ImageInfo& info = file.Reader->Info();
  const Rect part = file.Part.value_or(Rect{0, 0, info.Width, info.Height});
  return {part.Width, part.Height, info.Pixels, info.Density};
}

}

std::size_t Rows::RowBytes() const { return std::size_t(Of.Width) * std::size_t(BytesPerPixel(Of.Of)); }

void ReadRows(Rows& rows, std::uint8_t* room, std::ptrdiff_t stride, std::int32_t count) {
  while (count > 0) {
    const RowBlock block = rows.Next(room, stride, count);
    for (std::int32_t y = 0; block.First != room && y < block.Count; ++y)
      std::memcpy(room + y * stride, block.First + y * block.Stride, rows.RowBytes());
    room += block.Count * stride;
    count -= block.Count;
  }
}

Shape ShapeOf(const OpenFile& file) {
  files::ImageInfo info = file.Reader->Info();
  const Shape stored = StoredShapeOf(file);
  info.Width = stored.Width;
  info.Height = stored.Height;
  info = files::Upright(info);
  return {info.Width, info.Height, info.Pixels, info.Density};
}

RowSource RowsOf(OpenFile file) {
  struct Opened {
    std::mutex Access;
    OpenFile File;
  };
  const Shape shape = StoredShapeOf(file);
  const files::ImageInfo& info = file.Reader->Info();
  const Rect part = file.Part.value_or(Rect{0, 0, info.Width, info.Height});
  const bool anywhere = file.Reader->StartsAnywhere() && file.Again;
  auto opened = std::make_shared<Opened>();
  opened->File = std::move(file);
  const auto from = [opened, shape, part](std::int64_t first) -> std::unique_ptr<Rows> {
    std::unique_ptr<files::ImageReader> reader;
    {
      const std::lock_guard lock(opened->Access);
      reader = std::move(opened->File.Reader);
      if (!reader && !opened->File.Again)
        throw files::Failure("the input would have to be read twice, which can't be done with this one");
      if (!reader) reader = opened->File.Again();
    }
    const auto y = std::int32_t(first);
    const Rect rest{part.X, part.Y + y, part.Width, part.Height - y};
    return std::make_unique<RowsOfFile>(std::move(reader), shape, rest);
  };
  return {.Of = shape, .From = from, .Anywhere = anywhere};
}

RowSource RowsOf(const Picture& picture, const Shape& shape) {
  return {.Of = shape,
          .From = [=](std::int64_t first) { return std::make_unique<RowsOfPicture>(picture, shape, first); }};
}

Picture OverRows(const RowBlock& rows, const Shape& shape) {
  auto* first = const_cast<std::uint8_t*>(rows.First);
  const std::size_t bytes = std::size_t(rows.Stride) * std::size_t(rows.Count);
  return Picture(MemoryBlock::Over({first, bytes}), shape.Width, rows.Count, shape.Of,
                 std::int32_t(rows.Stride));
}

}
