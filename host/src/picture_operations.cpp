#include "invoke.h"

// What is done to pixels: a member a row of the class, in the order of the rooms.

namespace picturezor {

using namespace model;

bool Picture::Scale(const Picture& source, const Picture& temp, Kernel kernel, std::int32_t width,
                    std::int32_t height) const {
  return Invoke<bool>(*this, "Scale", source, temp, std::int32_t(kernel), width, height);
}
bool Picture::ScaleMT(std::int32_t threads, const Picture& source, const Picture& temp, Kernel kernel,
                      std::int32_t width, std::int32_t height) const {
  return Invoke<bool>(*this, "ScaleMT", threads, source, temp, std::int32_t(kernel), width, height);
}
bool Picture::ScaleFast(const Picture& source, std::int32_t width, std::int32_t height) const {
  return Invoke<bool>(*this, "ScaleFast", source, width, height);
}

void Picture::HMirror() const { Invoke<void>(*this, "HMirror"); }
void Picture::VMirror() const { Invoke<void>(*this, "VMirror"); }
void Picture::Rotate180() const { Invoke<void>(*this, "Rotate180"); }
Picture Picture::Rotate180(const Picture& dest) const { return Invoke<Picture>(*this, "Rotate180", dest); }
Picture Picture::Rotate90(const Picture& dest) const { return Invoke<Picture>(*this, "Rotate90", dest); }
Picture Picture::Rotate270(const Picture& dest) const { return Invoke<Picture>(*this, "Rotate270", dest); }
Picture Picture::Rotate90slow(const Picture& dest) const {
  return Invoke<Picture>(*this, "Rotate90slow", dest);
}
Picture Picture::Rotate270slow(const Picture& dest) const {
  return Invoke<Picture>(*this, "Rotate270slow", dest);
}
Picture Picture::Rotate(double angle) const { return InvokeShort<Picture>(*this, "Rotate", angle); }
Picture Picture::Rotate(double angle, const Background& b) const {
  return Invoke<Picture>(*this, "Rotate", angle, b.Red, b.Green, b.Blue, b.Alpha, b.Gray, b.Cyan, b.Magenta,
                         b.Yellow, b.Black);
}

void Picture::Invert() const { Invoke<void>(*this, "Invert"); }
void Picture::Invert(const Rect& r) const { Invoke<void>(*this, "Invert", r.X, r.Y, r.Width, r.Height); }
bool Picture::AutoLevel() const { return Invoke<bool>(*this, "AutoLevel"); }
bool Picture::AutoLevel(const Rect& r) const {
  return Invoke<bool>(*this, "AutoLevel", r.X, r.Y, r.Width, r.Height);
}
Picture Picture::SolarizeFilter(const Picture& dest) const {
  return Invoke<Picture>(*this, "SolarizeFilter", dest);
}
Picture Picture::GammaFilter(const Picture& dest, double gamma) const {
  return Invoke<Picture>(*this, "GammaFilter", dest, gamma);
}
Picture Picture::GammaFilter(const Picture& dest, double gamma, double alphaGamma) const {
  return Invoke<Picture>(*this, "GammaFilter", dest, gamma, alphaGamma);
}
Picture Picture::GammaFilter(const Picture& dest, double redGamma, double greenGamma,
                             double blueGamma) const {
  return Invoke<Picture>(*this, "GammaFilter", dest, redGamma, greenGamma, blueGamma);
}
Picture Picture::GammaFilter(const Picture& dest, double redGamma, double greenGamma, double blueGamma,
                             double alphaGamma) const {
  return Invoke<Picture>(*this, "GammaFilter", dest, redGamma, greenGamma, blueGamma, alphaGamma);
}
Picture Picture::GainFilter(const Picture& dest, double gain, double bias) const {
  return Invoke<Picture>(*this, "GainFilter", dest, gain, bias);
}
Picture Picture::TransferFilter(const Picture& dest, const IntegerArray& gray) const {
  return Invoke<Picture>(*this, "TransferFilter", dest, gray);
}
Picture Picture::TransferFilter(const Picture& dest, const IntegerArray& gray,
                                const IntegerArray& alpha) const {
  return Invoke<Picture>(*this, "TransferFilter", dest, gray, alpha);
}
Picture Picture::TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                                const IntegerArray& blue) const {
  return Invoke<Picture>(*this, "TransferFilter", dest, red, green, blue);
}
Picture Picture::TransferFilter(const Picture& dest, const IntegerArray& red, const IntegerArray& green,
                                const IntegerArray& blue, const IntegerArray& alpha) const {
  return Invoke<Picture>(*this, "TransferFilter", dest, red, green, blue, alpha);
}
Picture Picture::ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix) const {
  return Invoke<Picture>(*this, "ApplyMatrix", dest, dimension, matrix);
}
Picture Picture::ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                             std::int32_t delta) const {
  return Invoke<Picture>(*this, "ApplyMatrix", dest, dimension, matrix, delta);
}
Picture Picture::ApplyMatrix(const Picture& dest, std::int32_t dimension, const IntegerArray& matrix,
                             std::int32_t delta, double scaleFactor) const {
  return Invoke<Picture>(*this, "ApplyMatrix", dest, dimension, matrix, delta, scaleFactor);
}
Picture Picture::BoxBlurFilter(const Picture& dest, double radius) const {
  return InvokeShort<Picture>(*this, "BoxBlurFilter", dest, radius);
}
Picture Picture::BoxBlurFilter(const Picture& dest, double radius, bool vertical, bool horizontal) const {
  return Invoke<Picture>(*this, "BoxBlurFilter", dest, radius, vertical, horizontal);
}
Picture Picture::BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations) const {
  return InvokeShort<Picture>(*this, "BoxBlurFilter", dest, radius, iterations);
}
Picture Picture::BoxBlurFilter(const Picture& dest, double radius, std::int32_t iterations, bool vertical,
                               bool horizontal) const {
  return Invoke<Picture>(*this, "BoxBlurFilter", dest, radius, iterations, vertical, horizontal);
}
Picture Picture::BoxBlurFractionalFilter(const Picture& dest, double radius) const {
  return Invoke<Picture>(*this, "BoxBlurFractionalFilter", dest, radius);
}
Picture Picture::StampFilter(const Picture& dest, double radius, double threshold, double softness,
                             Color black, Color white) const {
  return Invoke<Picture>(*this, "StampFilter", dest, radius, threshold, softness, black, white);
}
bool Picture::UnsharpFilter(const Picture& original, double amount, std::int32_t threshold) const {
  return Invoke<bool>(*this, "UnsharpFilter", original, amount, threshold);
}
Picture Picture::OilFilter(const Picture& dest, std::int32_t levels, std::int32_t range) const {
  return Invoke<Picture>(*this, "OilFilter", dest, levels, range);
}
Picture Picture::DiffuseFilter(const Picture& dest, std::int32_t level) const {
  return Invoke<Picture>(*this, "DiffuseFilter", dest, level);
}
Picture Picture::EngraveFilter(const Picture& dest, std::int32_t level) const {
  return Invoke<Picture>(*this, "EngraveFilter", dest, level);
}
Picture Picture::NeonFilter(const Picture& dest) const { return Invoke<Picture>(*this, "NeonFilter", dest); }
Picture Picture::DitherFilter(const Picture& dest, DitherMatrix matrix, std::int32_t levels) const {
  return Invoke<Picture>(*this, "DitherFilter", dest, std::int32_t(matrix), levels);
}

void Picture::FillRect(std::int32_t value) const { Invoke<void>(*this, "FillRect", value); }
void Picture::FillRect(const Rect& r, std::int32_t value) const {
  Invoke<void>(*this, "FillRect", r.X, r.Y, r.Width, r.Height, value);
}
void Picture::FillRectRGB(std::int32_t red, std::int32_t green, std::int32_t blue) const {
  Invoke<void>(*this, "FillRectRGB", red, green, blue);
}
void Picture::FillRectRGB(std::int32_t red, std::int32_t green, std::int32_t blue, std::int32_t alpha) const {
  Invoke<void>(*this, "FillRectRGB", red, green, blue, alpha);
}
void Picture::FillRectRGB(const Rect& r, std::int32_t red, std::int32_t green, std::int32_t blue) const {
  Invoke<void>(*this, "FillRectRGB", r.X, r.Y, r.Width, r.Height, red, green, blue);
}
void Picture::FillRectRGB(const Rect& r, std::int32_t red, std::int32_t green, std::int32_t blue,
                          std::int32_t alpha) const {
  Invoke<void>(*this, "FillRectRGB", r.X, r.Y, r.Width, r.Height, red, green, blue, alpha);
}
void Picture::FillRectRGB(Color color) const { Invoke<void>(*this, "FillRectRGB", color); }
void Picture::FillRectRGB(Color color, std::int32_t alpha) const {
  Invoke<void>(*this, "FillRectRGB", color, alpha);
}
void Picture::FillRectRGB(const Rect& r, Color color) const {
  Invoke<void>(*this, "FillRectRGB", r.X, r.Y, r.Width, r.Height, color);
}
void Picture::FillRectRGB(const Rect& r, Color color, std::int32_t alpha) const {
  Invoke<void>(*this, "FillRectRGB", r.X, r.Y, r.Width, r.Height, color, alpha);
}
void Picture::FillRectRandom() const { Invoke<void>(*this, "FillRectRandom"); }
void Picture::FillRectRandom(const Rect& r) const {
  Invoke<void>(*this, "FillRectRandom", r.X, r.Y, r.Width, r.Height);
}
void Picture::ClearRect() const { Invoke<void>(*this, "ClearRect"); }
void Picture::ClearRect(const Rect& r) const {
  Invoke<void>(*this, "ClearRect", r.X, r.Y, r.Width, r.Height);
}
std::int64_t Picture::CompareImages(const Picture& other) const {
  return Invoke<std::int64_t>(*this, "CompareImages", other);
}
bool Picture::CopyPixels(const Picture& source) const { return Invoke<bool>(*this, "CopyPixels", source); }
bool Picture::CopyPixels(const Picture& source, const Rect& r) const {
  return Invoke<bool>(*this, "CopyPixels", source, r.X, r.Y, r.Width, r.Height);
}
bool Picture::CopyPixels(const Picture& source, const Rect& r, std::int32_t sourceX,
                         std::int32_t sourceY) const {
  return Invoke<bool>(*this, "CopyPixels", source, r.X, r.Y, r.Width, r.Height, sourceX, sourceY);
}

bool Picture::Combine(const Picture& image, const Rect& dest, std::int32_t sourceX, std::int32_t sourceY,
                      const CombineOptions& options) const {
  const auto colour = [](const std::optional<Color>& given) { return given ? given->Packed() : -1; };
  return Invoke<bool>(*this, "Combine", image, options.PreMultipliedSource, options.Mask, dest.X, dest.Y,
                      sourceX, sourceY, dest.Width, dest.Height, options.UseColours,
                      colour(options.ForeColour), colour(options.MaskColour));
}

}
