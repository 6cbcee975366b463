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
  WholeReader(const Input& input, const ReadOptions& options) : From(input), Options(options) {}
  /// Packed pixels of the size and format that Info() had at first, from the top down.
  virtual void Decode(std::uint8_t* pixels) = 0;

  Input From;
  ReadOptions Options;

 private:
  Bytes Pixels;
  std::int32_t Left = 0, Next = 0, WholeWidth = 0, WholeHeight = 0;
};

}
