#pragma once
#include "frame/types.h"

// What goes through the host's drawing instead of through pixels.

namespace zor {

/// A new 32-bit picture with the same content, with a reference for the caller. Nil without one, or for a
/// size below 1. On a host that can't draw the new picture stays as the host made it.
HostPicture* ConvertToFreshPicture(HostPicture* picture, std::int32_t width, std::int32_t height);

/// Draws `mask` into the mask of `picture`, which the host makes where there is none. Without a mask there is
/// nothing to do, which is true. False for a size below 1, and when nothing could be drawn.
bool ApplyMaskToPicture(HostPicture* picture, HostPicture* mask, std::int32_t width, std::int32_t height);

/// The size as the host's properties tell it; 0 for nil.
std::int32_t HostPictureWidth(HostPicture* picture);
std::int32_t HostPictureHeight(HostPicture* picture);

}
