#include "small_picture.h"

#include <algorithm>
#include <cmath>

#include "failure.h"

namespace picturezor::cli {

HostPicture SmallPicture(Session& session, OpenedImage& image, std::int32_t width, std::int32_t height) {
  const PictureSize whole = image.Size();
  const auto pictures = MakePictures(session.Stores, {whole, {width, height, whole.Of}});
  image.ReadInto(session, pictures[0]);
  const bool sameSize = width == whole.Width && height == whole.Height;
  const Picture& small = pictures[sameSize ? 0 : 1];
  if (!sameSize && !small.Scale(pictures[0], {}, Kernel::Lanczos3, width, height))
    throw Failure(image.File, "it can't be scaled");
  HostPicture picture = small.CopyPictureWithMask();
  if (!picture) throw Failure(image.File, "no picture can be made of it");
  return picture;
}

PictureSize SizeWithin(const PictureSize& image, double width, double height) {
  const double factor = std::min(width / image.Width, height / image.Height);
  const auto side = [&](std::int32_t pixels) { return std::max(1, int(std::lround(pixels * factor))); };
  return {side(image.Width), side(image.Height), image.Of};
}

}
