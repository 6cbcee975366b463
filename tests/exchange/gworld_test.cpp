#include <gmock/gmock.h>

#include <cstring>

#include "exchange_test_support.h"

namespace picturezor {
namespace {

std::vector<Samples> RowsOf(const GWorld& gworld) {
  std::vector<Samples> rows;
  for (int y = 0; y < gworld.Height(); ++y) rows.push_back(gworld.Row(y));
  return rows;
}

/// The pixels of a picture as a GWorld has them, by a slow second way: the letters say which sample goes
/// where.
std::vector<Samples> Expected(const Picture& picture, const std::string& into) {
  const std::string letters = LettersOf(picture.ImageFormat());
  const Samples pixels = Packed(picture);
  std::vector<Samples> rows(std::size_t(picture.Height()));
  for (std::size_t at = 0; at < pixels.size(); at += letters.size())
    for (const char letter : into)
      rows[at / letters.size() / std::size_t(picture.Width())].push_back(
          letter == '#' ? 255 : pixels[at + letters.find(letter)]);
  return rows;
}

TEST(GWorlds, HoldTheWholeImage) {
  for (const int bytesOf24 : {3, 4})
    InHost({.BytesOfDepth24 = bytesOf24}, [&] {
      for (const Format format : EveryFormat()) {
        SCOPED_TRACE(int(format));
        const std::string letters = LettersOf(format);
        const bool gray = letters.find('g') != letters.npos, rgb = letters.find('R') != letters.npos,
                   alpha = letters.find('A') != letters.npos;
        ForEveryStore(5, 6, format, [&](const Picture& picture) {
          SetPacked(picture, Noise(3).Many(5 * 6 * letters.size()));
          const GWorld gworld = picture.CopyGWorld();
          ASSERT_EQ(bool(gworld), gray || rgb);
          if (!gworld) return;
          EXPECT_EQ(gworld.Depth(), gray ? 8 : alpha ? 32 : 24);
          EXPECT_EQ(RowsOf(gworld), Expected(picture, gray             ? "g"
                                                      : alpha          ? "ARGB"
                                                      : bytesOf24 == 3 ? "RGB"
                                                                       : "#RGB"));
          EXPECT_EQ(gworld.References(), 1);
          EXPECT_EQ(Host::Count().PixelLocks, 1) << "the pixels stay locked";
        });
      }
    });
}

TEST(GWorlds, LieWhereTheClassHasThem) {
  InHost(PictureForm::GWorld32, [] {
    const GWorld gworld = Picture(5, 6, Format::G).CopyGWorld();
    const auto* bytes = static_cast<const std::uint8_t*>(gworld.Address());
    void* held;
    std::memcpy(&held, bytes + 24, sizeof held);
    EXPECT_NE(held, nullptr);
    EXPECT_EQ(bytes[24 + sizeof held], 1);
    EXPECT_EQ(bytes[25 + sizeof held], 0);
    EXPECT_EQ(Host::CountOf("GWorldZOR"), 1);
  });
}

TEST(GWorlds, DontOutliveAFailure) {
  for (const char* hidden : {"NewGWorld", "GWorldZOR", "GetGWorldPixMap", "LockPixels", "GetPixBaseAddr",
                             "GetPixRowBytes", "GetCTable"})
    InHost(PictureForm::GWorld32, [&] {
      SCOPED_TRACE(hidden);
      const Picture gray(5, 6, Format::G), colour(5, 6, Format::BGRA);
      EXPECT_TRUE(gray.CopyGWorld());
      EXPECT_TRUE(colour.CopyGWorld());
      Host::Hide(hidden);
      EXPECT_FALSE(gray.CopyGWorld());
      EXPECT_EQ(bool(colour.CopyGWorld()), std::string_view(hidden) == "GetCTable");
    });
  InHost(PictureForm::GWorld32, [] {
    const Picture picture(5, 6, Format::G);
    for (int successes = 0; successes < 2; ++successes) {
      Host::FailCreationsAfter(successes);
      EXPECT_FALSE(picture.CopyGWorld());
    }
    Host::FailCreationsAfter(-1);
    EXPECT_TRUE(picture.CopyGWorld());
  });
}

// Catches pixels that are written into a GWorld whose bounds lost the upper bits of the size.
TEST(GWorlds, HaveTheSizeOfTheImageOrNone) {
  InHost(PictureForm::GWorld32, [] {
    for (const int size : {32768, 65536, 65541, 100000}) {
      EXPECT_FALSE(Picture(size, 1, Format::G).CopyGWorld()) << size;
      EXPECT_FALSE(Picture(1, size, Format::G).CopyGWorld()) << size;
    }
    EXPECT_EQ(Picture(32767, 1, Format::G).CopyGWorld().Width(), 32767);
  });
}

}
}
