#pragma once
#include "frame/method.h"

namespace zor {

/// A host picture of the top left 512 x 512 pixels, for the debugger of a host program; nil unless
/// `DebugPictureEnabled`, and on a host that can't make pictures.
HostPicture* DebugPicture(PictureZOR* self, Word);

}
