#include <gmock/gmock.h>

#include "support/every_store.h"

namespace picturezor {
namespace {

TEST(ClipImage, CutsItsRectangle) {
  const Picture picture(100, 50, Format::RGB);
  constexpr int Least = -0x7FFFFFFF - 1, Most = 0x7FFFFFFF;
  struct {
    Rect Asked;
    int Left, Top, Width, Height;
  } cases[] = {
      {{0, 0, 100, 50}, 0, 0, 100, 50},   {{5, 6, 7, 8}, 5, 6, 7, 8},
      {{10, 10, -5, -5}, 5, 5, 5, 5},     {{-3, 0, 10, 10}, 0, 0, 7, 10},
      {{3, -4, 10, 10}, 3, 0, 10, 6},     {{0, 0, 1000, 1000}, 0, 0, 100, 50},
      {{2, 0, -10, 50}, 0, 0, 2, 50},     {{99, 49, 5, 5}, 99, 49, 1, 1},
      {{100, 0, 10, 10}, 100, 0, 0, 10},  {{150, 0, 10, 10}, 150, 0, -50, 10},
      {{0, 60, 10, 10}, 0, 60, 10, -10},  {{Least, Least, Most, Most}, 0, 0, -1, -1},
      {{1, 1, Most, Most}, 1, 1, 99, 49}, {{5, 5, Least, Least}, 0, 0, 5, 5},
  };
  for (const auto& [asked, left, top, width, height] : cases) {
    SCOPED_TRACE(testing::PrintToString(asked));
    const Picture view = picture.ClipImage(asked);
    EXPECT_TRUE(view.Valid());
    EXPECT_EQ(view.Width(), width);
    EXPECT_EQ(view.Height(), height);
    EXPECT_EQ(view.RowOffset(), top);
    EXPECT_EQ(view.RedOffset(), 3 * left);
    EXPECT_EQ(view.BlueOffset(), 3 * left + 2);
    EXPECT_EQ(view.AlphaOffset(), 0) << "a plane that isn't there doesn't move";
    EXPECT_EQ(view.Parent(), picture);
    EXPECT_EQ(view.RowSize(), picture.RowSize());
    EXPECT_EQ(view.TotalSize(), picture.TotalSize());
    EXPECT_EQ(view.Channel(1).GrayOffset(), 3 * left + 1);
    EXPECT_EQ(view.DataStringInFormat(Format::RGB).empty(), width <= 0 || height <= 0);
  }
}

// Catches an edge that is counted from the wrong picture where views stand on views.
TEST(Views, AddUp) {
  for (const auto kind : StoredPicture::Kinds) {
    SCOPED_TRACE(StoredPicture::NameOf(kind));
    const StoredPicture stored(kind, 9, 12, Format::RGBA);
    const Picture& picture = stored.Get();
    FillWithNoise(picture, 12);
    const Samples pixels = Packed(picture);
    const auto at = [&](int x, int y, int c) { return pixels[std::size_t((y * 9 + x) * 4 + c)]; };

    const Picture clip = picture.ClipImage({1, 2, 7, 8}).ClipImage({2, 1, 4, 6});
    const Picture mirror = clip.MirroredView(), again = mirror.MirroredView();
    for (int y = 0; y < 6; ++y) {
      Samples row, green;
      for (int x = 3; x < 7; ++x) {
        for (int c = 0; c < 4; ++c) row.push_back(at(x, y + 3, c));
        green.push_back(at(x, y + 3, 1));
      }
      // A mirrored picture's views have their parent's rows from top to bottom as it stores them.
      const bool upsideDown = kind == StoredPicture::Mirrored;
      if (upsideDown) continue;
      EXPECT_EQ(clip.RowInFormat(y, Format::RGBA), row);
      EXPECT_EQ(mirror.RowInFormat(5 - y, Format::RGBA), row);
      EXPECT_EQ(again.RowInFormat(y, Format::RGBA), row);
      EXPECT_EQ(clip.GreenChannel().RowInFormat(y, Format::G), green);
      EXPECT_EQ(mirror.RGBChannels().GreenChannel().RowInFormat(5 - y, Format::G), green);
    }
  }
  // A clip of a mirrored view shows the rows at y of the store, in reverse order.
  const Picture gray(1, 6, Format::G);
  gray.SetDataStringInFormat(Format::G, Samples{0, 1, 2, 3, 4, 5});
  EXPECT_EQ(gray.MirroredView().DataStringInFormat(Format::G), (Samples{5, 4, 3, 2, 1, 0}));
  EXPECT_EQ(gray.MirroredView().ClipImage({0, 1, 1, 3}).DataStringInFormat(Format::G), (Samples{3, 2, 1}));
}

TEST(Views, WriteTheirPlaneAlone) {
  ForEveryStore(3, 6, Format::ARGB, [](const Picture& picture) {
    Samples pixels = Noise(6).Many(72);
    SetPacked(picture, pixels);
    const Samples plane = Noise(7).Many(18);
    picture.BlueChannel().SetDataStringInFormat(Format::G, plane);
    for (std::size_t i = 0; i < plane.size(); ++i) pixels[i * 4 + 3] = plane[i];
    EXPECT_EQ(Packed(picture), pixels);
    EXPECT_EQ(picture.RGBChannels().BlueChannel().DataStringInFormat(Format::G), plane);
  });
}

TEST(Views, ShowTheColoursOfAFamily) {
  struct {
    Format Of, RGB, CMYK;  // Unknown for nil
    int First;             // the place of the view's first plane
  } cases[] = {
      {Format::ARGB, Format::RGB, Format::Unknown, 1},
      {Format::RGBX, Format::RGB, Format::Unknown, 0},
      {Format::XBGR, Format::BGR, Format::Unknown, 1},
      {Format::GA, Format::Unknown, Format::Unknown, 0},
      {Format::XCMYK, Format::Unknown, Format::CMYK, 1},
      {Format::KYMCA, Format::Unknown, Format::KYMC, 0},
      {Format::Buffer, Format::Unknown, Format::Unknown, 0},
  };
  for (const auto& [format, rgb, cmyk, first] : cases) {
    SCOPED_TRACE(int(format));
    const Picture picture(2, 2, format);
    for (const auto& [view, wanted] :
         {std::pair(picture.RGBChannels(), rgb), std::pair(picture.CMYKChannels(), cmyk)}) {
      ASSERT_EQ(bool(view), wanted != Format::Unknown);
      if (!view) continue;
      EXPECT_EQ(view.ImageFormat(), wanted);
      EXPECT_EQ(view.ChannelCount(), wanted == rgb ? 3 : 4);
      EXPECT_EQ(view.Channel(0).GrayOffset(), first);
      EXPECT_EQ(view.PixelSize(), picture.PixelSize());
      EXPECT_FALSE(view.HasAlpha());
    }
  }
}

TEST(Views, HoldTheirParent) {
  Picture parent(4, 4, Format::RGB);
  parent.SetYieldTicks(5);
  const Picture view = parent.RedChannel().ClipImage({1, 1, 2, 2});
  EXPECT_EQ(view.YieldTicks(), 0);
  EXPECT_EQ(view.Parent().Parent(), parent);
  EXPECT_EQ(parent.References(), 2);
  parent = Picture();
  view.SetRowInFormat(0, Format::G, Samples{3, 4});
  EXPECT_EQ(view.RowInFormat(0, Format::G), (Samples{3, 4}));
  EXPECT_EQ(Host::CountOf("PictureZOR"), 3);
  view.Close();
  EXPECT_EQ(Host::CountOf("PictureZOR"), 1);

  const Picture none(0, 4, Format::RGB);
  EXPECT_FALSE(none.ClipImage().Valid());
  EXPECT_FALSE(none.MirroredView().Valid());
}

}
}
