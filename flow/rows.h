#pragma once
#include <cstdint>
#include <functional>
#include <memory>

#include "operation.h"

namespace picturezor::flow {

/// Rows that stand in memory, `Stride` bytes from one to the next.
struct RowBlock {
  const std::uint8_t* First = nullptr;
  std::ptrdiff_t Stride = 0;
  std::int32_t Count = 0;
};

/// The rows of a picture from one on to the last, each once, as packed pixels of its format.
class Rows {
 public:
  virtual ~Rows() = default;
  const Shape& About() const { return Of; }
  std::size_t RowBytes() const;
  /// The next rows, one to `most` of them, of those that there are: in `room`, which has place for so many,
  /// or where they stand already, until the next call. What went wrong on other threads is thrown here.
  virtual RowBlock Next(std::uint8_t* room, std::ptrdiff_t stride, std::int32_t most) = 0;

 protected:
  explicit Rows(const Shape& shape) : Of(shape) {}

 private:
  Shape Of;
};

/// The next rows, in `room`.
void ReadRows(Rows& rows, std::uint8_t* room, std::ptrdiff_t stride, std::int32_t count);

/// Where the rows of a picture come from.
struct RowSource {
  Shape Of;
  /// The rows from one on. A second call may be refused with files::Failure, as of a file that comes through
  /// a pipe.
  std::function<std::unique_ptr<Rows>(std::int64_t first)> From;
  /// Whether that costs little wherever they begin, and may be done several times at once.
  bool Anywhere = false;
};

/// A file that is open.
struct OpenFile {
  std::unique_ptr<files::ImageReader> Reader;
  /// Opens it once more; empty where that can't be.
  std::function<std::unique_ptr<files::ImageReader>()> Again;
  /// What alone counts, in pixels as they are stored; all without it.
  std::optional<Rect> Part{};
};
/// What its picture is once it stands upright.
Shape ShapeOf(const OpenFile& file);

/// The rows of a file as they are stored, but those of orientation 2 upright. Behind the last row the file is
/// read to its end.
RowSource RowsOf(OpenFile file);
/// The rows of a picture in one of the formats of files. One thread at a time reads them.
RowSource RowsOf(const Picture& picture, const Shape& shape);

/// A picture of rows that stand in memory for longer than it.
Picture OverRows(const RowBlock& rows, const Shape& shape);
using files::RowOf;

}
