#pragma once
#include "frame/method.h"

namespace zor {

// Pixels that move and don't change. Planes move sample by sample, alpha like the colours, and bytes that
// belong to no plane stay as they are. Where a `dest` is asked for, nil makes a new picture; the result is
// the destination with a reference for the caller. Nil when a picture isn't usable, when `dest` is the
// source, smaller than the result or without a plane of the source, or when a row can't be reached. A picture
// of no colour family moves nothing.

/// Left for right, in place. An unusable picture stays as it is.
void HMirror(PictureZOR* self);
/// Top for bottom, in place. An unusable picture stays as it is, and one in a file where there is no memory
/// for two rows.
void VMirror(PictureZOR* self);
/// Both.
void Rotate180(PictureZOR* self);
PictureZOR* Rotate180(PictureZOR* self, PictureZOR* dest);

/// A quarter turn counter-clockwise: the source's top right pixel comes to the top left. `dest` is as wide as
/// the source is high. In tiles of rows that are in the address space at the same time; where rows of `dest`
/// overlap, as they may in a caller's block, the samples end as the slow form leaves them.
PictureZOR* Rotate90(PictureZOR* self, PictureZOR* dest);
/// A quarter turn clockwise: the source's bottom left pixel comes to the top left.
PictureZOR* Rotate270(PictureZOR* self, PictureZOR* dest);
/// The same pixels, written row by row of the source, which moves the window of a mapped destination for
/// nearly every pixel.
PictureZOR* Rotate90slow(PictureZOR* self, PictureZOR* dest);
PictureZOR* Rotate270slow(PictureZOR* self, PictureZOR* dest);

/// Turns by any angle, in degrees counter-clockwise, into a new picture that holds all of it; its corners get
/// the low 8 bits of the values of the source's planes. Right angles give the exact turns, and 0 the source
/// itself with one more reference. Others are three shears, which split each sample between two neighbours
/// and so blur a little; alpha is sheared like the colours, which are not weighted by it. Nil for an angle
/// that is infinite or not a number, for a picture that isn't usable or has no colour family, and when one of
/// the three pictures can't be made, has rows that overlap or is the source's own store. They come from the
/// source's factory.
PictureZOR* Rotate(PictureZOR* self, Double angle, Integer Red, Integer Green, Integer Blue, Integer Alpha,
                   Integer Gray, Integer Cyan, Integer Magenta, Integer Yellow, Integer Black);

// clang-format off
inline constexpr MethodRow GeometryMethods[] = {
    Method<53, "HMirror", HMirror>,
    Method<54, "VMirror", VMirror>,
    Method<55, "Rotate180", Rotate180>,
    Method<111, "Rotate90slow(dest as PictureZOR=nil) as PictureZOR", Rotate90slow>,
    Method<112, "Rotate180(dest as PictureZOR=nil) as PictureZOR", Rotate180>,
    Method<113, "Rotate270slow(dest as PictureZOR=nil) as PictureZOR", Rotate270slow>,
    Method<114, "Rotate(angle as double, Red as integer = 0, Green as integer = 0, Blue as integer = 0, Alpha as integer = 0, Gray as integer = 0, Cyan as integer = 0, Magenta as integer = 0, Yellow as integer = 0, Black as integer = 0) as PictureZOR", Rotate>,
    Method<115, "Rotate90(dest as PictureZOR=nil) as PictureZOR", Rotate90>,
    Method<116, "Rotate270(dest as PictureZOR=nil) as PictureZOR", Rotate270>,
};
// clang-format on

}
