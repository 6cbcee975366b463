#pragma once
#include <cstdint>
#include <memory>

#include "operation.h"

namespace picturezor::flow {

/// The rows of a picture from top to bottom, each once, as packed pixels of its format.
class Rows {
 public:
  virtual ~Rows() = default;
  const Shape& About() const { return Of; }
  std::size_t RowBytes() const;
  /// The next row: in `room`, which has place for one, or where it stands already, until the next call. To be
  /// called About().Height times at most. What went wrong on other threads is thrown here.
  virtual const std::uint8_t* Next(std::uint8_t* room) = 0;
  /// Leaves out some rows.
  virtual void Skip(std::int64_t count) = 0;

 protected:
  explicit Rows(const Shape& shape) : Of(shape) {}

 private:
  Shape Of;
};

/// The next row, in `room`.
void ReadRow(Rows& rows, std::uint8_t* room);

/// What a file's picture is once it stands upright.
Shape ShapeOf(const files::ImageInfo& info);
/// The rows of a file, whose orientation is 1 or 2, upright. Behind the last row the file is read to its end.
std::unique_ptr<Rows> RowsOf(std::unique_ptr<files::ImageReader> reader);
/// The rows of a picture in one of the formats of files.
std::unique_ptr<Rows> RowsOf(const Picture& picture, const Shape& shape);

/// The samples of a row of a picture that isn't a view.
std::uint8_t* RowOf(const Picture& picture, std::int32_t y);

}
