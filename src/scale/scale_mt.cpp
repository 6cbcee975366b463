#include <atomic>

#include "scale/scale.h"
#include "scale/scale_request.h"
#include "scale/workers.h"

namespace zor {
namespace {

/// Makes rows on several threads; whether all of them could be made.
template <class Make>
bool OnThreads(std::int32_t threads, std::int32_t rows, Make& make) {
  struct Work {
    Make& Of;
    std::atomic<bool> Done;
  } work{make, true};
  ParallelFor(threads, rows, &work, [](std::int32_t first, std::int32_t last, void* context) {
    auto& shared = *static_cast<Work*>(context);
    if (first <= last && !shared.Of(first, last)) shared.Done = false;
  });
  return work.Done;
}

}

Boolean ScaleMT(PictureZOR* self, Integer threads, PictureZOR* source, PictureZOR* temp, Integer mode,
                Integer width, Integer height) {
  if (!source || height < 1 || width < 1) return false;
  // A window has one thread at a time.
  if (DataOf(source).IsMapping || DataOf(self).IsMapping || (temp && DataOf(temp).IsMapping))
    return Scale(self, source, temp, mode, width, height);
  if (!IsKernel(mode)) return false;
  ScalePreparation prepared({self, source, temp, ScaleKernel(mode), width, height});
  if (prepared.Result() == ScalePreparation::Outcome::Refused) return false;
  if (prepared.Result() == ScalePreparation::Outcome::WrongFactoryFormat)
    return Scale(self, source, nullptr, mode, width, height);
  prepared.KeepPictures();
  return prepared.Run(nullptr,
                      [threads](std::int32_t rows, auto&& make) { return OnThreads(threads, rows, make); });
}

}
