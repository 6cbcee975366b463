#include "scale_peers.h"

#include <cmath>
#include <cstdlib>
#include <map>
#include <memory>
#include <optional>
#include <stdexcept>

#include "peers.h"

#ifdef PICTUREZOR_ZIMG
#include <zimg.h>
#endif
#ifdef PICTUREZOR_PILLOW
#include <Python.h>
#endif

namespace picturezor::bench {
namespace {

using Prepared = std::function<void()>;

[[maybe_unused]] int ChannelsOf(Format format) { return BytesPerPixel(format); }

/// The packed samples of the test picture, which all contenders scale.
[[maybe_unused]] std::shared_ptr<Bytes> PackedSource(Format format, const Sizes& sizes) {
  return std::make_shared<Bytes>(
      TestPicture(format, sizes.FromWidth, sizes.FromHeight).DataStringInFormat(format));
}

[[maybe_unused]] void Require(bool done, const char* who) {
  if (!done) throw std::runtime_error(who);
}

#ifdef PICTUREZOR_ZIMG
std::optional<Contender> Zimg(Format format, Kernel kernel, const Sizes& sizes) {
  struct Filter {
    zimg_resample_filter_e Name;
    double A, B;
  };
  static const std::map<Kernel, Filter> filters{{Kernel::Triangle, {ZIMG_RESIZE_BILINEAR, NAN, NAN}},
                                                {Kernel::Lanczos3, {ZIMG_RESIZE_LANCZOS, 3, NAN}},
                                                {Kernel::Lanczos8, {ZIMG_RESIZE_LANCZOS, 8, NAN}},
                                                {Kernel::Mitchell, {ZIMG_RESIZE_BICUBIC, 1.0 / 3, 1.0 / 3}},
                                                {Kernel::Poly3, {ZIMG_RESIZE_BICUBIC, 0, 0.75}}};
  if (!filters.contains(kernel)) return {};
  return Contender{"zimg", [=] {
                     zimg_image_format from, into;
                     zimg_image_format_default(&from, ZIMG_API_VERSION);
                     from.width = unsigned(sizes.FromWidth);
                     from.height = unsigned(sizes.FromHeight);
                     from.pixel_type = ZIMG_PIXEL_BYTE;
                     from.pixel_range = ZIMG_RANGE_FULL;
                     into = from;
                     into.width = unsigned(sizes.IntoWidth);
                     into.height = unsigned(sizes.IntoHeight);
                     zimg_graph_builder_params parameters;
                     zimg_graph_builder_params_default(&parameters, ZIMG_API_VERSION);
                     const Filter& filter = filters.at(kernel);
                     parameters.resample_filter = filter.Name;
                     parameters.filter_param_a = filter.A;
                     parameters.filter_param_b = filter.B;
#if defined(__x86_64__) || defined(__i386__)
                     constexpr zimg_cpu_type_e processors[] = {ZIMG_CPU_X86_SSE2, ZIMG_CPU_X86_AVX2,
                                                               ZIMG_CPU_X86_AVX512_SKX, ZIMG_CPU_AUTO_64B};
                     parameters.cpu_type = processors[InstructionSets()];
#endif
                     const auto build = [=] {
                       const std::shared_ptr<zimg_filter_graph> graph(
                           zimg_filter_graph_build(&from, &into, &parameters), zimg_filter_graph_free);
                       Require(bool(graph), "zimg");
                       return graph;
                     };
                     std::size_t scratch = 0;
                     zimg_filter_graph_get_tmp_size(build().get(), &scratch);
                     // Rows and planes aligned as it asks for.
                     const auto aligned = [](std::size_t bytes) {
                       return std::shared_ptr<std::uint8_t>(
                           static_cast<std::uint8_t*>(std::aligned_alloc(64, (bytes + 63) / 64 * 64)),
                           std::free);
                     };
                     const std::ptrdiff_t fromStride = (sizes.FromWidth + 63) / 64 * 64,
                                          intoStride = (sizes.IntoWidth + 63) / 64 * 64;
                     const int channels = ChannelsOf(format);
                     const auto source = aligned(std::size_t(fromStride) * sizes.FromHeight * channels);
                     const auto dest = aligned(std::size_t(intoStride) * sizes.IntoHeight * channels);
                     const auto temporary = aligned(scratch);
                     const auto packed = PackedSource(format, sizes);
                     for (int c = 0; c < channels; ++c)
                       for (int y = 0; y < sizes.FromHeight; ++y)
                         for (int x = 0; x < sizes.FromWidth; ++x)
                           source.get()[(std::ptrdiff_t{c} * sizes.FromHeight + y) * fromStride + x] =
                               (*packed)[(std::size_t(y) * sizes.FromWidth + x) * channels + c];
                     return Prepared([=] {
                       // As a user would: the weights are part of the work.
                       const auto graph = build();
                       for (int c = 0; c < channels; ++c) {
                         zimg_image_buffer_const in{ZIMG_API_VERSION, {}};
                         zimg_image_buffer out{ZIMG_API_VERSION, {}};
                         in.plane[0] = {source.get() + std::ptrdiff_t{c} * sizes.FromHeight * fromStride,
                                        fromStride, ZIMG_BUFFER_MAX};
                         out.plane[0] = {dest.get() + std::ptrdiff_t{c} * sizes.IntoHeight * intoStride,
                                         intoStride, ZIMG_BUFFER_MAX};
                         Require(zimg_filter_graph_process(graph.get(), &in, &out, temporary.get(), nullptr,
                                                           nullptr, nullptr, nullptr) == ZIMG_ERROR_SUCCESS,
                                 "zimg");
                       }
                     });
                   }};
}
const bool zimgNamed = [] {
  unsigned major, minor, micro;
  zimg_get_version_info(&major, &minor, &micro);
  return NamePeer("zimg", std::to_string(major) + "." + std::to_string(minor) + "." + std::to_string(micro));
}();
#endif

#ifdef PICTUREZOR_VIPS
std::optional<Contender> VipsScale(Format format, Kernel kernel, const Sizes& sizes) {
  const bool enlarges = sizes.IntoWidth > sizes.FromWidth;
  // Its kernels serve to reduce; it enlarges by interpolation, of which linear is the same work.
  if (kernel != Kernel::Triangle && (kernel != Kernel::Lanczos3 || enlarges)) return {};
  const VipsKernel of = kernel == Kernel::Triangle ? VIPS_KERNEL_LINEAR : VIPS_KERNEL_LANCZOS3;
  const double factor = double(sizes.IntoWidth) / sizes.FromWidth;
  return Vips(
      format,
      [=](VipsImage* in, VipsImage** out) {
        // No shrinking by whole numbers before the kernel, which is coarser.
        return vips_resize(in, out, factor, "kernel", of, "gap", 0.0, nullptr);
      },
      sizes.FromWidth, sizes.FromHeight);
}
#endif

#ifdef PICTUREZOR_OPENCV
std::optional<Contender> OpenCVScale(Format format, Kernel kernel, const Sizes& sizes) {
  const bool enlarges = sizes.IntoWidth > sizes.FromWidth;
  // Its other methods don't look at all pixels when they reduce.
  if (!(kernel == Kernel::Box && !enlarges) && !(kernel == Kernel::Triangle && enlarges)) return {};
  const cv::Size size(sizes.IntoWidth, sizes.IntoHeight);
  return OpenCV(
      format,
      [=](cv::Mat& source, cv::Mat& dest) {
        cv::resize(source, dest, size, 0, 0, enlarges ? cv::INTER_LINEAR : cv::INTER_AREA);
      },
      sizes.FromWidth, sizes.FromHeight);
}
#endif

#ifdef PICTUREZOR_PILLOW
std::optional<Contender> Pillow(Format format, Kernel kernel, const Sizes& sizes) {
  if (kernel != Kernel::Triangle && kernel != Kernel::Box && kernel != Kernel::Lanczos3) return {};
  return Contender{"Pillow", [=] {
                     if (!Py_IsInitialized()) Py_InitializeEx(0);
                     const char* mode = format == Format::RGB ? "RGB" : format == Format::RGBA ? "RGBA" : "L";
                     const char* filter = kernel == Kernel::Triangle ? "BILINEAR"
                                          : kernel == Kernel::Box    ? "BOX"
                                                                     : "LANCZOS";
                     const auto packed = PackedSource(format, sizes);
                     PyObject* names = PyDict_New();
                     PyDict_SetItemString(names, "__builtins__", PyEval_GetBuiltins());
                     PyObject* samples = PyBytes_FromStringAndSize(
                         reinterpret_cast<const char*>(packed->data()), Py_ssize_t(packed->size()));
                     PyDict_SetItemString(names, "samples", samples);
                     Py_DECREF(samples);
                     const std::string program =
                         std::string("from PIL import Image\nimage = Image.frombytes('") + mode + "', (" +
                         std::to_string(sizes.FromWidth) + ", " + std::to_string(sizes.FromHeight) +
                         "), samples)\ndef work(): image.resize((" + std::to_string(sizes.IntoWidth) + ", " +
                         std::to_string(sizes.IntoHeight) + "), Image." + filter + ")\n";
                     PyObject* ran = PyRun_String(program.c_str(), Py_file_input, names, names);
                     if (!ran) PyErr_Print();
                     Require(ran, "Pillow");
                     const std::shared_ptr<PyObject> held(names, [](PyObject* object) { Py_DECREF(object); });
                     PyObject* work = PyDict_GetItemString(names, "work");
                     return Prepared([=] {
                       PyObject* done = PyObject_CallObject(work, nullptr);
                       Require(done && held, "Pillow");
                       Py_DECREF(done);
                     });
                   }};
}
const bool pillowNamed = [] {
  Py_InitializeEx(0);
  PyObject* module = PyImport_ImportModule("PIL");
  PyObject* version = module ? PyObject_GetAttrString(module, "__version__") : nullptr;
  return NamePeer("Pillow", version ? PyUnicode_AsUTF8(version) : "of an unknown version");
}();
#endif

#ifdef PICTUREZOR_GRAPHICSMAGICK
std::optional<Contender> GraphicsMagickScale(Format format, Kernel kernel, const Sizes& sizes) {
  // Tens of times slower than the others; one format tells as much as three.
  if (format != Format::RGB) return {};
  if (kernel != Kernel::Triangle && kernel != Kernel::Box && kernel != Kernel::Lanczos3) return {};
  const FilterTypes filter = kernel == Kernel::Triangle ? TriangleFilter
                             : kernel == Kernel::Box    ? BoxFilter
                                                        : LanczosFilter;
  const auto width = unsigned(sizes.IntoWidth), height = unsigned(sizes.IntoHeight);
  return GraphicsMagick(
      format,
      [=](Image* image, ExceptionInfo* exception) {
        return ResizeImage(image, width, height, filter, 1.0, exception);
      },
      sizes.FromWidth, sizes.FromHeight);
}
#endif

}

std::vector<Contender> ScalePeers([[maybe_unused]] Format format, [[maybe_unused]] Kernel kernel,
                                  [[maybe_unused]] const Sizes& sizes) {
  std::vector<Contender> peers;
  [[maybe_unused]] const auto add = [&](std::optional<Contender> peer) {
    if (peer) peers.push_back(std::move(*peer));
  };
#ifdef PICTUREZOR_ZIMG
  add(Zimg(format, kernel, sizes));
#endif
#ifdef PICTUREZOR_VIPS
  add(VipsScale(format, kernel, sizes));
#endif
#ifdef PICTUREZOR_OPENCV
  add(OpenCVScale(format, kernel, sizes));
#endif
#ifdef PICTUREZOR_PILLOW
  add(Pillow(format, kernel, sizes));
#endif
#ifdef PICTUREZOR_GRAPHICSMAGICK
  add(GraphicsMagickScale(format, kernel, sizes));
#endif
  return peers;
}

}
