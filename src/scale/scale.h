#pragma once
#include "frame/method.h"

namespace zor {

/// Resamples `source` into the top left width x height pixels of this picture, along the rows and then along
/// the columns, with 8 bits between the two. `mode` is one of the seven kernels. Gray, RGB and CMYK become
/// each other but for RGB and CMYK; alpha is a channel like the others, and is left alone where one of the
/// two pictures lacks it.
///
/// `temp` is nil, or a picture that keeps what stands between the passes: of the pixel size that the pair
/// asks for, all of it its own, at least `width` wide and as high as `source`. It shares no samples with the
/// other two. `source` may be this picture, whose samples are read before the first is written.
///
/// False, and nothing written, when the size is below 1 or passes this picture, for another mode, for
/// pictures that aren't usable or have no way to each other, and when `temp` doesn't fit or can't be made in
/// memory. False too when a row of `source` can't be reached; rows of
/// this picture may have been made then.
Boolean Scale(PictureZOR* self, PictureZOR* source, PictureZOR* temp, Integer mode, Integer width,
              Integer height);
/// The same on a number of threads, with the same result: below 0 on the calling thread, 0 on as many as
/// there are processors, 32 at most. Mapped pictures stay on the calling thread.
Boolean ScaleMT(PictureZOR* self, Integer threads, PictureZOR* source, PictureZOR* temp, Integer mode,
                Integer width, Integer height);
/// Takes for each pixel the one of `source` at the truncated place, from the first one on. The size is cut to
/// this picture's, so the whole source goes into it. Alpha is copied where both have it. False when nothing
/// is left of the size, when a picture isn't usable, and where there is no way: between RGB and CMYK, from
/// CMYK without alpha, and from gray to CMYK with alpha. False too when a row can't be reached; the rows
/// above are done.
Boolean ScaleFast(PictureZOR* self, PictureZOR* source, Integer width, Integer height);

/// The kernels of `Scale`, by their mode.
inline constexpr ConstantRecord KernelConstants[] = {
    {"ScaleTriangle", 0, 1}, {"ScaleBox", 0, 2},   {"ScaleLanczos3", 0, 3}, {"ScaleLanczos8", 0, 4},
    {"ScaleMitchell", 0, 5}, {"ScalePoly3", 0, 6}, {"ScaleCubic", 0, 7},
};

// clang-format off
inline constexpr MethodRow ScaleMethods[] = {
    Method<12, "ScaleFast(source as PictureZOR, width as integer, height as integer) as boolean", ScaleFast>,
    Method<13, "Scale(source as PictureZOR, temp as PictureZOR, mode as integer, width as integer, height as integer) as boolean", Scale>,
    Method<14, "ScaleMT(threads as integer, source as PictureZOR, temp as PictureZOR, mode as integer, width as integer, height as integer) as boolean", ScaleMT>,
};
// clang-format on

}
