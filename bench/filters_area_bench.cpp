#include "peers.h"

// Filters that look at the surroundings of a pixel; RGB, one thread each.

namespace picturezor::bench {
namespace {

Contender Ours(const std::function<void(const Picture& source, const Picture& dest)>& filter) {
  return {"PictureZOR", [=] {
            return [filter, source = TestPicture(Format::RGB), dest = Picture(Width, Height, Format::RGB)] {
              filter(source, dest);
            };
          }};
}

void Race(const std::string& work, std::vector<Contender> contenders) {
  contenders.push_back(Memcpy(BytesOf(3)));
  AddRace("filters", work, std::move(contenders));
}

void RaceBlur(int radius) {
  Race("box blur, radius " + std::to_string(radius),
       {Ours([=](const Picture& source, const Picture& dest) { source.BoxBlurFilter(dest, radius); }),
#ifdef PICTUREZOR_OPENCV
        OpenCV(Format::RGB,
               [=](cv::Mat& source, cv::Mat& dest) {
                 cv::blur(source, dest, cv::Size(2 * radius + 1, 2 * radius + 1), cv::Point(-1, -1),
                          cv::BORDER_REPLICATE);
               })
#endif
       });
}

void RaceMatrix(const std::string& name, int dimension, const std::vector<std::int32_t>& weights,
                double scale) {
  Race(name, {
                 Ours([=](const Picture& source, const Picture& dest) {
                   source.ApplyMatrix(dest, dimension, IntegerArray(weights), 0, scale);
                 }),
#ifdef PICTUREZOR_OPENCV
                 OpenCV(Format::RGB,
                        [=](cv::Mat& source, cv::Mat& dest) {
                          cv::Mat kernel(dimension, dimension, CV_32F);
                          for (std::size_t i = 0; i < weights.size(); ++i)
                            kernel.ptr<float>()[i] = float(weights[i] * scale);
                          cv::filter2D(source, dest, -1, kernel, cv::Point(-1, -1), 0, cv::BORDER_REPLICATE);
                        }),
#endif
#ifdef PICTUREZOR_VIPS
                 Vips(Format::RGB,
                      [=](VipsImage* in, VipsImage** out) {
                        VipsImage* kernel = vips_image_new_matrix(dimension, dimension);
                        for (std::size_t i = 0; i < weights.size(); ++i)
                          *VIPS_MATRIX(kernel, int(i) % dimension, int(i) / dimension) = weights[i];
                        vips_image_set_double(kernel, "scale", 1 / scale);
                        const int failed =
                            vips_conv(in, out, kernel, "precision", VIPS_PRECISION_INTEGER, nullptr);
                        g_object_unref(kernel);
                        return failed;
                      }),
#endif
             });
}

void RaceOil(int levels, int range) {
  Race("oil, range " + std::to_string(range) + ", " + std::to_string(levels) + " levels",
       {Ours([=](const Picture& source, const Picture& dest) { source.OilFilter(dest, levels, range); }),
#ifdef PICTUREZOR_GRAPHICSMAGICK
        GraphicsMagick(
            Format::RGB,
            [=](Image* source, ExceptionInfo* exception) { return OilPaintImage(source, range, exception); })
#endif
       });
}

const auto registered = [] {
  for (const int radius : {3, 10, 50}) RaceBlur(radius);
  RaceMatrix("matrix 3 x 3, sharpen", 3, {-1, -2, -1, -2, 13, -2, -1, -2, -1}, 1.0);
  RaceMatrix("matrix 3 x 3, mean", 3, std::vector<std::int32_t>(9, 1), 1.0 / 9);
  RaceMatrix("matrix 5 x 5, Gauss", 5,
             {1, 4, 7, 4, 1, 4, 16, 26, 16, 4, 7, 26, 41, 26, 7, 4, 16, 26, 16, 4, 1, 4, 7, 4, 1}, 1.0 / 273);
  // Products that fit 16 bits few at a time.
  RaceMatrix("matrix 5 x 5, large weights", 5, {-9, 31,  -22, 14,  5,  40, -7, 60, -33, 12,  -18, 25, 100,
                                                25, -18, 12,  -33, 60, -7, 40, 5,  14,  -22, 31,  -9},
             0.004);
  for (const int levels : {20, 256}) RaceOil(levels, 3);
  Race("fractional blur",
       {Ours([](const Picture& source, const Picture& dest) { source.BoxBlurFractionalFilter(dest, 0.5); })});
  Race("engrave", {Ours([](const Picture& source, const Picture& dest) { source.EngraveFilter(dest, 1); })});
  Race("neon", {Ours([](const Picture& source, const Picture& dest) { source.NeonFilter(dest); })});
  Race("diffuse, level 3",
       {Ours([](const Picture& source, const Picture& dest) { source.DiffuseFilter(dest, 3); })});
  return true;
}();

}
}
