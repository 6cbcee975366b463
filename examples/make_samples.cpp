// Paints the sample images of this folder: lake.jpg (RGB), badge.png (RGB with alpha) and vignette.png
// (gray).
//   make_samples DIRECTORY

#include <png.h>

#include <cstdio>
// jpeglib.h needs FILE.
#include <jpeglib.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <filesystem>
#include <numbers>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

struct Colour {
  double R = 0, G = 0, B = 0;
};

Colour Mix(Colour a, Colour b, double t) {
  t = std::clamp(t, 0.0, 1.0);
  return {a.R + (b.R - a.R) * t, a.G + (b.G - a.G) * t, a.B + (b.B - a.B) * t};
}

double Hash(int x, int y) {
  std::uint32_t h = std::uint32_t(x) * 0x9E3779B1u ^ std::uint32_t(y) * 0x85EBCA77u;
  h = (h ^ h >> 15) * 0x2C1B3C6Du;
  h = (h ^ h >> 12) * 0x297A2D39u;
  return (h ^ h >> 15) / 4294967296.0;
}

/// Smooth noise from 0 to 1, a wave a unit.
double Noise(double x, double y) {
  const double fx = std::floor(x), fy = std::floor(y);
  const auto ease = [](double t) { return t * t * (3 - 2 * t); };
  const double u = ease(x - fx), v = ease(y - fy);
  const int ix = int(fx), iy = int(fy);
  const double top = std::lerp(Hash(ix, iy), Hash(ix + 1, iy), u);
  const double bottom = std::lerp(Hash(ix, iy + 1), Hash(ix + 1, iy + 1), u);
  return std::lerp(top, bottom, v);
}

double Rough(double x, double y, int octaves) {
  double sum = 0, weight = 0.5;
  for (int i = 0; i < octaves; ++i, x *= 2, y *= 2, weight /= 2) sum += weight * Noise(x, y + 31.7 * i);
  return sum;
}

/// Height of the skyline of a ridge, the nearest being 0, as a part of the picture's height.
double Ridge(int ridge, double x) {
  constexpr double base[] = {0.585, 0.55, 0.50, 0.45}, size[] = {0.07, 0.12, 0.20, 0.26};
  return base[ridge] + size[ridge] * (0.45 - Rough(x * (5.2 - ridge), 7.3 * (ridge + 1), 7));
}

constexpr double Shore = 0.62, SunX = 0.66, SunY = 0.37;

/// What is above the water: y from 0, the top, to Shore. The water mirrors it without the sun, which leaves a
/// path of light there.
Colour Land(double x, double y, double aspect, bool sun) {
  const double far = std::hypot((x - SunX) * aspect, y - SunY);
  Colour sky = Mix({34, 47, 98}, {244, 150, 96}, std::pow(y / 0.5, 1.3));
  sky = Mix(sky, {255, 214, 130}, 0.85 * std::exp(-far * far * 14));
  const double cloud = Rough(x * 3 * aspect, y * 13 + 5, 6) * 1.6 - 0.72 - y * 0.35;
  sky = Mix(sky, Mix({255, 188, 150}, {120, 84, 120}, y * 1.6), std::clamp(cloud * 2.4, 0.0, 0.75));
  if (y < 0.34)
    for (int i = -1; i <= 0; ++i) {
      // A few early stars.
      const int cellX = int(x * 190) + i, cellY = int(y * 130);
      if (Hash(cellX, cellY + 999) > 0.985 && std::hypot(x * 190 - cellX - 0.5, y * 130 - cellY - 0.5) < 0.12)
        sky = Mix(sky, {255, 250, 235}, 0.9 - y * 2.4);
    }
  if (sun) sky = Mix(sky, {255, 246, 214}, (0.052 - far) * 260);
  for (int ridge = 0; ridge <= 3; ++ridge) {
    double skyline = Ridge(ridge, x);
    // Firs on the nearest one.
    if (ridge == 0) {
      const double cell = x * 150, tip = cell - std::floor(cell) - 0.5;
      skyline -= std::max(0.0, (0.5 - std::abs(tip)) * 0.05 * (0.35 + Hash(int(std::floor(cell)), 5)));
    }
    if (y < skyline) continue;
    constexpr Colour shade[] = {{14, 20, 30}, {42, 44, 68}, {84, 70, 104}, {146, 104, 124}};
    Colour rock = shade[ridge];
    const double light = Rough(x * 60 * aspect, y * 60, 4) - 0.45;
    rock = Mix(rock, {255, 190, 140}, 0.07 * ridge * std::max(0.0, light * 4));
    return sky = Mix(rock, {226, 148, 120}, ridge * 0.75 * (y - skyline));
  }
  return sky;
}

Colour Lake(double x, double y, double aspect) {
  if (y < Shore) return Land(x, y, aspect, true);
  const double depth = (y - Shore) / (1 - Shore);
  const double ripple = Rough(x * 9 * aspect, 90 * std::pow(depth, 0.45), 5) - 0.48;
  const double mirrored = Shore - (y - Shore) * 1.02 + ripple * 0.10 * (0.25 + depth);
  const Colour seen =
      Land(std::clamp(x + ripple * 0.012, 0.0, 1.0), std::clamp(mirrored, 0.0, Shore), aspect, false);
  Colour water = Mix(seen, {16, 28, 52}, 0.22 + 0.42 * depth);
  const double path = std::exp(-std::pow((x - SunX) * aspect / (0.03 + 0.13 * depth), 2));
  return Mix(water, {255, 218, 150}, std::clamp(path * (ripple * 5 + 0.12), 0.0, 0.85));
}

std::uint8_t Sample(double value) { return std::uint8_t(std::clamp(std::lround(value), 0L, 255L)); }

std::vector<std::uint8_t> PaintLake(int width, int height) {
  std::vector<std::uint8_t> pixels;
  for (int y = 0; y < height; ++y)
    for (int x = 0; x < width; ++x) {
      Colour sum;
      for (int i = 0; i < 4; ++i) {
        const Colour c = Lake((x + 0.25 + 0.5 * (i & 1)) / width, (y + 0.25 + 0.5 * (i >> 1)) / height,
                              double(width) / height);
        sum = {sum.R + c.R / 4, sum.G + c.G / 4, sum.B + c.B / 4};
      }
      for (const double value : {sum.R, sum.G, sum.B}) pixels.push_back(Sample(value));
    }
  return pixels;
}

/// A compass rose in a ring, clear around it.
std::vector<std::uint8_t> PaintBadge(int edge) {
  std::vector<std::uint8_t> pixels;
  for (int y = 0; y < edge; ++y)
    for (int x = 0; x < edge; ++x) {
      const double u = (x + 0.5) * 2 / edge - 1, v = (y + 0.5) * 2 / edge - 1;
      const double r = std::hypot(u, v), soft = edge / 2.0;
      const auto inside = [&](double distance) { return std::clamp(distance * soft + 0.5, 0.0, 1.0); };
      Colour colour = Mix({24, 40, 72}, {70, 104, 150}, 0.5 - v / 2 - u * 0.2);
      double alpha = inside(0.96 - r) * 0.72;
      const double ring = inside(0.055 - std::abs(r - 0.9));
      colour = Mix(colour, Mix({255, 226, 160}, {190, 130, 50}, (v + 1) / 2), ring);
      alpha = std::max(alpha, ring);
      const double angle = std::atan2(u, -v);
      const double tick =
          inside(0.012 - std::abs(std::sin(angle * 18)) * r / 18) * inside(0.03 - std::abs(r - 0.79));
      colour = Mix(colour, {250, 240, 214}, tick);
      for (const int points : {8, 4}) {
        const double turn = std::numbers::pi * 2 / points;
        const double off = std::remainder(angle, turn), along = r * std::cos(off), across = r * std::sin(off);
        const bool minor = points == 8;
        const double length = minor ? 0.52 : 0.74, wide = minor ? 0.10 : 0.15;
        const double body = inside((length - along) * wide / length - std::abs(across));
        const bool north = !minor && std::abs(angle) < turn / 2;
        const Colour lit = north ? Colour{232, 84, 60} : Colour{252, 244, 226};
        const Colour dim = north ? Colour{150, 36, 30} : Colour{150, 150, 164};
        colour = Mix(colour, across < 0 ? lit : dim, body);
        alpha = std::max(alpha, body);
      }
      for (const double value : {colour.R, colour.G, colour.B, alpha * 255}) pixels.push_back(Sample(value));
    }
  return pixels;
}

/// White in the middle, dark towards the corners.
std::vector<std::uint8_t> PaintVignette(int edge) {
  std::vector<std::uint8_t> pixels;
  for (int y = 0; y < edge; ++y)
    for (int x = 0; x < edge; ++x) {
      const double r = std::hypot((x + 0.5) * 2 / edge - 1, (y + 0.5) * 2 / edge - 1);
      const double t = std::clamp((r - 0.35) / 0.65, 0.0, 1.0);
      pixels.push_back(Sample(255 * (1 - t * t * (3 - 2 * t))));
    }
  return pixels;
}

void WritePNG(const std::filesystem::path& file, int edge, unsigned format,
              const std::vector<std::uint8_t>& pixels) {
  png_image image{};
  image.version = PNG_IMAGE_VERSION;
  image.width = image.height = png_uint_32(edge);
  image.format = format;
  if (!png_image_write_to_file(&image, file.c_str(), 0, pixels.data(), 0, nullptr))
    throw std::runtime_error(file.string() + ": " + image.message);
}

void WriteJPEG(const std::filesystem::path& file, int width, int height,
               const std::vector<std::uint8_t>& pixels) {
  std::FILE* stream = std::fopen(file.c_str(), "wb");
  if (!stream) throw std::runtime_error(file.string() + " can't be written");
  jpeg_error_mgr errors;
  jpeg_compress_struct jpeg{};
  jpeg.err = jpeg_std_error(&errors);
  jpeg_create_compress(&jpeg);
  jpeg_stdio_dest(&jpeg, stream);
  jpeg.image_width = JDIMENSION(width);
  jpeg.image_height = JDIMENSION(height);
  jpeg.input_components = 3;
  jpeg.in_color_space = JCS_RGB;
  jpeg_set_defaults(&jpeg);
  jpeg_set_quality(&jpeg, 90, TRUE);
  jpeg.optimize_coding = TRUE;
  jpeg_start_compress(&jpeg, TRUE);
  while (jpeg.next_scanline < jpeg.image_height) {
    auto row = const_cast<JSAMPROW>(pixels.data() + std::size_t{3} * std::size_t(width) * jpeg.next_scanline);
    jpeg_write_scanlines(&jpeg, &row, 1);
  }
  jpeg_finish_compress(&jpeg);
  jpeg_destroy_compress(&jpeg);
  if (std::fclose(stream) != 0) throw std::runtime_error(file.string() + " can't be written");
}

}

int main(int count, char** arguments) try {
  if (count != 2) throw std::runtime_error("give the directory to write to");
  const std::filesystem::path directory = arguments[1];
  WriteJPEG(directory / "lake.jpg", 1920, 1200, PaintLake(1920, 1200));
  WritePNG(directory / "badge.png", 400, PNG_FORMAT_RGBA, PaintBadge(400));
  WritePNG(directory / "vignette.png", 400, PNG_FORMAT_GRAY, PaintVignette(400));
} catch (const std::exception& failure) {
  std::fprintf(stderr, "make_samples: %s\n", failure.what());
  return 1;
}
