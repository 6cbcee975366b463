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
               "keeps what "
               "stands between the two passes.");
  pictures.def("scale_mt_from", Method("scale_mt_from", &Picture::ScaleMT), arg("threads"), arg("source"),
               arg("temp") = py::none(), arg("kernel"), arg("width"), arg("height"),
               "The same on a number of threads, 0 for one a processor.");
  pictures.def("scale_fast_from", Method("scale_fast_from", &Picture::ScaleFast), arg("source"), arg("width"),
               arg("height"), "The same by the nearest pixels.");
}

void AddGeometry(PictureClass& pictures) {
  pictures.def("h_mirror", Method("h_mirror", &Picture::HMirror), "Swap left and right, in place.");
  pictures.def("v_mirror", Method("v_mirror", &Picture::VMirror), "Swap top and bottom, in place.");
  pictures.def("rotate180", Method("rotate180", py::overload_cast<Dest>(&Picture::Rotate180, py::const_)),
               arg("dest") = py::none(), "Half a turn into `dest`, by default a new picture. Gives `dest`.");
  pictures.def("rotate180_in_place",
               Method("rotate180_in_place", py::overload_cast<>(&Picture::Rotate180, py::const_)),
               "Half a turn.");
  pictures.def("rotate90", Method("rotate90", &Picture::Rotate90), arg("dest") = py::none(),
               "A quarter turn into `dest`, by default a new picture. Gives `dest`.");
  pictures.def("rotate270", Method("rotate270", &Picture::Rotate270), arg("dest") = py::none(),
               "Three quarters of a turn into `dest`, by default a new picture. Gives `dest`.");
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
      "A new picture, turned by degrees and large enough for all of it; the samples given fill its corners.");
}

void AddFilters(PictureClass& pictures) {
  const auto filter = [&](const char* name, auto method, const char* help, auto... arguments) {
    pictures.def(name, Method(name, method), arg("dest") = py::none(), arguments..., help);
  };
  pictures.def("invert", Method("invert", py::overload_cast<>(&Picture::Invert, py::const_)),
               "255 minus each sample.");
  pictures.def("invert", Method("invert", py::overload_cast<const Rect&>(&Picture::Invert, py::const_)),
               arg("rect"), "In a rectangle (x, y, width, height).");
  pictures.def("auto_level", Method("auto_level", py::overload_cast<>(&Picture::AutoLevel, py::const_)),
               "Stretch the colours to the whole range.");
  pictures.def("auto_level",
               Method("auto_level", py::overload_cast<const Rect&>(&Picture::AutoLevel, py::const_)),
               arg("rect"), "In a rectangle (x, y, width, height).");
  filter("solarize_filter", &Picture::SolarizeFilter, "Invert the brighter half of the samples.");
  filter("gamma_filter", py::overload_cast<Dest, double>(&Picture::GammaFilter, py::const_),
         "One gamma for all colours.", arg("gamma"));
  filter("gamma_filter", py::overload_cast<Dest, double, double>(&Picture::GammaFilter, py::const_),
         "Alpha too.", arg("gamma"), arg("alpha_gamma"));
  filter("gamma_filter", py::overload_cast<Dest, double, double, double>(&Picture::GammaFilter, py::const_),
         "A gamma a colour.", arg("red_gamma"), arg("green_gamma"), arg("blue_gamma"));
  filter("gamma_filter",
         py::overload_cast<Dest, double, double, double, double>(&Picture::GammaFilter, py::const_),
         "Alpha too.", arg("red_gamma"), arg("green_gamma"), arg("blue_gamma"), arg("alpha_gamma"));
  filter("gain_filter", &Picture::GainFilter, "Contrast and brightness by curves.", arg("gain"), arg("bias"));
  using Table = const IntegerArray&;
  filter("transfer_filter", py::overload_cast<Dest, Table>(&Picture::TransferFilter, py::const_),
         "A table of up to 256 values for all colours.", arg("gray"));
  filter("transfer_filter", py::overload_cast<Dest, Table, Table>(&Picture::TransferFilter, py::const_),
         "Alpha too.", arg("gray"), arg("alpha"));
  filter("transfer_filter",
         py::overload_cast<Dest, Table, Table, Table>(&Picture::TransferFilter, py::const_),
         "A table a colour.", arg("red"), arg("green"), arg("blue"));
  filter("transfer_filter",
         py::overload_cast<Dest, Table, Table, Table, Table>(&Picture::TransferFilter, py::const_),
         "Alpha too.", arg("red"), arg("green"), arg("blue"), arg("alpha"));
  filter("apply_matrix", py::overload_cast<Dest, std::int32_t, Table>(&Picture::ApplyMatrix, py::const_),
         "A convolution by dimension x dimension weights.", arg("dimension"), arg("matrix"));
  filter("apply_matrix",
         py::overload_cast<Dest, std::int32_t, Table, std::int32_t>(&Picture::ApplyMatrix, py::const_),
         "`delta` is added to each result.", arg("dimension"), arg("matrix"), arg("delta"));
  filter(
      "apply_matrix",
      py::overload_cast<Dest, std::int32_t, Table, std::int32_t, double>(&Picture::ApplyMatrix, py::const_),
      "The sum is multiplied by `scale_factor` before.", arg("dimension"), arg("matrix"), arg("delta"),
      arg("scale_factor"));
  filter("box_blur_filter",
         py::overload_cast<Dest, double, std::int32_t, bool, bool>(&Picture::BoxBlurFilter, py::const_),
         "The mean of the samples within `radius`, `iterations` times.", arg("radius"), arg("iterations"),
         arg("vertical") = true, arg("horizontal") = true);
  filter("box_blur_filter", py::overload_cast<Dest, double, bool, bool>(&Picture::BoxBlurFilter, py::const_),
         "The mean of the samples within `radius`.", arg("radius"), py::kw_only(), arg("vertical") = true,
         arg("horizontal") = true);
  filter("box_blur_fractional_filter", &Picture::BoxBlurFractionalFilter,
         "A box blur whose radius need not be whole.", arg("radius"));
  filter("stamp_filter", &Picture::StampFilter, "Blur, then two colours with a soft edge between them.",
         arg("radius"), arg("threshold"), arg("softness"), arg("black"), arg("white"));
  pictures.def("unsharp_filter", Method("unsharp_filter", &Picture::UnsharpFilter), arg("original"),
               arg("amount"), arg("threshold"),
               "On a blurred picture: `original` sharpened by its difference to this one.");
  filter("oil_filter", &Picture::OilFilter, "The most frequent of some levels within a range.", arg("levels"),
         arg("range"));
  filter("diffuse_filter", &Picture::DiffuseFilter, "Pixels from random places nearby.", arg("level"));
  filter("engrave_filter", &Picture::EngraveFilter, "Differences along the diagonal, around gray.",
         arg("level"));
  filter("neon_filter", &Picture::NeonFilter, "Bright edges on black.");
  filter("dither_filter", &Picture::DitherFilter, "A few levels a channel, by a pattern of thresholds.",
         arg("matrix"), arg("levels"));
}

void AddComposition(PictureClass& pictures) {
  pictures.def("fill_rect",
               Method("fill_rect", py::overload_cast<std::int32_t>(&Picture::FillRect, py::const_)),
               arg("value"), "One value for all samples.");
  pictures.def(
      "fill_rect",
      Method("fill_rect", py::overload_cast<const Rect&, std::int32_t>(&Picture::FillRect, py::const_)),
      arg("rect"), arg("value"), "In a rectangle (x, y, width, height).");
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb", py::overload_cast<std::int32_t, std::int32_t, std::int32_t>(
                                           &Picture::FillRectRGB, py::const_)),
               arg("red"), arg("green"), arg("blue"), "One colour for all pixels.");
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<std::int32_t, std::int32_t, std::int32_t, std::int32_t>(
                                  &Picture::FillRectRGB, py::const_)),
      arg("red"), arg("green"), arg("blue"), arg("alpha"), "With alpha.");
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
               arg("colour"));
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<Color, std::int32_t>(&Picture::FillRectRGB, py::const_)),
      arg("colour"), arg("alpha"));
  pictures.def(
      "fill_rect_rgb",
      Method("fill_rect_rgb", py::overload_cast<const Rect&, Color>(&Picture::FillRectRGB, py::const_)),
      arg("rect"), arg("colour"));
  pictures.def("fill_rect_rgb",
               Method("fill_rect_rgb",
                      py::overload_cast<const Rect&, Color, std::int32_t>(&Picture::FillRectRGB, py::const_)),
               arg("rect"), arg("colour"), arg("alpha"));
  pictures.def("fill_rect_random",
               Method("fill_rect_random", py::overload_cast<>(&Picture::FillRectRandom, py::const_)),
               "Random samples.");
  pictures.def(
      "fill_rect_random",
      Method("fill_rect_random", py::overload_cast<const Rect&>(&Picture::FillRectRandom, py::const_)),
      arg("rect"), "In a rectangle (x, y, width, height).");
  pictures.def("clear_rect", Method("clear_rect", py::overload_cast<>(&Picture::ClearRect, py::const_)),
               "All samples 0.");
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
      arg("other"), "The sum of the absolute differences of all samples.");
  pictures.def("copy_pixels",
               Method("copy_pixels", py::overload_cast<Dest>(&Picture::CopyPixels, py::const_)),
               arg("source"), "The pixels of `source`, converted to this picture's format.");
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
      "Lay a block of `image` over a rectangle (x, y, width, height) of this picture. `mask`, as large as "
      "the image, "
      "says how much of this picture stays: 255 keeps it.");
}

}

void AddOperations(PictureClass& pictures) {
  AddScales(pictures);
  AddGeometry(pictures);
  AddFilters(pictures);
  AddComposition(pictures);
}

}
