#include <pybind11/numpy.h>

#include "handle.h"

// Samples as arrays and bytes.

namespace picturezor::python {

namespace {

using py::arg;

/// The places of the samples in a pixel, in the order red, green, blue | cyan, magenta, yellow, black | gray,
/// and alpha last. Pixels without colours are bytes.
std::vector<std::int32_t> PlanesOf(const Picture& picture) {
  std::vector<std::int32_t> planes;
  if (picture.IsGray()) planes = {picture.GrayOffset()};
  if (picture.IsRGB()) planes = {picture.RedOffset(), picture.GreenOffset(), picture.BlueOffset()};
  if (picture.IsCMYK())
    planes = {picture.CyanOffset(), picture.MagentaOffset(), picture.YellowOffset(), picture.BlackOffset()};
  if (!planes.empty() && picture.HasAlpha()) planes.push_back(picture.AlphaOffset());
  if (planes.empty())
    for (int i = 0; i < picture.ChannelCount(); ++i) planes.push_back(picture.RowOffset() + i);
  return planes;
}

/// rows x columns, and x channels where there is more than one.
py::buffer_info ArrayOf(Handle& self) {
  const Picture& picture = Opened(self);
  if (picture.IsMapping())
    throw std::invalid_argument("a mapped picture isn't in memory as a whole; take rows(), or a copy");
  const std::vector<std::int32_t> planes = PlanesOf(picture);
  const std::int32_t apart = planes.size() > 1 ? planes[1] - planes[0] : 1;
  for (std::size_t i = 1; i < planes.size(); ++i)
    if (planes[i] - planes[i - 1] != apart)
      throw std::invalid_argument(picture.ImageFormatString() +
                                  " has its channels in an order that no array can have; convert it");
  if (!self.Exported) self.Exported = picture.ClipImage();
  std::uint8_t* const first = picture.RawRow(0).Start();
  // Upwards in a view that shows the last row first.
  const py::ssize_t rowStep = picture.Height() > 1 ? picture.RawRow(1).Start() - first : picture.RowSize();
  std::vector<py::ssize_t> shape{picture.Height(), picture.Width()}, strides{rowStep, picture.PixelSize()};
  if (planes.size() > 1) {
    shape.push_back(py::ssize_t(planes.size()));
    strides.push_back(apart);
  }
  return {first + planes[0], 1, "B", py::ssize_t(shape.size()), shape, strides};
}

/// The array's memory, and a reference to it that is given back when the picture ends, on whatever thread.
Handle FromArray(py::array array, std::optional<Format> format) {
  if (!array.dtype().is(py::dtype::of<std::uint8_t>()))
    throw std::invalid_argument("an array of uint8 is needed; array.astype('uint8') makes one");
  if (!array.writeable())
    throw std::invalid_argument("the array is read-only; array.copy() makes one that isn't");
  if (array.ndim() != 2 && array.ndim() != 3)
    throw std::invalid_argument("an array of rows x columns, or rows x columns x channels, is needed");
  const py::ssize_t height = array.shape(0), width = array.shape(1),
                    channels = array.ndim() == 3 ? array.shape(2) : 1;
  constexpr Format usual[] = {Format::Unknown, Format::G,    Format::GA,
                              Format::RGB,     Format::RGBA, Format::CMYKA};
  if (channels < 1 || (!format && channels > 5)) throw std::invalid_argument("an array has 1 to 5 channels");
  const Format of = format ? *format : usual[channels];
  if (BytesPerPixel(of) != channels)
    throw std::invalid_argument("the format has pixels of " + std::to_string(BytesPerPixel(of)) +
                                " bytes, the array of " + std::to_string(channels));
  if (height < 1 || width < 1 || height > INT32_MAX || width > INT32_MAX)
    throw std::invalid_argument("a picture has at least one row and one column");
  const bool packed = (channels == 1 || array.ndim() == 2 || array.strides(2) == 1) &&
                      (width == 1 || array.strides(1) == channels);
  const py::ssize_t stride = height == 1 ? width * channels : array.strides(0);
  if (!packed || stride < width * channels || stride > INT32_MAX)
    throw std::invalid_argument(
        "the pixels of a row must lie side by side; numpy.ascontiguousarray(array) sees to it");
  const std::shared_ptr<void> owner(new py::object(array), [](void* reference) {
    // At the interpreter's end there is nobody to give it back to.
    if (!Py_IsInitialized()) return;
    const py::gil_scoped_acquire locked;
    delete static_cast<py::object*>(reference);
  });
  const MemoryBlock block = MemoryBlock::Over({static_cast<std::uint8_t*>(array.mutable_data()),
                                               std::size_t((height - 1) * stride + width * channels)},
                                              owner);
  Picture picture(block, std::int32_t(width), std::int32_t(height), of, std::int32_t(stride));
  if (!picture.Valid()) throw Failed("from_array: no picture can lie there");
  return Handle(std::move(picture));
}

py::bytes AsBytes(const Bytes& bytes) {
  return py::bytes(reinterpret_cast<const char*>(bytes.data()), bytes.size());
}

std::span<const std::uint8_t> SpanOf(const py::bytes& bytes) {
  const std::string_view view = bytes;
  return {reinterpret_cast<const std::uint8_t*>(view.data()), view.size()};
}

void RequireRow(const Picture& picture, std::int32_t index) {
  if (index < 0 || index >= picture.Height())
    throw py::index_error("row " + std::to_string(index) + " of a picture of " +
                          std::to_string(picture.Height()));
}

}

void AddSamples(py::module_&, PictureClass& pictures) {
  pictures.def_buffer(ArrayOf);
  pictures.def_static(
      "from_array", FromArray, arg("array"), arg("format") = py::none(),
      "A picture on the memory of an array of uint8, rows x columns (x channels): what is written to one "
      "shows in the other. The pixels of a row must lie side by side; rows may be apart.");
  const auto bytes = [](auto get) {
    return [get](const Handle& self, std::int32_t index, auto... more) {
      RequireRow(Opened(self), index);
      Bytes row;
      {
        const AtWork working({&self});
        row = get(self.Of, index, more...);
      }
      return AsBytes(row);
    };
  };
  pictures.def(
      "row",
      [bytes](const Handle& self, std::int32_t index) {
        return bytes([](const Picture& p, std::int32_t y) { return p.Row(y); })(self, index);
      },
      arg("index"), "The bytes of a stored row, a copy. IndexError outside of the picture.");
  pictures.def(
      "set_row",
      [](const Handle& self, std::int32_t index, const py::bytes& row) {
        RequireRow(Opened(self), index);
        const auto samples = SpanOf(row);
        const AtWork working({&self});
        self.Of.SetRow(index, samples);
      },
      arg("index"), arg("row"),
      "Store a row. IndexError outside of the picture, ValueError for a wrong length.");
  pictures.def(
      "row_in_format",
      [bytes](const Handle& self, std::int32_t index, Format format, bool invertAlpha) {
        const py::bytes row = bytes([](const Picture& p, std::int32_t y, Format of, bool invert) {
          return p.RowInFormat(y, of, invert);
        })(self, index, format, invertAlpha);
        if (py::len(row) == 0) throw Failed("row_in_format: there is no way to that format");
        return row;
      },
      arg("index"), arg("format"), arg("invert_alpha") = false,
      "A row as packed pixels of a format, a copy.");
  pictures.def(
      "set_row_in_format",
      [](const Handle& self, std::int32_t index, Format format, const py::bytes& row, bool invertAlpha) {
        RequireRow(Opened(self), index);
        const auto samples = SpanOf(row);
        const AtWork working({&self});
        self.Of.SetRowInFormat(index, format, invertAlpha, samples);
      },
      arg("index"), arg("format"), arg("row"), arg("invert_alpha") = false,
      "Store a row of packed pixels of a format.");
  pictures.def(
      "data_in_format",
      [](const Handle& self, Format format) {
        Bytes all;
        {
          const AtWork working({&self});
          all = Opened(self).DataStringInFormat(format);
        }
        if (all.empty()) throw Failed("data_in_format: there is no way to that format");
        return AsBytes(all);
      },
      arg("format"), "All rows as packed pixels of a format, a copy below 2 GiB.");
  pictures.def(
      "set_data_in_format",
      [](const Handle& self, Format format, const py::bytes& all) {
        const auto samples = SpanOf(all);
        const AtWork working({&self});
        Opened(self).SetDataStringInFormat(format, samples);
      },
      arg("format"), arg("data"), "Store all rows from packed pixels of a format.");
}

}
