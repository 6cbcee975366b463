#pragma once
#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "image_file.h"
#include "pictures.h"
#include "picturezor/picture.h"

namespace picturezor::flow {

/// What is known of a picture before its samples.
struct Shape {
  std::int32_t Width = 0, Height = 0;
  Format Of = Format::Unknown;
  std::optional<files::Resolution> Density;

  /// Of its pixels, without a gap.
  std::int64_t RowBytes() const { return std::int64_t{Width} * BytesPerPixel(Of); }
};

/// How the rows of a result come from those of the source.
struct Dependence {
  enum class Kind {
    /// From anywhere: the source stands whole before the work begins.
    Whole,
    /// Row y of the result from the rows First + y - Reach to First + y + Reach of the source, as far as
    /// there are such, and from nothing else. Any band of rows can be worked on by itself then: `Apply`
    /// gives as many rows as it gets, row i out of those around row i; which rows it gets, and which of the
    /// result count, is the caller's business. So to cut rows off takes no more than to tell it here.
    Bands,
    /// The work reads the rows from top to bottom and leaves them as they are, but has to see the whole size:
    /// they may arrive while it runs, and go some megabytes later.
    InOrder
  };
  Kind Of = Kind::Whole;
  std::int32_t First = 0, Reach = 0;
  /// The first row that `Apply` gives of a band is a multiple of this in the whole result, where the work
  /// repeats itself from row to row.
  std::int32_t Period = 1;
  /// Whether the source comes back as it was. The result of bands may show it.
  bool KeepsSource = false;
};

/// Where and how an operation works.
struct Workplace {
  /// Where new pictures live.
  files::StoreOptions Stores;
  /// The row of the whole source that the picture at hand begins with.
  std::int32_t FirstRow = 0;
  /// Threads that the work may keep busy. With 1 it stays on the calling thread.
  int Threads = 1;
};

struct Draft;

/// What a step does to a picture, its options known. It keeps nothing from call to call, so it may work on
/// several threads at once, each with pictures of its own.
class Operation {
 public:
  virtual ~Operation() = default;
  /// What comes out of a picture. Throws files::Failure where the step isn't there for such a one.
  virtual Shape Result(const Shape& source) const = 0;
  virtual Dependence DependsOn(const Shape&) const { return {}; }
  /// The pictures of the source's size that the work takes at a time, source and result included.
  virtual int Pictures() const { return 2; }
  /// The part of the source that the result is, where the work is nothing else: a reader may read that alone.
  virtual std::optional<Rect> Cuts() const { return std::nullopt; }
  /// Where a reader may give a smaller picture instead of the source.
  virtual std::optional<Draft> Drafted(const Shape& source) const;
  /// Where the work is nothing else than to turn or mirror the source: how a file would lie, 1 to 8 as in
  /// EXIF, that holds the source and shows the result.
  virtual std::optional<int> Turns() const { return std::nullopt; }
  /// The same as several operations that need less memory, one after the other, where the rows in order don't
  /// do because source or result are so large.
  virtual std::vector<std::unique_ptr<const Operation>> Parts(const Shape&) const { return {}; }
  /// The result of a whole picture, or of a band of rows with those in reach. In place where that can be: the
  /// source may come back changed, and is lost otherwise. The source may be a view. Throws files::Failure
  /// where it can't be done.
  virtual Picture Apply(Picture source, const Workplace& at) const = 0;
};

/// A smaller picture that does instead of a source.
struct Draft {
  /// How large it is at least.
  files::Extent Least;
  /// What is left to do with it: the result has the size that it would have of the source.
  std::unique_ptr<const Operation> Rest;
};

inline std::optional<Draft> Operation::Drafted(const Shape&) const { return std::nullopt; }

}
