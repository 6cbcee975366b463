#pragma once
#include "image/conversion.h"
#include "image/walk.h"

namespace zor {

/// What a mask is for: to become alpha, or to blend each colour by its own sample of it. Inverted, 255 - m
/// stands for m.
struct MaskUse {
  enum Kind { Alpha, Blend } For;
  bool Invert;
};

/// Draws rows of a picture and its mask, both red, green and blue, into rows of an image: its red, green and
/// blue, and alpha behind them where the mask becomes alpha and the image has a place for it.
class MaskedRows {
 public:
  MaskedRows(MaskUse use, const PlaneList& picture, const PlaneList& mask, const PlaneList& image,
             std::int32_t width);

  /// The rows may overlap: the result is that of going pixel by pixel from left to right.
  void operator()(const Sample* picture, const Sample* mask, Sample* image) const;

 private:
  using PlainRow = void (*)(const Sample* from, const PlaneList& in, const Sample* mask,
                            const PlaneList& inMask, Sample* into, const PlaneList& out, std::int32_t width);

  void BlendAsRun(const Sample* picture, const Sample* mask, Sample* image) const;

  PlainRow Plain;
  PlaneList In, InMask, Out;
  std::int32_t Width;
  bool Invert;
  // For a blend as one run of bytes: where the image's pixels begin in a row, how many bytes they take, and
  // the picture and the mask laid out like them. Null where there is no memory for it.
  std::int32_t First = 0;
  std::size_t RunBytes = 0;
  RowConversion TakeColours, TakeMask;
  Buffer Colours, Masks;
};

}
