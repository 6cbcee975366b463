#include <gmock/gmock.h>

#include "invoke.h"
#include "support/every_store.h"

namespace picturezor {
namespace {

using testing::Each;

TEST(Constructor, MakesZeroedRowsInMemory) {
  struct {
    int Width, Height;
    Format Of;
    int RowSize;
  } cases[] = {{1, 1, Format::G, 64},       {64, 3, Format::G, 64},      {65, 3, Format::G, 128},
               {3, 2, Format::RGB, 64},     {22, 2, Format::RGB, 128},   {16, 2, Format::RGBA, 64},
               {13, 2, Format::CMYKA, 128}, {8, 2, Format::Scaling8, 64}};
  for (const auto& [width, height, format, rowSize] : cases) {
    const Picture picture(width, height, format);
    EXPECT_TRUE(picture.Valid());
    EXPECT_EQ(picture.Width(), width);
    EXPECT_EQ(picture.Height(), height);
    EXPECT_EQ(picture.RowSize(), rowSize);
    EXPECT_EQ(picture.TotalSize(), rowSize * height);
    EXPECT_EQ(Picture::CalculateMemory(width, height, format), rowSize * height);
    EXPECT_TRUE(Picture::CanAllocate(width, height, format));
    EXPECT_THAT(picture.Row(height - 1), Each(0));
    EXPECT_FALSE(picture.IsMapping() || picture.Parent() || picture.MemoryTarget());
  }
}

// Catches products that wrap round to a small allocation.
TEST(Constructor, RefusesSizesBeyondItsArithmetic) {
  constexpr int Most = 0x7FFFFFFF;
  struct {
    int Width, Height;
    Format Of;
    std::int64_t Memory;
    bool MayBeHad;  // memory is asked for
  } cases[] = {
      {0, 1, Format::RGB, 0, false},
      {1, 0, Format::RGB, 0, false},
      {-1, -1, Format::RGB, 0, false},
      {1, 1, Format(14), 0, false},
      {Most, 1, Format::RGB, 0, false},
      {Most, 1, Format::G, 0, false},  // no room to round up
      {0x40000001, 1, Format::RGBA, 0, false},
      {0x55555556, 3, Format::RGB, 0, false},  // a row of 2^32 + 2 bytes
      {1 << 15, 1 << 16, Format::G, 1ll << 31, true},
      {1 << 16, 1 << 16, Format::G, 1ll << 32, false},
      {1 << 30, Most, Format::G, (1ll << 30) * Most, false},
  };
  for (const auto& [width, height, format, memory, mayBeHad] : cases) {
    SCOPED_TRACE(std::to_string(width) + " x " + std::to_string(height));
    EXPECT_FALSE(Picture(width, height, format).Valid());
    EXPECT_FALSE(Picture::Create(width, height, format));
    EXPECT_EQ(Picture::CalculateMemory(width, height, format), memory);
    EXPECT_FALSE(!mayBeHad && Picture::CanAllocate(width, height, format));
  }
}

TEST(Constructor, UsesTheBlockOfTheCaller) {
  MemoryBlock block(5 * 20);
  {
    const Picture picture(block, 6, 5, Format::RGB, 20);
    EXPECT_TRUE(picture.Valid());
    EXPECT_EQ(picture.MemoryTarget(), block);
    EXPECT_EQ(picture.Memory().Start(), block.Start());
    EXPECT_EQ(picture.RowSize(), 20);
    for (int y = 0; y < 5; ++y) picture.SetRowInFormat(y, Format::RGB, Samples(18, 7));
    picture.Close();
    EXPECT_EQ(block.References(), 1);
    EXPECT_EQ(block.Data()[17], 7);
    EXPECT_EQ(block.Data()[18], 0) << "the gap behind a row belongs to the caller";
    EXPECT_EQ(block.Data()[20], 7);
  }
  EXPECT_FALSE(Picture(MemoryBlock(), 6, 5, Format::RGB, 20).Valid());
  EXPECT_FALSE(Picture(block, 6, 0, Format::RGB, 20).Valid());
  EXPECT_FALSE(Picture(block, 6, 5, Format(14), 20).Valid());
  EXPECT_EQ(block.References(), 1);
}

TEST(Constructor, BuildsAPictureOnce) {
  const Picture picture(4, 3, Format::G);
  picture.SetRowInFormat(0, Format::G, Samples{1, 2, 3, 4});
  model::Invoke<void>(picture, "Constructor", 9, 9, 1);
  EXPECT_EQ(picture.Width(), 4);
  EXPECT_EQ(picture.RowInFormat(0, Format::G), (Samples{1, 2, 3, 4}));
}

TEST(Clone, CopiesWhatAPictureShows) {
  for (const Format format : {Format::RGB, Format::AG, Format::XKYMC, Format::TwoOf4, Format::Scaling5})
    for (const auto kind : StoredPicture::Kinds) {
      SCOPED_TRACE(std::string(StoredPicture::NameOf(kind)) + " in " + std::to_string(int(format)));
      const StoredPicture stored(kind, 5, 7, format);
      const Picture& picture = stored.Get();
      FillWithNoise(picture, 3);
      picture.SetYieldTicks(9);
      picture.SetFactory(PictureFactory([](int, int, Format) { return Picture(); }));
      const Picture clone = picture.Clone();
      if (picture.IsMapping()) {
        EXPECT_FALSE(clone);
        continue;
      }
      EXPECT_EQ(StoredRows(clone), StoredRows(picture));
      EXPECT_EQ(Packed(clone), Packed(picture));
      EXPECT_EQ(clone.ImageFormat(), format);
      EXPECT_EQ(clone.RowOffset(), 0);
      EXPECT_EQ(clone.YieldTicks(), 0);
      EXPECT_FALSE(clone.Factory() || clone.MemoryTarget() || clone.Parent());
      const Samples before = Packed(picture);
      SetPacked(clone, Samples(before.size(), 0));
      EXPECT_EQ(Packed(picture), before) << "the clone has samples of its own";
    }
}

TEST(Close, EndsAPictureAtOnce) {
  const TemporaryFile file;
  const Picture pictures[] = {Picture(4, 6, Format::RGB), Picture(MemoryBlock(200), 4, 6, Format::RGB, 20),
                              Picture::Mapped(file.Path(), 4, 6, Format::RGB)};
  for (const Picture& picture : pictures) {
    picture.Close();
    picture.Close();
    EXPECT_TRUE(picture.Valid());
    EXPECT_EQ(picture.Width(), 4);
    EXPECT_FALSE(picture.Memory() || picture.MemoryTarget() || picture.Clone());
    EXPECT_TRUE(picture.RowInFormat(0, Format::RGB).empty());
    EXPECT_TRUE(picture.DataStringInFormat(Format::RGB).empty());
    picture.SetRowInFormat(0, Format::RGB, Samples(12, 1));
    picture.SetMappingBlockSize(1);
    const Picture view = picture.RedChannel();
    EXPECT_TRUE(view && view.RowInFormat(0, Format::G).empty());
  }
  EXPECT_FALSE(std::filesystem::exists(file.Path()));
}

// Catches a view that reads memory which its parent has freed.
TEST(Close, LeavesViewsTheirSamples) {
  for (const auto kind : StoredPicture::Kinds) {
    SCOPED_TRACE(StoredPicture::NameOf(kind));
    const StoredPicture stored(kind, 4, 6, Format::G);
    FillWithNoise(stored.Get(), 1);
    const Samples pixels = Packed(stored.Get());
    const Picture copy = stored.Get().ClipImage();  // keeps the store while `stored` looks at it
    const Picture view = stored.Get().ClipImage(), ofView = view.ClipImage();
    stored.Get().Close();
    view.Close();
    EXPECT_EQ(Packed(ofView), pixels);
    ofView.FillRect(9);
    const Samples filled(pixels.size(), 9);
    EXPECT_EQ(Packed(copy), filled);
    const Picture source(4, 6, Format::G);
    SetPacked(source, pixels);
    EXPECT_TRUE(ofView.CopyPixels(source));
    EXPECT_EQ(Packed(copy), pixels);
  }
}

/// A factory that counts its calls and gives pictures of one size.
struct CountingFactory {
  int Calls = 0;
  PictureFactory Of;
  CountingFactory(int width, int height)
      : Of([this, width, height](int, int, Format format) {
          ++Calls;
          return width ? Picture(width, height, format) : Picture();
        }) {}
};

TEST(Factories, AreAskedOwnFirst) {
  struct {
    int OwnSize, GlobalSize;  // 0 gives nil
    int OwnCalls, GlobalCalls, Width;
  } cases[] = {
      {100, 100, 1, 0, 100}, {200, 100, 1, 0, 200},  // larger is as good
      {50, 150, 1, 1, 150},  {0, 150, 1, 1, 150},   {50, 50, 1, 1, 100}, {0, 0, 1, 1, 100},
  };
  const Picture picture(1, 1, Format::G);
  for (const auto& [ownSize, globalSize, ownCalls, globalCalls, width] : cases) {
    CountingFactory own(ownSize, ownSize), global(globalSize, globalSize);
    picture.SetFactory(own.Of);
    PictureFactory::SetFactory(global.Of);
    EXPECT_EQ(global.Of.References(), 2);
    const Picture made = picture.CreatePicture(100, 100, Format::RGB);
    EXPECT_EQ(own.Calls, ownCalls);
    EXPECT_EQ(global.Calls, globalCalls);
    EXPECT_EQ(made.Width(), width);
    EXPECT_EQ(made.References(), 1);
    EXPECT_EQ(Picture::Create(100, 100, Format::RGB).Width(), globalSize < 100 ? 100 : globalSize);
    EXPECT_EQ(global.Calls, globalCalls + 1);
    picture.SetFactory({});
    PictureFactory::SetFactory({});
    EXPECT_EQ(own.Of.References() + global.Of.References(), 2);
  }
  picture.SetFactory(PictureFactory(PictureFactory::Handler()));
  EXPECT_EQ(picture.CreatePicture(7, 7, Format::G).Width(), 7) << "a factory without a handler";
  // One that is closed can't hold samples, yet is Valid by its record; one that never was isn't accepted.
  picture.SetFactory(PictureFactory([](int, int, Format) { return Picture(9, 9, Format(14)); }));
  EXPECT_EQ(picture.CreatePicture(7, 7, Format::G).Width(), 7);
  picture.SetFactory({});
  EXPECT_FALSE(picture.CreatePicture(0, 7, Format::G));
}

}
}
