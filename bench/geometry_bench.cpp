#include "peers.h"

// Pixels that change places, and the free rotation.

namespace picturezor::bench {
namespace {

constexpr std::pair<const char*, Format> Formats[] = {
    {"gray", Format::G}, {"RGB", Format::RGB}, {"RGBA", Format::RGBA}};

/// Work of ours on a picture.
Contender Ours(Format format, void (*work)(const Picture&)) {
  return {"PictureZOR", [=] { return [=, picture = TestPicture(format)] { work(picture); }; }};
}
/// Work of ours from a picture into another one that stays.
Contender OursInto(Format format, bool swaps, void (*work)(const Picture&, const Picture&)) {
  return {"PictureZOR", [=] {
            return [=, picture = TestPicture(format),
                    dest = swaps ? Picture(Height, Width, format) : Picture(Width, Height, format)] {
              work(picture, dest);
            };
          }};
}

#ifdef PICTUREZOR_OPENCV
Contender Flip(Format format, int code) {
  return OpenCV(format, [=](cv::Mat& source, cv::Mat&) { cv::flip(source, source, code); });
}
Contender Turn(Format format, int code) {
  return OpenCV(format, [=](cv::Mat& source, cv::Mat& dest) { cv::rotate(source, dest, code); });
}
#endif

void AddFormat(const std::string& name, Format format) {
  const Contender memcpyOfAll = Memcpy(BytesOf(BytesPerPixel(format)));
  const auto race = [&](const char* work, Contender ours, std::vector<Contender> peers) {
    peers.insert(peers.begin(), std::move(ours));
    peers.push_back(memcpyOfAll);
    AddRace("geometry", name + " " + work, std::move(peers));
  };
  std::vector<Contender> mirror, flip, half, left, right, free;
#ifdef PICTUREZOR_OPENCV
  mirror.push_back(Flip(format, 1));
  flip.push_back(Flip(format, 0));
  half.push_back(Flip(format, -1));
  left.push_back(Turn(format, cv::ROTATE_90_COUNTERCLOCKWISE));
  right.push_back(Turn(format, cv::ROTATE_90_CLOCKWISE));
#endif
#ifdef PICTUREZOR_VIPS
  left.push_back(Vips(
      format, [](VipsImage* in, VipsImage** out) { return vips_rot(in, out, VIPS_ANGLE_D270, nullptr); }));
  right.push_back(Vips(
      format, [](VipsImage* in, VipsImage** out) { return vips_rot(in, out, VIPS_ANGLE_D90, nullptr); }));
  free.push_back(
      Vips(format, [](VipsImage* in, VipsImage** out) { return vips_rotate(in, out, 12.0, nullptr); }));
#endif
#ifdef PICTUREZOR_GRAPHICSMAGICK
  free.push_back(GraphicsMagick(
      format, [](Image* image, ExceptionInfo* exception) { return RotateImage(image, 12, exception); }));
#endif
  race("HMirror in place", Ours(format, [](const Picture& p) { p.HMirror(); }), mirror);
  race("VMirror in place", Ours(format, [](const Picture& p) { p.VMirror(); }), flip);
  race("Rotate180 in place", Ours(format, [](const Picture& p) { p.Rotate180(); }), half);
  race("Rotate180", OursInto(format, false, [](const Picture& p, const Picture& d) { p.Rotate180(d); }), {});
  race("Rotate90", OursInto(format, true, [](const Picture& p, const Picture& d) { p.Rotate90(d); }), left);
  race("Rotate270", OursInto(format, true, [](const Picture& p, const Picture& d) { p.Rotate270(d); }),
       right);
  race("Rotate by 12 degrees", Ours(format, [](const Picture& p) { p.Rotate(12); }), free);
}

const auto registered = [] {
  for (const auto& [name, format] : Formats) AddFormat(name, format);
  return true;
}();

}
}
