#include "rows.h"

#include <algorithm>
#include <cstring>

#include "failure.h"

namespace picturezor::flow {

namespace {

class RowsOfFile final : public Rows {
 public:
  explicit RowsOfFile(std::unique_ptr<files::ImageReader> reader)
      : Rows(ShapeOf(reader->Info())), Reader(std::move(reader)) {}

  const std::uint8_t* Next(std::uint8_t* room) override {
    Reader->ReadRow(room);
    if (Reader->Info().Orientation == 2) Mirror(room);
    if (++Done == About().Height) Reader->Finish();
    return room;
  }

  void Skip(std::int64_t count) override {
    Dropped.resize(RowBytes());
    while (count-- > 0) Next(Dropped.data());
  }

 private:
  void Mirror(std::uint8_t* row) const {
    const int channels = files::ChannelsOf(About().Of);
    for (std::uint8_t *left = row, *right = row + RowBytes() - channels; left < right;
         left += channels, right -= channels)
      std::swap_ranges(left, left + channels, right);
  }

  std::unique_ptr<files::ImageReader> Reader;
  std::int32_t Done = 0;
  Bytes Dropped;
};

class RowsOfPicture final : public Rows {
 public:
  RowsOfPicture(const Picture& picture, const Shape& shape)
      : Rows(shape), Of(picture), Packed(!picture.Parent() && picture.ImageFormat() == shape.Of) {}

  const std::uint8_t* Next(std::uint8_t* room) override {
    if (Packed) return RowOf(Of, Done++);
    Row = Of.RowInFormat(Done++, About().Of);
    if (Row.empty()) throw files::Failure("a row of a picture can't be converted");
    std::memcpy(room, Row.data(), Row.size());
    return room;
  }

  void Skip(std::int64_t count) override { Done += std::int32_t(count); }

 private:
  Picture Of;
  const bool Packed;
  std::int32_t Done = 0;
  Bytes Row;
};

}

std::size_t Rows::RowBytes() const { return std::size_t(Of.Width) * std::size_t(BytesPerPixel(Of.Of)); }

void ReadRow(Rows& rows, std::uint8_t* room) {
  const std::uint8_t* row = rows.Next(room);
  if (row != room) std::memcpy(room, row, rows.RowBytes());
}

Shape ShapeOf(const files::ImageInfo& info) {
  const files::ImageInfo upright = files::Upright(info);
  return {upright.Width, upright.Height, upright.Pixels, upright.Density};
}

std::unique_ptr<Rows> RowsOf(std::unique_ptr<files::ImageReader> reader) {
  return std::make_unique<RowsOfFile>(std::move(reader));
}
std::unique_ptr<Rows> RowsOf(const Picture& picture, const Shape& shape) {
  return std::make_unique<RowsOfPicture>(picture, shape);
}

std::uint8_t* RowOf(const Picture& picture, std::int32_t y) {
  const MemoryBlock row = picture.RawRow(y);
  if (!row) throw files::Failure("a row of a picture can't be reached");
  return row.Start();
}

}
