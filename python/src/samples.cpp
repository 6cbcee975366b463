#include <pybind11/numpy.h>

#include <algorithm>
#include <cstring>
#include <utility>

#include "handle.h"

// Samples as arrays and bytes.

namespace picturezor::python {

namespace {

using py::arg;
using Array = py::array_t<std::uint8_t>;

/// Where the samples of a row stand: the channels of a pixel side by side, in the order of the format's name.
struct PixelLayout {
  std::int32_t First = 0, Channels = 1, Step = 1;
};

PixelLayout LayoutOf(const Picture& picture) {
  std::vector<std::int32_t> planes;
  const auto add = [&](bool has, std::int32_t offset) {
    if (has) planes.push_back(offset);
  };
  add(picture.HasRed(), picture.RedOffset());
  add(picture.HasGreen(), picture.GreenOffset());
  add(picture.HasBlue(), picture.BlueOffset());
  add(picture.HasGray(), picture.GrayOffset());
  add(picture.HasAlpha(), picture.AlphaOffset());
  add(picture.HasCyan(), picture.CyanOffset());
  add(picture.HasMagenta(), picture.MagentaOffset());
  add(picture.HasYellow(), picture.YellowOffset());
  add(picture.HasBlack(), picture.BlackOffset());
  // Pixels without colours are bytes.
  if (planes.empty()) return {0, picture.PixelSize(), picture.PixelSize()};
  return {*std::ranges::min_element(planes), std::int32_t(planes.size()), picture.PixelSize()};
}

std::vector<py::ssize_t> ShapeOf(std::int32_t rows, const Picture& picture, const PixelLayout& layout) {
  std::vector<py::ssize_t> shape{rows, picture.Width()};
  if (layout.Channels > 1) shape.push_back(layout.Channels);
  return shape;
}

std::uint8_t* StartOfRow(const Picture& picture, std::int32_t y) {
  const MemoryBlock row = picture.RawRow(y);
  if (!row) throw Failed("a row of the picture can't be reached");
  return row.Start();
}

/// Keeps an object of the library as long as the array that shows its memory.
template <class T>
py::capsule Keep(T kept) {
  return py::capsule(new T(std::move(kept)), [](void* held) { delete static_cast<T*>(held); });
}

/// An array on the samples of a picture in memory.
Array View(const Handle& self) {
  std::vector<py::ssize_t> strides;
  PixelLayout layout;
  std::uint8_t* first = nullptr;
  Picture view;
  {
    const AtWork working({&self.At});
    const Picture& picture = Opened(self);
    if (picture.IsMapping())
      throw std::invalid_argument(
          "a mapped picture isn't in memory as a whole: to_array() copies it, rows() gives parts");
    // Outlives close().
    view = picture.ClipImage();
    if (!view) throw Failed("not enough memory for a view");
    layout = LayoutOf(picture);
    first = StartOfRow(view, 0);
    const std::int32_t height = picture.Height();
    const py::ssize_t apart = height > 1 ? StartOfRow(view, 1) - first : picture.RowSize();
    // A picture of the host may have its rows anywhere.
    if (picture.Target())
      for (std::int32_t y = 2; y < height; ++y)
        if (StartOfRow(view, y) != first + y * apart)
          throw std::invalid_argument(
              "the rows of this host picture aren't evenly spaced; to_array() copies it");
    strides = {apart, layout.Step};
  }
  if (layout.Channels > 1) strides.push_back(1);
  const auto shape = ShapeOf(view.Height(), view, layout);
  const std::uint8_t* samples = first + layout.First;
  return Array(shape, strides, samples, Keep(std::move(view)));
}

void RequireRows(const Picture& picture, std::int32_t first, std::int32_t count) {
  if (first < 0 || count < 0 || count > picture.Height() - first)
    throw py::index_error("rows " + std::to_string(first) + " to " +
                          std::to_string(std::int64_t{first} + count - 1) + " of a picture of " +
                          std::to_string(picture.Height()));
}

/// Moves the samples of some rows between a picture and packed ones.
template <class Copy>
void ForRows(const Handle& self, std::int32_t first, std::int32_t count, std::uint8_t* packed, Copy&& copy) {
  const AtWork working({&self.At});
  const Picture& picture = Opened(self);
  RequireRows(picture, first, count);
  const PixelLayout layout = LayoutOf(picture);
  const std::int32_t width = picture.Width();
  for (std::int32_t y = 0; y < count; ++y) {
    std::uint8_t* row = StartOfRow(picture, first + y) + layout.First;
    if (layout.Step == layout.Channels) {
      copy(row, packed, std::size_t(width) * std::size_t(layout.Channels));
      packed += std::ptrdiff_t{width} * layout.Channels;
      continue;
    }
    for (std::int32_t x = 0; x < width; ++x, row += layout.Step, packed += layout.Channels)
      copy(row, packed, std::size_t(layout.Channels));
  }
}

Array ReadRows(const Handle& self, std::int32_t first, std::int32_t count) {
  RequireRows(Opened(self), first, count);
  Array rows(ShapeOf(count, self.Of, LayoutOf(self.Of)));
  ForRows(self, first, count, rows.mutable_data(),
          [](const std::uint8_t* row, std::uint8_t* packed, std::size_t bytes) {
            std::memcpy(packed, row, bytes);
          });
  return rows;
}

void WriteRows(const Handle& self, std::int32_t first,
               const py::array_t<std::uint8_t, py::array::c_style>& rows) {
  const auto shape =
      ShapeOf(rows.ndim() > 0 ? std::int32_t(rows.shape(0)) : 0, Opened(self), LayoutOf(self.Of));
  if (!std::equal(shape.begin(), shape.end(), rows.shape(), rows.shape() + rows.ndim()))
    throw std::invalid_argument("the array has another shape than the rows");
  ForRows(self, first, std::int32_t(shape[0]), const_cast<std::uint8_t*>(rows.data()),
          [](std::uint8_t* row, const std::uint8_t* packed, std::size_t bytes) {
            std::memcpy(row, packed, bytes);
          });
}

struct Extent {
  const std::uint8_t *First, *End;
};

/// The memory that an array is a part of, as far as arrays tell.
Extent MemoryBehind(const py::array& array, py::ssize_t bytes) {
  py::array root = array;
  for (py::object base = root.base(); py::isinstance<py::array>(base); base = root.base())
    root = py::reinterpret_borrow<py::array>(base);
  const auto* first = static_cast<const std::uint8_t*>(root.data());
  if (root.flags() & (py::array::c_style | py::array::f_style)) return {first, first + root.nbytes()};
  first = static_cast<const std::uint8_t*>(array.data());
  return {first, first + bytes};
}

/// The array's memory, and a reference to it that is given back when the picture ends.
Handle FromArray(const py::array& array, const std::optional<Named<Format>>& format) {
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
  if (channels < 1 || (!format && channels > 5))
    throw std::invalid_argument("an array must have 1 to 5 channels");
  const Format of = format ? Format(*format) : usual[channels];
  if (BytesPerPixel(of) != channels)
    throw std::invalid_argument("the format has pixels of " + std::to_string(BytesPerPixel(of)) +
                                " bytes, the array of " + std::to_string(channels));
  if (height < 1 || width < 1 || height > INT32_MAX || width > INT32_MAX)
    throw std::invalid_argument("a picture has at least one row and one column");
  const bool packed = (channels == 1 || array.ndim() == 2 || array.strides(2) == 1) &&
                      (width == 1 || array.strides(1) == channels);
  const bool upwards = height > 1 && array.strides(0) < 0;
  const py::ssize_t rowBytes = width * channels, stride = height == 1 ? rowBytes
                                                          : upwards   ? -array.strides(0)
                                                                      : array.strides(0);
  if (!packed || stride < rowBytes || stride > INT32_MAX)
    throw std::invalid_argument(
        "the pixels of a row must be contiguous; numpy.ascontiguousarray(array) makes them so");
  auto* first = const_cast<std::uint8_t*>(static_cast<const std::uint8_t*>(array.data()));
  if (upwards) first -= (height - 1) * stride;
  // The last row's bytes up to the next one belong to the picture. Where they aren't the array's to give,
  // each row begins a few pixels earlier, and the picture is clipped.
  const Extent memory = MemoryBehind(array, (height - 1) * stride + rowBytes);
  const py::ssize_t missing = std::max<py::ssize_t>(0, first + height * stride - memory.End);
  const py::ssize_t before = (missing + channels - 1) / channels;
  if (before * channels > std::min<py::ssize_t>(first - memory.First, stride - rowBytes))
    throw std::invalid_argument(
        "the array's memory ends with its last pixel; numpy.ascontiguousarray(array) has no gaps");
  const std::shared_ptr<void> owner = std::make_shared<Reference>(array);
  const MemoryBlock block =
      MemoryBlock::Over({first - before * channels, std::size_t(height * stride)}, owner);
  const std::int32_t columns = std::int32_t(width), rows = std::int32_t(height);
  Picture picture(block, std::int32_t(before) + columns, rows, of, std::int32_t(stride));
  if (before > 0) picture = picture.ClipImage({std::int32_t(before), 0, columns, rows});
  if (upwards && picture) picture = picture.MirroredView();
  return Handle(std::move(picture));
}

/// A block of the host's memory, with what keeps it.
Array BlockAsArray(const MemoryBlock& block, std::size_t size, Picture keeper) {
  const std::uint8_t* start = block.Start();
  return Array(std::vector<py::ssize_t>{py::ssize_t(size)}, std::vector<py::ssize_t>{1}, start,
               Keep(std::pair(block, std::move(keeper))));
}

Array RawRow(const Handle& self, std::int32_t index) {
  MemoryBlock row;
  Picture view;
  {
    const AtWork working({&self.At});
    if (Opened(self).IsMapping())
      throw std::invalid_argument(
          "the window of a mapped picture moves; row() copies a row, rows() gives a block of rows");
    RequireRows(self.Of, index, 1);
    view = self.Of.ClipImage();
    row = view ? view.RawRow(index) : MemoryBlock();
    if (!row) throw Failed("raw_row: the row can't be reached");
  }
  return BlockAsArray(row, row.Data().size(), std::move(view));
}

std::optional<Array> Memory(const Handle& self) {
  MemoryBlock memory;
  Picture view;
  std::size_t size = 0;
  {
    const AtWork working({&self.At});
    if (Opened(self).IsMapping())
      throw std::invalid_argument("the window of a mapped picture moves; rows() gives a block of rows");
    view = self.Of.ClipImage();
    memory = view ? view.Memory() : MemoryBlock();
    if (!memory) return {};
    const std::uint8_t* ends[] = {StartOfRow(view, 0), StartOfRow(view, view.Height() - 1)};
    if (std::max(ends[0], ends[1]) < memory.Start()) throw Failed("memory: the rows lie elsewhere");
    size = std::size_t(std::max(ends[0], ends[1]) - memory.Start() + view.RowSize());
  }
  return BlockAsArray(memory, size, std::move(view));
}

std::optional<Array> MemoryTarget(const Handle& self) {
  MemoryBlock block;
  {
    const AtWork working({&self.At});
    block = Opened(self).MemoryTarget();
  }
  if (!block) return {};
  return BlockAsArray(block, block.Data().size(), {});
}

int GetBuffer(PyObject* object, Py_buffer* buffer, int flags) {
  try {
    const Array array = View(py::handle(object).cast<const Handle&>());
    return PyObject_GetBuffer(array.ptr(), buffer, flags);
  } catch (const std::exception& failed) {
    PyErr_SetString(PyExc_BufferError, failed.what());
  }
  buffer->obj = nullptr;
  return -1;
}

/// Bytes that a method gives; none where there is no way to a format.
template <class Get>
py::bytes Taken(const Handle& self, const char* name, Get&& get) {
  Bytes bytes;
  {
    const AtWork working({&self.At});
    bytes = get(Opened(self));
  }
  if (bytes.empty()) throw Failed(std::string(name) + ": it can't be converted to that format");
  return AsBytes(bytes);
}

template <class Put>
void Stored(const Handle& self, const py::buffer& bytes, Put&& put) {
  const GivenBytes given(bytes);
  const AtWork working({&self.At});
  put(Opened(self), std::span<const std::uint8_t>(given));
}

void AddRows(PictureClass& pictures) {
  using NamedFormat = Named<Format>;
  using Samples = std::span<const std::uint8_t>;
  pictures.def(
      "row",
      [](const Handle& self, std::int32_t index) {
        return Taken(self, "row", [=](const Picture& picture) { return picture.Row(index); });
      },
      arg("index"),
      "Return a copy of a stored row: row_size bytes, filler and padding included. Raises IndexError for a "
      "row outside the picture.");
  pictures.def(
      "set_row",
      [](const Handle& self, std::int32_t index, const py::buffer& row) {
        Stored(self, row, [=](const Picture& picture, Samples samples) { picture.SetRow(index, samples); });
      },
      arg("index"), arg("row"),
      "Store the first row_size bytes as a row, filler and padding included. Raises IndexError for a row "
      "outside the picture, ValueError for too few bytes.");
  pictures.def(
      "row_in_format",
      [](const Handle& self, std::int32_t index, NamedFormat format, std::optional<bool> invertAlpha) {
        return Taken(self, "row_in_format", [=](const Picture& picture) {
          return invertAlpha ? picture.RowInFormat(index, format, *invertAlpha)
                             : picture.RowInFormat(index, format);
        });
      },
      arg("index"), arg("format"), arg("invert_alpha") = py::none(),
      "Return a copy of a row as packed pixels of a format. Gray is copied to all four channels of CMYK. "
      "Alpha is 0 if the picture has none; with invert_alpha, it is 255 minus the picture's alpha. Raises "
      "IndexError for a row outside the picture, Error if the row can't be converted to the format, such as "
      "between RGB and CMYK.");
  pictures.def(
      "set_row_in_format",
      [](const Handle& self, std::int32_t index, NamedFormat format, const py::buffer& row,
         std::optional<bool> invertAlpha) {
        Stored(self, row, [=](const Picture& picture, Samples samples) {
          if (invertAlpha)
            picture.SetRowInFormat(index, format, *invertAlpha, samples);
          else
            picture.SetRowInFormat(index, format, samples);
        });
      },
      arg("index"), arg("format"), arg("row"), arg("invert_alpha") = py::none(),
      "Store a row from packed pixels of a format; with invert_alpha, 255 minus their alpha is stored. "
      "Raises IndexError for a row outside the picture, ValueError for too few bytes, Error between RGB and "
      "CMYK. Formats without a colour model (Buffer, Scaling1 to Scaling8) store nothing.");
  pictures.def(
      "row_string_in_format",
      [](const Handle& self, std::int32_t index, NamedFormat format) {
        return Taken(self, "row_string_in_format",
                     [=](const Picture& picture) { return picture.RowStringInFormat(index, format); });
      },
      arg("index"), arg("format"), "Return a row as row_in_format does, through a string of the host.");
  pictures.def(
      "set_row_string_in_format",
      [](const Handle& self, std::int32_t index, NamedFormat format, const py::buffer& row) {
        Stored(self, row, [=](const Picture& picture, Samples samples) {
          picture.SetRowStringInFormat(index, format, samples);
        });
      },
      arg("index"), arg("format"), arg("row"),
      "Store a row as set_row_in_format does, through a string of the host.");
  pictures.def(
      "data_string_in_format",
      [](const Handle& self, NamedFormat format) {
        return Taken(self, "data_string_in_format",
                     [=](const Picture& picture) { return picture.DataStringInFormat(format); });
      },
      arg("format"),
      "Return a copy of all rows as packed pixels of a format, less than 2 GiB. Raises Error for more, and "
      "if the picture can't be converted to the format.");
  pictures.def(
      "set_data_string_in_format",
      [](const Handle& self, NamedFormat format, const py::buffer& data) {
        Stored(self, data, [=](const Picture& picture, Samples samples) {
          picture.SetDataStringInFormat(format, samples);
        });
      },
      arg("format"), arg("data"),
      "Store all rows from packed pixels of a format, less than 2 GiB. Raises ValueError for too few bytes, "
      "Error between RGB and CMYK. Formats without a colour model (Buffer, Scaling1 to Scaling8) store "
      "nothing.");
}

}

void SetBuffer(PyHeapTypeObject* type) {
  type->as_buffer.bf_getbuffer = GetBuffer;
  type->ht_type.tp_as_buffer = &type->as_buffer;
}

void AddSamples(PictureClass& pictures) {
  AddRows(pictures);
  pictures.def_property_readonly(
      "__array_interface__", [](const Handle& self) { return View(self).attr("__array_interface__"); },
      "The array interface, by which numpy accesses the samples of a picture in memory. Raises ValueError "
      "for a mapped picture.");
  pictures.def_static(
      "from_array", FromArray, arg("array"), arg("format") = py::none(),
      "Make a picture that shares the memory of an array of uint8, rows x columns (x channels): what is "
      "written to one shows in the other. The pixels of a row must be contiguous; rows may have any stride "
      "that keeps them apart, and may run upwards. Without a format, 1 to 5 channels are taken as G, GA, "
      "RGB, RGBA and CMYKA. Raises ValueError for other arrays, and for read-only ones.");
  pictures.def(
      "to_array", [](const Handle& self) { return ReadRows(self, 0, Opened(self).Height()); },
      "Return a copy of the samples: rows x columns and, if there is more than one channel, x channels in "
      "the order of the format's name.");
  pictures.def("_read_rows", ReadRows, arg("first"), arg("count"));
  pictures.def("_write_rows", WriteRows, arg("first"), arg("rows"));
  pictures.def("raw_row", RawRow, arg("index"),
               "Return an array of bytes that shares the memory of a stored row, filler and padding "
               "included. Raises IndexError for a row outside the picture, ValueError for a mapped picture.");
  pictures.def_property_readonly("memory", Memory,
                                 "All stored rows as an array of bytes that shares their memory, or None. "
                                 "Raises ValueError for a mapped picture.");
  pictures.def_property_readonly(
      "memory_target", MemoryTarget,
      "The caller's memory that holds the samples, as an array of bytes, or None.");
}

}
