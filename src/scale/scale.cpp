#include "scale/scale.h"

#include "image/stores.h"
#include "scale/scale_request.h"

namespace zor {
namespace {

/// How often a factory is asked again that gave a temporary picture of another format.
constexpr int MostAttempts = 4;

/// Whether every byte of a row's pixels, from its first on, is the picture's own: not so on a view of a
/// plane, and on one with a left edge.
bool OwnsItsBytes(const PictureData& picture) {
  return picture.ChannelCount == 0 ||
         (picture.ChannelCount == picture.PixelSize && picture.ChannelOffsets[0] == 0);
}

/// Whether a picture can stand between the passes.
bool FitsBetween(const PictureData& temp, const ScaleContext& context) {
  return OwnsItsBytes(temp) && temp.PixelSize == context.Pair.Temp.Count &&
         temp.Width >= context.ResultWidth && temp.Height >= context.Source->Height &&
         !SharePixels(temp, *context.Source) && !SharePixels(temp, *context.Dest);
}

}

ScalePreparation::ScalePreparation(const ScaleRequest& request)
    : Kernel(request.Kernel), Of(Prepare(request)) {}

ScalePreparation::Outcome ScalePreparation::Prepare(const ScaleRequest& request) {
  PictureData &dest = DataOf(request.Dest), &source = DataOf(request.Source);
  if (request.Temp && !DataOf(request.Temp).Valid) return Outcome::Refused;
  if (!dest.Valid || !source.Valid || !FindScalePair(source, dest, Pictures.Pair)) return Outcome::Refused;
  if (request.Width > dest.Width || request.Height > dest.Height || source.Width < 1 || source.Height < 1)
    return Outcome::Refused;
  Pictures.Source = &source;
  Pictures.Dest = &dest;
  Pictures.ResultWidth = request.Width;
  Pictures.ResultHeight = request.Height;
  if (const Outcome outcome = FindTemp(request); outcome != Outcome::Ready) return outcome;
  for (PictureData* picture : {&source, &dest, Pictures.Temp}) {
    if (!picture) continue;
    if (!Usable(*picture)) return Outcome::Refused;
    MayYield(*picture);
  }
  return Outcome::Ready;
}

ScalePreparation::Outcome ScalePreparation::FindTemp(const ScaleRequest& request) {
  if (request.Temp) {
    Pictures.Temp = &DataOf(request.Temp);
    return FitsBetween(*Pictures.Temp, Pictures) ? Outcome::Ready : Outcome::Refused;
  }
  Held offered{
      AskFactories(Pictures.Source, request.Width, Pictures.Source->Height, Pictures.Pair.TempFormat)};
  if (!offered) {
    // Lines may be written before all rows have been read, unless they are rows of one picture.
    const bool needed = SharePixels(*Pictures.Source, *Pictures.Dest);
    return !needed || MakeTemp() ? Outcome::Ready : Outcome::Refused;
  }
  const PictureData& temp = offered.Data();
  if (temp.ImageFormat != Pictures.Pair.TempFormat) return Outcome::WrongFactoryFormat;
  if (temp.IsMapping || !FitsBetween(temp, Pictures)) return Outcome::Refused;
  Made = std::move(offered);
  Pictures.Temp = &Made.Data();
  return Outcome::Ready;
}

void ScalePreparation::KeepPictures() {
  const auto keep = [](PictureData*& picture, std::optional<KeptPicture>& kept) {
    if (picture) picture = &kept.emplace(*picture).Data();
  };
  keep(Pictures.Source, KeptSource);
  keep(Pictures.Dest, KeptDest);
  keep(Pictures.Temp, KeptTemp);
}

bool ScalePreparation::MakeTemp() {
  Made = Held{NewPictureInMemory(Pictures.ResultWidth, Pictures.Source->Height, Pictures.Pair.TempFormat)};
  Pictures.Temp = Made ? &Made.Data() : nullptr;
  return Pictures.Temp != nullptr;
}

ContributionTable ScalePreparation::AcrossTable(PictureData* yields) const {
  const double scale = double(Pictures.ResultWidth) / Pictures.Source->Width;
  return {Pictures.ResultWidth, Pictures.Source->Width, scale, Kernel, yields};
}

ContributionTable ScalePreparation::DownTable(PictureData* yields) const {
  // Of a temporary picture that is higher only the rows that the first pass makes count.
  const double scale = double(Pictures.ResultHeight) / Pictures.Source->Height;
  return {Pictures.ResultHeight, Pictures.Source->Height, scale, Kernel, yields};
}

Boolean Scale(PictureZOR* self, PictureZOR* source, PictureZOR* temp, Integer mode, Integer width,
              Integer height) {
  if (!source || height < 1 || width < 1 || !IsKernel(mode)) return false;
  for (int attempt = 0; attempt < MostAttempts; ++attempt) {
    ScalePreparation prepared({self, source, temp, ScaleKernel(mode), width, height});
    if (prepared.Result() == ScalePreparation::Outcome::Refused) return false;
    if (prepared.Result() == ScalePreparation::Outcome::WrongFactoryFormat) continue;
    return prepared.Run(&DataOf(self), [](std::int32_t rows, auto&& make) { return make(0, rows - 1); });
  }
  return false;
}

}
