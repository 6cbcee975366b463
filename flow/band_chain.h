#pragma once
#include <vector>

#include "operation.h"

namespace picturezor::flow {

/// Rows of a picture, First to End - 1.
struct RowRange {
  std::int64_t First = 0, End = 0;
  std::int64_t Count() const { return End - First; }
  bool operator==(const RowRange&) const = default;
};

/// Operations on bands, one after the other, that are done on a band while it is at hand.
class BandChain {
 public:
  /// All of them depend on bands, in the picture that they get.
  BandChain(std::vector<const Operation*> chain, const Shape& source);

  const Shape& Source() const { return Shapes.front(); }
  const Shape& Result() const { return Shapes.back(); }
  bool Empty() const { return Chain.empty(); }
  /// Whether `Apply` leaves its source as it is.
  bool KeepsSource() const;
  /// The rows around those of a band that are read for it, at most.
  std::int64_t Margin() const;
  /// Bytes of all that is in memory for a row of a band.
  std::int64_t BytesOfRow() const;
  /// The rows of the source that some rows of the result are made of.
  RowRange SourceOf(RowRange result) const { return Ranges(result).front(); }
  /// Rows of the result, out of the rows SourceOf(result) of the source, whose samples are lost
  /// unless the chain keeps it.
  Picture Apply(Picture source, RowRange result, Workplace at) const;

 private:
  /// The rows of each of the shapes that some rows of the result are made of.
  std::vector<RowRange> Ranges(RowRange result) const;

  std::vector<const Operation*> Chain;
  /// Of the source, and of what each operation gives.
  std::vector<Shape> Shapes;
  std::vector<Dependence> Needs;
};

}
