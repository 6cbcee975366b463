#pragma once
#include "image_file.h"

namespace picturezor::files {

/// A reader of a type whose library gives a picture as a whole: it is decoded with the first row.
class WholeReader : public ImageReader {
 public:
  bool Select(const Rect& part) override;
  void ReadRow(std::uint8_t* row) override;
  void Finish() override {}

 protected:
  /// Pictures of one colour take hardly any bytes, whatever their size.
  static constexpr double MostPixelsPerByte = 1e9;

  WholeReader(const Input& input, const ReadOptions& options) : From(input), Options(options) {}
  /// Gives packed pixels from the top down, of the whole size: Info() may have that of a part by now.
  virtual void Decode(std::uint8_t* pixels, const Extent& size) = 0;

  Input From;
  ReadOptions Options;
  /// Bytes that decoding takes for each sample of the picture, which stands in one of them.
  std::int64_t Needs = 1;

 private:
  Bytes Pixels;
  std::int32_t Left = 0, Next = 0;
  Extent Whole;
};

}
