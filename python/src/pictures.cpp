#include <utility>

#include "handle.h"

// What a picture is: formats, making one, properties, views.

namespace picturezor::python {

namespace {

using py::arg;

/// Names as strings do where a member of the enumeration is asked for.
template <class Enum>
void AddEnum(py::module_& module, const char* name, const char* help,
             const std::vector<std::pair<const char*, Enum>>& members) {
  py::enum_<Enum> type(module, name, help);
  for (const auto& [member, value] : members) type.value(member, value);
  type.def(py::init([name, members](const std::string& text) {
    std::string known;
    for (const auto& [member, value] : members) {
      if (text == member) return value;
      known += (known.empty() ? "" : ", ") + std::string(member);
    }
    throw std::invalid_argument(text + " is no " + name + "; there are " + known);
  }));
  py::implicitly_convertible<py::str, Enum>();
}

void AddEnums(py::module_& module) {
  AddEnum<Format>(module, "Format", "How the samples of a pixel lie in memory, a byte each.",
                  {{"RGB", Format::RGB},
                   {"RGBA", Format::RGBA},
                   {"RGBX", Format::RGBX},
                   {"ARGB", Format::ARGB},
                   {"XRGB", Format::XRGB},
                   {"BGR", Format::BGR},
                   {"BGRA", Format::BGRA},
                   {"BGRX", Format::BGRX},
                   {"ABGR", Format::ABGR},
                   {"XBGR", Format::XBGR},
                   {"G", Format::G},
                   {"GA", Format::GA},
                   {"AG", Format::AG},
                   {"OneOf3", Format::OneOf3},
                   {"TwoOf3", Format::TwoOf3},
                   {"ThreeOf3", Format::ThreeOf3},
                   {"OneOf4", Format::OneOf4},
                   {"TwoOf4", Format::TwoOf4},
                   {"ThreeOf4", Format::ThreeOf4},
                   {"FourOf4", Format::FourOf4},
                   {"Buffer", Format::Buffer},
                   {"CMYK", Format::CMYK},
                   {"CMYKA", Format::CMYKA},
                   {"ACMYK", Format::ACMYK},
                   {"CMYKX", Format::CMYKX},
                   {"XCMYK", Format::XCMYK},
                   {"KYMC", Format::KYMC},
                   {"KYMCA", Format::KYMCA},
                   {"AKYMC", Format::AKYMC},
                   {"KYMCX", Format::KYMCX},
                   {"XKYMC", Format::XKYMC},
                   {"Scaling1", Format::Scaling1},
                   {"Scaling2", Format::Scaling2},
                   {"Scaling3", Format::Scaling3},
                   {"Scaling4", Format::Scaling4},
                   {"Scaling5", Format::Scaling5},
                   {"Scaling6", Format::Scaling6},
                   {"Scaling7", Format::Scaling7},
                   {"Scaling8", Format::Scaling8}});
  AddEnum<Kernel>(module, "Kernel", "How samples are weighted when a picture is resampled.",
                  {{"triangle", Kernel::Triangle},
                   {"box", Kernel::Box},
                   {"lanczos3", Kernel::Lanczos3},
                   {"lanczos8", Kernel::Lanczos8},
                   {"mitchell", Kernel::Mitchell},
                   {"poly3", Kernel::Poly3},
                   {"cubic", Kernel::Cubic}});
  AddEnum<DitherMatrix>(module, "DitherMatrix", "The pattern of thresholds of a dither.",
                        {{"magic2x2", DitherMatrix::Magic2x2},
                         {"magic4x4", DitherMatrix::Magic4x4},
                         {"ordered4x4", DitherMatrix::Ordered4x4},
                         {"lines4x4", DitherMatrix::Lines4x4},
                         {"halftone", DitherMatrix::Halftone90_6x6},
                         {"ordered6x6", DitherMatrix::Ordered6x6},
                         {"ordered8x8", DitherMatrix::Ordered8x8},
                         {"cluster3", DitherMatrix::Cluster3},
                         {"cluster4", DitherMatrix::Cluster4},
                         {"cluster8", DitherMatrix::Cluster8}});
}

Handle Made(Picture picture) {
  if (!picture || !picture.Valid()) throw Failed("not enough memory or disk space for such a picture");
  return Handle(std::move(picture));
}

void RequireSize(std::int32_t width, std::int32_t height) {
  if (width < 1 || height < 1) throw std::invalid_argument("a picture has at least one row and one column");
}

void AddConstructors(PictureClass& pictures) {
  pictures.def(py::init([](std::int32_t width, std::int32_t height, Format format) {
                 RequireSize(width, height);
                 return Made(Picture(width, height, format));
               }),
               arg("width"), arg("height"), arg("format") = Format::RGB,
               "A picture in memory, all samples 0.");
  pictures.def_static(
      "mapped",
      [](const std::filesystem::path& file, std::int32_t width, std::int32_t height, Format format,
         std::int32_t block) {
        RequireSize(width, height);
        if (height < 5) throw std::invalid_argument("a mapped picture has at least 5 rows");
        return Made(Picture::Mapped(file, width, height, format, block));
      },
      arg("file"), arg("width"), arg("height"), arg("format") = Format::RGB, arg("block_size") = 0,
      "A picture in a temporary file, which is created or overwritten and goes away with the picture.");
  pictures.def_static(
      "create",
      [](std::int32_t width, std::int32_t height, Format format) {
        RequireSize(width, height);
        return Made(Picture::Create(width, height, format));
      },
      arg("width"), arg("height"), arg("format") = Format::RGB,
      "A picture from the global factory, or in memory.");
  pictures.def_static("calculate_memory", &Picture::CalculateMemory, arg("width"), arg("height"),
                      arg("format"), "Bytes that a picture in memory takes; 0 where it can't be.");
  pictures.def_static("can_allocate", &Picture::CanAllocate, arg("width"), arg("height"), arg("format"),
                      "Whether there is memory for such a picture now.");
  pictures.def("create_picture", Method("create_picture", &Picture::CreatePicture), arg("width"),
               arg("height"), arg("format"), "A picture from this picture's factory, or in memory.");
  pictures.def("clone", Method("clone", &Picture::Clone), "A copy in memory.");
  pictures.def(
      "close",
      [](Handle& self) {
        const AtWork working({&self});
        if (!std::exchange(self.Closed, true)) self.Of.Close();
      },
      "End the picture. Views and arrays of it go on working; anything else raises ValueError from now on.");
  pictures.def("__enter__", [](py::object self) { return self; });
  pictures.def("__exit__", [](py::object self, py::args) { self.attr("close")(); });
}

template <class T>
void Property(PictureClass& pictures, const char* name, T (Picture::*get)() const, const char* help) {
  pictures.def_property_readonly(
      name, [get](const Handle& self) { return (Opened(self).*get)(); }, help);
}

void AddProperties(PictureClass& pictures) {
  pictures.def_property_readonly(
      "valid", [](const Handle& self) { return !self.Closed && self.Of.Valid(); },
      "False once it is closed.");
  Property(pictures, "width", &Picture::Width, "Columns.");
  Property(pictures, "height", &Picture::Height, "Rows.");
  Property(pictures, "image_format", &Picture::ImageFormat, "The pixel format.");
  Property(pictures, "image_format_string", &Picture::ImageFormatString, "Its name.");
  Property(pictures, "pixel_size", &Picture::PixelSize,
           "Bytes from pixel to pixel; negative in a mirrored view.");
  Property(pictures, "row_size", &Picture::RowSize, "Bytes from row to row.");
  Property(pictures, "row_offset", &Picture::RowOffset, "Bytes from the start of a row to its first pixel.");
  Property(pictures, "total_size", &Picture::TotalSize, "Bytes of all rows.");
  Property(pictures, "channel_count", &Picture::ChannelCount, "Channels, alpha included.");
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
      "Least sixtieths of a second between two yields to the host; 0 is never.");
  pictures.def_property(
      "mapping_block_size", [](const Handle& self) { return Opened(self).MappingBlockSize(); },
      [](const Handle& self, std::int32_t bytes) {
        const AtWork working({&self});
        Opened(self).SetMappingBlockSize(bytes);
      },
      "Bytes of the file that are in the address space at a time.");
  pictures.def_property_readonly(
      "parent",
      [](const Handle& self) -> std::optional<Handle> {
        Picture parent = Opened(self).Parent();
        if (!parent) return {};
        return Handle(std::move(parent), self.Turn);
      },
      "The picture that this view was made from, or None.");
  pictures.def("__repr__", [](const Handle& self) {
    if (self.Closed || !self.Of.Valid()) return std::string("<picturezor.Picture, closed>");
    return "<picturezor.Picture " + std::to_string(self.Of.Width()) + " x " +
           std::to_string(self.Of.Height()) + " " + self.Of.ImageFormatString() +
           (self.Of.IsMapping() ? ", mapped>" : ">");
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
  view("rgb_channels", &Picture::RGBChannels, "A view without alpha.");
  view("cmyk_channels", &Picture::CMYKChannels, "A view without alpha.");
  view("mirrored_view", &Picture::MirroredView, "A view with top and bottom swapped.");
  pictures.def("channel", Method("channel", &Picture::Channel), arg("index"),
               "A view of the samples at a place in the pixel. IndexError outside of it.");
  pictures.def("clip_image", Method("clip_image", py::overload_cast<>(&Picture::ClipImage, py::const_)),
               "A view of the whole.");
  pictures.def("clip_image",
               Method("clip_image", py::overload_cast<const Rect&>(&Picture::ClipImage, py::const_)),
               arg("rect"), "A view of a rectangle (x, y, width, height).");
}

}

void AddPictures(py::module_& module, PictureClass& pictures) {
  AddEnums(module);
  AddConstructors(pictures);
  AddProperties(pictures);
  AddViews(pictures);
}

}
