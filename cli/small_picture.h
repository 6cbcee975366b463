#pragma once
#include "session.h"

namespace picturezor::cli {

/// What scales an image to a size; nothing where it has that. A draft may begin with what the reader gives
/// smaller for less work.
flow::Chain ScaleTo(Session& session, const OpenedImage& image, const Extent& size, bool draft);

/// The largest size with an image's proportions that lies within a box, at least 1 x 1.
Extent SizeWithin(const ImageInfo& image, double width, double height);

}
