#pragma once
#include <atomic>
#include <functional>

#include "failure.h"
#include "run.h"

namespace picturezor::flow {

/// A file that is never on a disk: noise that depends on the seed.
struct MadeFile {
  std::int32_t Width, Height;
  Format Of = Format::RGB;
  int Orientation = 1;
  unsigned Seed = 1;
  /// The row at which reading fails; none by default.
  std::int32_t FailsAt = INT32_MAX;
  bool StartsAnywhere = false, OpensAgain = true;
  /// Counts the rows that are read, if it is given.
  std::atomic<int>* RowsRead = nullptr;
  OpenFile Open() const;
};

/// The rows that were written.
class KeptRows final : public files::ImageWriter {
 public:
  explicit KeptRows(std::size_t rowBytes) : RowBytes(rowBytes) {}
  void WriteRow(const std::uint8_t* row) override { Samples.insert(Samples.end(), row, row + RowBytes); }
  void Finish() override { Finished = true; }
  Bytes Samples;
  bool Finished = false;

 private:
  std::size_t RowBytes;
};

/// An operation that stands in a test.
struct Made final : Operation {
  std::function<Picture(const Picture&, const Workplace&)> Work;
  Dependence Needs{};
  std::function<void(Shape&)> Change{};
  std::optional<int> Turned{};

  Made(Dependence needs, std::function<Picture(const Picture&, const Workplace&)> work,
       std::function<void(Shape&)> change = {})
      : Work(std::move(work)), Needs(needs), Change(std::move(change)) {}
  Shape Result(const Shape& source) const override;
  Dependence DependsOn(const Shape&) const override { return Needs; }
  std::optional<int> Turns() const override { return Turned; }
  Picture Apply(Picture source, const Workplace& at) const override { return Work(source, at); }
};

/// A result's bytes.
Bytes Result(const MadeFile& file, const Chain& chain, const RunOptions& options);

}
