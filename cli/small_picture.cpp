#include "small_picture.h"

#include <algorithm>
#include <cmath>

#include "failure.h"
#include "step.h"
#include "step_options.h"

namespace picturezor::cli {

std::unique_ptr<const flow::Operation> ScaleTo(Session& session, const Extent& size, bool draft) {
  return steps::MakeOperation(
      *steps::FindStep("scale"),
      std::map<std::string, steps::Value>{
          {"width", std::int64_t{size.Width}}, {"height", std::int64_t{size.Height}}, {"draft", draft}},
      SurroundingsOf(session));
}

HostPicture SmallPicture(Session& session, OpenedImage& image, std::int32_t width, std::int32_t height) {
  flow::Chain chain;
  if (width != image.Upright.Width || height != image.Upright.Height)
    chain.push_back(ScaleTo(session, {width, height}, false));
  const auto rows = image.Rows(session, chain);
  HostPicture picture = flow::Gather(*rows, session.Stores, session.Bar).CopyPictureWithMask();
  if (!picture) throw Failure(image.File, "no picture can be made from it");
  return picture;
}

PictureSize SizeWithin(const PictureSize& image, double width, double height) {
  const double factor = std::min(width / image.Width, height / image.Height);
  const auto side = [&](std::int32_t pixels) { return std::max(1, int(std::lround(pixels * factor))); };
  return {side(image.Width), side(image.Height), image.Of};
}

}
