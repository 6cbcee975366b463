#include "handle.h"

// The rows of the class that work on samples.

namespace picturezor::python {

namespace {

using py::arg;
using Dest = const Picture&;

void AddScales(PictureClass& pictures) {
  pictures.def("scale_from", Method("scale_from", &Picture::Scale), arg("source"), arg("temp") = py::none(),
               arg("kernel"), arg("width"), arg("height"),
               "Resample all of `source` into the top left `width` x `height` pixels of this picture. `temp` "
               "can provide the memory for the intermediate picture between the horizontal and the vertical "
               "pass: it must be at least `width` wide and as high as `source`, with 4 bytes per pixel if "
               "this picture is RGB, and otherwise one byte per channel. Raises Error for a size below 1 or "
               "larger than this picture, between RGB and CMYK, and for a `temp` that doesn't fit.");
  pictures.def("scale_mt_from", Method("scale_mt_from", &Picture::ScaleMT), arg("threads"), arg("source"),
               arg("temp") = py::none(), arg("kernel"), arg("width"), arg("height"),
               "Resample as scale_from does, with the same result, on `threads` threads, at most 32: 0 is "
               "one per processor, below 0 only the calling thread.");
  pictures.def(
      "scale_fast_from", Method("scale_fast_from", &Picture::ScaleFast), arg("source"), arg("width"),
      arg("height"),
      "Scale all of `source` into the top left `width` x `height` pixels of this picture by taking the "
      "nearest pixels; the size is limited to that of this picture. Raises Error for a size below 1, between "
      "RGB and CMYK, from CMYK without alpha, and from gray without alpha to CMYK with alpha.");
}

void AddGeometry(PictureClass& pictures) {
  pictures.def("h_mirror", Method("h_mirror", &Picture::HMirror), "Swap left and right, in place.");
  pictures.def("v_mirror", Method("v_mirror", &Picture::VMirror), "Swap top and bottom, in place.");
  pictures.def("rotate180", Method("rotate180", py::overload_cast<Dest>(&Picture::Rotate180, py::const_)),
               arg("dest") = py::none(),
               "Rotate by 180 degrees into `dest`, by default a new picture. Returns `dest`. Raises Error if "
               "`dest` is the picture itself, or too small.");
  pictures.def("rotate180_in_place",
               Method("rotate180_in_place", py::overload_cast<>(&Picture::Rotate180, py::const_)),
               "Rotate by 180 degrees, in place.");
  pictures.def(
      "rotate90", Method("rotate90", &Picture::Rotate90), arg("dest") = py::none(),
      "Rotate by 90 degrees counter-clockwise into `dest`, which is as wide as this picture is high; by "
      "default a new picture. Returns `dest`. Raises Error if `dest` is the picture itself, or too small.");
  pictures.def(
      "rotate270", Method("rotate270", &Picture::Rotate270), arg("dest") = py::none(),
      "Rotate by 90 degrees clockwise into `dest`, which is as wide as this picture is high; by default a "
      "new picture. Returns `dest`. Raises Error if `dest` is the picture itself, or too small.");
  pictures.def("rotate90slow", Method("rotate90slow", &Picture::Rotate90slow), arg("dest") = py::none(),
               "Rotate as rotate90 does, with the same result, but pixel by pixel.");
  pictures.def("rotate270slow", Method("rotate270slow", &Picture::Rotate270slow), arg("dest") = py::none(),
               "Rotate as rotate270 does, with the same result, but pixel by pixel.");
  pictures.def(
      "rotate_by",
      [](const Handle& self, double angle, int red, int green, int blue, int alpha, int gray, int cyan,
         int magenta, int yellow, int black) {
        const auto turned = [&] {
          const AtWork working({&self.At});
          return Result(
              Opened(self).Rotate(angle, {red, green, blue, alpha, gray, cyan, magenta, yellow, black}),
              "rotate_by", self);
        };
        return turned().ToPython();
      },
      arg("angle"), py::kw_only(), arg("red") = 0, arg("green") = 0, arg("blue") = 0, arg("alpha") = 0,
      arg("gray") = 0, arg("cyan") = 0, arg("magenta") = 0, arg("yellow") = 0, arg("black") = 0,
      "Return a new picture, rotated counter-clockwise by `angle` degrees and large enough for all of it. "
      "The given samples, by their low 8 bits, fill its corners. A multiple of 360 degrees returns the "
      "picture itself. Raises Error for an angle that isn't finite and, for formats without a colour model "
      "(Buffer, Scaling1 to Scaling8), for angles that aren't multiples of 90 degrees.");
}

void AddFilters(PictureClass& pictures) {
  const auto filter = [&](const char* name, auto method, const char* help, auto... arguments) {
    pictures.def(name, Method(name, method), arg("dest") = py::none(), arguments..., help);
  };
  pictures.def("invert", Method("invert", py::overload_cast<>(&Picture::Invert, py::const_)),
               "Invert the picture in place: each sample becomes 255 minus itself, alpha included.");
  pictures.def("invert", Method("invert", py::overload_cast<const Rect&>(&Picture::Invert, py::const_)),
               arg("rect"),
               "Invert a rectangle (x, y, width, height) in place: each sample becomes 255 minus itself, "
               "alpha included.");
  pictures.def("auto_level", Method("auto_level", py::overload_cast<>(&Picture::AutoLevel, py::const_)),
               "Stretch the levels of red, green and blue alike, in place, so that about half a percent of "
               "the pixels becomes black and as many white. Raises Error unless is_rgb is true.");
  pictures.def(
      "auto_level", Method("auto_level", py::overload_cast<const Rect&>(&Picture::AutoLevel, py::const_)),
      arg("rect"),
      "Stretch the levels of a rectangle (x, y, width, height) in place, as auto_level() does for the whole "
      "picture. Raises Error unless is_rgb is true, and for a rectangle outside the picture.");
  filter("solarize_filter", &Picture::SolarizeFilter,
         "Make dark and bright samples bright, and those in the middle dark: 0 and 255 become 255, 127 and "
         "128 become 0. All channels are mapped alike, alpha included.");
  filter("gamma_filter", py::overload_cast<Dest, double>(&Picture::GammaFilter, py::const_),
         "Correct the gamma of gray, or of red, green and blue, with one value above 0; above 1 brightens. "
         "Alpha isn't written.",
         arg("gamma"));
  filter("gamma_filter", py::overload_cast<Dest, double, double>(&Picture::GammaFilter, py::const_),
         "Correct the gamma of gray, or of red, green and blue, with one value, and that of alpha with a "
         "second one.",
         arg("gamma"), arg("alpha_gamma"));
  filter("gamma_filter", py::overload_cast<Dest, double, double, double>(&Picture::GammaFilter, py::const_),
         "Correct the gamma with one value each for red, green and blue; alpha isn't written. Gray pictures "
         "use one gamma, (77 red + 151 green + 28 blue) / 256, where each value and the result are truncated "
         "to whole numbers; values below 1 thus count as 0, and a gamma of 0 makes everything but 255 black.",
         arg("red_gamma"), arg("green_gamma"), arg("blue_gamma"));
  filter("gamma_filter",
         py::overload_cast<Dest, double, double, double, double>(&Picture::GammaFilter, py::const_),
         "Correct the gamma with one value each for red, green, blue and alpha. Gray pictures use one gamma "
         "as with three values.",
         arg("red_gamma"), arg("green_gamma"), arg("blue_gamma"), arg("alpha_gamma"));
  filter("gain_filter", &Picture::GainFilter,
         "Change the contrast of midtones by `gain` and their brightness by `bias`, both above 0 and below "
         "1: above 0.5 raises, below 0.5 lowers. 0.5 for both changes nothing except for rounding. Supports "
         "gray and RGB; alpha is changed too.",
         arg("gain"), arg("bias"));
  using Table = const IntegerArray&;
  filter("transfer_filter", py::overload_cast<Dest, Table>(&Picture::TransferFilter, py::const_),
         "Map gray, or red, green and blue, through one lookup table: a sample v becomes the low 8 bits of "
         "entry v, or 0 if the table is shorter. Alpha isn't written.",
         arg("gray"));
  filter("transfer_filter", py::overload_cast<Dest, Table, Table>(&Picture::TransferFilter, py::const_),
         "Map gray, or red, green and blue, through one lookup table, and alpha through a second one.",
         arg("gray"), arg("alpha"));
  filter("transfer_filter",
         py::overload_cast<Dest, Table, Table, Table>(&Picture::TransferFilter, py::const_),
         "Map red, green and blue through a lookup table each; alpha isn't written. Gray pictures use the "
         "green one.",
         arg("red"), arg("green"), arg("blue"));
  filter("transfer_filter",
         py::overload_cast<Dest, Table, Table, Table, Table>(&Picture::TransferFilter, py::const_),
         "Map red, green, blue and alpha through a lookup table each. Gray pictures use the green one.",
         arg("red"), arg("green"), arg("blue"), arg("alpha"));
  filter("apply_matrix", py::overload_cast<Dest, std::int32_t, Table>(&Picture::ApplyMatrix, py::const_),
         "Convolve with a square kernel of `dimension` x `dimension` weights, given row by row; alpha is "
         "treated like a colour. A weight of 255 or more leaves its sample out; missing weights are 0. "
         "Raises Error for a dimension above 50.",
         arg("dimension"), arg("matrix"));
  filter("apply_matrix",
         py::overload_cast<Dest, std::int32_t, Table, std::int32_t>(&Picture::ApplyMatrix, py::const_),
         "Convolve with a square kernel, and add `delta` to each weighted sum.", arg("dimension"),
         arg("matrix"), arg("delta"));
  filter(
      "apply_matrix",
      py::overload_cast<Dest, std::int32_t, Table, std::int32_t, double>(&Picture::ApplyMatrix, py::const_),
      "Convolve with a square kernel, add `delta` to each weighted sum, and multiply by `scale_factor`. The "
      "result is truncated, and limited to 0 to 255.",
      arg("dimension"), arg("matrix"), arg("delta"), arg("scale_factor"));
  filter("box_blur_filter",
         py::overload_cast<Dest, double, std::int32_t, bool, bool>(&Picture::BoxBlurFilter, py::const_),
         "Apply the box blur `iterations` times. Only the first pass is written to `dest`: with several, a "
         "new picture is returned; with less than 1, the picture itself.",
         arg("radius"), arg("iterations"), arg("vertical") = true, arg("horizontal") = true);
  filter("box_blur_filter", py::overload_cast<Dest, double, bool, bool>(&Picture::BoxBlurFilter, py::const_),
         "Box blur: replace each sample by the mean of the samples within `radius` pixels, vertically, "
         "horizontally or both. The fraction of the radius is ignored; below 1 the picture is copied. Alpha "
         "is treated like a colour. Raises Error if `dest` is the picture itself.",
         arg("radius"), py::kw_only(), arg("vertical") = true, arg("horizontal") = true);
  filter("box_blur_fractional_filter", &Picture::BoxBlurFractionalFilter,
         "Blur by less than a pixel. Only the fraction of the radius counts, so a whole number copies the "
         "picture. Alpha is treated like a colour. Raises Error for formats without a colour model (Buffer, "
         "Scaling1 to Scaling8).",
         arg("radius"));
  filter("stamp_filter", &Picture::StampFilter,
         "Blur by `radius` pixels (below 3 nothing is blurred), then map each channel to `black` below "
         "`threshold` and to `white` above it, with a transition over `softness` levels; both are fractions "
         "of full scale, where 1 stands for 255. Supports RGB, and gray, which uses the green of the "
         "colours. Returns a new picture with alpha 0; `dest` receives the first pass of the blur. Raises "
         "Error if `dest` is the picture itself.",
         arg("radius"), arg("threshold"), arg("softness"), arg("black"), arg("white"));
  pictures.def(
      "unsharp_filter", Method("unsharp_filter", &Picture::UnsharpFilter), arg("original"), arg("amount"),
      arg("threshold"),
      "Sharpen in place: 4 `amount` times the difference from the sample of `original`, usually a blurred "
      "copy, is added to each sample, alpha included. Samples that differ by less than `threshold` (0 to "
      "256) aren't changed. Raises Error unless both pictures have the same size and format.");
  filter("oil_filter", &Picture::OilFilter,
         "Oil painting: divide the samples within `range` pixels into `levels` classes of values, and take "
         "the mean of the most frequent class. Alpha is treated like a colour. `levels` is limited to 1 to "
         "256, `range` to 0 or more. Raises Error if the pixels of `dest` have another size.",
         arg("levels"), arg("range"));
  filter("diffuse_filter", &Picture::DiffuseFilter,
         "Take each pixel from a random place up to `level` rows and columns away; 0 or less copies the "
         "picture. Supports gray and RGB.",
         arg("level"));
  filter(
      "engrave_filter", &Picture::EngraveFilter,
      "Emboss: each sample becomes 128 plus its difference from the sample `level` rows and columns further "
      "on, or further back if `level` is negative. Supports gray and RGB; alpha is treated like a colour.",
      arg("level"));
  filter(
      "neon_filter", &Picture::NeonFilter,
      "Draw bright edges on black: each sample becomes the root of 2 (a^2 + b^2), at most 255, where a and b "
      "are its differences from the samples below and to the right. Alpha is treated like a colour.");
  filter("dither_filter", &Picture::DitherFilter,
         "Ordered dithering to `levels` evenly spaced levels per channel, with a threshold matrix. `levels` "
         "is limited to 2 to 256. Supports gray and RGB; alpha is treated like a colour. Raises ValueError "
         "for an unknown `matrix`.",
         arg("matrix"), arg("levels"));
}

void AddComposition(PictureClass& pictures) {
  pictures.def("fill_rect",
               Method("fill_rect", py::overload_cast<std::int32_t>(&Picture::FillRect, py::const_)),
               arg("value"), "Set all samples to the low 8 bits of a value, alpha included.");
  pictures.def(
      "fill_rect",
      Method("fill_rect", py::overload_cast<const Rect&, std::int32_t>(&Picture::FillRect, py::const_)),
      arg("rect"), arg("value"),
      "Set all samples of a rectangle (x, y, width, height) to the low 8 bits of a value, alpha included.");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb", py::overload_cast<std::int32_t, std::int32_t, std::int32_t>(
                                           &Picture::FillRectRGB, py::const_)),
               arg("red"), arg("green"), arg("blue"),
               "Fill the picture with red, green and blue, by the low 8 bits of each. Alpha isn't changed. "
               "Gray and CMYK pictures aren't changed.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<std::int32_t, std::int32_t, std::int32_t, std::int32_t>(
                                  &Picture::FillRectRGB, py::const_)),
      arg("red"), arg("green"), arg("blue"), arg("alpha"),
      "Fill the picture with red, green, blue and, if the picture has it, alpha, by the low 8 bits of each. "
      "Gray and CMYK pictures aren't changed.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<const Rect&, std::int32_t, std::int32_t, std::int32_t>(
                                  &Picture::FillRectRGB, py::const_)),
      arg("rect"), arg("red"), arg("green"), arg("blue"),
      "Fill a rectangle (x, y, width, height) with red, green and blue, by the low 8 bits of each. Alpha "
      "isn't changed. Gray and CMYK pictures aren't changed.");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb",
                      py::overload_cast<const Rect&, std::int32_t, std::int32_t, std::int32_t, std::int32_t>(
                          &Picture::FillRectRGB, py::const_)),
               arg("rect"), arg("red"), arg("green"), arg("blue"), arg("alpha"),
               "Fill a rectangle (x, y, width, height) with red, green, blue and, if the picture has it, "
               "alpha, by the low 8 bits of each. Gray and CMYK pictures aren't changed.");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb", py::overload_cast<Color>(&Picture::FillRectRGB, py::const_)),
               arg("colour"),
               "Fill the picture with a colour: '#ff8000', or red, green and blue of 0 to 255. Alpha isn't "
               "changed. Gray and CMYK pictures aren't changed.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<Color, std::int32_t>(&Picture::FillRectRGB, py::const_)),
      arg("colour"), arg("alpha"),
      "Fill the picture with a colour and, if the picture has it, alpha, by its low 8 bits. The colour is "
      "'#ff8000', or red, green and blue of 0 to 255. Gray and CMYK pictures aren't changed.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<const Rect&, Color>(&Picture::FillRectRGB, py::const_)),
      arg("rect"), arg("colour"),
      "Fill a rectangle (x, y, width, height) with a colour: '#ff8000', or red, green and blue of 0 to 255. "
      "Alpha isn't changed. Gray and CMYK pictures aren't changed.");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb",
                      py::overload_cast<const Rect&, Color, std::int32_t>(&Picture::FillRectRGB, py::const_)),
               arg("rect"), arg("colour"), arg("alpha"),
               "Fill a rectangle (x, y, width, height) with a colour and, if the picture has it, alpha, by "
               "its low 8 bits. The colour is '#ff8000', or red, green and blue of 0 to 255. Gray and CMYK "
               "pictures aren't changed.");
  pictures.def("fill_rect_random",
               Method("fill_rect_random", py::overload_cast<>(&Picture::FillRectRandom, py::const_)),
               "Fill the picture with random samples, alpha included.");
  pictures.def(
      "fill_rect_random",
      Method("fill_rect_random", py::overload_cast<const Rect&>(&Picture::FillRectRandom, py::const_)),
      arg("rect"), "Fill a rectangle (x, y, width, height) with random samples, alpha included.");
  pictures.def("clear_rect", Method("clear_rect", py::overload_cast<>(&Picture::ClearRect, py::const_)),
               "Set all bytes of the picture to 0, filler bytes included.");
  pictures.def(
      "clear_rect", Method("clear_rect", py::overload_cast<const Rect&>(&Picture::ClearRect, py::const_)),
      arg("rect"), "Set all bytes of a rectangle (x, y, width, height) to 0, filler bytes included.");
  pictures.def(
      "compare_images",
      [](const Handle& self, const Handle& other) {
        const AtWork working({&self.At, &other.At});
        const std::int64_t difference = Opened(self).CompareImages(Opened(other));
        if (difference < 0)
          throw Failed("compare_images: pictures of these sizes or formats can't be compared");
        return difference;
      },
      arg("other"),
      "Return the sum of the absolute differences of all samples, alpha included; 0 if the pictures are "
      "equal. The order of the channels doesn't matter. Raises Error if the sizes differ, if the formats "
      "differ in their colours (gray, RGB, CMYK) or in having alpha, and for formats without a colour model "
      "(Buffer, Scaling1 to Scaling8).");
  pictures.def(
      "copy_pixels", Method("copy_pixels", py::overload_cast<Dest>(&Picture::CopyPixels, py::const_)),
      arg("source"),
      "Copy `source` to the top left corner of this picture, clipped to it and converted to its format. Gray "
      "becomes the black channel of CMYK; alpha is copied if both pictures have it. Raises Error between RGB "
      "and CMYK, and for formats without a colour model (Buffer, Scaling1 to Scaling8).");
  pictures.def("copy_pixels",
               Method("copy_pixels", py::overload_cast<Dest, const Rect&>(&Picture::CopyPixels, py::const_)),
               arg("source"), arg("dest"),
               "Copy the top left part of `source` to a rectangle (x, y, width, height) of this picture, "
               "without scaling. Raises Error between RGB and CMYK, for formats without a colour model, and "
               "if nothing of the block lies within both pictures.");
  pictures.def("copy_pixels",
               Method("copy_pixels", py::overload_cast<Dest, const Rect&, std::int32_t, std::int32_t>(
                                         &Picture::CopyPixels, py::const_)),
               arg("source"), arg("dest"), arg("source_x"), arg("source_y"),
               "Copy a block of `source`, from source_x, source_y on, to a rectangle (x, y, width, height) "
               "of this picture, without scaling. Raises Error between RGB and CMYK, for formats without a "
               "colour model, and if nothing of the block lies within both pictures.");
  pictures.def(
      "combine_with",
      [](const Handle& self, const Handle& image, const Rect& dest, std::int32_t sourceX,
         std::int32_t sourceY, const Handle* mask, bool premultiplied, std::optional<Color> fore,
         std::optional<Color> maskColour) {
        const CombineOptions options{premultiplied, mask ? mask->Of : Picture(), fore || maskColour, fore,
                                     maskColour};
        const AtWork working({&self.At, &image.At, mask ? &mask->At : nullptr});
        if (mask) Opened(*mask);
        if (!Opened(self).Combine(Opened(image), dest, sourceX, sourceY, options))
          throw Failed("combine_with: it can't be done with these pictures");
      },
      arg("image"), arg("dest"), arg("source_x") = 0, arg("source_y") = 0, py::kw_only(),
      arg("mask") = py::none(), arg("premultiplied") = false, arg("fore_colour") = py::none(),
      arg("mask_colour") = py::none(),
      "Blend a block of `image`, from source_x, source_y on, over a rectangle (x, y, width, height) of this "
      "picture, without scaling and clipped to both pictures. `mask`, of the same size as the image, says "
      "how much of this picture is kept: 255 keeps it, 0 takes the image. `mask_colour` is one mask value "
      "per channel for all pixels. With `fore_colour`, the image is the mask for that solid colour. With "
      "`premultiplied`, the image's samples are already multiplied by alpha, and are added to what is kept. "
      "Without a mask and colours it is copy_pixels; with them, nothing is written if one of the pictures is "
      "CMYK or has no colour model. Raises Error for a width or height below 1, for a mask of another size, "
      "and if nothing of the block lies within both pictures.");
}

}

void AddOperations(PictureClass& pictures) {
  AddScales(pictures);
  AddGeometry(pictures);
  AddFilters(pictures);
  AddComposition(pictures);
}

}
