#include "box_levels.h"

#include <gtest/gtest.h>

#include <random>

#include "grid.h"
#include "picturezor/picture.h"
#include "rows.h"

namespace picturezor::tiles {
namespace {

Picture Noise(std::int32_t width, std::int32_t height, Format format, std::mt19937& random) {
  const Picture picture(width, height, format);
  for (std::int32_t y = 0; y < height; ++y) {
    Bytes row(std::size_t(width) * std::size_t(BytesPerPixel(format)));
    // Extreme samples make the sums that come nearest to their bounds.
    for (std::uint8_t& sample : row)
      sample = random() % 4 ? std::uint8_t(random()) : std::uint8_t(random() % 2 * 255);
    picture.SetRowInFormat(y, format, row);
  }
  return picture;
}

// Catches every departure of a level from the scale of the whole picture: lines that take other columns or
// rows than the kernel, a level that is made from another level, quotients that are rounded otherwise, and
// rows that are lost or counted twice where parts meet.
TEST(BoxLevels, AreScalesOfTheWholePicture) {
  const struct {
    std::int32_t Width, Height;
    Format Of;
  } cases[] = {
      {1, 1, Format::G},       {64, 64, Format::RGB},   {65, 63, Format::RGBA},  {3, 5, Format::GA},
      {127, 33, Format::CMYK}, {96, 40, Format::CMYKA}, {1000, 7, Format::RGB},  {1, 777, Format::RGB},
      {2049, 5, Format::G},    {512, 300, Format::RGB}, {1536, 11, Format::RGB}, {4099, 37, Format::GA},
  };
  std::mt19937 random(7);
  for (const auto& [width, height, format] : cases) {
    SCOPED_TRACE(testing::Message() << width << " x " << height << ' ' << int(format));
    const Picture source = Noise(width, height, format, random);
    const int channels = BytesPerPixel(format);
    const Grid grid({width, height}, Layout::DeepZoom, 256, 0);
    std::vector<files::Extent> sizes;
    for (int level = 1; level < grid.LevelCount(); ++level) sizes.push_back(grid.Level(level));
    BoxLevels boxes({width, height}, channels, sizes);
    std::vector<Bytes> made(sizes.size());
    const auto scratch = boxes.MakeScratch();
    for (std::int32_t y = 0; y < height;) {
      const std::int32_t count = std::min<std::int32_t>(1 + std::int32_t(random() % 21), height - y);
      const auto part = boxes.Reduce(flow::RowOf(source, y), source.RowSize(), y, count, *scratch);
      boxes.Add(part, [&](int level, std::int32_t row, const std::uint8_t* samples) {
        const std::size_t bytes = std::size_t(sizes[std::size_t(level)].Width) * std::size_t(channels);
        ASSERT_EQ(made[std::size_t(level)].size(), std::size_t(row) * bytes);
        made[std::size_t(level)].insert(made[std::size_t(level)].end(), samples, samples + bytes);
      });
      y += count;
    }
    for (std::size_t level = 0; level < sizes.size(); ++level) {
      const Picture scaled(sizes[level].Width, sizes[level].Height, format);
      ASSERT_TRUE(scaled.Scale(source, {}, Kernel::Box, sizes[level].Width, sizes[level].Height));
      EXPECT_EQ(made[level], scaled.DataStringInFormat(format)) << "level " << level;
    }
  }
}

// For every number of lines there is a first one where a slip of rounding would show.
TEST(BoxLevels, LinesAreThoseOfTheKernel) {
  for (std::int32_t source = 2; source < 700; ++source) {
    Bytes row(static_cast<std::size_t>(source));
    for (std::int32_t x = 0; x < source; ++x) row[std::size_t(x)] = std::uint8_t(x * 37 % 251);
    const Picture line(source, 1, Format::G);
    line.SetRowInFormat(0, Format::G, row);
    for (std::int32_t level = source / 2 + source % 2;; level = level / 2 + level % 2) {
      const Picture scaled(level, 1, Format::G);
      ASSERT_TRUE(scaled.Scale(line, {}, Kernel::Box, level, 1));
      const std::vector<BoxLine> lines = BoxLines(level, source);
      const Bytes means = scaled.Row(0);
      for (std::int32_t x = 0; x < level; ++x) {
        const auto [first, count] = lines[std::size_t(x)];
        std::int64_t sum = 0;
        for (std::int32_t i = first; i < first + count; ++i) sum += row[std::size_t(i)];
        ASSERT_EQ(means[std::size_t(x)], sum / count) << source << " to " << level << " at " << x;
      }
      if (level == 1) break;
    }
  }
}

}
}
