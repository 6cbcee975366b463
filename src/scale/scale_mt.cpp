#include "scale/scale.h"
#include "scale/scale_request.h"
#include "scale/workers.h"

namespace zor {
namespace {

/// Runs pass(first, last) over the rows on several threads.
template <class Pass>
void OnThreads(std::int32_t threads, std::int32_t rows, Pass& pass) {
  ParallelFor(threads, rows, &pass, [](std::int32_t first, std::int32_t last, void* context) {
    if (first <= last) (*static_cast<Pass*>(context))(first, last);
  });
}

}

Boolean ScaleMT(PictureZOR* self, Integer threads, PictureZOR* source, PictureZOR* temp, Integer mode,
                Integer width, Integer height) {
  if (!source || height < 1 || width < 1) return false;
  // A window has one thread at a time.
  if (DataOf(source).IsMapping || DataOf(self).IsMapping || (temp && DataOf(temp).IsMapping))
    return Scale(self, source, temp, mode, width, height);
  if (!IsKernel(mode)) return false;
  const ScaleRequest request{self, source, temp, ScaleKernel(mode), width, height};
  const ScalePreparation prepared(request);
  if (prepared.Result() == ScalePreparation::Outcome::Refused) return false;
  if (prepared.Result() == ScalePreparation::Outcome::WrongFactoryFormat)
    return Scale(self, source, nullptr, mode, width, height);
  const ScaleContext& context = prepared.Context();
  return RunPasses(
      context, request.Kernel, nullptr,
      [&](const HorizontalPass& pass, std::int32_t rows) {
        auto run = [&](std::int32_t first, std::int32_t last) { pass.Run(first, last, nullptr); };
        OnThreads(threads, rows, run);
        return true;
      },
      [&](const ContributionTable& table) {
        auto run = [&](std::int32_t first, std::int32_t last) {
          VerticalPass(context, table, first, last, nullptr);
        };
        OnThreads(threads, context.ResultHeight, run);
      });
}

}
