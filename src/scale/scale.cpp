#include "scale/scale.h"

#include "image/stores.h"
#include "scale/scale_request.h"

namespace zor {
namespace {

/// How often a factory is asked again that gave a temporary picture of another format.
constexpr int MostAttempts = 4;

/// Whether every byte of a row's pixels, from its first on, is the picture's own: not so on a view of a plane,
/// and on one with a left edge.
bool OwnsItsBytes(const PictureData& picture) {
  return picture.ChannelCount == 0 ||
         (picture.ChannelCount == picture.PixelSize && picture.ChannelOffsets[0] == 0);
}

/// Whether a picture can stand between the passes.
bool FitsBetween(const PictureData& temp, const ScaleContext& context) {
  return OwnsItsBytes(temp) && temp.PixelSize == context.Pair.TempBytes && temp.Width >= context.ResultWidth &&
         temp.Height >= context.Source->Height && !SharePixels(temp, *context.Source) &&
         !SharePixels(temp, *context.Dest);
}

}

ScalePreparation::ScalePreparation(const ScaleRequest& request) : Of(Prepare(request)) {}

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
  if (!dest.Valid || !source.Valid) return Outcome::Refused;
  for (PictureData* picture : {&source, &dest, Pictures.Temp}) {
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
  Held made{CreatePictureThroughFactory(Pictures.Source, request.Width, Pictures.Source->Height,
                                        Pictures.Pair.TempFormat)};
  if (!made || !made.Data().Valid) return Outcome::Refused;
  if (made.Data().ImageFormat != Pictures.Pair.TempFormat) return Outcome::WrongFactoryFormat;
  if (made.Data().IsMapping || !FitsBetween(made.Data(), Pictures)) return Outcome::Refused;
  Pictures.Temp = &made.Data();
  Made = std::move(made);
  return Outcome::Ready;
}

Boolean Scale(PictureZOR* self, PictureZOR* source, PictureZOR* temp, Integer mode, Integer width,
              Integer height) {
  if (!source || height < 1 || width < 1 || !IsKernel(mode)) return false;
  ScaleRequest request{self, source, temp, ScaleKernel(mode), width, height};
  for (int attempt = 0; attempt < MostAttempts; ++attempt) {
    const ScalePreparation prepared(request);
    if (prepared.Result() == ScalePreparation::Outcome::Refused) return false;
    if (prepared.Result() == ScalePreparation::Outcome::WrongFactoryFormat) continue;
    const ScaleContext& context = prepared.Context();
    PictureData* yields = context.Dest;
    return RunPasses(
        context, request.Kernel, yields,
        [&](const HorizontalPass& pass, std::int32_t rows) { return pass.Run(0, rows - 1, yields); },
        [&](const ContributionTable& table) {
          VerticalPass(context, table, 0, context.ResultHeight - 1, yields);
        });
  }
  return false;
}

}
