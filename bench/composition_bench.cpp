#include <benchmark/benchmark.h>

#include <cstring>

#include "peers.h"

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

std::vector<Contender> BesideNorm(Contender ours, [[maybe_unused]] Format format) {
  std::vector<Contender> contenders{std::move(ours)};
#ifdef PICTUREZOR_OPENCV
  contenders.push_back(
      OpenCV(format, [](cv::Mat& a, cv::Mat& b) { benchmark::DoNotOptimize(cv::norm(a, b, cv::NORM_L1)); }));
#endif
  return contenders;
}

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

  for (const auto& [name, from, into] : ConversionsOfCvtColor) {
    std::vector<Contender> contenders{Copy(from, into)};
    AddCvtColor(contenders, from, into);
    AddRace("composition", std::string("CopyPixels ") + name, std::move(contenders));
  }
  race("Combine RGB, gray mask", {Combine(Format::RGB, Format::RGB, Format::G), Memcpy(BytesOf(3))});
  race("Combine RGB, RGB mask", {Combine(Format::RGB, Format::RGB, Format::RGB), Memcpy(BytesOf(3))});
  race("Combine RGBA, gray mask", {Combine(Format::RGBA, Format::RGBA, Format::G), Memcpy(BytesOf(4))});
  race("CompareImages RGB", BesideNorm(Compare(Format::RGB, Format::RGB), Format::RGB));
  race("CompareImages RGB with BGRX", {Compare(Format::RGB, Format::BGRX)});
  race("CompareImages gray", BesideNorm(Compare(Format::G, Format::G), Format::G));
  return true;
}();

}
}
