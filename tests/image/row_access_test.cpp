#include <gmock/gmock.h>

#include "support/every_store.h"
#include "support/every_target.h"

namespace picturezor {
namespace {

using testing::Each;

char FamilyOf(const std::string& layout) {
  for (char family : {'R', 'g', 'C'})
    if (layout.find(family) != std::string::npos) return family;
  return 0;
}

/// What one pixel becomes, plane by plane; false where there is no way.
bool ConvertPixel(const std::string& from, const std::uint8_t* source, const std::string& into,
                  std::uint8_t* dest, bool invertAlpha) {
  const auto get = [&](char plane) { return int(source[from.find(plane)]); };
  const auto put = [&](char plane, int value) { dest[into.find(plane)] = std::uint8_t(value); };
  const char a = FamilyOf(from), b = FamilyOf(into);
  if (!a || !b || (a == 'R' && b == 'C') || (a == 'C' && b == 'R')) return false;
  if (a == b) {
    for (char plane : std::string(a == 'R' ? "RGB" : a == 'g' ? "g" : "CMYK")) put(plane, get(plane));
  } else if (a == 'g') {
    for (char plane : std::string(b == 'R' ? "RGB" : "CMYK")) put(plane, get('g'));
  } else {
    put('g', a == 'C' ? get('K') : (77 * get('R') + 151 * get('G') + 28 * get('B')) / 256);
  }
  const bool alpha = from.find('A') != std::string::npos && into.find('A') != std::string::npos;
  if (alpha) put('A', invertAlpha ? 255 - get('A') : get('A'));
  return true;
}

struct Expected {
  Samples Pixels;
  bool Converts;
};

Expected Convert(Format from, const Samples& pixels, Format into, Samples dest, bool invertAlpha) {
  const std::string a = LettersOf(from), b = LettersOf(into);
  bool converts = true;
  for (std::size_t x = 0; x < pixels.size() / a.size(); ++x)
    converts = ConvertPixel(a, &pixels[x * a.size()], b, &dest[x * b.size()], invertAlpha) && converts;
  return {dest, converts};
}

bool Raises(Format from, Format into) {
  const char a = FamilyOf(LettersOf(from)), b = FamilyOf(LettersOf(into));
  return (a == 'R' && b == 'C') || (a == 'C' && b == 'R');
}

// Catches a wrong plane, weight or alpha in any pair, and bytes that nobody should write.
void ConvertEveryPair(int width, Noise& noise) {
  constexpr int Height = 2;
  for (const Format own : EveryFormat())
    for (const Format other : EveryFormat()) {
      SCOPED_TRACE(std::to_string(int(own)) + " and " + std::to_string(int(other)));
      const Picture picture = NoisePicture(width, Height, own, unsigned(noise.Byte()));
      const Samples before = Packed(picture);
      const Samples zeros(std::size_t(width * Height * BytesPerPixel(other)), 0);
      const Samples given = noise.Many(zeros.size());
      const std::size_t half = zeros.size() / 2;

      if (Raises(own, other)) {
        EXPECT_THROW(picture.RowInFormat(0, other), HostException);
        EXPECT_THROW(picture.RowStringInFormat(0, other), HostException);
        EXPECT_THROW(picture.DataStringInFormat(other), HostException);
        EXPECT_THROW(picture.SetDataStringInFormat(other, given), HostException);
        EXPECT_THROW(picture.SetRowInFormat(0, other, given), HostException);
        EXPECT_EQ(Packed(picture), before);
        continue;
      }
      const Expected read = Convert(own, before, other, zeros, false);
      const Samples wanted = read.Converts ? read.Pixels : Samples();
      EXPECT_EQ(picture.DataStringInFormat(other), wanted);
      const Samples second(wanted.begin() + std::ptrdiff_t(read.Converts ? half : 0), wanted.end());
      EXPECT_EQ(picture.RowInFormat(1, other), second);
      EXPECT_EQ(picture.RowStringInFormat(1, other), second);

      picture.SetDataStringInFormat(other, given);
      EXPECT_EQ(Packed(picture), Convert(other, given, own, before, false).Pixels);
      SetPacked(picture, before);
      for (int y = 0; y < Height; ++y)
        picture.SetRowInFormat(y, other, true, std::span(given).subspan(std::size_t(y) * half, half));
      EXPECT_EQ(Packed(picture), Convert(other, given, own, before, true).Pixels);
      if (read.Converts) {
        const Samples after = Packed(picture);
        const Samples inverted = Convert(own, after, other, zeros, true).Pixels;
        EXPECT_EQ(picture.RowInFormat(0, other, true),
                  Samples(inverted.begin(), inverted.begin() + std::ptrdiff_t(half)));
      }
    }
}

TEST(RowAccess, ConvertsEveryPairOfFormats) {
  Noise noise(11);
  ForEveryTarget([&] {
    // A few pixels, and more than one run of the faster forms with some left over. The longest begin with
    // what brings them to a cache line.
    for (const int width : {1, 19, 131}) {
      SCOPED_TRACE(testing::Message() << "width " << width << ", seed 11");
      ConvertEveryPair(width, noise);
    }
  });
}

// Catches a getter that keeps an address over a window move, or a view that reads its parent's edge.
TEST(RowAccess, WorksOnEveryStore) {
  for (const Format format : {Format::RGB, Format::GA, Format::XKYMC, Format::ThreeOf4})
    ForEveryStore(7, 9, format, [&](const Picture& picture) {
      const Samples pixels = Noise(5).Many(std::size_t(7 * 9 * BytesPerPixel(format)));
      picture.SetDataStringInFormat(format, pixels);
      const Samples zeros(pixels.size(), 0);
      EXPECT_EQ(picture.DataStringInFormat(format), Convert(format, pixels, format, zeros, false).Pixels);
    });
}

TEST(RowAccess, GivesGrayByWeightsThatKeepWhite) {
  const Picture picture(4, 1, Format::RGB);
  picture.SetRowInFormat(0, Format::RGB, Samples{255, 0, 0, 0, 255, 0, 0, 0, 255, 255, 255, 255});
  EXPECT_EQ(picture.RowInFormat(0, Format::G), (Samples{76, 150, 27, 255}));
}

TEST(RowAccess, HandsOutStoredRows) {
  const Picture picture = NoisePicture(5, 3, Format::RGBX, 8);
  const Samples row = picture.Row(1);
  EXPECT_EQ(row.size(), 64u);
  const MemoryBlock raw = picture.RawRow(1);
  EXPECT_EQ(Samples(raw.Data().begin(), raw.Data().end()), row);
  raw.Data()[3] = std::uint8_t(row[3] + 1);  // a filler byte: the block lies over the row itself
  EXPECT_EQ(picture.Row(1)[3], std::uint8_t(row[3] + 1));
}

TEST(RowAccess, RaisesWhatAProgramCanCatch) {
  const Picture rgb(2, 2, Format::RGB), cmyk(2, 2, Format::CMYK), none(0, 2, Format::RGB);
  const Samples row(64, 1);
  const std::string bounds = "OutOfBoundsException: Index is out of bounds.";
  struct {
    std::function<void()> Call;
    std::string Raised;
  } cases[] = {
      {[&] { rgb.Row(-1); }, bounds},
      {[&] { rgb.RawRow(2); }, bounds},
      {[&] { rgb.RowInFormat(2, Format::G); }, bounds},
      {[&] { rgb.RowStringInFormat(-1, Format::G); }, bounds},
      {[&] { rgb.SetRow(2, row); }, bounds},
      {[&] { rgb.SetRowInFormat(2, Format::RGB, row); }, bounds},
      {[&] { rgb.RowInFormat(0, Format::CMYK); },
       "OutOfBoundsException: Conversion from RGB to CMYK is not supported."},
      {[&] { cmyk.DataStringInFormat(Format::RGB); },
       "OutOfBoundsException: Conversion from CMYK to RGB is not supported."},
      {[&] { rgb.SetRowInFormat(0, Format::CMYK, row); },
       "OutOfBoundsException: Conversion from CMYK to RGB is not supported."},
      {[&] { EXPECT_EQ(rgb.RowInFormat(0, Format(14)), Samples()); }, ""},
      {[&] { EXPECT_EQ(rgb.RowInFormat(0, Format::Buffer), Samples()); }, ""},
      {[&] { EXPECT_EQ(none.RowInFormat(-1, Format::RGB), Samples()); }, ""},
      {[&] { EXPECT_EQ(none.Row(0), Samples()); }, ""},
  };
  for (const auto& [call, raised] : cases) EXPECT_EQ(RaisedBy(call), raised) << &call - &cases[0].Call;
}

}
}
