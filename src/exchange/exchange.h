#pragma once
#include "frame/method.h"

// Everything that touches the pixels of a host picture or of a GWorld. A host picture is 1 to 32767 pixels on
// a side and holds red, green and blue; transparency stands in a picture of its own, its mask, which has the
// same size.

namespace zor {

/// A picture whose store is the pixels of a host picture, which it keeps alive: what is written to one shows
/// in the other. Only of pictures that are GWorlds of 24 or 32 bits; of others it stays not `Valid`. In 32
/// bits `useAlpha` says whether the byte in front of the colours is alpha. The channels have no numbers for
/// `Channel`.
void Constructor(PictureZOR* self, HostPicture* pic, Boolean useAlpha);

// Copies into new host pictures, with a reference for the caller. A rectangle is clipped, a negative width or
// height meaning to the left or upwards, and the result has the clipped size. Gray becomes all three colours,
// an ink takes its part of the light that black leaves: 255 - (k + c (255 - k) / 255). Nil for an empty
// rectangle, a side beyond 32767, a picture without colours or one that isn't usable, and where the host has
// no picture to give or a row can't be reached.

/// The colours; alpha plays no part.
HostPicture* CopyPicture(PictureZOR* self, Integer x, Integer y, Integer w, Integer h);
HostPicture* CopyPicture(PictureZOR* self);
/// Alpha as gray, 255 being white; nil without alpha.
HostPicture* CopyMask(PictureZOR* self, Integer x, Integer y, Integer w, Integer h);
HostPicture* CopyMask(PictureZOR* self);
/// The colours, with alpha drawn into the mask of the picture. Without alpha, or with a negative width or
/// height, there is no mask.
HostPicture* CopyPictureWithMask(PictureZOR* self, Integer x, Integer y, Integer w, Integer h);
HostPicture* CopyPictureWithMask(PictureZOR* self);
/// The top left 512 x 512 pixels with their mask, for the debugger of a host program; nil unless
/// `DebugPictureEnabled`.
HostPicture* DebugPicture(PictureZOR* self, Word);

// Copies from a host picture into this one, pixel by pixel, without scaling. The block is clipped to both as
// CopyRect does it. Without a source it starts at the picture's top left corner, without a size it is all of
// the picture, without a place it lands at 0, 0. Nothing changes when this picture lacks the planes or isn't
// usable, and when the host's can't be locked.

/// One colour of the picture into the gray plane.
void DrawPictureRedToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                 Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY);
void DrawPictureRedToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                 Integer destWidth, Integer destHeight);
void DrawPictureGreenToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY);
void DrawPictureGreenToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight);
void DrawPictureBlueToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                  Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY);
void DrawPictureBlueToGrayChannel(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                  Integer destWidth, Integer destHeight);
/// The colours; alpha and filler stay.
void DrawPictureRGB(PictureZOR* self, HostPicture* pic);
void DrawPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY);
void DrawPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                    Integer destHeight);
void DrawPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                    Integer destHeight, Integer sourceX, Integer sourceY);
/// The colours, and red of the picture's mask into alpha, or 255 - red with `invertMask`. A picture without a
/// mask counts as white there. In a format with a filler byte in front of the colours that byte is written;
/// in others without alpha the mask has no place to go. A mask that can't be locked, or that is narrower than
/// the block needs, leaves everything as it was.
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Boolean invertMask);
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                          Boolean invertMask);
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                          Integer destHeight, Boolean invertMask);
void DrawMaskedPictureRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY, Integer destWidth,
                          Integer destHeight, Integer sourceX, Integer sourceY, Boolean invertMask);
/// The colours, blended by the mask's sample of the same colour: where it is white the image stays, where it
/// is black the picture is taken, or the other way round with `invertMask`. Alpha stays. Without a mask this
/// is DrawPictureRGB.
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Boolean invertMask);
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Boolean invertMask);
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight, Boolean invertMask);
void DrawMaskedPictureApplyMaskRGB(PictureZOR* self, HostPicture* pic, Integer destX, Integer destY,
                                   Integer destWidth, Integer destHeight, Integer sourceX, Integer sourceY,
                                   Boolean invertMask);

/// The whole image in a new GWorld, wrapped in an instance of the host's class GWorldZOR: gray in 8 bits with
/// the gray ramp, RGB in 24 bits, RGB with alpha in 32. Nil for other pictures, for one that isn't usable or
/// passes the 16 bits of the bounds, and where the host has no GWorld or no such class.
Variant* CopyGWorld(PictureZOR* self);

// clang-format off
inline constexpr MethodRow ExchangeMethods[] = {
    Method<17, "Constructor(pic as picture, UseAlpha as boolean=false)", Constructor, PictureFlags>,
    Method<60, "CopyPictureWithMask(x as integer, y as integer, w as integer, h as integer) as picture", CopyPictureWithMask, PictureFlags>,
    Method<61, "CopyPicture(x as integer, y as integer, w as integer, h as integer) as picture", CopyPicture, PictureFlags>,
    Method<62, "CopyMask(x as integer, y as integer, w as integer, h as integer) as picture", CopyMask, PictureFlags>,
    Method<63, "CopyPictureWithMask as picture", CopyPictureWithMask, PictureFlags>,
    Method<64, "CopyPicture as picture", CopyPicture, PictureFlags>,
    Method<65, "CopyMask as picture", CopyMask, PictureFlags>,
    Method<88, "DrawPictureRedToGrayChannel(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer)", DrawPictureRedToGrayChannel, PictureFlags>,
    Method<89, "DrawPictureRedToGrayChannel(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer)", DrawPictureRedToGrayChannel, PictureFlags>,
    Method<90, "DrawPictureGreenToGrayChannel(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer)", DrawPictureGreenToGrayChannel, PictureFlags>,
    Method<91, "DrawPictureGreenToGrayChannel(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer)", DrawPictureGreenToGrayChannel, PictureFlags>,
    Method<92, "DrawPictureBlueToGrayChannel(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer)", DrawPictureBlueToGrayChannel, PictureFlags>,
    Method<93, "DrawPictureBlueToGrayChannel(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer)", DrawPictureBlueToGrayChannel, PictureFlags>,
    Method<94, "DrawPictureRGB(pic as picture)", DrawPictureRGB, PictureFlags>,
    Method<95, "DrawPictureRGB(pic as picture, DestX as integer, DestY as integer)", DrawPictureRGB, PictureFlags>,
    Method<96, "DrawPictureRGB(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer)", DrawPictureRGB, PictureFlags>,
    Method<97, "DrawPictureRGB(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer)", DrawPictureRGB, PictureFlags>,
    Method<98, "DrawMaskedPictureRGB(pic as picture, InvertMask as boolean=False)", DrawMaskedPictureRGB, PictureFlags>,
    Method<99, "DrawMaskedPictureRGB(pic as picture, DestX as integer, DestY as integer, InvertMask as boolean=False)", DrawMaskedPictureRGB, PictureFlags>,
    Method<100, "DrawMaskedPictureRGB(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, InvertMask as boolean=False)", DrawMaskedPictureRGB, PictureFlags>,
    Method<101, "DrawMaskedPictureRGB(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer, InvertMask as boolean=False)", DrawMaskedPictureRGB, PictureFlags>,
    Method<102, "DrawMaskedPictureApplyMaskRGB(pic as picture, InvertMask as boolean=False)", DrawMaskedPictureApplyMaskRGB, PictureFlags>,
    Method<103, "DrawMaskedPictureApplyMaskRGB(pic as picture, DestX as integer, DestY as integer, InvertMask as boolean=False)", DrawMaskedPictureApplyMaskRGB, PictureFlags>,
    Method<104, "DrawMaskedPictureApplyMaskRGB(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, InvertMask as boolean=False)", DrawMaskedPictureApplyMaskRGB, PictureFlags>,
    Method<105, "DrawMaskedPictureApplyMaskRGB(pic as picture, DestX as integer, DestY as integer, DestWidth as integer, DestHeight as integer, SourceX as integer, SourceY as integer, InvertMask as boolean=False)", DrawMaskedPictureApplyMaskRGB, PictureFlags>,
    Method<120, "CopyGWorld as variant", CopyGWorld>,
};
// clang-format on

}
