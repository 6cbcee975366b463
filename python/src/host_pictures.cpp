#include "handle.h"

// Pictures of the host, and the rows of the class that read and make them.

namespace picturezor::python {

namespace {

using py::arg;
using HostClass = py::class_<HostHandle>;

void RequireSize(std::int32_t width, std::int32_t height) {
  if (width < 1 || height < 1 || width > 32767 || height > 32767)
    throw std::invalid_argument("a picture of the host has 1 to 32767 rows and columns");
}

void AddHostPicture(py::module_& module) {
  HostClass pictures(
      module, "HostPicture",
      "A picture of the host: red, green and blue, 1 to 32767 pixels on a side, and maybe a mask, "
      "which is another one of the same size.");
  pictures.def(py::init([](std::int32_t width, std::int32_t height, std::optional<Named<PictureForm>> form) {
                 RequireSize(width, height);
                 return HostHandle(form ? HostPicture(width, height, *form) : HostPicture(width, height));
               }),
               arg("width"), arg("height"), arg("form") = py::none(),
               "A white picture. ValueError for a side that isn't 1 to 32767, and an unknown form.");
  pictures.def_property_readonly(
      "width", [](const HostHandle& self) { return self.Of.Width(); }, "Columns.");
  pictures.def_property_readonly(
      "height", [](const HostHandle& self) { return self.Of.Height(); }, "Rows.");
  pictures.def_property_readonly(
      "form", [](const HostHandle& self) { return self.Of.Form(); }, "How it holds its pixels.");
  pictures.def(
      "pixel",
      [](const HostHandle& self, std::int32_t x, std::int32_t y) {
        const AtWork working({&self.At});
        return self.Of.Pixel(x, y);
      },
      arg("x"), arg("y"), "Red, green and blue, 0 to 255. IndexError outside of the picture.");
  pictures.def(
      "set_pixel",
      [](const HostHandle& self, std::int32_t x, std::int32_t y, Color colour) {
        const AtWork working({&self.At});
        self.Of.SetPixel(x, y, colour);
      },
      arg("x"), arg("y"), arg("colour"), "Store a colour. IndexError outside of the picture.");
  pictures.def(
      "rgb",
      [](const HostHandle& self) {
        Bytes all;
        {
          const AtWork working({&self.At});
          all = self.Of.RGB();
        }
        return AsBytes(all);
      },
      "All pixels, row by row, as red, green and blue: 3 x width x height bytes.");
  pictures.def(
      "set_rgb",
      [](const HostHandle& self, const py::bytes& data) {
        const std::string_view all = data;
        const AtWork working({&self.At});
        self.Of.SetRGB({reinterpret_cast<const std::uint8_t*>(all.data()), all.size()});
      },
      arg("data"), "Store all pixels, as rgb() gives them. ValueError for another number of bytes.");
  pictures.def_property_readonly(
      "mask",
      [](const HostHandle& self) -> std::optional<HostHandle> {
        const AtWork working({&self.At});
        HostPicture mask = self.Of.Mask();
        if (!mask) return {};
        return HostHandle(std::move(mask), self.At);
      },
      "The mask, or None.");
  pictures.def(
      "make_mask",
      [](const HostHandle& self) {
        const AtWork working({&self.At});
        return HostHandle(self.Of.MakeMask(), self.At);
      },
      "The mask, made white where there was none.");
  pictures.def(
      "draw",
      [](const HostHandle& self, const HostHandle& source, const Rect& dest, const Rect& part) {
        const AtWork working({&self.At, &source.At});
        self.Of.Draw(source.Of, dest.X, dest.Y, dest.Width, dest.Height, part.X, part.Y, part.Width,
                     part.Height);
      },
      arg("source"), arg("dest"), arg("part"),
      "Draw a block of a picture into a rectangle of this one, by the nearest pixel. What lies outside is "
      "left out; a size below 1 draws nothing.");
}

void AddGWorld(py::module_& module) {
  py::class_<GWorld>(module, "GWorld", "Pixels in QuickDraw's way, as copy_gworld makes them.")
      .def_property_readonly("width", &GWorld::Width, "Columns.")
      .def_property_readonly("height", &GWorld::Height, "Rows.")
      .def_property_readonly("depth", &GWorld::Depth, "Bits of a pixel: 8, 24 or 32.")
      .def_property_readonly("pixel_bytes", &GWorld::PixelBytes, "Bytes from pixel to pixel.")
      .def(
          "row", [](const GWorld& self, std::int32_t y) { return AsBytes(self.Row(y)); }, arg("index"),
          "The bytes of a row's pixels, width x pixel_bytes. IndexError outside of the GWorld.");
}

void AddCopies(PictureClass& pictures) {
  const auto copy = [&](const char* name, HostPicture (Picture::*whole)() const,
                        HostPicture (Picture::*part)(const Rect&) const, const char* help) {
    pictures.def(name, Method(name, whole), help);
    pictures.def(name, Method(name, part), arg("rect"), "Of a rectangle (x, y, width, height).");
  };
  copy("copy_picture", &Picture::CopyPicture, &Picture::CopyPicture,
       "A new picture of the host, inks mixed to light. Error for pixels without colours, where nothing of "
       "the rectangle is left, and beyond 32767 pixels on a side.");
  copy("copy_mask", &Picture::CopyMask, &Picture::CopyMask,
       "Alpha as a gray picture of the host, white where it is 255. Error without alpha, and as "
       "copy_picture.");
  copy("copy_picture_with_mask", &Picture::CopyPictureWithMask, &Picture::CopyPictureWithMask,
       "A new picture of the host, its mask made of alpha; none without alpha. Error as copy_picture.");
  pictures.def("copy_gworld", Method("copy_gworld", &Picture::CopyGWorld),
               "A new GWorld of gray, RGB, or RGB with alpha. Error for other colours.");
}

using Source = const HostPicture&;

void AddGrayDraws(PictureClass& pictures) {
  const auto draw = [&](const char* name, void (Picture::*whole)(Source, const Rect&) const,
                        void (Picture::*part)(Source, const Rect&, std::int32_t, std::int32_t) const) {
    pictures.def(
        name, Method(name, whole), arg("picture"), arg("dest"),
        "One colour of a picture of the host into the gray samples of a rectangle (x, y, width, height). "
        "Pictures without gray stay as they are.");
    pictures.def(name, Method(name, part), arg("picture"), arg("dest"), arg("source_x"), arg("source_y"),
                 "From a place in the source.");
  };
  draw("draw_picture_red_to_gray_channel", &Picture::DrawPictureRedToGrayChannel,
       &Picture::DrawPictureRedToGrayChannel);
  draw("draw_picture_green_to_gray_channel", &Picture::DrawPictureGreenToGrayChannel,
       &Picture::DrawPictureGreenToGrayChannel);
  draw("draw_picture_blue_to_gray_channel", &Picture::DrawPictureBlueToGrayChannel,
       &Picture::DrawPictureBlueToGrayChannel);
}

/// The four forms of a row: all of it to the corner, to a place, to a rectangle, from a place to a rectangle;
/// with what comes behind the places in each.
template <class... More, class... Extra>
void AddDraws(PictureClass& pictures, const char* name, const char* help,
              void (Picture::*whole)(Source, More...) const,
              void (Picture::*at)(Source, std::int32_t, std::int32_t, More...) const,
              void (Picture::*into)(Source, const Rect&, More...) const,
              void (Picture::*part)(Source, const Rect&, std::int32_t, std::int32_t, More...) const,
              const Extra&... extra) {
  pictures.def(name, Method(name, whole), arg("picture"), extra..., help);
  pictures.def(name, Method(name, at), arg("picture"), arg("x"), arg("y"), extra..., "To a place.");
  pictures.def(name, Method(name, into), arg("picture"), arg("dest"), extra...,
               "Into a rectangle (x, y, width, height).");
  pictures.def(name, Method(name, part), arg("picture"), arg("dest"), arg("source_x"), arg("source_y"),
               extra..., "From a place in the source.");
}

}

void AddHostPictures(py::module_& module, PictureClass& pictures) {
  AddHostPicture(module);
  AddGWorld(module);
  module.def(
      "make_pictures_as", [](Named<PictureForm> form) { Host::MakePicturesAs(form); }, arg("form"),
      "The form of the host's pictures that are made from now on.");
  AddCopies(pictures);
  AddGrayDraws(pictures);
  AddDraws<>(pictures, "draw_picture_rgb",
             "Draw a picture of the host, without its mask, unscaled; alpha stays. Gray and inks stay as "
             "they are.",
             &Picture::DrawPictureRGB, &Picture::DrawPictureRGB, &Picture::DrawPictureRGB,
             &Picture::DrawPictureRGB);
  AddDraws<bool>(pictures, "draw_masked_picture_rgb",
                 "Draw a picture of the host, unscaled; red of its mask becomes alpha, or 255 less it with "
                 "invert_mask. No mask counts as white.",
                 &Picture::DrawMaskedPictureRGB, &Picture::DrawMaskedPictureRGB,
                 &Picture::DrawMaskedPictureRGB, &Picture::DrawMaskedPictureRGB, arg("invert_mask") = false);
  AddDraws<bool>(pictures, "draw_masked_picture_apply_mask_rgb",
                 "Draw a picture of the host; its mask says how much of this picture stays: all where it is "
                 "white, or none with invert_mask.",
                 &Picture::DrawMaskedPictureApplyMaskRGB, &Picture::DrawMaskedPictureApplyMaskRGB,
                 &Picture::DrawMaskedPictureApplyMaskRGB, &Picture::DrawMaskedPictureApplyMaskRGB,
                 arg("invert_mask") = false);
}

}
