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
               "Make a picture in memory, all samples 0. Raises ValueError for a size below 1 or an unknown "
               "format, Error for 2 GiB or more, or without enough memory.");
  pictures.def_static(
      "mapped",
      [](const std::filesystem::path& file, std::int32_t width, std::int32_t height, NamedFormat format,
         std::int32_t block) {
        RequireSize(width, height);
        if (height < 5) throw std::invalid_argument("a mapped picture has at least 5 rows");
        return Handle(Picture::Mapped(file, width, height, format, block));
      },
      arg("file"), arg("width"), arg("height"), arg("format") = rgb, arg("block_size") = 0,
      "Make a picture in a temporary file, which is created or overwritten, and deleted with the picture. "
      "About block_size bytes of it, at least 16 MiB, are mapped into the address space at a time. Raises "
      "ValueError for fewer than 5 rows; Error for a file that can't be written or that another picture "
      "uses, or without enough disk space.");
  pictures.def_static(
      "from_host",
      [](const HostHandle& picture, bool useAlpha) {
        const AtWork working({&picture.At});
        return Handle(Picture(picture.Of, useAlpha));
      },
      arg("picture"), arg("use_alpha") = false,
      "Make a picture that shares the pixels of a host picture: what is written to one shows in the other. "
      "With use_alpha, the byte before the colours of a 32-bit pixel is alpha. Raises Error unless the "
      "pixels are in a GWorld of 24 or 32 bits.");
  pictures.def_static(
      "create",
      [](std::int32_t width, std::int32_t height, NamedFormat format) {
        RequireSize(width, height);
        const AtWork working({});
        return Handle(Picture::Create(width, height, format));
      },
      arg("width"), arg("height"), arg("format") = rgb,
      "Make a picture through the global factory, or in memory. Raises ValueError for a size below 1, Error "
      "without enough memory.");
  const auto byFormat = [](auto function) {
    return [function](std::int32_t width, std::int32_t height, NamedFormat format) {
      return function(width, height, format);
    };
  };
  pictures.def_static("calculate_memory", byFormat(&Picture::CalculateMemory), arg("width"), arg("height"),
                      arg("format"),
                      "Return the bytes that a picture in memory takes; 0 for a size below 1. Pictures of 2 "
                      "GiB or more can't be made in memory.");
  pictures.def_static("can_allocate", byFormat(&Picture::CanAllocate), arg("width"), arg("height"),
                      arg("format"),
                      "Return whether enough memory for such a picture is free now. False for a size below "
                      "1, and for 4 GiB or more.");
  pictures.def(
      "create_picture",
      [](const Handle& self, std::int32_t width, std::int32_t height, NamedFormat format) {
        RequireSize(width, height);
        const AtWork working({&self.At});
        return Handle(Opened(self).CreatePicture(width, height, format), self.From);
      },
      arg("width"), arg("height"), arg("format"),
      "Make a picture through this picture's factory, else through the global one, else in memory. Raises "
      "ValueError for a size below 1, Error without enough memory.");
  pictures.def("clone", Method("clone", &Picture::Clone),
               "Return a copy in memory. Raises Error for a mapped picture; copy() copies any picture.");
  pictures.def(
      "close",
      [](const Handle& self) {
        const AtWork working({&self.At});
        if (!std::exchange(self.Own->Closed, true)) self.Of.Close();
      },
      "Close the picture. Its views and arrays stay valid; every other use of it raises ValueError from now "
      "on.");
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
      "valid", [](const Handle& self) { return !self.Own->Closed; }, "False once the picture is closed.");
  Property(pictures, "width", &Picture::Width, "Width in pixels.");
  Property(pictures, "height", &Picture::Height, "Height in pixels.");
  Property(pictures, "image_format", &Picture::ImageFormat, "The pixel format.");
  Property(pictures, "image_format_string", &Picture::ImageFormatString,
           "The class's own name of the pixel format, empty if it has none. For RGBA it is \"RBBA\", which "
           "programs compare with; image_format.name is \"RGBA\".");
  Property(pictures, "pixel_size", &Picture::PixelSize, "Bytes per pixel.");
  Property(pictures, "row_size", &Picture::RowSize,
           "The stride: bytes from the start of one row to the start of the next.");
  Property(pictures, "row_offset", &Picture::RowOffset,
           "For a view, the number of stored rows above its first row; otherwise 0.");
  Property(pictures, "total_size", &Picture::TotalSize, "row_size times the number of stored rows.");
  Property(pictures, "channel_count", &Picture::ChannelCount,
           "Number of channels, alpha included; 0 for a picture that shares the pixels of a host picture.");
  Property(pictures, "is_gray", &Picture::IsGray, "Whether the format is gray, with or without alpha.");
  Property(pictures, "is_rgb", &Picture::IsRGB,
           "Whether the format has red, green and blue, with or without alpha.");
  Property(pictures, "is_cmyk", &Picture::IsCMYK, "Whether the format is CMYK, with or without alpha.");
  Property(pictures, "is_mapping", &Picture::IsMapping, "Whether the samples are in a mapped file.");
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
    Property(pictures, has, hasGet,
             (std::string("Whether the picture has a ") + plane + " channel.").c_str());
    Property(pictures, offset, offsetGet,
             (std::string("Bytes from the start of a row to its first ") + plane + " sample.").c_str());
  }
  pictures.def_property(
      "yield_ticks", [](const Handle& self) { return Opened(self).YieldTicks(); },
      [](const Handle& self, std::int32_t ticks) { Opened(self).SetYieldTicks(ticks); },
      "The shortest time between two yields to the host, in sixtieths of a second; 0 or less means never.");
  pictures.def_property(
      "mapping_block_size", [](const Handle& self) { return Opened(self).MappingBlockSize(); },
      [](const Handle& self, std::int32_t bytes) {
        const AtWork working({&self.At});
        Opened(self).SetMappingBlockSize(bytes);
      },
      "Bytes of the file that are mapped into the address space at a time. A value that is set is raised to "
      "at least 16 MiB, rounded to whole pages, and limited to the file. Has no meaning for a picture in "
      "memory.");
  pictures.def_property_readonly(
      "parent",
      [](const Handle& self) -> std::optional<Handle> {
        const AtWork working({&self.At});
        Picture parent = Opened(self).Parent();
        if (!parent) return {};
        Handle made(std::move(parent), self.From);
        return made.Own->Closed ? std::nullopt : std::optional(std::move(made));
      },
      "The picture that this view was made from; None if it is closed, or if this isn't a view.");
  pictures.def_property_readonly(
      "target",
      [](const Handle& self) -> std::optional<HostHandle> {
        const AtWork working({&self.At});
        HostPicture target = Opened(self).Target();
        if (!target) return {};
        return HostHandle(std::move(target), self.At);
      },
      "The host picture that holds the samples, or None.");
  pictures.def_property(
      "debug_picture_enabled", [](const Handle& self) { return Opened(self).DebugPictureEnabled(); },
      [](const Handle& self, bool enabled) { Opened(self).SetDebugPictureEnabled(enabled); },
      "Whether debug_picture returns a picture; False at first.");
  pictures.def_property_readonly(
      "debug_picture",
      [](const Handle& self) -> std::optional<HostHandle> {
        const AtWork working({&self.At});
        HostPicture shown = Opened(self).DebugPicture();
        if (!shown) return {};
        return HostHandle(std::move(shown));
      },
      "The top left corner, at most 512 x 512 pixels, as a host picture; None unless debug_picture_enabled "
      "is set.");
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
  view("alpha_channel", &Picture::AlphaChannel,
       "Return a view of the alpha channel, as a gray picture. Raises Error if there is none.");
  view("red_channel", &Picture::RedChannel,
       "Return a view of the red channel, as a gray picture. Raises Error if there is none.");
  view("green_channel", &Picture::GreenChannel,
       "Return a view of the green channel, as a gray picture. Raises Error if there is none.");
  view("blue_channel", &Picture::BlueChannel,
       "Return a view of the blue channel, as a gray picture. Raises Error if there is none.");
  view("gray_channel", &Picture::GrayChannel,
       "Return a view of the gray channel. Raises Error if there is none.");
  view("cyan_channel", &Picture::CyanChannel,
       "Return a view of the cyan channel, as a gray picture. Raises Error if there is none.");
  view("magenta_channel", &Picture::MagentaChannel,
       "Return a view of the magenta channel, as a gray picture. Raises Error if there is none.");
  view("yellow_channel", &Picture::YellowChannel,
       "Return a view of the yellow channel, as a gray picture. Raises Error if there is none.");
  view("black_channel", &Picture::BlackChannel,
       "Return a view of the black channel, as a gray picture. Raises Error if there is none.");
  view("rgb_channels", &Picture::RGBChannels,
       "Return a view of red, green and blue without alpha. Raises Error unless is_rgb is true.");
  view(
      "cmyk_channels", &Picture::CMYKChannels,
      "Return a view of cyan, magenta, yellow and black without alpha. Raises Error unless is_cmyk is true.");
  view("mirrored_view", &Picture::MirroredView, "Return a view with the rows in reverse order.");
  pictures.def("channel", Method("channel", &Picture::Channel), arg("index"),
               "Return a view of a channel by its position in the pixel, from 0, not counting filler bytes, "
               "as a gray picture. Raises IndexError for a position that doesn't exist.");
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
          throw std::invalid_argument("a view of a format without a colour model has all columns");
        Picture view = picture.ClipImage(part);
        if (view && upwards) view = view.MirroredView();
        return Handle(std::move(view), self.From);
      },
      "Return a view of a rectangle of the picture as it is shown, with its rows in reverse order if "
      "`upwards`.");
  pictures.def("clip_image", Method("clip_image", py::overload_cast<>(&Picture::ClipImage, py::const_)),
               "Return a view of the whole picture.");
  pictures.def("clip_image",
               Method("clip_image", py::overload_cast<const Rect&>(&Picture::ClipImage, py::const_)),
               arg("rect"),
               "Return a view of a rectangle (x, y, width, height), whose y counts rows in the order in "
               "which they are stored. A rectangle outside the picture gives a view without rows or columns, "
               "which can't be used.");
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
  py::class_<PictureFactory>(
      module, "Factory",
      "Makes the pictures that operations need, by a function that is called with width, height and format. "
      "It returns a Picture of at least that size, or None to let the next factory or the default be used. "
      "An exception that it raises is raised by the operation; any other result raises TypeError.")
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
      "Set the global factory, for all pictures that have none of their own; None removes it. Raises Error "
      "while other threads work on pictures.");
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
      "This picture's own factory, which is asked before the global one, or None.");
}

}

void AddPictures(py::module_& module, PictureClass& pictures) {
  AddConstructors(pictures);
  AddProperties(pictures);
  AddViews(pictures);
  AddFactories(module, pictures);
}

}
