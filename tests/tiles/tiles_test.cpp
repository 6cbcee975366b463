#include <archive.h>
#include <archive_entry.h>

#include <algorithm>
#include <csignal>
#include <cstring>

#include "cli/command_test_support.h"
#include "grid.h"

namespace picturezor::tests {

namespace {

using std::filesystem::path;
using tiles::Grid;
using tiles::Layout;

class Tiles : public CommandTest {
 protected:
  /// The level as `scale` makes it of the whole picture.
  Raster Scaled(const std::string& file, files::Extent size, const std::string& kernel) const {
    Do({"scale", file, "--width", std::to_string(size.Width), "--height", std::to_string(size.Height),
        "--kernel", kernel, "-o", "scaled.png"});
    const Raster scaled = ReadPNG(At("scaled.png"));
    std::filesystem::remove(At("scaled.png"));
    return scaled;
  }

  /// The tiles of a level, put together; the pixels that tiles share have to be the same in both.
  Raster Together(const Grid& grid, const std::string& name, int level, int channels) const {
    const auto [width, height] = grid.Level(level);
    Raster whole{width, height, channels,
                 Bytes(std::size_t(width) * std::size_t(height) * std::size_t(channels))};
    std::vector<bool> there(whole.Samples.size());
    for (int row = 0; row < grid.Down(level); ++row)
      for (int column = 0; column < grid.Across(level); ++column) {
        const Rect part = grid.TileAt(level, column, row);
        const Raster tile = ReadPNG(At(grid.TileName(name, ".png", level, column, row)));
        EXPECT_EQ(tile.Width, grid.Fills() ? grid.Tile() : part.Width);
        EXPECT_EQ(tile.Height, grid.Fills() ? grid.Tile() : part.Height);
        for (int y = 0; y < part.Height; ++y)
          for (int i = 0; i < part.Width * channels; ++i) {
            const std::size_t to =
                (std::size_t(part.Y + y) * std::size_t(width) + std::size_t(part.X)) * std::size_t(channels) +
                std::size_t(i);
            const std::uint8_t sample = tile.Samples[std::size_t(y * tile.Width * channels + i)];
            EXPECT_TRUE(!there[to] || whole.Samples[to] == sample);
            whole.Samples[to] = sample;
            there[to] = true;
          }
      }
    EXPECT_TRUE(std::ranges::all_of(there, [](bool is) { return is; }));
    return whole;
  }

  std::string Text(const std::string& name) const {
    const Bytes bytes = ReadBytes(At(name));
    return {bytes.begin(), bytes.end()};
  }

  std::vector<std::string> FilesBelow(const std::string& folder) const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(At(folder)))
      if (entry.is_regular_file())
        names.push_back(std::filesystem::relative(entry.path(), At(folder)).string());
    std::ranges::sort(names);
    return names;
  }

  void ExpectSame(const std::string& folder, const std::string& other) const {
    EXPECT_EQ(FilesBelow(folder), FilesBelow(other));
    for (const std::string& name : FilesBelow(other))
      EXPECT_EQ(ReadBytes(At(folder) / name), ReadBytes(At(other) / name)) << name;
  }
};

TEST_F(Tiles, PutTogetherAreTheScaledPicture) {
  const struct {
    int Width, Height, Channels;
    Layout Of;
    const char* Options;
    int Tile, Overlap;
    const char* Kernel = "box";
  } cases[] = {
      {300, 200, 3, Layout::DeepZoom, "--tile 64 --overlap 3", 64, 3},
      {257, 130, 4, Layout::DeepZoom, "--tile 32 --overlap 1 --threads 1", 32, 1},
      {100, 65, 1, Layout::DeepZoom, "--tile 16 --overlap 15 --layout deepzoom", 16, 15},
      {333, 250, 3, Layout::IIIF, "--layout iiif --tile 64", 64, 0},
      {200, 333, 2, Layout::XYZ, "--layout xyz --tile 64", 64, 0},
      {90, 70, 3, Layout::DeepZoom, "--kernel lanczos3", 256, 0, "lanczos3"},
  };
  for (const auto& [width, height, channels, layout, options, tile, overlap, kernel] : cases) {
    SCOPED_TRACE(testing::Message() << width << ' ' << int(layout));
    WritePNG(At("a.png"), Noise(width, height, channels));
    Do(Words("tiles a.png --format png -o p") + Words(options));
    const Grid grid({width, height}, layout, tile, overlap);
    for (int level = 0; level < grid.LevelCount(); ++level) {
      const Raster expected = level == 0 ? ReadPNG(At("a.png")) : Scaled("a.png", grid.Level(level), kernel);
      EXPECT_EQ(Together(grid, "p", level, channels), expected) << level;
    }
    for (const char* made : {"p", "p_files", "p.dzi"}) std::filesystem::remove_all(At(made));
    EXPECT_EQ(Files(), std::vector<std::string>{"a.png"});
  }
}

// Catches copies that are taken for others, or not taken: theirs are of another picture.
TEST_F(Tiles, CopiesInTheFileServeWhereTheyAreAskedFor) {
  WritePNG(At("a.png"), Noise(400, 321, 3));
  Do({"convert", "a.png", "--pyramid", "--tile", "64", "-o", "a.tif"});
  Do({"tiles", "a.tif", "--format", "png", "--use-levels", "-o", "p"});
  const Grid grid({400, 321}, Layout::DeepZoom, 256, 0);
  EXPECT_EQ(Together(grid, "p", 0, 3), ReadPNG(At("a.png")));
  // Copies have half as many columns and rows, rounded down, so level 1, of 200 x 161, is made of the
  // picture.
  EXPECT_EQ(Together(grid, "p", 1, 3), Scaled("a.png", {200, 161}, "box"));
  Do({"crop", "a.png", "--rect", "0,0,400,320", "-o", "copy.png"});
  for (const auto& [level, copy] : {std::pair{2, files::Extent{200, 160}}, {3, {100, 80}}}) {
    WritePNG(At("copy.png"), Scaled("copy.png", copy, "box"));
    EXPECT_EQ(Together(grid, "p", level, 3), Scaled("copy.png", grid.Level(level), "box")) << level;
  }
}

TEST_F(Tiles, StandUpright) {
  WriteJPEG(At("a.jpg"), Waves(90, 40, 3), {.Orientation = 6});
  Do({"convert", "a.jpg", "-o", "upright.png"});
  Do({"tiles", "a.jpg", "--format", "png", "-o", "p"});
  EXPECT_EQ(ReadPNG(At("p_files/7/0_0.png")), ReadPNG(At("upright.png")));
}

TEST_F(Tiles, DescriptionsKeepTheRules) {
  WritePNG(At("a.png"), Noise(700, 300, 3));
  Do({"tiles", "a.png", "--tile", "254", "--overlap", "1", "-o", "zoom.dzi"});
  EXPECT_EQ(Text("zoom.dzi"),
            "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
            "<Image xmlns=\"http://schemas.microsoft.com/deepzoom/2008\" Format=\"jpg\" Overlap=\"1\" "
            "TileSize=\"254\">\n  <Size Width=\"700\" Height=\"300\"/>\n</Image>\n");
  // One folder for each level: 2^10 is the first power of two that is at least 700.
  EXPECT_TRUE(std::filesystem::exists(At("zoom_files/0/0_0.jpg")));
  EXPECT_TRUE(std::filesystem::exists(At("zoom_files/10/2_1.jpg")));
  EXPECT_FALSE(std::filesystem::exists(At("zoom_files/11")));

  Do({"tiles", "a.png", "--layout", "iiif", "--address", "https://example.org/iiif", "-o", "scan"});
  EXPECT_EQ(Text("scan/info.json"),
            "{\n  \"@context\": \"http://iiif.io/api/image/3/context.json\",\n"
            "  \"id\": \"https://example.org/iiif/scan\",\n  \"type\": \"ImageService3\",\n"
            "  \"protocol\": \"http://iiif.io/api/image\",\n  \"profile\": \"level0\",\n"
            "  \"width\": 700,\n  \"height\": 300,\n"
            "  \"sizes\": [{\"width\": 175, \"height\": 75}],\n"
            "  \"tiles\": [{\"width\": 256, \"height\": 256, \"scaleFactors\": [1, 2, 4]}]\n}\n");
  // Region / size / rotation / quality, each in its canonical form.
  EXPECT_EQ(
      FilesBelow("scan"),
      (std::vector<std::string>{"0,0,256,256/256,256/0/default.jpg", "0,0,512,300/256,150/0/default.jpg",
                                "0,256,256,44/256,44/0/default.jpg", "256,0,256,256/256,256/0/default.jpg",
                                "256,256,256,44/256,44/0/default.jpg", "512,0,188,256/188,256/0/default.jpg",
                                "512,0,188,300/94,150/0/default.jpg", "512,256,188,44/188,44/0/default.jpg",
                                "full/175,75/0/default.jpg", "info.json"}));
}

TEST_F(Tiles, BlankOnesCanBeLeftOutAndAlphaIsBlended) {
  Raster picture{64, 32, 4, Bytes(64 * 32 * 4)};
  for (int y = 0; y < 32; ++y)
    for (int x = 0; x < 16; ++x) {
      std::uint8_t* pixel = &picture.Samples[std::size_t((y * 64 + x) * 4)];
      pixel[0] = 200;
      pixel[3] = 51;
    }
  WritePNG(At("a.png"), picture);
  Do({"tiles", "a.png", "--tile", "32", "--skip-blank", "--format", "png", "-o", "p"});
  EXPECT_EQ(Text("p.dzi").find("Format=\"png\"") != std::string::npos, true);
  EXPECT_TRUE(std::filesystem::exists(At("p_files/6/0_0.png")));
  EXPECT_FALSE(std::filesystem::exists(At("p_files/6/1_0.png")));
  Do({"tiles", "a.png", "--tile", "32", "--background", "0000ff", "--quality", "100", "-o", "j"});
  // A fifth of the red, and four fifths of the blue: 255 * 204 / 255.
  const Raster tile = ReadJPEG(At("j_files/6/0_0.jpg"));
  EXPECT_NEAR(tile.Samples[0], 40, 2);
  EXPECT_NEAR(tile.Samples[2], 204, 2);
  EXPECT_NEAR(tile.Samples[31 * 3 + 2], 255, 2);
}

TEST_F(Tiles, OneZipHoldsTheSameFiles) {
  WritePNG(At("a.png"), Noise(100, 90, 3));
  Do({"tiles", "a.png", "--tile", "64", "-o", "p"});
  // In a SZI all stands in a folder, and one file more.
  for (const auto& [name, folder, more] : {std::tuple{"p.zip", "", 0U}, {"p.szi", "p/", 1U}}) {
    Do({"tiles", "a.png", "--tile", "64", "-o", name});
    archive* zip = archive_read_new();
    archive_read_support_format_zip(zip);
    ASSERT_EQ(archive_read_open_filename(zip, At(name).c_str(), 1 << 16), ARCHIVE_OK);
    std::size_t files = 0;
    for (archive_entry* entry; archive_read_next_header(zip, &entry) == ARCHIVE_OK; ++files) {
      Bytes bytes(std::size_t(archive_entry_size(entry)));
      EXPECT_EQ(archive_read_data(zip, bytes.data(), bytes.size()), la_ssize_t(bytes.size()));
      std::string path = archive_entry_pathname(entry);
      ASSERT_TRUE(path.starts_with(folder)) << path;
      path.erase(0, std::strlen(folder));
      if (path == "scan-properties.xml")
        EXPECT_THAT(std::string(bytes.begin(), bytes.end()),
                    testing::ContainsRegex("ImageWidth</name>[^0-9]*100<.*ImageHeight</name>[^0-9]*90<"));
      else
        EXPECT_EQ(bytes, ReadBytes(At(path))) << path;
    }
    EXPECT_STREQ(archive_format_name(zip), "ZIP 1.0 (uncompressed)");
    archive_read_free(zip);
    EXPECT_EQ(files, FilesBelow("p_files").size() + 1 + more);
  }
}

TEST_F(Tiles, AreThereWhenTheyAreCompleteAndCanBeGoneOnWith) {
  const Raster picture = Noise(2000, 1500, 3);
  WritePNG(At("a.png"), picture);
  Do({"tiles", "a.png", "--tile", "64", "--format", "png", "-o", "whole"});
  const pid_t process = Start({"tiles", "a.png", "--tile", "64", "--format", "png", "-o", "p"}, 1, 2);
  // A row of the picture's tiles is there.
  while (!std::filesystem::exists(At("p.unfinished/p_files/11/0_3.png")) &&
         !std::filesystem::exists(At("p.dzi")))
    sched_yield();
  kill(process, SIGKILL);
  ASSERT_EQ(WaitFor(process), -SIGKILL);
  EXPECT_FALSE(std::filesystem::exists(At("p.dzi")) || std::filesystem::exists(At("p_files")));
  // What the journal says is done isn't made again.
  const path first = At("p.unfinished/p_files/11/0_0.png");
  std::filesystem::resize_file(first, 0);
  Do({"tiles", "a.png", "--tile", "64", "--format", "png", "--resume", "-o", "p"});
  EXPECT_EQ(ReadBytes(At("p_files/11/0_0.png")).size(), 0U);
  std::filesystem::copy_file(At("whole_files/11/0_0.png"), At("p_files/11/0_0.png"),
                             std::filesystem::copy_options::overwrite_existing);
  ExpectSame("p_files", "whole_files");
  EXPECT_FALSE(std::filesystem::exists(At("p.unfinished")));
}

// Catches seams between parts: rows of smaller levels that two of them share, tiles that overlap, sums that
// are counted twice.
TEST_F(Tiles, MadeByPartsAreTheSame) {
  const struct {
    int Width, Height, Channels;
    std::vector<int> Parts;
    std::vector<std::string> Options;
  } cases[] = {
      {300, 517, 3, {1, 2, 3, 9}, {"--tile", "64", "--overlap", "7"}},
      {130, 333, 4, {5, 21}, {"--tile", "16", "--format", "png", "--skip-blank", "--layout", "xyz"}},
      {77, 1023, 1, {4, 11}, {"--tile", "32", "--layout", "iiif", "--page"}},
      {5, 4000, 2, {7}, {"--tile", "16", "--overlap", "15", "--format", "png"}},
  };
  for (const auto& [width, height, channels, counts, options] : cases) {
    WriteTIFF(At("a.tif"), Noise(width, height, channels), {.RowsPerStrip = 9});
    const auto command = [&](const std::string& name, const Arguments& more) {
      return Arguments{"tiles", "a.tif", "-o", name} + options + more;
    };
    Do(command("whole/p", {}));
    for (const int parts : counts) {
      SCOPED_TRACE(testing::Message() << height << " by " << parts);
      const std::string of = "/" + std::to_string(parts);
      const Arguments join{"--join", std::to_string(parts)};
      for (int part = parts; part > 1; --part) Do(command("made/p/", {"--part", std::to_string(part) + of}));
      Fail(command("made/p", join), parts > 1 ? "made/p.unfinished/part-1" : "made/p.unfinished", "made yet");
      if (parts > 1)
        Fail(command("made/p", {"--part", "1" + of, "--background", "010203"}), "made/p.unfinished",
             "other options");
      Do(command("made/p", {"--part", "1" + of}));
      Do(command("made/p", join));
      ExpectSame("made", "whole");
      EXPECT_THAT(Run(command("made/p", {"--part", "1" + of})).Error,
                  testing::HasSubstr("it is there already"));
      std::filesystem::remove_all(At("made"));
    }
    std::filesystem::remove_all(At("whole"));
  }
}

// Catches parts that step on each other, and permissions that are lost where many threads make files.
TEST_F(Tiles, PartsAreMadeAtTheSameTime) {
  WriteTIFF(At("a.tif"), Noise(400, 600, 3));
  const auto command = [](const std::string& name, const Arguments& more) {
    return Words("tiles a.tif --tile 32 --overlap 31 --threads 4 -o " + name) + more;
  };
  Do(command("whole/p", {}));
  std::vector<pid_t> processes;
  for (const char* part : {"1/3", "2/3", "3/3", "2/3"})
    processes.push_back(Start(command("made/p", {"--part", part}), 1, 2));
  for (const pid_t process : processes) EXPECT_EQ(WaitFor(process), 0);
  Do(command("made/p", {"--join", "3"}));
  ExpectSame("made", "whole");
  const auto rights = [&](const path& file) { return std::filesystem::status(file).permissions(); };
  for (const std::string& name : FilesBelow("whole"))
    EXPECT_EQ(rights(At("made/" + name)), rights(At("whole/" + name))) << name;
  EXPECT_EQ(rights(At("made/p_files/10")), rights(At("whole/p_files/10")));
}

TEST_F(Tiles, RefuseWhatCantBe) {
  WritePNG(At("a.png"), Noise(20, 10, 3));
  WriteBytes(At("p_files"), {1});
  Fail({"tiles", "a.png", "-o", "p"}, "p_files", "it is there already");
  std::filesystem::remove(At("p_files"));
  WriteBytes(At("cut.png"), Bytes(ReadBytes(At("a.png"))));
  std::filesystem::resize_file(At("cut.png"), 300);
  EXPECT_EQ(Run({"tiles", "cut.png", "-o", "p.zip"}).Code, 2);
  // Jobs are under way on other threads when its end is missed.
  WriteTIFF(At("cut.tif"), Noise(2000, 2000, 3));
  std::filesystem::resize_file(At("cut.tif"), 9'000'000);
  EXPECT_EQ(Run({"tiles", "cut.tif", "--threads", "4", "-o", "p.zip"}).Code, 2);
  EXPECT_EQ(Files(), (std::vector<std::string>{"a.png", "cut.png", "cut.tif"}));
}

}

}
