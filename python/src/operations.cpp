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
               "keeps what stands between the two passes: at least `width` wide and as high as `source`, "
               "with pixels of 4 bytes where this picture is RGB, and otherwise of a byte a channel. Error "
               "for a size below 1 or beyond this picture, between RGB and CMYK, for a `temp` that doesn't "
               "fit.");
  pictures.def("scale_mt_from", Method("scale_mt_from", &Picture::ScaleMT), arg("threads"), arg("source"),
               arg("temp") = py::none(), arg("kernel"), arg("width"), arg("height"),
               "The same on a number of threads: 0 for one a processor, 32 at most, below 0 the caller "
               "alone.");
  pictures.def("scale_fast_from", Method("scale_fast_from", &Picture::ScaleFast), arg("source"), arg("width"),
               arg("height"),
               "The same by the nearest pixels; the size is cut to this picture's. Error for a size below 1, "
               "between RGB and CMYK, for inks without alpha, and for gray without alpha to inks with it.");
}

void AddGeometry(PictureClass& pictures) {
  pictures.def("h_mirror", Method("h_mirror", &Picture::HMirror), "Swap left and right, in place.");
  pictures.def("v_mirror", Method("v_mirror", &Picture::VMirror), "Swap top and bottom, in place.");
  pictures.def("rotate180", Method("rotate180", py::overload_cast<Dest>(&Picture::Rotate180, py::const_)),
               arg("dest") = py::none(),
               "Half a turn into `dest`, by default a new picture. Gives `dest`. Error for one that is the "
               "picture itself, or too small.");
  pictures.def("rotate180_in_place",
               Method("rotate180_in_place", py::overload_cast<>(&Picture::Rotate180, py::const_)),
               "Half a turn.");
  pictures.def("rotate90", Method("rotate90", &Picture::Rotate90), arg("dest") = py::none(),
               "A quarter turn counter-clockwise into `dest`, which is as wide as this picture is high; by "
               "default a new picture. Gives `dest`. Error for one that is the picture itself, or too "
               "small.");
  pictures.def("rotate270", Method("rotate270", &Picture::Rotate270), arg("dest") = py::none(),
               "A quarter turn clockwise into `dest`, as `rotate90`.");
  pictures.def("rotate90slow", Method("rotate90slow", &Picture::Rotate90slow), arg("dest") = py::none(),
               "As `rotate90`, pixel by pixel.");
  pictures.def("rotate270slow", Method("rotate270slow", &Picture::Rotate270slow), arg("dest") = py::none(),
               "As `rotate270`, pixel by pixel.");
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
      "A new picture, turned by degrees counter-clockwise and large enough for all of it; the samples given, "
      "of which the low 8 bits count, fill its corners. A whole turn gives the picture itself. Error for an "
      "angle that isn't finite, and for pixels without colours but by right angles.");
}

void AddFilters(PictureClass& pictures) {
  const auto filter = [&](const char* name, auto method, const char* help, auto... arguments) {
    pictures.def(name, Method(name, method), arg("dest") = py::none(), arguments..., help);
  };
  pictures.def("invert", Method("invert", py::overload_cast<>(&Picture::Invert, py::const_)),
               "255 minus each sample, alpha included, in place.");
  pictures.def("invert", Method("invert", py::overload_cast<const Rect&>(&Picture::Invert, py::const_)),
               arg("rect"), "In a rectangle (x, y, width, height).");
  pictures.def("auto_level", Method("auto_level", py::overload_cast<>(&Picture::AutoLevel, py::const_)),
               "Stretch red, green and blue alike to the whole range, in place, so that about half a percent "
               "of the pixels becomes black and as many white. Error for other colours, and where nothing of "
               "the rectangle is left.");
  pictures.def("auto_level",
               Method("auto_level", py::overload_cast<const Rect&>(&Picture::AutoLevel, py::const_)),
               arg("rect"), "In a rectangle (x, y, width, height).");
  filter("solarize_filter", &Picture::SolarizeFilter,
         "Darkest in the middle: 0 and 255 become 255, 127 and 128 become 0, alpha too.");
  filter("gamma_filter", py::overload_cast<Dest, double>(&Picture::GammaFilter, py::const_),
         "One gamma for gray, or red, green and blue: above 1 lightens; above 0. Alpha is left out.",
         arg("gamma"));
  filter("gamma_filter", py::overload_cast<Dest, double, double>(&Picture::GammaFilter, py::const_),
         "Alpha by a gamma of its own.", arg("gamma"), arg("alpha_gamma"));
  filter("gamma_filter", py::overload_cast<Dest, double, double, double>(&Picture::GammaFilter, py::const_),
         "A gamma a colour; gray takes a mean of their whole parts.", arg("red_gamma"), arg("green_gamma"),
         arg("blue_gamma"));
  filter("gamma_filter",
         py::overload_cast<Dest, double, double, double, double>(&Picture::GammaFilter, py::const_),
         "Alpha too.", arg("red_gamma"), arg("green_gamma"), arg("blue_gamma"), arg("alpha_gamma"));
  filter("gain_filter", &Picture::GainFilter,
         "Contrast by `gain` and brightness by `bias`, both between 0 and 1 without the ends; 0.5 changes "
         "nothing. For gray and RGB, alpha too.",
         arg("gain"), arg("bias"));
  using Table = const IntegerArray&;
  filter("transfer_filter", py::overload_cast<Dest, Table>(&Picture::TransferFilter, py::const_),
         "A table for gray, or red, green and blue: sample v becomes the low 8 bits of its value v, or 0 "
         "where it is shorter. Alpha is left out.",
         arg("gray"));
  filter("transfer_filter", py::overload_cast<Dest, Table, Table>(&Picture::TransferFilter, py::const_),
         "Alpha by a table of its own.", arg("gray"), arg("alpha"));
  filter("transfer_filter",
         py::overload_cast<Dest, Table, Table, Table>(&Picture::TransferFilter, py::const_),
         "A table a colour; gray takes that of green.", arg("red"), arg("green"), arg("blue"));
  filter("transfer_filter",
         py::overload_cast<Dest, Table, Table, Table, Table>(&Picture::TransferFilter, py::const_),
         "Alpha too.", arg("red"), arg("green"), arg("blue"), arg("alpha"));
  filter("apply_matrix", py::overload_cast<Dest, std::int32_t, Table>(&Picture::ApplyMatrix, py::const_),
         "A convolution by dimension x dimension weights, row by row; alpha too. One of 255 or more leaves "
         "its place out, and those that aren't given are 0. Error for a dimension above 50.",
         arg("dimension"), arg("matrix"));
  filter("apply_matrix",
         py::overload_cast<Dest, std::int32_t, Table, std::int32_t>(&Picture::ApplyMatrix, py::const_),
         "`delta` is added to each sum.", arg("dimension"), arg("matrix"), arg("delta"));
  filter(
      "apply_matrix",
      py::overload_cast<Dest, std::int32_t, Table, std::int32_t, double>(&Picture::ApplyMatrix, py::const_),
      "The sum with `delta` is multiplied by `scale_factor`, and truncated.", arg("dimension"), arg("matrix"),
      arg("delta"), arg("scale_factor"));
  filter("box_blur_filter",
         py::overload_cast<Dest, double, std::int32_t, bool, bool>(&Picture::BoxBlurFilter, py::const_),
         "The same `iterations` times. Only the first is written to `dest`: of several a new picture comes "
         "back, of less than 1 the picture itself.",
         arg("radius"), arg("iterations"), arg("vertical") = true, arg("horizontal") = true);
  filter("box_blur_filter", py::overload_cast<Dest, double, bool, bool>(&Picture::BoxBlurFilter, py::const_),
         "The mean of the samples within `radius` pixels, without its fraction; below 1 copies. Alpha too. "
         "Error where `dest` is the picture itself.",
         arg("radius"), py::kw_only(), arg("vertical") = true, arg("horizontal") = true);
  filter("box_blur_fractional_filter", &Picture::BoxBlurFractionalFilter,
         "A blur by less than a pixel: only the fraction of the radius counts, and a whole number copies. "
         "Alpha too. Error for pixels without colours.",
         arg("radius"));
  filter("stamp_filter", &Picture::StampFilter,
         "Blur, then two colours, `white` from `threshold` on, with an edge that is `softness` wide, both 0 "
         "to 1 for samples of 0 to 255. A radius below 3 pixels doesn't blur. For gray, which takes the "
         "green of the colours, and RGB. Gives a new picture, its alpha 0; `dest` gets the first blur, and "
         "Error where it is the picture itself.",
         arg("radius"), arg("threshold"), arg("softness"), arg("black"), arg("white"));
  pictures.def("unsharp_filter", Method("unsharp_filter", &Picture::UnsharpFilter), arg("original"),
               arg("amount"), arg("threshold"),
               "In place: push each sample away from that of `original`, a blurred copy as a rule, by 4 "
               "`amount` times their difference, alpha too; differences below `threshold` (in sample values) "
               "are left alone. Error unless both have one size and format.");
  filter("oil_filter", &Picture::OilFilter,
         "The mean of the most frequent of `levels` classes of values within `range` pixels, alpha too. "
         "Levels count as 1 to 256, a range below 0 as 0. Error where `dest` has pixels of another size.",
         arg("levels"), arg("range"));
  filter("diffuse_filter", &Picture::DiffuseFilter,
         "Pixels from random places up to `level` rows and columns away; below 0 counts as 0, which copies. "
         "For gray and RGB.",
         arg("level"));
  filter("engrave_filter", &Picture::EngraveFilter,
         "128 and the difference to the sample `level` rows and columns further on, or back below 0. For "
         "gray and RGB, alpha too.",
         arg("level"));
  filter("neon_filter", &Picture::NeonFilter, "Bright edges on black.");
  filter("dither_filter", &Picture::DitherFilter,
         "A few levels a channel, 2 to 256, by a pattern of thresholds; others count as the nearer of these. "
         "For gray and RGB, alpha too. ValueError for an unknown `matrix`.",
         arg("matrix"), arg("levels"));
}

void AddComposition(PictureClass& pictures) {
  pictures.def("fill_rect",
               Method("fill_rect", py::overload_cast<std::int32_t>(&Picture::FillRect, py::const_)),
               arg("value"), "The low 8 bits of a value for all samples, alpha too.");
  pictures.def(
      "fill_rect",
      Method("fill_rect", py::overload_cast<const Rect&, std::int32_t>(&Picture::FillRect, py::const_)),
      arg("rect"), arg("value"), "In a rectangle (x, y, width, height).");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb", py::overload_cast<std::int32_t, std::int32_t, std::int32_t>(
                                           &Picture::FillRectRGB, py::const_)),
               arg("red"), arg("green"), arg("blue"),
               "One colour for all pixels, by the low 8 bits; alpha stays. Gray and inks stay as they are.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<std::int32_t, std::int32_t, std::int32_t, std::int32_t>(
                                  &Picture::FillRectRGB, py::const_)),
      arg("red"), arg("green"), arg("blue"), arg("alpha"), "With alpha, where the picture has it.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<const Rect&, std::int32_t, std::int32_t, std::int32_t>(
                                  &Picture::FillRectRGB, py::const_)),
      arg("rect"), arg("red"), arg("green"), arg("blue"), "In a rectangle (x, y, width, height).");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb",
                      py::overload_cast<const Rect&, std::int32_t, std::int32_t, std::int32_t, std::int32_t>(
                          &Picture::FillRectRGB, py::const_)),
               arg("rect"), arg("red"), arg("green"), arg("blue"), arg("alpha"),
               "In a rectangle, with alpha.");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb", py::overload_cast<Color>(&Picture::FillRectRGB, py::const_)),
               arg("colour"), "The colour as '#ff8000', or as red, green and blue of 0 to 255.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<Color, std::int32_t>(&Picture::FillRectRGB, py::const_)),
      arg("colour"), arg("alpha"), "With alpha, where the picture has it.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<const Rect&, Color>(&Picture::FillRectRGB, py::const_)),
      arg("rect"), arg("colour"), "In a rectangle (x, y, width, height).");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb",
                      py::overload_cast<const Rect&, Color, std::int32_t>(&Picture::FillRectRGB, py::const_)),
               arg("rect"), arg("colour"), arg("alpha"), "In a rectangle, with alpha.");
  pictures.def("fill_rect_random",
               Method("fill_rect_random", py::overload_cast<>(&Picture::FillRectRandom, py::const_)),
               "Random samples, alpha too.");
  pictures.def(
      "fill_rect_random",
      Method("fill_rect_random", py::overload_cast<const Rect&>(&Picture::FillRectRandom, py::const_)),
      arg("rect"), "In a rectangle (x, y, width, height).");
  pictures.def("clear_rect", Method("clear_rect", py::overload_cast<>(&Picture::ClearRect, py::const_)),
               "All samples 0, filler too.");
  pictures.def("clear_rect",
               Method("clear_rect", py::overload_cast<const Rect&>(&Picture::ClearRect, py::const_)),
               arg("rect"), "In a rectangle (x, y, width, height).");
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
      "The sum of the absolute differences of all samples, alpha too; 0 for equal ones. Error for another "
      "size, other colours, alpha in one of the two only, and pixels without colours.");
  pictures.def("copy_pixels",
               Method("copy_pixels", py::overload_cast<Dest>(&Picture::CopyPixels, py::const_)),
               arg("source"),
               "The pixels of `source`, converted to this picture's format, cut off at both edges. Gray "
               "becomes black ink alone; alpha goes along where both have it. Error between RGB and CMYK, "
               "and where nothing is left.");
  pictures.def("copy_pixels",
               Method("copy_pixels", py::overload_cast<Dest, const Rect&>(&Picture::CopyPixels, py::const_)),
               arg("source"), arg("dest"), "To a rectangle (x, y, width, height) of this picture.");
  pictures.def("copy_pixels",
               Method("copy_pixels", py::overload_cast<Dest, const Rect&, std::int32_t, std::int32_t>(
                                         &Picture::CopyPixels, py::const_)),
               arg("source"), arg("dest"), arg("source_x"), arg("source_y"), "From a place in `source`.");
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
      "Lay a block of `image` over a rectangle (x, y, width, height) of this picture, cut off at both edges. "
      "`mask`, as large as the image, says how much of this picture stays: 255 keeps it; `mask_colour` says "
      "the same for all pixels, and with `fore_colour` the image is the mask of a flat colour. Without any "
      "it is `copy_pixels`; otherwise nothing is written where one of the pictures has inks. Error for a "
      "width or height below 1, a mask of another size, and where nothing is left.");
}

}

void AddOperations(PictureClass& pictures) {
  AddScales(pictures);
  AddGeometry(pictures);
  AddFilters(pictures);
  AddComposition(pictures);
}

}
