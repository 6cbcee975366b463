#pragma once
#include <memory>

#include "race.h"

#ifdef PICTUREZOR_OPENCV
#include <opencv2/imgproc.hpp>
#endif
#ifdef PICTUREZOR_GRAPHICSMAGICK
#include <magick/api.h>
#endif
#ifdef PICTUREZOR_VIPS
#include <vips/vips.h>
#endif

// The peers that are there, each at work on the test picture, on one thread. Each keeps pixels its own way.

namespace picturezor::bench {

#ifdef PICTUREZOR_OPENCV

/// Work from a matrix, which may be changed, into another one of the same kind at first.
using OpenCVWork = std::function<void(cv::Mat& source, cv::Mat& dest)>;

inline Contender OpenCV(Format format, OpenCVWork work, int width = Width, int height = Height) {
  NamePeer("OpenCV", CV_VERSION);
  return {"OpenCV", [=] {
            cv::setNumThreads(1);
            Bytes samples = TestPicture(format, width, height).DataStringInFormat(format);
            const cv::Mat picture(height, width, CV_8UC(BytesPerPixel(format)), samples.data());
            return [work, source = picture.clone(), dest = picture.clone()]() mutable { work(source, dest); };
          }};
}

#endif

/// Changes of format that OpenCV has under one name.
inline constexpr struct {
  const char* Name;
  Format From, Into;
} ConversionsOfCvtColor[] = {{"RGB to BGRA", Format::RGB, Format::BGRA},
                             {"RGB to gray", Format::RGB, Format::G},
                             {"gray to RGB", Format::G, Format::RGB}};

/// Adds OpenCV at such a change, if it is there: of the whole picture, or of each row into a matrix of its
/// own.
inline void AddCvtColor([[maybe_unused]] std::vector<Contender>& contenders, [[maybe_unused]] Format from,
                        [[maybe_unused]] Format into, [[maybe_unused]] bool byRows = false) {
#ifdef PICTUREZOR_OPENCV
  const int code = from == Format::G   ? cv::COLOR_GRAY2RGB
                   : into == Format::G ? cv::COLOR_RGB2GRAY
                                       : cv::COLOR_RGB2BGRA;
  contenders.push_back(OpenCV(from, [=](cv::Mat& source, cv::Mat& dest) {
    if (!byRows) return cv::cvtColor(source, dest, code);
    for (int y = 0; y < source.rows; ++y) {
      cv::Mat row;
      cv::cvtColor(source.row(y), row, code);
    }
  }));
  if (byRows) contenders.back().Name = "OpenCV by rows";
#endif
}

#ifdef PICTUREZOR_GRAPHICSMAGICK

/// Work that changes an image and returns null, or makes a new one.
using GraphicsMagickWork = std::function<Image*(Image* image, ExceptionInfo* exception)>;

inline Contender GraphicsMagick(Format format, GraphicsMagickWork work, int width = Width,
                                int height = Height) {
  NamePeer("GraphicsMagick", MagickLibVersionText);
  return {"GraphicsMagick", [=] {
            InitializeMagick(nullptr);
            SetMagickResourceLimit(ThreadsResource, 1);
            const auto exception = std::shared_ptr<ExceptionInfo>(new ExceptionInfo, [](ExceptionInfo* held) {
              DestroyExceptionInfo(held);
              delete held;
            });
            GetExceptionInfo(exception.get());
            const char* map = format == Format::G ? "I" : format == Format::RGB ? "RGB" : "RGBA";
            const Bytes samples = TestPicture(format, width, height).DataStringInFormat(format);
            const std::shared_ptr<Image> image(ConstituteImage(unsigned(width), unsigned(height), map,
                                                               CharPixel, samples.data(), exception.get()),
                                               DestroyImage);
            return [=] {
              if (Image* made = work(image.get(), exception.get())) DestroyImage(made);
            };
          }};
}

#endif

#ifdef PICTUREZOR_VIPS

/// Work that gives 0 and a new image, whose samples are then written to memory.
using VipsWork = std::function<int(VipsImage* in, VipsImage** out)>;

inline Contender Vips(Format format, VipsWork work, int width = Width, int height = Height) {
  [[maybe_unused]] static const bool named =
      VIPS_INIT("picturezor_bench") == 0 && NamePeer("libvips", vips_version_string());
  return {"libvips", [=] {
            vips_concurrency_set(1);
            vips_cache_set_max(0);
            auto samples =
                std::make_shared<Bytes>(TestPicture(format, width, height).DataStringInFormat(format));
            return [=] {
              VipsImage* in = vips_image_new_from_memory(samples->data(), samples->size(), width, height,
                                                         BytesPerPixel(format), VIPS_FORMAT_UCHAR);
              VipsImage* out = nullptr;
              std::size_t size = 0;
              void* result = work(in, &out) == 0 ? vips_image_write_to_memory(out, &size) : nullptr;
              g_free(result);
              if (out) g_object_unref(out);
              g_object_unref(in);
            };
          }};
}

#endif

}
