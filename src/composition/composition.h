#pragma once
#include "frame/method.h"

namespace zor {

// Everything here works in place on any store and on views. Rectangles and blocks may have any numbers: a
// negative size means to the left or upwards, and what lies outside is left out. Nothing is raised. A picture
// that isn't usable stays as it is.

/// Every sample of the rectangle becomes the low 8 bits of value, alpha included. Filler bytes stay.
void FillRect(PictureZOR* self, Integer value);
void FillRect(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Integer value);

/// Red, green and blue of the rectangle get their values, by the low 8 bits; alpha too in the forms with
/// alpha, where the picture has it. A picture without these three planes stays as it is.
void FillRectRGB(PictureZOR* self, Integer red, Integer green, Integer blue);
void FillRectRGB(PictureZOR* self, Integer red, Integer green, Integer blue, Integer alpha);
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Integer red,
                 Integer green, Integer blue);
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Integer red,
                 Integer green, Integer blue, Integer alpha);
void FillRectRGB(PictureZOR* self, Color fillColor);
void FillRectRGB(PictureZOR* self, Color fillColor, Integer alpha);
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Color fillColor);
void FillRectRGB(PictureZOR* self, Integer x, Integer y, Integer width, Integer height, Color fillColor,
                 Integer alpha);

/// Every sample of the rectangle becomes the low 8 bits of a call of `rand`, row by row and pixel by pixel.
/// In a pixel the samples of gray and RGB come in the order of their bytes where they take up all of them;
/// else as gray, alpha; red, green, blue, alpha; alpha, cyan, magenta, yellow, black. Filler bytes stay.
void FillRectRandom(PictureZOR* self);
void FillRectRandom(PictureZOR* self, Integer x, Integer y, Integer width, Integer height);

/// All bytes of the rows become 0, filler bytes and what stands behind the last pixel included. On a view
/// only what it shows: on a clip or mirrored view the bytes of its pixels, on a view of channels their
/// samples.
void ClearRect(PictureZOR* self);
/// All bytes of the rectangle's pixels become 0, filler bytes included; on a view of channels their samples.
/// Raw pixels have no planes that could hold a view's left edge, so there the columns count from the left
/// edge of the picture below.
void ClearRect(PictureZOR* self, Integer x, Integer y, Integer width, Integer height);

/// The sum of the absolute differences of all samples of two pictures, alpha included; filler bytes and the
/// order of the planes don't count. 0 means equal. -1 where they differ in size, family or having alpha,
/// where one isn't usable or of a format without a family, and where a row can't be reached.
Int64 CompareImages(PictureZOR* self, PictureZOR* other);

/// Copies a block of `source`, pixel to pixel, to destX, destY of this picture. Gray goes to red, green and
/// blue or to black, with the other inks 0; red, green and blue become (77 r + 151 g + 28 b) >> 8; black
/// becomes gray. Alpha is copied where both have it; the dest's other bytes stay. A negative source origin
/// moves the dest's origin left or up by as much. Within one picture, and between pictures that share
/// samples, the block is as if read before the first write. False and nothing changed for a nil source, a
/// picture that isn't usable, an empty block, between RGB and CMYK, and for formats without a family; false
/// without memory, or when a row can't be reached.
Boolean CopyPixels(PictureZOR* self, PictureZOR* source);
Boolean CopyPixels(PictureZOR* self, PictureZOR* source, Integer destX, Integer destY, Integer destWidth,
                   Integer destHeight);
Boolean CopyPixels(PictureZOR* self, PictureZOR* source, Integer destX, Integer destY, Integer destWidth,
                   Integer destHeight, Integer sourceX, Integer sourceY);

/// Lays a block of `image` over this picture. A mask value m, 255 to keep the dest's sample d and 0 to take
/// the source's sample s, gives (s (255 - m) + m d) / 255; with `preMultipliedSource` s + m d / 255, of which
/// the low 8 bits are stored.
///
/// - With a mask, which must be as large as the image, s comes from the image and m from the mask, channel by
///   channel; gray counts for all three, and on a gray dest RGB becomes luma, (77 r + 151 g + 28 b) >> 8. An
///   alpha of the dest is blended the same way; an image or mask without alpha has 255.
/// - Without a mask or colours it is CopyPixels.
/// - With `foreColour` alone, that is the source, and the image's gray or mean of red, green and blue the
/// mask.
///   On a gray dest the three results become luma.
/// - With `maskColour`, that is the mask if `useColours`, else 0. `foreColour` doesn't matter.
///
/// The colours are 0xRRGGBB, negative for none; alpha plays no part with them. CMYK and formats without a
/// family write nothing and give true.
///
/// Pictures that share samples are read and written pixel by pixel, from left to right and from top to
/// bottom; the samples of a pixel are all read before they are written.
///
/// False and nothing changed for a nil image, a size below 1, a picture that isn't usable, a mask of another
/// size than the image, and an empty block; false when a row can't be reached.
Boolean Combine(PictureZOR* self, PictureZOR* image, PictureZOR* mask, Integer destX, Integer destY,
                Integer sourceX, Integer sourceY, Integer width, Integer height, Boolean useColours);
Boolean Combine(PictureZOR* self, PictureZOR* image, PictureZOR* mask, Integer destX, Integer destY,
                Integer sourceX, Integer sourceY, Integer width, Integer height, Boolean useColours,
                Integer foreColour);
Boolean Combine(PictureZOR* self, PictureZOR* image, PictureZOR* mask, Integer destX, Integer destY,
                Integer sourceX, Integer sourceY, Integer width, Integer height, Boolean useColours,
                Integer foreColour, Integer maskColour);
Boolean Combine(PictureZOR* self, PictureZOR* image, Boolean preMultipliedSource, PictureZOR* mask,
                Integer destX, Integer destY, Integer sourceX, Integer sourceY, Integer width, Integer height,
                Boolean useColours);
Boolean Combine(PictureZOR* self, PictureZOR* image, Boolean preMultipliedSource, PictureZOR* mask,
                Integer destX, Integer destY, Integer sourceX, Integer sourceY, Integer width, Integer height,
                Boolean useColours, Integer foreColour);
Boolean Combine(PictureZOR* self, PictureZOR* image, Boolean preMultipliedSource, PictureZOR* mask,
                Integer destX, Integer destY, Integer sourceX, Integer sourceY, Integer width, Integer height,
                Boolean useColours, Integer foreColour, Integer maskColour);

// clang-format off
inline constexpr MethodRow CompositionMethods[] = {
    Method<1, "Combine(Image As PictureZOR, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As Integer, MaskColour As Integer) as boolean", Combine, NoFlags>,
    Method<2, "Combine(Image As PictureZOR, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As Integer) as boolean", Combine, NoFlags>,
    Method<3, "Combine(Image As PictureZOR, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean) as boolean", Combine, NoFlags>,
    Method<4, "Combine(Image As PictureZOR, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As color, MaskColour As color) as boolean", Combine, NoFlags>,
    Method<5, "Combine(Image As PictureZOR, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As color) as boolean", Combine, NoFlags>,
    Method<6, "Combine(Image As PictureZOR, PreMultipliedSource as boolean, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As Integer, MaskColour As Integer) as boolean", Combine, NoFlags>,
    Method<7, "Combine(Image As PictureZOR, PreMultipliedSource as boolean, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As Integer) as boolean", Combine, NoFlags>,
    Method<8, "Combine(Image As PictureZOR, PreMultipliedSource as boolean, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean) as boolean", Combine, NoFlags>,
    Method<9, "Combine(Image As PictureZOR, PreMultipliedSource as boolean, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As color, MaskColour As color) as boolean", Combine, NoFlags>,
    Method<10, "Combine(Image As PictureZOR, PreMultipliedSource as boolean, Mask As PictureZOR, DestX As Integer, DestY As Integer, SourceX As Integer, SourceY As Integer, Width As Integer, Height As Integer, UseColours As Boolean, ForeColour As color) as boolean", Combine, NoFlags>,
    Method<73, "ClearRect", ClearRect>,
    Method<74, "ClearRect(x as integer, y as integer, width as integer, height as integer)", ClearRect>,
    Method<75, "CompareImages(other as PictureZOR) as Int64", CompareImages>,
    Method<76, "FillRect(value as integer)", FillRect>,
    Method<77, "FillRect(x as integer, y as integer, width as integer, height as integer, value as integer)", FillRect>,
    Method<78, "FillRectRandom", FillRectRandom>,
    Method<79, "FillRectRandom(x as integer, y as integer, width as integer, height as integer)", FillRectRandom>,
    Method<80, "FillRectRGB(red as integer, green as integer, blue as integer)", FillRectRGB>,
    Method<81, "FillRectRGB(red as integer, green as integer, blue as integer, alpha as integer)", FillRectRGB>,
    Method<82, "FillRectRGB(x as integer, y as integer, width as integer, height as integer, red as integer, green as integer, blue as integer)", FillRectRGB>,
    Method<83, "FillRectRGB(x as integer, y as integer, width as integer, height as integer, red as integer, green as integer, blue as integer, alpha as integer)", FillRectRGB>,
    Method<84, "FillRectRGB(FillColor as color)", FillRectRGB>,
    Method<85, "FillRectRGB(FillColor as color, alpha as integer)", FillRectRGB>,
    Method<86, "FillRectRGB(x as integer, y as integer, width as integer, height as integer, FillColor as color)", FillRectRGB>,
    Method<87, "FillRectRGB(x as integer, y as integer, width as integer, height as integer, FillColor as color, alpha as integer)", FillRectRGB>,
    Method<106, "CopyPixels(source as PictureZOR, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer) as boolean", CopyPixels>,
    Method<107, "CopyPixels(source as PictureZOR, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer) as boolean", CopyPixels>,
    Method<108, "CopyPixels(source as PictureZOR) as boolean", CopyPixels>,
};
// clang-format on

}
