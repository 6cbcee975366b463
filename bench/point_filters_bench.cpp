#include "peers.h"

// Filters that look at one sample at a time, from one picture into another one; Invert, AutoLevel and
// UnsharpFilter in place.

namespace picturezor::bench {
namespace {

using Work = std::function<void(const Picture& source, const Picture& dest)>;

Contender Ours(Format format, Work work) {
  return {"PictureZOR", [=] {
            return [source = TestPicture(format), dest = TestPicture(format), work] { work(source, dest); };
          }};
}

#ifdef PICTUREZOR_OPENCV
/// A table of so many channels, other values in each.
cv::Mat LookUpTable(int channels) {
  cv::Mat table(1, 256, CV_8UC(channels));
  for (int i = 0; i < 256 * channels; ++i) table.data[i] = std::uint8_t(255 - i / channels + i % channels);
  return table;
}

OpenCVWork LookUp(int tables) {
  return [table = LookUpTable(tables)](cv::Mat& source, cv::Mat& dest) { cv::LUT(source, table, dest); };
}
#endif

/// A filter beside a table of OpenCV with as many channels, and a copy.
void AddTableRace(const std::string& name, Format format, [[maybe_unused]] int tables, Work work) {
  std::vector<Contender> contenders{Ours(format, work)};
#ifdef PICTUREZOR_OPENCV
  contenders.push_back(OpenCV(format, LookUp(tables)));
#endif
#ifdef PICTUREZOR_VIPS
  contenders.push_back(Vips(format, [tables](VipsImage* in, VipsImage** out) {
    std::vector<std::uint8_t> entries;
    for (int i = 0; i < 256 * tables; ++i) entries.push_back(std::uint8_t(255 - i / tables + i % tables));
    VipsImage* table =
        vips_image_new_from_memory_copy(entries.data(), entries.size(), 256, 1, tables, VIPS_FORMAT_UCHAR);
    const int failed = vips_maplut(in, out, table, nullptr);
    g_object_unref(table);
    return failed;
  }));
#endif
  contenders.push_back(Memcpy(BytesOf(BytesPerPixel(format))));
  AddRace("filters", name, std::move(contenders));
}

const auto registered = [] {
  for (const auto& [name, format] :
       {std::pair{"Invert RGB", Format::RGB}, {"Invert RGBX", Format::RGBX}, {"Invert RGBA", Format::RGBA}}) {
    std::vector<Contender> contenders{
        Ours(format, [](const Picture& source, const Picture&) { source.Invert(); })};
#ifdef PICTUREZOR_OPENCV
    contenders.push_back(OpenCV(format, [](cv::Mat& source, cv::Mat&) { cv::bitwise_not(source, source); }));
#endif
#ifdef PICTUREZOR_VIPS
    contenders.push_back(
        Vips(format, [](VipsImage* in, VipsImage** out) { return vips_invert(in, out, nullptr); }));
#endif
    contenders.push_back(Memcpy(BytesOf(BytesPerPixel(format))));
    AddRace("filters", name, std::move(contenders));
  }

  std::vector<std::int32_t> values;
  for (int i = 0; i < 256; ++i) values.push_back(255 - i);
  const IntegerArray array(values);
  for (const auto& [suffix, format] :
       {std::pair{"gray", Format::G}, {"RGB", Format::RGB}, {"RGBX", Format::RGBX}, {"RGBA", Format::RGBA}}) {
    const auto named = [&](const char* filter) { return std::string(filter) + " " + suffix; };
    AddTableRace(named("SolarizeFilter"), format, 1,
                 [](const Picture& s, const Picture& d) { s.SolarizeFilter(d); });
    AddTableRace(named("GammaFilter"), format, 1,
                 [](const Picture& s, const Picture& d) { s.GammaFilter(d, 2.2); });
    if (format == Format::G) continue;
    const int channels = BytesPerPixel(format);
    AddTableRace(named("GammaFilter, three gammas,"), format, channels,
                 [](const Picture& s, const Picture& d) { s.GammaFilter(d, 2.2, 1.8, 0.7); });
  }
  AddTableRace("GainFilter RGB", Format::RGB, 1,
               [](const Picture& s, const Picture& d) { s.GainFilter(d, 0.7, 0.4); });
  AddTableRace("TransferFilter RGB", Format::RGB, 1,
               [=](const Picture& s, const Picture& d) { s.TransferFilter(d, array); });

  for (const double amount : {0.5, 0.3}) {
    std::vector<Contender> unsharp{{"PictureZOR", [=] {
                                      const Picture picture = TestPicture(Format::RGB);
                                      const Picture sharp(Width, Height, Format::RGB);
                                      return [=, blurred = picture.BoxBlurFilter({}, 2)] {
                                        // What has been sharpened again and again is no picture any more.
                                        sharp.CopyPixels(picture);
                                        sharp.UnsharpFilter(blurred, amount, 4);
                                      };
                                    }}};
#ifdef PICTUREZOR_OPENCV
    // Of a copy as well, and without a threshold.
    unsharp.push_back(OpenCV(Format::RGB, [=, copy = cv::Mat()](cv::Mat& source, cv::Mat& beside) mutable {
      source.copyTo(copy);
      cv::addWeighted(copy, 1 + 4 * amount, beside, -4 * amount, 0, copy);
    }));
#endif
    unsharp.push_back(Memcpy(BytesOf(3)));
    AddRace("filters",
            amount == 0.5 ? "UnsharpFilter of a copy, RGB" : "UnsharpFilter of a copy, RGB, doubtful factor",
            std::move(unsharp));
  }

  std::vector<Contender> level{
      Ours(Format::RGB, [](const Picture& source, const Picture&) { source.AutoLevel(); })};
  std::vector<Contender> dither{Ours(Format::RGB, [](const Picture& source, const Picture& dest) {
    source.DitherFilter(dest, DitherMatrix::Ordered4x4, 2);
  })};
#ifdef PICTUREZOR_GRAPHICSMAGICK
  level.push_back(GraphicsMagick(Format::RGB, [](Image* image, ExceptionInfo*) -> Image* {
    NormalizeImage(image);
    return nullptr;
  }));
  dither.push_back(GraphicsMagick(Format::RGB, [](Image* image, ExceptionInfo* exception) -> Image* {
    // Or else it does nothing the second time.
    image->is_monochrome = image->is_grayscale = MagickFalse;
    RandomChannelThresholdImage(image, "all", "4x4", exception);
    return nullptr;
  }));
#endif
  level.push_back(Memcpy(BytesOf(3)));
  dither.push_back(Memcpy(BytesOf(3)));
  AddRace("filters", "AutoLevel RGB", std::move(level));
  return AddRace("filters", "DitherFilter RGB", std::move(dither));
}();

}
}
