#include "peers.h"
#include "scale_peers.h"

// The nearest pixel, without a kernel.

namespace picturezor::bench {
namespace {

constexpr Sizes AllSizes[] = {{"to a quarter", 4000, 3000, 1000, 750}, {"up by 4", 1000, 750, 4000, 3000}};

Contender Ours(Format format, const Sizes& sizes) {
  return {"PictureZOR", [=] {
            return [=, source = TestPicture(format, sizes.FromWidth, sizes.FromHeight),
                    dest = Picture(sizes.IntoWidth, sizes.IntoHeight, format)] {
              dest.ScaleFast(source, sizes.IntoWidth, sizes.IntoHeight);
            };
          }};
}

const auto registered = [] {
  for (const auto& [name, format] :
       {std::pair{"RGB", Format::RGB}, {"RGBA", Format::RGBA}, {"gray", Format::G}})
    for (const Sizes& sizes : AllSizes) {
      std::vector<Contender> contenders{Ours(format, sizes)};
#ifdef PICTUREZOR_OPENCV
      contenders.push_back(OpenCV(
          format,
          [=](cv::Mat& source, cv::Mat& dest) {
            cv::resize(source, dest, cv::Size(sizes.IntoWidth, sizes.IntoHeight), 0, 0, cv::INTER_NEAREST);
          },
          sizes.FromWidth, sizes.FromHeight));
#endif
#ifdef PICTUREZOR_GRAPHICSMAGICK
      contenders.push_back(GraphicsMagick(
          format,
          [=](Image* image, ExceptionInfo* exception) {
            return SampleImage(image, unsigned(sizes.IntoWidth), unsigned(sizes.IntoHeight), exception);
          },
          sizes.FromWidth, sizes.FromHeight));
#endif
      AddRace("scale", std::string(name) + " " + sizes.Name + ", nearest", std::move(contenders),
              double(sizes.IntoWidth) * sizes.IntoHeight);
    }
  return true;
}();

}
}
