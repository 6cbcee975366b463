#pragma once
#include "session.h"

namespace picturezor::cli {

/// The step that scales to a size; a draft may begin with what the reader gives smaller for less work.
std::unique_ptr<const flow::Operation> ScaleTo(Session& session, const Extent& size, bool draft);

/// An image in another size, as a picture of the host: with a mask where it has alpha, and gray or inks
/// turned into light.
HostPicture SmallPicture(Session& session, OpenedImage& image, std::int32_t width, std::int32_t height);

/// The largest size with an image's proportions that lies within a box, at least 1 x 1.
PictureSize SizeWithin(const PictureSize& image, double width, double height);

}
