#pragma once
#include "frame/method.h"

namespace zor {

/// The matrices of `DitherFilter`.
inline constexpr ConstantRecord DitherConstants[] = {
    {"DitherMagic2x2Matrix", 0, 1},   {"DitherMagic4x4Matrix", 0, 2},      {"DitherOrdered4x4Matrix", 0, 3},
    {"DitherLines4x4Matrix", 0, 4},   {"Dither90Halftone6x6Matrix", 0, 5}, {"DitherOrdered6x6Matrix", 0, 6},
    {"DitherOrdered8x8Matrix", 0, 7}, {"DitherCluster3Matrix", 0, 8},      {"DitherCluster4Matrix", 0, 9},
    {"DitherCluster8Matrix", 0, 10},
};

// Filters that look at one sample at a time. Those with a `dest` take it as RunFilter does: nil makes a new
// picture, `dest` may be the source, and the result is the destination with a reference for the caller, or
// nil, also when a row can't be reached. A group that a filter doesn't serve leaves the destination as it is.

/// 255 - v for every sample of the rectangle, alpha included, in place.
void Invert(PictureZOR* self, Integer x, Integer y, Integer w, Integer h);
void Invert(PictureZOR* self);

/// Stretches the levels of an RGB picture's rectangle, in place, so that about half a percent of its pixels
/// becomes black and as many white. Luma counts, with its own weights of 0.177, 0.813 and 0.01; red, green
/// and blue are stretched alike, alpha isn't touched. False for another family, an empty rectangle, or when a
/// row can't be reached.
Boolean AutoLevel(PictureZOR* self, Integer x, Integer y, Integer w, Integer h);
Boolean AutoLevel(PictureZOR* self);

/// Darkest in the middle and bright at both ends, all planes alike, alpha included.
PictureZOR* SolarizeFilter(PictureZOR* self, PictureZOR* dest);

/// 255 (v / 255)^(1 / gamma) to the nearest, for gray and RGB. Alpha is written only by those with an
/// `alphaGamma`. Of three gammas a gray picture takes the weighted mean of their whole parts, truncated.
PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double gamma);
PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double gamma, Double alphaGamma);
PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double redGamma, Double greenGamma,
                        Double blueGamma);
PictureZOR* GammaFilter(PictureZOR* self, PictureZOR* dest, Double redGamma, Double greenGamma,
                        Double blueGamma, Double alphaGamma);

/// An S-shaped curve through the middle, steeper with more `gain`, and then one that lifts with more `bias`;
/// 0.5 and 0.5 leave all as it is, within 1. For gray and RGB, alpha included.
PictureZOR* GainFilter(PictureZOR* self, PictureZOR* dest, Double gain, Double bias);

/// Sends each plane of a gray or RGB picture through the low 8 bits of an array's first 256 elements; what
/// the array doesn't have is 0, and nil has nothing. A gray picture takes `green` of three. Alpha is written
/// only by those with an `alpha`.
PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* gray);
PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* gray, IntegerArray* alpha);
PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* red, IntegerArray* green,
                           IntegerArray* blue);
PictureZOR* TransferFilter(PictureZOR* self, PictureZOR* dest, IntegerArray* red, IntegerArray* green,
                           IntegerArray* blue, IntegerArray* alpha);

/// Pushes each sample away from that of `origpixels`, a blurred copy as a rule, by 4 `Amount` times their
/// difference, alpha included; differences below `Threshold` are left alone. In place. False unless both
/// pictures are usable and of one size and format, or when a row can't be reached.
Boolean UnsharpFilter(PictureZOR* self, PictureZOR* origpixels, Double Amount, Integer Threshold);

/// Ordered dithering of gray and RGB to `levels` evenly spaced levels, alpha included. `levels` below 2 count
/// as 2, above 256 as 256; a `matrix` that isn't one of the constants leaves the destination as it is.
PictureZOR* DitherFilter(PictureZOR* self, PictureZOR* dest, Integer matrix, Integer levels);

// Filters that look at the surroundings of a pixel. `dest` is as RunFilter takes it: nil makes a new picture,
// and the result is the destination with a reference for the caller, or nil, also when a row can't be
// reached. Each plane is treated by itself, alpha like a colour. A group that a filter doesn't serve leaves
// the destination as it is.

/// Sums up the samples around each sample, weighted by a square of numbers, row by row, whose middle is the
/// sample itself; an even square has one more row and column before the sample than behind it. Beyond the
/// edges the nearest row or column counts again.
/// The result is (sum + delta) scaleFactor, truncated and clamped. A weight of 255 or more leaves its place
/// out. Numbers that `matrix` doesn't have are 0, nil has none; a dimension below 1 has no places. Nil for a
/// dimension above 50. Where `dest` shares memory with the source, as when it is the source, pixels are read
/// as those before them have left them, row by row.
PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix);
PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix,
                        Integer delta);
PictureZOR* ApplyMatrix(PictureZOR* self, PictureZOR* dest, Integer matrixDimension, IntegerArray* matrix,
                        Integer delta, Double scaleFactor);

/// The mean of the 2r + 1 rows and then of the 2r + 1 columns around each sample, truncated each time; beyond
/// the edges the nearest row or column counts again. r is the radius truncated; with less than 1 the picture
/// is copied. Either direction may be left out; without both nothing is written. `dest` may not be the
/// source; it may share memory with it, which then is copied first. Without memory the destination stays as
/// it is.
PictureZOR* BoxBlurFilter(PictureZOR* self, PictureZOR* dest, Double radius, Boolean vertical,
                          Boolean horizontal);
/// The same so many times, each on what the one before gave. Only the first writes into `dest`; the others
/// make new pictures, and end once one changes nothing, since the rest wouldn't either. With less than 1
/// iteration the result is the source itself.
PictureZOR* BoxBlurFilter(PictureZOR* self, PictureZOR* dest, Double radius, Integer iterations,
                          Boolean vertical, Boolean horizontal);
/// A blur by less than a pixel: k (c + f (p + n)), truncated, down and then along, where f is the fraction of
/// the radius, k is 1 / (2 f + 1), and p and n are the neighbours of c. Beyond the edges c itself counts; the
/// first row and the last column count it for both neighbours. An infinite radius has no fraction. `dest` may
/// be the source. Nil for a picture of no group; without memory the destination stays as it is.
PictureZOR* BoxBlurFractionalFilter(PictureZOR* self, PictureZOR* dest, Double radius);

/// The mean of the most frequent among `levels` classes of values, the lowest of them on a tie, within
/// `range` pixels around each sample, as far as there are any. `levels` below 1 count as 1, above 256 as 256;
/// a negative range counts as 0. Nil for a given `dest` with another `PixelSize`; one that shares memory with
/// the source as in ApplyMatrix.
PictureZOR* OilFilter(PictureZOR* self, PictureZOR* dest, Integer levels, Integer range);
/// Each pixel comes from a place up to `level` columns and rows away, chosen by the process's `rand`, or from
/// the edge where that is nearer; a negative level counts as 0. For gray and RGB. A `dest` that shares memory
/// with the source as in ApplyMatrix.
PictureZOR* DiffuseFilter(PictureZOR* self, PictureZOR* dest, Integer level);
/// 128 and the difference of each sample to the one `level` columns and rows further on, or at the edge,
/// clamped. For gray and RGB. A `dest` that shares memory with the source as in ApplyMatrix.
PictureZOR* EngraveFilter(PictureZOR* self, PictureZOR* dest, Integer level);
/// The root of 2 (a^2 + b^2), at most 255, where a and b are the differences to the samples below and right.
/// Below the last row lies 0, and right of the last column what the row holds there: padding, on a clip view
/// the next pixel, or 0 where the row ends. `dest` may be the source. Without memory it stays as it is.
PictureZOR* NeonFilter(PictureZOR* self, PictureZOR* dest);

/// Two colours with a smooth step between them, where the picture blurred three times by a third of `radius`
/// passes `threshold`; the step is `softness` wide, both on a scale where 1 stands for 255. Gray takes the
/// green of the colours. A radius below 3 doesn't blur. The result is always a new picture, without the
/// alpha; `dest`, which may not be the source, receives the first pass of the blur. Nil where the blur gives
/// nil.
PictureZOR* StampFilter(PictureZOR* self, PictureZOR* dest, Double radius, Double threshold, Double softness,
                        Color Black, Color White);

// clang-format off
inline constexpr MethodRow FilterMethods[] = {
    Method<19, "OilFilter(dest as PictureZOR, levels as integer, range as integer) as PictureZOR", OilFilter>,
    Method<20, "DiffuseFilter(dest as PictureZOR, level as integer) as PictureZOR", DiffuseFilter>,
    Method<21, "EngraveFilter(dest as PictureZOR, level as integer) as PictureZOR", EngraveFilter>,
    Method<22, "NeonFilter(dest as PictureZOR) as PictureZOR", NeonFilter>,
    Method<23, "BoxBlurFilter(dest as PictureZOR, Radius as double, Vertical as boolean = true, Horizontal as boolean = true) as PictureZOR", BoxBlurFilter>,
    Method<24, "BoxBlurFilter(dest as PictureZOR, Radius as double, Iterations as integer, Vertical as boolean = true, Horizontal as boolean = true) as PictureZOR", BoxBlurFilter>,
    Method<25, "BoxBlurFractionalFilter(dest as PictureZOR, Radius as double) as PictureZOR", BoxBlurFractionalFilter>,
    Method<26, "SolarizeFilter(dest as PictureZOR) as PictureZOR", SolarizeFilter>,
    Method<27, "GammaFilter(dest as PictureZOR, redGamma as double, greenGamma as double, blueGamma as double) as PictureZOR", GammaFilter>,
    Method<28, "GammaFilter(dest as PictureZOR, redGamma as double, greenGamma as double, blueGamma as double, alphaGamma as double) as PictureZOR", GammaFilter>,
    Method<29, "GammaFilter(dest as PictureZOR, gamma as double) as PictureZOR", GammaFilter>,
    Method<30, "GammaFilter(dest as PictureZOR, gamma as double, alphaGamma as double) as PictureZOR", GammaFilter>,
    Method<31, "DitherFilter(dest as PictureZOR, matrix as integer, levels as integer) as PictureZOR", DitherFilter>,
    Method<32, "GainFilter(dest as PictureZOR, gain as double, bias as double) as PictureZOR", GainFilter>,
    Method<33, "StampFilter(dest as PictureZOR, radius as double, threshold as double, softness as double, Black as Color, White as Color) as PictureZOR", StampFilter>,
    Method<34, "TransferFilter(dest as PictureZOR, red() as integer, green() as integer, blue() as integer) as PictureZOR", TransferFilter>,
    Method<35, "TransferFilter(dest as PictureZOR, red() as integer, green() as integer, blue() as integer, alpha() as integer) as PictureZOR", TransferFilter>,
    Method<36, "TransferFilter(dest as PictureZOR, gray() as integer) as PictureZOR", TransferFilter>,
    Method<37, "TransferFilter(dest as PictureZOR, gray() as integer, alpha() as integer) as PictureZOR", TransferFilter>,
    Method<38, "UnsharpFilter(origpixels as PictureZOR, Amount as double, Threshold as integer) as boolean", UnsharpFilter>,
    Method<56, "Invert", Invert>,
    Method<57, "Invert(x as integer, y as integer, w as integer, h as integer)", Invert>,
    Method<58, "AutoLevel as boolean", AutoLevel>,
    Method<59, "AutoLevel(x as integer, y as integer, w as integer, h as integer) as boolean", AutoLevel>,
    Method<117, "ApplyMatrix(dest as PictureZOR, MatrixDimension as integer, matrix() as integer) as PictureZOR", ApplyMatrix>,
    Method<118, "ApplyMatrix(dest as PictureZOR, MatrixDimension as integer, matrix() as integer, delta as integer) as PictureZOR", ApplyMatrix>,
    Method<119, "ApplyMatrix(dest as PictureZOR, MatrixDimension as integer, matrix() as integer, delta as integer, ScaleFactor as double) as PictureZOR", ApplyMatrix>,
};
// clang-format on

}
