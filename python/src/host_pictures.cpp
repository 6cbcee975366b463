#include "handle.h"

// Pictures of the host, and the rows of the class that read and make them.

namespace picturezor::python {

namespace {

using py::arg;
using HostClass = py::class_<HostHandle>;

void RequireSize(std::int32_t width, std::int32_t height) {
  if (width < 1 || height < 1 || width > 32767 || height > 32767)
    throw std::invalid_argument("a host picture has 1 to 32767 rows and columns");
}

void AddHostPicture(py::module_& module) {
  HostClass pictures(module, "HostPicture",
                     "A host picture: RGB, 1 to 32767 pixels on a side, with an optional mask, which is "
                     "another host picture of the same size.");
  pictures.def(
      py::init([](std::int32_t width, std::int32_t height, std::optional<Named<PictureForm>> form) {
        RequireSize(width, height);
        return HostHandle(form ? HostPicture(width, height, *form) : HostPicture(width, height));
      }),
      arg("width"), arg("height"), arg("form") = py::none(),
      "Make a white picture. Raises ValueError for a side outside 1 to 32767, and for an unknown form.");
  pictures.def_property_readonly(
      "width", [](const HostHandle& self) { return self.Of.Width(); }, "Width in pixels.");
  pictures.def_property_readonly(
      "height", [](const HostHandle& self) { return self.Of.Height(); }, "Height in pixels.");
  pictures.def_property_readonly(
      "form", [](const HostHandle& self) { return self.Of.Form(); }, "How the picture stores its pixels.");
  pictures.def(
      "pixel",
      [](const HostHandle& self, std::int32_t x, std::int32_t y) {
        const AtWork working({&self.At});
        return self.Of.Pixel(x, y);
      },
      arg("x"), arg("y"),
      "Return red, green and blue of a pixel, 0 to 255. Raises IndexError outside the picture.");
  pictures.def(
      "set_pixel",
      [](const HostHandle& self, std::int32_t x, std::int32_t y, Color colour) {
        const AtWork working({&self.At});
        self.Of.SetPixel(x, y, colour);
      },
      arg("x"), arg("y"), arg("colour"),
      "Store the colour of a pixel. Raises IndexError outside the picture.");
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
      "Return all pixels, row by row, as red, green and blue: 3 x width x height bytes.");
  pictures.def(
      "set_rgb",
      [](const HostHandle& self, const py::bytes& data) {
        const std::string_view all = data;
        const AtWork working({&self.At});
        self.Of.SetRGB({reinterpret_cast<const std::uint8_t*>(all.data()), all.size()});
      },
      arg("data"),
      "Store all pixels, in the form that rgb() returns. Raises ValueError for another number of bytes.");
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
      "Return the mask; a white one is made if there is none.");
  pictures.def(
      "draw",
      [](const HostHandle& self, const HostHandle& source, const Rect& dest, const Rect& part) {
        const AtWork working({&self.At, &source.At});
        self.Of.Draw(source.Of, dest.X, dest.Y, dest.Width, dest.Height, part.X, part.Y, part.Width,
                     part.Height);
      },
      arg("source"), arg("dest"), arg("part"),
      "Draw a block of a host picture into a rectangle of this one, scaled to the nearest pixel. Both are "
      "clipped to their pictures; a width or height below 1 draws nothing.");
}

void AddGWorld(py::module_& module) {
  py::class_<GWorld>(module, "GWorld", "An image in QuickDraw's form, as copy_gworld makes it.")
      .def_property_readonly("width", &GWorld::Width, "Width in pixels.")
      .def_property_readonly("height", &GWorld::Height, "Height in pixels.")
      .def_property_readonly("depth", &GWorld::Depth,
                             "Bits per pixel: 8 for gray, 24 for RGB, 32 for RGB with alpha.")
      .def_property_readonly("pixel_bytes", &GWorld::PixelBytes, "Bytes per pixel.")
      .def(
          "row", [](const GWorld& self, std::int32_t y) { return AsBytes(self.Row(y)); }, arg("index"),
          "Return the bytes of a row, width x pixel_bytes. Raises IndexError outside the GWorld.");
}

void AddCopies(PictureClass& pictures) {
  // One help for both forms, with what is returned in each.
  const auto copy = [&](const char* name, HostPicture (Picture::*whole)() const,
                        HostPicture (Picture::*part)(const Rect&) const, const std::string& what,
                        const std::string& as) {
    pictures.def(name, Method(name, whole), ("Return " + what + " as " + as).c_str());
    pictures.def(name, Method(name, part), arg("rect"),
                 ("Return " + what + " of a rectangle (x, y, width, height) as " + as).c_str());
  };
  copy("copy_picture", &Picture::CopyPicture, &Picture::CopyPicture, "the colours",
       "a new host picture. CMYK is converted to RGB. Raises Error for formats without a colour model "
       "(Buffer, Scaling1 to Scaling8), for a rectangle outside the picture, and for a side of more than "
       "32767 pixels.");
  copy("copy_mask", &Picture::CopyMask, &Picture::CopyMask, "alpha",
       "a new gray host picture, which is white where alpha is 255. Raises Error without alpha, and where "
       "copy_picture does.");
  copy("copy_picture_with_mask", &Picture::CopyPictureWithMask, &Picture::CopyPictureWithMask, "the colours",
       "a new host picture, with alpha, if there is any, as its mask. Raises Error where copy_picture does.");
  pictures.def("copy_gworld", Method("copy_gworld", &Picture::CopyGWorld),
               "Return a new GWorld: 8 bits for gray, 24 for RGB, 32 for RGB with alpha. Raises Error for "
               "CMYK and for formats without a colour model.");
}

using Source = const HostPicture&;

void AddGrayDraws(PictureClass& pictures) {
  const auto draw = [&](const char* name, const std::string& colour,
                        void (Picture::*whole)(Source, const Rect&) const,
                        void (Picture::*part)(Source, const Rect&, std::int32_t, std::int32_t) const) {
    const std::string to =
        " to the gray channel in a rectangle (x, y, width, height) of this picture, without scaling. "
        "Pictures without a gray channel aren't changed.";
    pictures.def(name, Method(name, whole), arg("picture"), arg("dest"),
                 ("Copy " + colour + " of a host picture, from its top left corner on," + to).c_str());
    pictures.def(name, Method(name, part), arg("picture"), arg("dest"), arg("source_x"), arg("source_y"),
                 ("Copy " + colour + " of a host picture, from source_x, source_y on," + to).c_str());
  };
  draw("draw_picture_red_to_gray_channel", "red", &Picture::DrawPictureRedToGrayChannel,
       &Picture::DrawPictureRedToGrayChannel);
  draw("draw_picture_green_to_gray_channel", "green", &Picture::DrawPictureGreenToGrayChannel,
       &Picture::DrawPictureGreenToGrayChannel);
  draw("draw_picture_blue_to_gray_channel", "blue", &Picture::DrawPictureBlueToGrayChannel,
       &Picture::DrawPictureBlueToGrayChannel);
}

/// The four forms of a row: all of it to the corner, to a place, to a rectangle, from a place to a rectangle;
/// with what comes behind the places in each. `how` ends the help of each.
template <class... More, class... Extra>
void AddDraws(PictureClass& pictures, const char* name, const std::string& how,
              void (Picture::*whole)(Source, More...) const,
              void (Picture::*at)(Source, std::int32_t, std::int32_t, More...) const,
              void (Picture::*into)(Source, const Rect&, More...) const,
              void (Picture::*part)(Source, const Rect&, std::int32_t, std::int32_t, More...) const,
              const Extra&... extra) {
  const auto help = [&](const char* where) { return "Draw a host picture " + std::string(where) + how; };
  pictures.def(name, Method(name, whole), arg("picture"), extra..., help("at the top left corner").c_str());
  pictures.def(name, Method(name, at), arg("picture"), arg("x"), arg("y"), extra...,
               help("with its top left corner at x, y").c_str());
  pictures.def(name, Method(name, into), arg("picture"), arg("dest"), extra...,
               help("into a rectangle (x, y, width, height)").c_str());
  pictures.def(
      name, Method(name, part), arg("picture"), arg("dest"), arg("source_x"), arg("source_y"), extra...,
      help("into a rectangle (x, y, width, height), from source_x, source_y of the host picture on").c_str());
}

}

void AddHostPictures(py::module_& module, PictureClass& pictures) {
  AddHostPicture(module);
  AddGWorld(module);
  module.def(
      "make_pictures_as", [](Named<PictureForm> form) { Host::MakePicturesAs(form); }, arg("form"),
      "Set how host pictures that are made from now on store their pixels.");
  AddCopies(pictures);
  AddGrayDraws(pictures);
  AddDraws<>(
      pictures, "draw_picture_rgb",
      ", without scaling and without its mask. Alpha isn't changed, and neither are gray and CMYK pictures.",
      &Picture::DrawPictureRGB, &Picture::DrawPictureRGB, &Picture::DrawPictureRGB, &Picture::DrawPictureRGB);
  AddDraws<bool>(pictures, "draw_masked_picture_rgb",
                 ", without scaling. Red of its mask becomes alpha, or 255 minus red with invert_mask; a "
                 "missing mask counts as white. Gray and CMYK pictures aren't changed.",
                 &Picture::DrawMaskedPictureRGB, &Picture::DrawMaskedPictureRGB,
                 &Picture::DrawMaskedPictureRGB, &Picture::DrawMaskedPictureRGB, arg("invert_mask") = false);
  AddDraws<bool>(pictures, "draw_masked_picture_apply_mask_rgb",
                 ", without scaling. Its mask says, channel by channel, how much of this picture is kept: "
                 "everything where it is white, or nothing there with invert_mask; without a mask, nothing "
                 "is kept. Alpha isn't changed, and neither are gray and CMYK pictures.",
                 &Picture::DrawMaskedPictureApplyMaskRGB, &Picture::DrawMaskedPictureApplyMaskRGB,
                 &Picture::DrawMaskedPictureApplyMaskRGB, &Picture::DrawMaskedPictureApplyMaskRGB,
                 arg("invert_mask") = false);
}

}
