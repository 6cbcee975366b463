#include "small_picture.h"

#include <algorithm>
#include <cmath>

#include "step.h"
#include "step_options.h"

namespace picturezor::cli {

flow::Chain ScaleTo(Session& session, const OpenedImage& image, const Extent& size, bool draft) {
  flow::Chain chain;
  if (size.Width != image.Upright.Width || size.Height != image.Upright.Height)
    chain.push_back(steps::MakeOperation(
        *steps::FindStep("scale"),
        std::map<std::string, steps::Value>{
            {"width", std::int64_t{size.Width}}, {"height", std::int64_t{size.Height}}, {"draft", draft}},
        SurroundingsOf(session)));
  return chain;
}

Extent SizeWithin(const ImageInfo& image, double width, double height) {
  const double factor = std::min(width / image.Width, height / image.Height);
  const auto side = [&](std::int32_t pixels) { return std::max(1, int(std::lround(pixels * factor))); };
  return {side(image.Width), side(image.Height)};
}

}
