#include "image/stores.h"

#include <gmock/gmock.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>

#include "image/picture_data.h"
#include "invoke.h"
#include "support/every_store.h"
#include "support/row_arguments.h"

namespace picturezor {
namespace {

/// The numbers below are those of pages of 4096 bytes.
bool OtherPages() { return getpagesize() > 4096; }

std::pair<int, int> Window(const Picture& picture) {
  return {DataOf(picture).WindowFirstRow, DataOf(picture).WindowLastRow};
}

/// Asks for a row as a loop does, and gives the window that it came from.
std::pair<int, int> WindowAt(const Picture& picture, int row) {
  EXPECT_NE(DataOf(picture).RowGetter(&DataOf(picture), row), nullptr);
  return Window(picture);
}

using Rows = std::pair<int, int>;

TEST(MappedStore, RoundsWindowsToPages) {
  if (OtherPages()) GTEST_SKIP();
  struct {
    int Width, Height, Asked;
    int RowSize, BlockSize, RowsPerBlock;
  } cases[] = {
      {1000, 10000, 1000000, 4096, 16777216, 4096},
      {1000, 10000, 0, 4096, 16777216, 4096},
      {1000, 10000, -5, 4096, 16777216, 4096},
      {1000, 10000, 16781311, 4096, 16777216, 4096},
      {1000, 10000, 16781312, 4096, 16781312, 4097},
      {1000, 10000, 100000000, 4096, 40960000, 10000},
      {1000, 5, 1, 4096, 20480, 5},
      {2000, 6, 1, 8192, 49152, 6},
      {2000, 3000, 1, 8192, 16777216, 2048},
      {1400000, 7, 1, 4202496, 21012480, 5},
  };
  for (const auto& [width, height, asked, rowSize, blockSize, rowsPerBlock] : cases) {
    SCOPED_TRACE(std::to_string(width) + " x " + std::to_string(height) + ", " + std::to_string(asked));
    const TemporaryFile file;
    const Picture picture = Picture::Mapped(file.Path(), width, height, Format::RGB, asked);
    EXPECT_TRUE(picture.Valid() && picture.IsMapping());
    EXPECT_EQ(picture.RowSize(), rowSize);
    EXPECT_EQ(picture.TotalSize(), std::int64_t{rowSize} * height);
    EXPECT_EQ(picture.MappingBlockSize(), blockSize);
    EXPECT_EQ(DataOf(picture).RowsPerBlock, rowsPerBlock);
    EXPECT_EQ(std::int64_t(std::filesystem::file_size(file.Path())), picture.TotalSize() + 4096);
  }
}

TEST(MappedStore, OpensWindowsTwoRowsAbove) {
  if (OtherPages()) GTEST_SKIP();
  const TemporaryFile file;
  const Picture picture = Picture::Mapped(file.Path(), 1000, 10000, Format::RGB, 1);
  EXPECT_EQ(Window(picture), Rows(0, 4095));
  EXPECT_EQ(WindowAt(picture, 4095), Rows(0, 4095));
  EXPECT_EQ(WindowAt(picture, 4096), Rows(4094, 8189));
  EXPECT_EQ(WindowAt(picture, 9999), Rows(5904, 9999));
  EXPECT_EQ(WindowAt(picture, 1), Rows(1, 4096));
  EXPECT_EQ(WindowAt(picture, 0), Rows(0, 4095));
  EXPECT_EQ(WindowAt(picture, 5000), Rows(4998, 9093));
  EXPECT_EQ(WindowAt(picture, 2), Rows(0, 4095));
  WindowAt(picture, 9000);
  picture.SetMappingBlockSize(20000000);
  EXPECT_EQ(picture.MappingBlockSize(), 19996672);
  EXPECT_EQ(Window(picture), Rows(0, 4881));

  picture.SetMappingBlockSize(1);
  const Picture clip = picture.ClipImage({0, 5000, 1000, 1000});
  EXPECT_EQ(Window(clip), Rows(4998, 9093));
  EXPECT_EQ(WindowAt(clip, 999), Rows(4998, 9093));
  EXPECT_EQ(Window(picture), Rows(0, 4095)) << "a view has a window of its own";
  const Picture low = picture.ClipImage({0, 9500, 1000, 500});
  EXPECT_EQ(Window(low), Rows(5904, 9999));
  const Picture mirror = picture.MirroredView();
  EXPECT_EQ(Window(mirror), Rows(5904, 9999));
  EXPECT_EQ(WindowAt(mirror, 4095), Rows(5904, 9999));
  EXPECT_EQ(WindowAt(mirror, 4096), Rows(5901, 9996));
}

// Catches a window placed a row off, or samples lost when it moves.
TEST(MappedStore, KeepsRowsWhileWindowsMove) {
  const StoredPicture stored(StoredPicture::Mapped, 7, 41, Format::RGB);
  const Picture& picture = stored.Get();
  EXPECT_EQ(DataOf(picture).RowsPerBlock, 5);
  Noise noise(2);
  std::vector<Samples> rows;
  for (int y = 0; y < 41; ++y) {
    rows.push_back(noise.Many(21));
    picture.SetRowInFormat(y, Format::RGB, rows.back());
  }
  const Picture mirror = picture.MirroredView(), clip = mirror.ClipImage({2, 3, 4, 30});
  for (int y = 40; y >= 0; --y) {
    EXPECT_EQ(picture.RowInFormat(y, Format::RGB), rows[std::size_t(y)]);
    EXPECT_EQ(mirror.RowInFormat(40 - y, Format::RGB), rows[std::size_t(y)]);
  }
  for (int i = 0; i < 200; ++i) {
    const int y = noise.Between(0, 29);
    const Samples& row = rows[std::size_t(32 - y)];
    EXPECT_EQ(clip.RowInFormat(y, Format::RGB), Samples(row.begin() + 6, row.begin() + 18));
  }
}

TEST(MappedStore, EndsWithItsFile) {
  const TemporaryFile file;
  {
    const Picture picture = Picture::Mapped(file.Path(), 3, 5, Format::G);
    const Picture view = picture.ClipImage();
    EXPECT_THAT(picture.Row(4), testing::Each(0));
    picture.Close();
    EXPECT_TRUE(std::filesystem::exists(file.Path())) << "a view still shows the file";
    view.Close();
    EXPECT_FALSE(std::filesystem::exists(file.Path()));
  }
  { const Picture picture = Picture::Mapped(file.Path(), 3, 5, Format::G); }
  EXPECT_FALSE(std::filesystem::exists(file.Path()));
}

TEST(MappedStore, IsRefusedWithoutAFile) {
  const TemporaryFile file;
  const std::filesystem::path folder = file.Path().parent_path();
  for (const auto& path : {folder, file.Path() / "below nothing", folder / std::string(300, 'n')})
    EXPECT_FALSE(Picture::Mapped(path, 3, 5, Format::G).Valid()) << path;
  EXPECT_TRUE(std::filesystem::is_directory(folder));

  const Picture noItem{Object::Adopt(model::NewObject(model::ClassNamed("PictureZOR")))};
  model::Invoke<void>(noItem, "Constructor", 3, 5, 11, 0, FolderItem());
  EXPECT_FALSE(noItem.Valid());

  for (const auto& [width, height, code] :
       {std::tuple(3, 4, 11), {0, 5, 11}, {3, 5, 14}, {0x7FFFFFFF, 5, 1}, {0x10000000, 5, 2}})
    EXPECT_FALSE(Picture::Mapped(file.Path(), width, height, Format(code)).Valid()) << width;
  EXPECT_FALSE(std::filesystem::exists(file.Path()));

  const Picture huge = Picture::Mapped(file.Path(), 400000000, 0x7FFFFFFF, Format::G);
  EXPECT_FALSE(huge.Valid()) << "the disk can't hold 2^59 bytes";
  EXPECT_FALSE(std::filesystem::exists(file.Path()));
}

// A second picture on the file would cut it, and the first row of the first one that is touched then would
// end the process.
TEST(MappedStore, SharesItsFileWithNobody) {
  const TemporaryFile file, link;
  const Picture picture = Picture::Mapped(file.Path(), 40, 20, Format::RGB, 1);
  FillWithNoise(picture, 31);
  const std::vector<Samples> rows = StoredRows(picture);
  std::filesystem::create_symlink(file.Path(), link.Path());
  for (const auto& path : {file.Path(), link.Path()}) {
    EXPECT_FALSE(Picture::Mapped(path, 9, 9, Format::G, 1).Valid());
    EXPECT_EQ(StoredRows(picture), rows);
  }
  const Picture view = picture.MirroredView();
  picture.Close();
  EXPECT_FALSE(Picture::Mapped(file.Path(), 9, 9, Format::G, 1).Valid()) << "a view is on it still";
  view.Close();
  EXPECT_TRUE(Picture::Mapped(file.Path(), 9, 9, Format::G, 1).Valid());
}

TEST(MappedStore, LeavesDevicesAlone) {
  EXPECT_FALSE(Picture::Mapped("/dev/null", 9, 9, Format::G, 1).Valid());
  EXPECT_TRUE(std::filesystem::exists("/dev/null"));
}

// Catches bytes that belong to a picture's rows and aren't taken for it, as those of the last row of a block
// beyond the way from row to row, and bytes between its rows that are.
TEST(MemoryStore, SharesNothingButItsPixels) {
  for (const int rowSize : {0, 4, 20, 23}) {
    const Picture picture(MemoryBlock(100), 20, 3, Format::G, rowSize);
    // The block that a picture gives says no size, so the class would refuse it.
    const Picture bytes = UnbuiltPicture();
    model::Invoke<void>(bytes, "Constructor", picture.Memory(), 1, 100, int(Format::G), 1);
    for (int at = 0; at < 100; ++at) {
      bool inRow = false;
      for (int y = 0; y < 3; ++y) inRow |= at >= y * rowSize && at < y * rowSize + 20;
      const Picture byte = bytes.ClipImage({0, at, 1, 1});
      EXPECT_EQ(SharePixels(DataOf(picture), DataOf(byte)), inRow) << rowSize << " apart, byte " << at;
      EXPECT_EQ(SharePixels(DataOf(byte), DataOf(picture)), inRow) << rowSize << " apart, byte " << at;
    }
  }
}

/// Two pictures as far apart from row to row as a block below 4 GiB allows, of which only the pixels take
/// memory.
class FarRows {
 public:
  static constexpr std::size_t Bytes = 0xFFFFFFFF;
  static constexpr int RowSize = Bytes / RowArguments::Height / 64 * 64;

  explicit FarRows(Format format) {
    for (int i = 0; i < 2; ++i) {
      Memory[i] =
          mmap(nullptr, Bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
      MemoryBlock block(Object::Adopt(model::NewBlock(Memory[i])));
      block.Limit(Bytes);
      Of[i] = Picture(block, RowArguments::Width, RowArguments::Height, format, RowSize);
    }
  }
  ~FarRows() {
    for (void* memory : Memory) munmap(memory, Bytes);
  }
  FarRows(const FarRows&) = delete;
  Picture Of[2];

 private:
  void* Memory[2];
};

/// What a row makes of the first of two pictures, and of the second if it takes one.
std::vector<Samples> Made(const model::MethodEntry& row, const Picture (&pictures)[2], Format format) {
  const RowArguments with(StoredPicture::Memory, format);
  const std::size_t bytes = std::size_t(RowArguments::Width * RowArguments::Height * BytesPerPixel(format));
  for (unsigned i = 0; i < 2; ++i) pictures[i].SetDataStringInFormat(format, Noise(i).Many(bytes));
  std::vector<Value> arguments = with.Ordinary(row);
  for (std::size_t i = 0; i < arguments.size(); ++i)
    if (row.Of.Parameters[i].Type == "picturezor") arguments[i] = {.Address = pictures[1].Address()};
  const Outcome outcome = CallRow(row, pictures[0].Address(), arguments);
  std::vector<Samples> made{Samples(outcome.Raised.begin(), outcome.Raised.end())};
  if (row.Of.Result == "picturezor" && outcome.Result.Address) {
    const Picture result(Object::Share(outcome.Result.Address));
    made.push_back(result.DataStringInFormat(result.ImageFormat()));
  }
  if (row.Of.Result == "boolean") made.push_back({std::uint8_t(outcome.Result.Whole)});
  for (const Picture& picture : pictures) made.push_back(picture.DataStringInFormat(format));
  GiveBack(row.Of.Result, outcome.Result);
  return made;
}

// Catches a place in a picture that is worked out in 32 bits.
TEST(MemoryStore, ReachesRowsBeyond2GiB) {
  if (sizeof(void*) < 8) GTEST_SKIP();
  // These copy whole rows, or a picture whole, or have their own random numbers.
  const char* others[] = {"constructor", "row", "clone", "fillrectrandom", "diffusefilter"};
  for (const Format format : {Format::RGBA, Format::G, Format::KYMCA})
    for (const model::MethodEntry& row : model::ClassNamed("PictureZOR").Methods) {
      if (std::ranges::find(others, row.LowerName) != std::end(others)) continue;
      const Picture near[] = {Picture(RowArguments::Width, RowArguments::Height, format),
                              Picture(RowArguments::Width, RowArguments::Height, format)};
      const FarRows far(format);
      ASSERT_TRUE(far.Of[0].Valid() && far.Of[1].Valid());
      EXPECT_EQ(Made(row, far.Of, format), Made(row, near, format)) << row.Record->Declaration << int(format);
    }
}

TEST(MemoryStore, MayBeABlockOf4GiB) {
  if (sizeof(void*) < 8) GTEST_SKIP();
  EXPECT_FALSE(Picture(40000, 20000, Format::RGB).Valid());
  const Picture picture = Picture::InBlock(40000, 20000, Format::RGB);
  ASSERT_TRUE(picture.Valid());
  EXPECT_EQ(picture.TotalSize(), 2400000000);
  picture.ClipImage({39999, 19998, 1, 2}).FillRectRGB(1, 2, 3);
  EXPECT_EQ(picture.ClipImage({39998, 19999, 2, 1}).DataStringInFormat(Format::RGB),
            (Samples{0, 0, 0, 1, 2, 3}));
  EXPECT_FALSE(Picture::InBlock(65536, 65536, Format::G).Valid()) << "2^32 bytes";
  EXPECT_FALSE(Picture::InBlock(0, 5, Format::G).Valid());
}

// Catches rows that lie otherwise than in a picture of the module's own, and memory of others behind them.
TEST(Store, OneThatIsToBeFilledHasTheSameRows) {
  for (const std::int32_t width : {1, 21, 64, 4000}) {
    const Picture picture = Picture::ToBeFilled(width, 7, Format::RGB), own(width, 7, Format::RGB);
    EXPECT_TRUE(picture.CopyPixels(own));
    for (std::int32_t y = 0; y < 7; ++y) EXPECT_EQ(picture.Row(y), own.Row(y)) << width << ' ' << y;
  }
  EXPECT_TRUE(Picture::ToBeFilled(6000, 3000, Format::RGBA).Valid());
  EXPECT_FALSE(Picture::ToBeFilled(0, 5, Format::G).Valid());
}

TEST(MemoryStore, TakesABlockSizeToo) {
  if (OtherPages()) GTEST_SKIP();
  const Picture picture(10, 9, Format::G);
  picture.SetRowInFormat(8, Format::G, Samples(10, 5));
  picture.SetMappingBlockSize(0);
  EXPECT_EQ(picture.MappingBlockSize(), 4096);
  EXPECT_EQ(picture.RowInFormat(8, Format::G), Samples(10, 5));
}

}
}
