#include "support/every_target.h"
#include "support/plain_picture.h"

namespace picturezor {
namespace {

/// Whether there is a way; copies the block if so. The source is a copy, so it can't be overwritten.
bool CopyPlain(PlainPicture& dest, const PlainPicture& source, const Rect& rect, int sourceX, int sourceY) {
  const char from = source.Family(), into = dest.Family();
  if (!from || !into || (from == 'R' && into == 'C') || (from == 'C' && into == 'R')) return false;
  bool any = false;
  ForPixels(dest, source, rect, sourceX, sourceY, [&](int x, int y, int fromX, int fromY) {
    any = true;
    for (char plane : dest.Colours())
      dest.At(x, y, plane) = std::uint8_t(from == into                  ? source.At(fromX, fromY, plane)
                                          : into == 'C' && plane != 'K' ? 0
                                          : from == 'C'                 ? source.At(fromX, fromY, 'K')
                                                                        : source.Gray(fromX, fromY));
    if (dest.Has('A') && source.Has('A')) dest.At(x, y, 'A') = std::uint8_t(source.At(fromX, fromY, 'A'));
  });
  return any;
}

TEST(CopyPixels, CopiesEveryPairOfFormats) {
  constexpr int Width = 41, Height = 6;
  Noise noise(51);
  for (const Format from : EveryFormat()) {
    const Picture source = NoisePicture(Width - 3, Height + 1, from, noise.Byte());
    const PlainPicture plain(source);
    for (const Format into : EveryFormat()) {
      SCOPED_TRACE(testing::Message() << int(from) << " into " << int(into) << ", seed 51");
      ForStores((int(from) + int(into)) % 5 == 0, Width, Height, into, [&](const Picture& dest) {
        SetPacked(dest, noise.Many(std::size_t(Width * Height * dest.PixelSize())));
        PlainPicture wanted(dest);
        const Rect rect = AnyRect(noise, Width, Height);
        const int x = noise.Between(-4, Width), y = noise.Between(-2, 3);
        const bool copies = CopyPlain(wanted, plain, rect, x, y);
        EXPECT_EQ(dest.CopyPixels(source, rect, x, y), copies);
        EXPECT_EQ(Packed(dest), wanted.Pixels);
      });
    }
  }
}

TEST(CopyPixels, IsTheSameWithEveryInstructionSet) {
  Noise noise(52);
  for (const auto& [from, into] : {std::pair(Format::RGB, Format::BGRA),
                                   {Format::BGRX, Format::G},
                                   {Format::RGB, Format::G},
                                   {Format::G, Format::RGB},
                                   {Format::CMYKA, Format::GA},
                                   {Format::ARGB, Format::BGRA},
                                   {Format::G, Format::KYMCX},
                                   {Format::ThreeOf3, Format::G}})
    for (const int width : {1, 3, 4, 5, 15, 16, 17, 31, 32, 33, 40, 47, 64, 97}) {
      const Picture source(width, 2, from), dest(width, 2, into);
      FillWithNoise(source, noise.Byte());
      FillWithNoise(dest, noise.Byte());
      const Samples before = Packed(dest);
      PlainPicture wanted(dest);
      ASSERT_TRUE(CopyPlain(wanted, PlainPicture(source), {0, 0, width, 2}, 0, 0));
      ForEveryTarget([&] {
        SCOPED_TRACE(testing::Message() << int(from) << " into " << int(into) << ", width " << width);
        SetPacked(dest, before);
        EXPECT_TRUE(dest.CopyPixels(source));
        EXPECT_EQ(Packed(dest), wanted.Pixels);
      });
    }
}

// As wide as a page, so that rows of mapped pictures have no gaps either.
TEST(CopyPixels, TakesRowsWithoutGapsTogether) {
  constexpr int Width = 4096, Height = 12;
  const Picture source = NoisePicture(Width, Height, Format::G, 53);
  for (const Picture& from : {source, source.MirroredView()})
    for (const Format into : {Format::G, Format::RGBX})
      ForEveryStore(Width, Height, into, [&](const Picture& dest) {
        SetPacked(dest, Noise(54).Many(std::size_t(Width * Height * dest.PixelSize())));
        PlainPicture wanted(dest);
        CopyPlain(wanted, PlainPicture(from), {0, 3, Width, 8}, 0, 1);
        EXPECT_TRUE(dest.CopyPixels(from, {0, 3, Width, 8}, 0, 1));
        EXPECT_TRUE(Packed(dest) == wanted.Pixels);
      });
}

/// A view of a picture, or the picture.
Picture AnyView(Noise& noise, const Picture& picture) {
  Picture view = picture;
  for (int depth = noise.Between(0, 2); depth > 0; --depth) switch (noise.Between(0, 3)) {
      case 0: view = view.MirroredView(); break;
      case 1: view = view.ClipImage({noise.Between(0, 2), noise.Between(0, 2), 12, 11}); break;
      case 2: view = view.Channel(noise.Between(0, view.ChannelCount() - 1)); break;
      case 3:
        if (view.IsRGB()) view = view.RGBChannels();
        break;
    }
  return view;
}

// Catches a row or pixel that is read after it was written, for all ways that two views can lie on each
// other.
TEST(CopyPixels, ReadsTheBlockBeforeItWrites) {
  Noise noise(53);
  for (int round = 0; round < 100; ++round)
    for (const auto kind : StoredPicture::Kinds) {
      SCOPED_TRACE(testing::Message() << StoredPicture::NameOf(kind) << ", round " << round << ", seed 53");
      const StoredPicture stored(kind, 14, 12, round % 2 ? Format::ARGB : Format::RGB);
      SetPacked(stored.Get(), noise.Many(Packed(stored.Get()).size()));
      const Picture dest = AnyView(noise, stored.Get()), source = AnyView(noise, stored.Get());
      PlainPicture wanted(dest);
      const Rect rect{noise.Between(-2, 6), noise.Between(-2, 6), noise.Between(-8, 14),
                      noise.Between(-8, 14)};
      const int x = noise.Between(-2, 5), y = noise.Between(-2, 5);
      const bool copies = CopyPlain(wanted, PlainPicture(source), rect, x, y);
      ASSERT_EQ(dest.CopyPixels(source, rect, x, y), copies);
      ASSERT_EQ(Packed(dest), wanted.Pixels);
      ASSERT_TRUE(stored.SurroundingsIntact());
    }
}

// Two pictures over one block, whose rows lie on each other anyhow.
TEST(CopyPixels, ReadsTheBlockFirstInSharedMemory) {
  const MemoryBlock block(Noise(54).Many(200));
  const Picture source(block, 6, 8, Format::RGB, 20), dest(block, 5, 8, Format::RGBX, 22);
  PlainPicture wanted(dest);
  ASSERT_TRUE(CopyPlain(wanted, PlainPicture(source), {0, 0, 5, 8}, 1, 0));
  EXPECT_TRUE(dest.CopyPixels(source, {0, 0, 5, 8}, 1, 0));
  EXPECT_EQ(Packed(dest), wanted.Pixels);
}

TEST(CopyPixels, KnowsItsDefaultsAndRefusals) {
  const Picture dest(4, 4, Format::G), large(6, 6, Format::RGB), small(2, 1, Format::RGB);
  large.FillRect(255);
  EXPECT_TRUE(dest.CopyPixels(small));
  EXPECT_TRUE(dest.CopyPixels(large, {1, 1, 2, 2}));
  EXPECT_EQ(Packed(dest), (Samples{0, 0, 0, 0, 0, 255, 255, 0, 0, 255, 255, 0, 0, 0, 0, 0}));
  EXPECT_TRUE(dest.CopyPixels(large));
  const Samples white(16, 255);
  EXPECT_EQ(Packed(dest), white);
  EXPECT_FALSE(dest.CopyPixels({}));
  EXPECT_FALSE(dest.CopyPixels(Picture(0, 1, Format::G)));
  EXPECT_FALSE(dest.CopyPixels(small, {0, 0, 2, 2}, 2, 0));
  EXPECT_FALSE(dest.CopyPixels(small, {4, 0, 2, 2}, 0, 0));
  EXPECT_FALSE(dest.CopyPixels(small.ClipImage({0, 5, 1, 1})));
  EXPECT_EQ(Packed(dest), white);
  // Gray is black ink, not inverted.
  const Picture inks(1, 1, Format::ACMYK), gray(1, 1, Format::GA);
  inks.FillRect(9);
  SetPacked(gray, {200, 70});
  EXPECT_TRUE(inks.CopyPixels(gray));
  EXPECT_EQ(Packed(inks), (Samples{70, 0, 0, 0, 200}));
}

}
}
