#pragma once
#include "image/walk.h"
#include "scale/contributions.h"
#include "scale/pairs.h"

namespace zor {

/// The samples of a pixel between temp and dest: which bytes of a temporary pixel, and which of them each
/// plane of dest gets.
struct SampleOrder {
  int Count = 0;
  std::array<int, 5> Byte{}, OfPlane{};
  /// Whether they are all of dest's pixel, in its order, so that a run of them can be copied.
  bool Direct = false;
};

/// The second pass in single precision, over a stripe of columns. Each row of temp is widened to floats once
/// and kept while lines need it; a line is then a sum of a few rows, many samples at a time.
class FloatColumns {
 public:
  FloatColumns(PictureData& temp, const ScalePair& pair, const ContributionTable& table);
  /// False without memory, and where a line takes in so many rows that the stripes become too narrow.
  explicit operator bool() const { return Memory != nullptr; }
  const SampleOrder& Order() const { return Samples; }
  /// Pixels of a stripe at most.
  std::int32_t StripePixels() const { return Stripe; }
  /// Goes on with a stripe.
  void Begin(std::int32_t firstPixel, std::int32_t pixels);
  /// The samples of one line of the stripe, ordered as `Order` says; good until the next call. Lines come in
  /// rising order. Null where the line is always in doubt.
  const Sample* Line(const Contribution& line);

 private:
  const float* Widened(std::int32_t row);
  void Settle(const Contribution& line);

  PictureData& Temp;
  int TempBytes;
  SampleOrder Samples;
  std::int32_t Slots = 0, Stripe = 0, FirstPixel = 0, Pixels = 0;
  /// Samples between the rows in memory: those of a stripe, rounded up to whole vectors.
  std::ptrdiff_t Room = 0;
  Buffer Memory, ShareMemory;
  float *Rows = nullptr, *Shares = nullptr;
  const float** RowsOfLine = nullptr;
  /// By slot, the row of temp that it holds, or -1.
  std::int32_t* RowOfSlot = nullptr;
  Sample *Packed = nullptr, *Lower = nullptr, *Upper = nullptr;
};

}
