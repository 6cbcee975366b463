#include <benchmark/benchmark.h>

#include <cstring>
#include <memory>

#include "race.h"

#ifdef PICTUREZOR_OPENCV
#include <opencv2/core.hpp>
#include <opencv2/imgproc.hpp>
#endif

// Filling, copying, combining and comparing.

namespace picturezor::bench {
namespace {

Contender Memset(std::size_t bytes, int value) {
  return {"memset", [=] {
            return [=, into = std::make_shared<Bytes>(bytes)] {
              std::memset(into->data(), value, into->size());
              benchmark::ClobberMemory();
            };
          }};
}

template <class Work>
Contender Ours(Format format, Work work) {
  return {"PictureZOR", [=] { return [=, picture = TestPicture(format)] { work(picture); }; }};
}

Contender Copy(Format from, Format into) {
  return {"PictureZOR", [=] {
            return [source = TestPicture(from), dest = TestPicture(into)] { dest.CopyPixels(source); };
          }};
}

Contender RowInFormat(Format from, Format into) {
  return Ours(from, [=](const Picture& picture) {
    for (int y = 0; y < Height; ++y) picture.RowInFormat(y, into);
  });
}

Contender Combine(Format dest, Format image, Format mask) {
  return {"PictureZOR", [=] {
            return [dest = TestPicture(dest), image = TestPicture(image), mask = TestPicture(mask)] {
              dest.Combine(image, {0, 0, Width, Height}, 0, 0, {.Mask = mask});
            };
          }};
}

Contender Compare(Format a, Format b) {
  return {"PictureZOR",
          [=] { return [one = TestPicture(a), other = TestPicture(b)] { one.CompareImages(other); }; }};
}

#ifdef PICTUREZOR_OPENCV

constexpr int RGB2BGRA = cv::COLOR_RGB2BGRA, RGB2GRAY = cv::COLOR_RGB2GRAY, GRAY2RGB = cv::COLOR_GRAY2RGB;

cv::Mat Matrix(int channels, double shade) {
  static const bool oneThread = (cv::setNumThreads(1), NamePeer("OpenCV", CV_VERSION));
  cv::Mat matrix(oneThread ? Height : 0, Width, CV_8UC(channels));
  cv::randu(matrix, cv::Scalar::all(shade), cv::Scalar::all(255));
  return matrix;
}

std::vector<Contender> CvtColor(std::vector<Contender> contenders, int from, int into, int code) {
  contenders.push_back({"OpenCV", [=] {
                          return [source = Matrix(from, 0), dest = Matrix(into, 0), code]() mutable {
                            cv::cvtColor(source, dest, code);
                          };
                        }});
  return contenders;
}

/// Each row by itself into a matrix of its own, as rows of a picture are asked for.
std::vector<Contender> CvtColorByRows(std::vector<Contender> contenders, int from, int code) {
  contenders.push_back({"OpenCV by rows", [=] {
                          return [source = Matrix(from, 0), code] {
                            for (int y = 0; y < Height; ++y) {
                              cv::Mat row;
                              cv::cvtColor(source.row(y), row, code);
                            }
                          };
                        }});
  return contenders;
}

std::vector<Contender> Norm(std::vector<Contender> contenders, int channels) {
  contenders.push_back({"OpenCV", [=] {
                          return [a = Matrix(channels, 0), b = Matrix(channels, 9)] {
                            benchmark::DoNotOptimize(cv::norm(a, b, cv::NORM_L1));
                          };
                        }});
  return contenders;
}

#else

enum { RGB2BGRA, RGB2GRAY, GRAY2RGB };
std::vector<Contender> CvtColor(std::vector<Contender> contenders, int, int, int) { return contenders; }
std::vector<Contender> CvtColorByRows(std::vector<Contender> contenders, int, int) { return contenders; }
std::vector<Contender> Norm(std::vector<Contender> contenders, int) { return contenders; }

#endif

const auto registered = [] {
  const auto race = [](const char* work, std::vector<Contender> contenders) {
    AddRace("composition", work, std::move(contenders));
  };
  race("FillRect RGB", {Ours(Format::RGB, [](const Picture& p) { p.FillRect(77); }), Memset(BytesOf(3), 77)});
  race("FillRectRGB RGB",
       {Ours(Format::RGB, [](const Picture& p) { p.FillRectRGB(7, 8, 9); }), Memset(BytesOf(3), 77)});
  race("ClearRect RGB", {Ours(Format::RGB, [](const Picture& p) { p.ClearRect(); }), Memset(BytesOf(3), 0)});
  race("CopyPixels RGB", {Copy(Format::RGB, Format::RGB), Memcpy(BytesOf(3))});
  race("CopyPixels RGBA", {Copy(Format::RGBA, Format::RGBA), Memcpy(BytesOf(4))});

  const struct {
    const char* Name;
    Format From, Into;
    int FromBytes, IntoBytes, Code;
  } pairs[] = {{"RGB to BGRA", Format::RGB, Format::BGRA, 3, 4, RGB2BGRA},
               {"RGB to gray", Format::RGB, Format::G, 3, 1, RGB2GRAY},
               {"gray to RGB", Format::G, Format::RGB, 1, 3, GRAY2RGB}};
  for (const auto& [name, from, into, fromBytes, intoBytes, code] : pairs) {
    const std::string pair = name;
    AddRace("composition", "CopyPixels " + pair, CvtColor({Copy(from, into)}, fromBytes, intoBytes, code));
    AddRace("composition", "RowInFormat " + pair,
            CvtColorByRows(CvtColor({RowInFormat(from, into)}, fromBytes, intoBytes, code), fromBytes, code));
  }

  race("Combine RGB, gray mask", {Combine(Format::RGB, Format::RGB, Format::G), Memcpy(BytesOf(3))});
  race("Combine RGB, RGB mask", {Combine(Format::RGB, Format::RGB, Format::RGB), Memcpy(BytesOf(3))});
  race("Combine RGBA, gray mask", {Combine(Format::RGBA, Format::RGBA, Format::G), Memcpy(BytesOf(4))});
  race("CompareImages RGB", Norm({Compare(Format::RGB, Format::RGB)}, 3));
  race("CompareImages RGB with BGRX", {Compare(Format::RGB, Format::BGRX)});
  race("CompareImages gray", Norm({Compare(Format::G, Format::G)}, 1));
  return true;
}();

}
}
