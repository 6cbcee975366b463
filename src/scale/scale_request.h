#pragma once
#include <optional>

#include "image/lifecycle.h"
#include "scale/kernels.h"
#include "scale/passes.h"

namespace zor {

/// What `Scale` and `ScaleMT` are asked for.
struct ScaleRequest {
  PictureZOR *Dest, *Source, *Temp;
  ScaleKernel Kernel;
  std::int32_t Width, Height;
};

/// A scale whose pictures are all there and fit, with a temporary picture that is given back if it was made
/// here.
class ScalePreparation {
 public:
  enum class Outcome { Refused, WrongFactoryFormat, Ready };

  explicit ScalePreparation(const ScaleRequest& request);
  /// WrongFactoryFormat: a factory gave a temporary picture of another format than it was asked for.
  Outcome Result() const { return Of; }
  const ScaleContext& Context() const { return Pictures; }

 private:
  Outcome Prepare(const ScaleRequest& request);
  Outcome FindTemp(const ScaleRequest& request);

  ScaleContext Pictures{};
  Held Made{nullptr};
  Outcome Of;
};

/// Runs both passes; how rows are made, on which thread, is up to the two functions, which get the prepared
/// pass. False without memory, or when rows says so.
template <class Rows, class Lines>
bool RunPasses(const ScaleContext& context, ScaleKernel kernel, PictureData* yields, Rows&& rows,
               Lines&& lines) {
  const PictureData& source = *context.Source;
  const std::int32_t height = source.Height;
  const double xScale = double(context.ResultWidth) / source.Width;
  const double yScale = double(context.ResultHeight) / height;
  {
    const ContributionTable table(context.ResultWidth, source.Width, xScale, kernel, yields);
    if (!table || !rows(HorizontalPass(context, table), height)) return false;
  }
  // Of a temporary picture that is higher only the rows that have just been made count.
  const ContributionTable table(context.ResultHeight, height, yScale, kernel, yields);
  if (!table) return false;
  lines(table);
  return true;
}

}
