#include <utility>

#include "handle.h"

// What a picture is: making one, properties, views, factories.

namespace picturezor::python {

namespace {

using py::arg;

void RequireSize(std::int32_t width, std::int32_t height) {
  if (width < 1 || height < 1) throw std::invalid_argument("a picture has at least one row and one column");
}

void AddConstructors(PictureClass& pictures) {
  using NamedFormat = Named<Format>;
  const NamedFormat rgb = Format::RGB;
  pictures.def(py::init([](std::int32_t width, std::int32_t height, NamedFormat format) {
                 RequireSize(width, height);
                 return Handle(Picture(width, height, format));
               }),
               arg("width"), arg("height"), arg("format") = rgb,
               "A picture in memory, all samples 0. ValueError for a size below 1 or an unknown format, "
               "Error from 2 GiB on or without memory.");
  pictures.def_static(
      "mapped",
      [](const std::filesystem::path& file, std::int32_t width, std::int32_t height, NamedFormat format,
         std::int32_t block) {
        RequireSize(width, height);
        if (height < 5) throw std::invalid_argument("a mapped picture has at least 5 rows");
        return Handle(Picture::Mapped(file, width, height, format, block));
      },
      arg("file"), arg("width"), arg("height"), arg("format") = rgb, arg("block_size") = 0,
      "A picture in a temporary file, which is created or overwritten and goes away with the picture. About "
      "block_size bytes of it, at least 16 MiB, are in the address space at a time. ValueError for less than "
      "5 rows; Error for a file that can't be written, or that another picture is on, and without room.");
  pictures.def_static(
      "from_host",
      [](const HostHandle& picture, bool useAlpha) {
        const AtWork working({&picture.At});
        return Handle(Picture(picture.Of, useAlpha));
      },
      arg("picture"), arg("use_alpha") = false,
      "A picture on the pixels of one of the host: what is written to one shows in the other. With use_alpha "
      "the byte before the colours of 32 bits is alpha. Error but for GWorlds of 24 or 32 bits.");
  pictures.def_static(
      "create",
      [](std::int32_t width, std::int32_t height, NamedFormat format) {
        RequireSize(width, height);
        const AtWork working({});
        return Handle(Picture::Create(width, height, format));
      },
      arg("width"), arg("height"), arg("format") = rgb,
      "A picture from the global factory, or in memory. ValueError for a size below 1, Error without "
      "memory.");
  const auto byFormat = [](auto function) {
    return [function](std::int32_t width, std::int32_t height, NamedFormat format) {
      return function(width, height, format);
    };
  };
  pictures.def_static("calculate_memory", byFormat(&Picture::CalculateMemory), arg("width"), arg("height"),
                      arg("format"),
                      "Bytes that a picture in memory takes; 0 for a size below 1. From 2 GiB on there is "
                      "none.");
  pictures.def_static("can_allocate", byFormat(&Picture::CanAllocate), arg("width"), arg("height"),
                      arg("format"),
                      "Whether there is memory for such a picture now. False for a size below 1, and from 4 "
                      "GiB on.");
  pictures.def(
      "create_picture",
      [](const Handle& self, std::int32_t width, std::int32_t height, NamedFormat format) {
        RequireSize(width, height);
        const AtWork working({&self.At});
        return Handle(Opened(self).CreatePicture(width, height, format), self.From);
      },
      arg("width"), arg("height"), arg("format"),
      "A picture from this picture's factory, the global one, or in memory. ValueError for a size below 1, "
      "Error without memory.");
  pictures.def("clone", Method("clone", &Picture::Clone),
               "A copy in memory of a picture that is there too, else Error; copy() does with every "
               "picture.");
  pictures.def(
      "close",
      [](const Handle& self) {
        const AtWork working({&self.At});
        if (!std::exchange(self.Own->Closed, true)) self.Of.Close();
      },
      "End the picture. Views and arrays of it go on working; anything else raises ValueError from now on.");
  pictures.def("__enter__", [](py::object self) { return self; });
  pictures.def("__exit__", [](const py::object& self, const py::args&) { self.attr("close")(); });
}

template <class T>
void Property(PictureClass& pictures, const char* name, T (Picture::*get)() const, const char* help) {
  pictures.def_property_readonly(
      name, [get](const Handle& self) { return (Opened(self).*get)(); }, help);
}

void AddProperties(PictureClass& pictures) {
  pictures.def_property_readonly(
      "valid", [](const Handle& self) { return !self.Own->Closed; }, "False once it is closed.");
  Property(pictures, "width", &Picture::Width, "Columns.");
  Property(pictures, "height", &Picture::Height, "Rows.");
  Property(pictures, "image_format", &Picture::ImageFormat, "The pixel format.");
  Property(pictures, "image_format_string", &Picture::ImageFormatString,
           "Its name, empty where it has none; RGBA is called RBBA here.");
  Property(pictures, "pixel_size", &Picture::PixelSize, "Bytes from pixel to pixel.");
  Property(pictures, "row_size", &Picture::RowSize, "Bytes from row to row.");
  Property(pictures, "row_offset", &Picture::RowOffset, "Rows of the store above those of a view.");
  Property(pictures, "total_size", &Picture::TotalSize, "Bytes of all rows.");
  Property(pictures, "channel_count", &Picture::ChannelCount,
           "Channels, alpha included; 0 on a picture of the host.");
  Property(pictures, "is_gray", &Picture::IsGray, "Whether its colours are gray.");
  Property(pictures, "is_rgb", &Picture::IsRGB, "Whether its colours are red, green and blue.");
  Property(pictures, "is_cmyk", &Picture::IsCMYK, "Whether its colours are cyan, magenta, yellow and black.");
  Property(pictures, "is_mapping", &Picture::IsMapping, "Whether it lives in a file.");
  const std::tuple<const char*, const char*, bool (Picture::*)() const, const char*,
                   std::int32_t (Picture::*)() const>
      planes[] = {{"red", "has_red", &Picture::HasRed, "red_offset", &Picture::RedOffset},
                  {"green", "has_green", &Picture::HasGreen, "green_offset", &Picture::GreenOffset},
                  {"blue", "has_blue", &Picture::HasBlue, "blue_offset", &Picture::BlueOffset},
                  {"gray", "has_gray", &Picture::HasGray, "gray_offset", &Picture::GrayOffset},
                  {"alpha", "has_alpha", &Picture::HasAlpha, "alpha_offset", &Picture::AlphaOffset},
                  {"cyan", "has_cyan", &Picture::HasCyan, "cyan_offset", &Picture::CyanOffset},
                  {"magenta", "has_magenta", &Picture::HasMagenta, "magenta_offset", &Picture::MagentaOffset},
                  {"yellow", "has_yellow", &Picture::HasYellow, "yellow_offset", &Picture::YellowOffset},
                  {"black", "has_black", &Picture::HasBlack, "black_offset", &Picture::BlackOffset}};
  for (const auto& [plane, has, hasGet, offset, offsetGet] : planes) {
    Property(pictures, has, hasGet, (std::string("Whether it has ") + plane + " samples.").c_str());
    Property(pictures, offset, offsetGet,
             (std::string("Bytes from the start of a row to its first ") + plane + " sample.").c_str());
  }
  pictures.def_property(
      "yield_ticks", [](const Handle& self) { return Opened(self).YieldTicks(); },
      [](const Handle& self, std::int32_t ticks) { Opened(self).SetYieldTicks(ticks); },
      "Least sixtieths of a second between two yields to the host; 0 or less is never.");
  pictures.def_property(
      "mapping_block_size", [](const Handle& self) { return Opened(self).MappingBlockSize(); },
      [](const Handle& self, std::int32_t bytes) {
        const AtWork working({&self.At});
        Opened(self).SetMappingBlockSize(bytes);
      },
      "Bytes of the file that are in the address space at a time; what is set becomes 16 MiB at least, or "
      "all of a smaller file, and whole pages. Means nothing for a picture in memory.");
  pictures.def_property_readonly(
      "parent",
      [](const Handle& self) -> std::optional<Handle> {
        const AtWork working({&self.At});
        Picture parent = Opened(self).Parent();
        if (!parent) return {};
        Handle made(std::move(parent), self.From);
        return made.Own->Closed ? std::nullopt : std::optional(std::move(made));
      },
      "The picture that this view was made from, while it isn't closed, or None.");
  pictures.def_property_readonly(
      "target",
      [](const Handle& self) -> std::optional<HostHandle> {
        const AtWork working({&self.At});
        HostPicture target = Opened(self).Target();
        if (!target) return {};
        return HostHandle(std::move(target), self.At);
      },
      "The picture of the host that holds the samples, or None.");
  pictures.def_property(
      "debug_picture_enabled", [](const Handle& self) { return Opened(self).DebugPictureEnabled(); },
      [](const Handle& self, bool enabled) { Opened(self).SetDebugPictureEnabled(enabled); },
      "Whether debug_picture shows something.");
  pictures.def_property_readonly(
      "debug_picture",
      [](const Handle& self) -> std::optional<HostHandle> {
        const AtWork working({&self.At});
        HostPicture shown = Opened(self).DebugPicture();
        if (!shown) return {};
        return HostHandle(std::move(shown));
      },
      "The top left corner as a picture of the host, or None.");
  pictures.def("__repr__", [](const Handle& self) {
    if (self.Own->Closed) return std::string("<picturezor.Picture, closed>");
    std::string format;
    for (const auto& [name, value] : EnumNames<Format>::Members)
      if (value == self.Of.ImageFormat()) format = name;
    return "<picturezor.Picture " + std::to_string(self.Of.Width()) + " x " +
           std::to_string(self.Of.Height()) + " " + format + (self.Of.IsMapping() ? ", mapped>" : ">");
  });
}

void AddViews(PictureClass& pictures) {
  const auto view = [&](const char* name, Picture (Picture::*make)() const, const char* help) {
    pictures.def(name, Method(name, make), help);
  };
  view("alpha_channel", &Picture::AlphaChannel, "A view of the alpha samples, as gray.");
  view("red_channel", &Picture::RedChannel, "A view of the red samples, as gray.");
  view("green_channel", &Picture::GreenChannel, "A view of the green samples, as gray.");
  view("blue_channel", &Picture::BlueChannel, "A view of the blue samples, as gray.");
  view("gray_channel", &Picture::GrayChannel, "A view of the gray samples.");
  view("cyan_channel", &Picture::CyanChannel, "A view of the cyan samples, as gray.");
  view("magenta_channel", &Picture::MagentaChannel, "A view of the magenta samples, as gray.");
  view("yellow_channel", &Picture::YellowChannel, "A view of the yellow samples, as gray.");
  view("black_channel", &Picture::BlackChannel, "A view of the black samples, as gray.");
  view("rgb_channels", &Picture::RGBChannels, "A view of red, green and blue. Error for other colours.");
  view("cmyk_channels", &Picture::CMYKChannels, "A view of the four inks. Error for other colours.");
  view("mirrored_view", &Picture::MirroredView, "A view with top and bottom swapped.");
  pictures.def("channel", Method("channel", &Picture::Channel), arg("index"),
               "A view of the samples at a place in the pixel, from 0 on, fillers not counted, as gray. "
               "IndexError outside of it.");
  pictures.def(
      "_view",
      [](const Handle& self, const Rect& rect, bool upwards) {
        const AtWork working({&self.At});
        const Picture& picture = Opened(self);
        const std::int32_t height = picture.Height();
        Rect part = rect;
        // A clip counts rows as they are stored. The first row comes second: then both are in one window.
        if (height > 1) {
          const std::uint8_t* second = picture.RawRow(1).Start();
          if (second < picture.RawRow(0).Start()) part.Y = height - rect.Y - rect.Height;
        }
        if (picture.ChannelCount() == 0 && rect.Width < picture.Width())
          throw std::invalid_argument("a view of pixels without colours has all columns");
        Picture view = picture.ClipImage(part);
        if (view && upwards) view = view.MirroredView();
        return Handle(std::move(view), self.From);
      },
      "A view of a rectangle as the picture shows it, from its last row up if asked for.");
  pictures.def("clip_image", Method("clip_image", py::overload_cast<>(&Picture::ClipImage, py::const_)),
               "A view of the whole.");
  pictures.def(
      "clip_image", Method("clip_image", py::overload_cast<const Rect&>(&Picture::ClipImage, py::const_)),
      arg("rect"),
      "A view of a rectangle (x, y, width, height), whose rows are counted as they are stored. Outside of "
      "the picture it has no rows or columns, and nothing can be done with it.");
}

PictureFactory FactoryOf(const py::object& function) {
  return PictureFactory([call = Reference(function)](std::int32_t width, std::int32_t height, Format format) {
    const py::gil_scoped_acquire locked;
    const py::object made = call.Object()(width, height, format);
    if (made.is_none()) return Picture();
    if (!py::isinstance<Handle>(made)) throw py::type_error("a factory gives a Picture, or None");
    return made.cast<const Handle&>().Of;
  });
}

void AddFactories(py::module_& module, PictureClass& pictures) {
  py::class_<PictureFactory>(module, "Factory",
                             "Makes the pictures that operations need: called with width, height and format, "
                             "it gives a Picture of at least that size, or None to let the next way be "
                             "tried. What it raises comes out of the call that asked; TypeError for anything "
                             "else.")
      .def(py::init(&FactoryOf), arg("function"))
      .def("__eq__", [](const PictureFactory& self, const PictureFactory& other) { return self == other; });
  module.def(
      "set_factory",
      [](const std::optional<PictureFactory>& factory) {
        if (AtWork::Threads() > 0)
          throw Failed("set_factory: threads are at work on pictures, which may need the factory just now");
        PictureFactory::SetFactory(factory.value_or(PictureFactory()));
      },
      arg("factory"),
      "The factory that all pictures are asked from which have none of their own; None for none. Error while "
      "other threads work on pictures.");
  pictures.def_property(
      "factory",
      [](const Handle& self) -> std::optional<PictureFactory> {
        const AtWork working({&self.At});
        PictureFactory factory = Opened(self).Factory();
        return factory ? std::optional(std::move(factory)) : std::nullopt;
      },
      [](const Handle& self, const std::optional<PictureFactory>& factory) {
        const AtWork working({&self.At});
        Opened(self).SetFactory(factory.value_or(PictureFactory()));
      },
      "This picture's own factory, asked before the global one, or None.");
}

}

void AddPictures(py::module_& module, PictureClass& pictures) {
  AddConstructors(pictures);
  AddProperties(pictures);
  AddViews(pictures);
  AddFactories(module, pictures);
}

}
