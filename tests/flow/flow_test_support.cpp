#include "flow_test_support.h"

#include <gtest/gtest.h>

namespace picturezor::flow {

namespace {

class MadeReader final : public files::ImageReader {
 public:
  explicit MadeReader(const MadeFile& file) : Of(file) {
    About.Width = file.Width;
    About.Height = file.Height;
    About.Pixels = file.Of;
    About.Orientation = file.Orientation;
  }
  bool StartsAnywhere() const override { return Of.StartsAnywhere; }
  bool Select(const Rect& part) override {
    if (!Of.StartsAnywhere) return false;
    NextRow = part.Y;
    return true;
  }
  void ReadRow(std::uint8_t* row) override {
    if (NextRow >= Of.FailsAt) throw files::Failure("the file ends in row " + std::to_string(NextRow));
    if (Of.RowsRead) ++*Of.RowsRead;
    std::uint32_t state = Of.Seed * 2654435761u + std::uint32_t(NextRow++) * 40503u;
    for (std::int32_t i = 0; i < Of.Width * BytesPerPixel(Of.Of); ++i) {
      state = state * 1664525u + 1013904223u;
      row[i] = std::uint8_t(state >> 24);
    }
  }
  void Finish() override {}

 private:
  const MadeFile Of;
  std::int32_t NextRow = 0;
};

}

OpenFile MadeFile::Open() const {
  OpenFile file{std::make_unique<MadeReader>(*this), {}};
  if (OpensAgain) file.Again = [made = *this] { return std::make_unique<MadeReader>(made); };
  return file;
}

Shape Made::Result(const Shape& source) const {
  Shape result = source;
  if (Change) Change(result);
  return result;
}

Bytes Result(const MadeFile& file, const Chain& chain, const RunOptions& options) {
  const OpenFile opened = file.Open();
  const Shape result = ResultOf(ShapeOf(opened), chain);
  KeptRows rows(std::size_t(result.Width) * std::size_t(BytesPerPixel(result.Of)));
  files::Silence silence;
  Run(file.Open(), chain, result.Of, rows, options, silence);
  EXPECT_TRUE(rows.Finished);
  return std::move(rows.Samples);
}

}
