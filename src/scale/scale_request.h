#pragma once
#include <optional>

#include "image/lifecycle.h"
#include "image/stores.h"
#include "scale/kernels.h"
#include "scale/vertical_pass.h"

namespace zor {

/// What `Scale` and `ScaleMT` are asked for.
struct ScaleRequest {
  PictureZOR *Dest, *Source, *Temp;
  ScaleKernel Kernel;
  std::int32_t Width, Height;
};

/// The record of a picture in memory, and its samples kept alive: what threads may look at while the host's
/// other threads close the picture itself.
class KeptPicture {
 public:
  explicit KeptPicture(const PictureData& picture) : Record(picture) {
    if (Record.Samples) ++Record.Samples->Pictures;
  }
  ~KeptPicture() { LeaveStore(Record); }
  KeptPicture(const KeptPicture&) = delete;
  PictureData& Data() { return Record; }

 private:
  PictureData Record;
};

/// A scale whose pictures are all there and fit. A temporary picture that was made here is given back at the
/// end.
class ScalePreparation {
 public:
  enum class Outcome { Refused, WrongFactoryFormat, Ready };

  explicit ScalePreparation(const ScaleRequest& request);
  /// WrongFactoryFormat: a factory gave a temporary picture of another format than it was asked for.
  Outcome Result() const { return Of; }
  /// Makes the scale independent of what becomes of its pictures meanwhile. None of them is mapped.
  void KeepPictures();
  /// Runs both passes. Rows of a pass are made by onRows(count, make), which calls make(first, last) for
  /// ranges that together are 0 to count - 1, and gives whether all of them gave true.
  template <class OnRows>
  bool Run(PictureData* yields, OnRows&& onRows);

 private:
  Outcome Prepare(const ScaleRequest& request);
  Outcome FindTemp(const ScaleRequest& request);
  bool MakeTemp();
  ContributionTable AcrossTable(PictureData* yields) const;
  ContributionTable DownTable(PictureData* yields) const;

  ScaleContext Pictures{};
  ScaleKernel Kernel;
  Held Made{nullptr};
  std::optional<KeptPicture> KeptSource, KeptDest, KeptTemp;
  Outcome Of;
};

template <class OnRows>
bool ScalePreparation::Run(PictureData* yields, OnRows&& onRows) {
  const auto onLines = [&](const VerticalPass& pass) {
    return onRows(Pictures.ResultHeight,
                  [&](std::int32_t first, std::int32_t last) { return pass.Run(first, last, yields); });
  };
  if (!Pictures.Temp) {
    // The rows between the passes are made when a line looks at them.
    const ContributionTable across = AcrossTable(yields), down = DownTable(yields);
    if (!across || !down) return false;
    const HorizontalPass rows(Pictures, across);
    if (const VerticalPass lines(Pictures, down, &rows); lines) return onLines(lines);
    if (!MakeTemp()) return false;
  }
  {
    const ContributionTable table = AcrossTable(yields);
    if (!table) return false;
    const HorizontalPass pass(Pictures, table);
    const auto make = [&](std::int32_t first, std::int32_t last) { return pass.Run(first, last, yields); };
    if (!onRows(Pictures.Source->Height, make)) return false;
  }
  const ContributionTable table = DownTable(yields);
  return table && onLines({Pictures, table, nullptr});
}

}
