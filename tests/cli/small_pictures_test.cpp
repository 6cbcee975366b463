#include <fcntl.h>
#include <pty.h>
#include <unistd.h>

#include <algorithm>

#include "command_test_support.h"

namespace picturezor::tests {

namespace {

class Thumbnails : public CommandTest {};
class Shown : public CommandTest {};

// Catches colours or alpha that don't come through the host's pictures as they are.
TEST_F(Thumbnails, KeepSmallPictures) {
  for (int channels = 1; channels <= 4; ++channels) {
    const Raster picture = Noise(9, 7, channels);
    WritePNG(At("a.png"), picture);
    Do({"thumbnail", "a.png", "--size", "9", "-o", "out"});
    Raster expected{9, 7, channels % 2 ? 3 : 4, {}};
    const int colours = channels < 3 ? 1 : 3;
    for (std::size_t at = 0; at < picture.Samples.size(); at += std::size_t(channels)) {
      for (int c = 0; c < 3; ++c) expected.Samples.push_back(picture.Samples[at + std::size_t(c % colours)]);
      if (channels % 2 == 0) expected.Samples.push_back(picture.Samples[at + std::size_t(colours)]);
    }
    EXPECT_EQ(ReadPNG(At("out/a.png")), expected) << channels;
  }
}

TEST_F(Thumbnails, TurnInksIntoLight) {
  WriteTIFF(At("a.tif"), {3, 1, 4, {0, 0, 0, 0, 9, 9, 9, 255, 50, 0, 0, 100}}, {.CMYK = true});
  Do({"thumbnail", "a.tif", "--size", "100", "-o", "."});
  EXPECT_EQ(ReadPNG(At("a.png")), (Raster{3, 1, 3, {255, 255, 255, 0, 0, 0, 125, 155, 155}}));
}

TEST_F(Thumbnails, AreScaledToTheirLongerSide) {
  WritePNG(At("wide.png"), Waves(300, 200, 3));
  WriteJPEG(At("high.jpg"), Waves(100, 220, 3), {.Orientation = 6});
  for (const char* store : {"memory", "mapped"}) {
    Do({"thumbnail", "wide.png", "high.jpg", "--size", "60", "--store", store, "-o", "out"});
    Do({"scale", "wide.png", "--width", "60", "-o", "scaled.png"});
    EXPECT_EQ(ReadPNG(At("out/wide.png")), ReadPNG(At("scaled.png")));
    const Raster turned = ReadPNG(At("out/high.png"));
    EXPECT_EQ(turned.Width, 60);
    EXPECT_EQ(turned.Height, 27);
  }
}

TEST_F(Thumbnails, NeverCostAnImage) {
  std::filesystem::create_directory(At("b"));
  for (const char* name : {"a.png", "b/a.png"}) WritePNG(At(name), Noise(9, 7, 3));
  WriteJPEG(At("a.jpg"), Waves(9, 7, 3));
  Fail({"thumbnail", "a.png", "--size", "5", "-o", "."}, "a.png", "overwritten by a thumbnail");
  Fail({"thumbnail", "b/a.png", "a.png", "--size", "5", "-o", "."}, "a.png", "the name of that of b/a.png");
  Fail({"thumbnail", "a.png", "a.jpg", "--size", "5", "-o", "out"}, "a.jpg", "the name of that of a.png");
  Fail({"thumbnail", "a.png", "a.jpg", "--name", "{width}.tif", "--size", "5", "-o", "out"}, "a.jpg",
       "the name of that of a.png");
  Fail({"thumbnail", "a.png", "--size", "5", "-o", "no/out"}, "no/out", "No such file");
  EXPECT_FALSE(std::filesystem::exists(At("out")));
}

// Catches a bad file that ends the work or is forgotten, and pictures that depend on who made them.
TEST_F(Thumbnails, AreMadeSeveralAtATime) {
  Arguments names{"none.png"};
  for (int i = 0; i < 12; ++i) {
    names.push_back("a" + std::to_string(i) + (i % 3 ? ".jpg" : ".png"));
    const Raster picture = Waves(90 + 30 * i, 120, 3);
    if (i % 3)
      WriteJPEG(At(names.back()), picture);
    else
      WritePNG(At(names.back()), picture);
  }
  WriteBytes(At("bad.jpg"), {0xFF, 0xD8, 0xFF, 0});
  names.push_back("bad.jpg");
  Raster first[12];
  for (const char* jobs : {"1", "3", "0"}) {
    const Outcome outcome = Run(Words("thumbnail --size 30 --name {ext}-{stem}-{width}x{height}.png") +
                                Arguments{"--jobs", jobs, "-o", jobs} + names);
    EXPECT_EQ(outcome.Code, 2);
    EXPECT_THAT(outcome.Error,
                testing::MatchesRegex("picturezor: none.png: [^\n]+\npicturezor: bad.jpg: [^\n]+\n"));
    for (int i = 0; i < 12; ++i) {
      const int width = i == 0 ? 23 : 30,
                height = i == 0 ? 30 : (30 * 120 + (90 + 30 * i) / 2) / (90 + 30 * i);
      const std::string name = std::string(i % 3 ? "jpg-a" : "png-a") + std::to_string(i) + "-" +
                               std::to_string(width) + "x" + std::to_string(height) + ".png";
      const Raster made = ReadPNG(At(std::string(jobs) + "/" + name));
      EXPECT_EQ(made.Width, width) << name;
      if (jobs[0] == '1') first[i] = made;
      EXPECT_EQ(made, first[i]);
    }
  }
}

TEST_F(Shown, HasTwoPixelsInAPlace) {
  // 3 rows, so that the last place has but an upper pixel.
  WritePNG(At("a.png"), {2, 3, 3, {1, 2, 3, 1, 2, 3, 4, 5, 6, 4, 5, 6, 7, 8, 9, 10, 11, 12}});
  EXPECT_EQ(Run({"show", "a.png", "--width", "2"}).Out,
            "\x1b[0;38;2;1;2;3;48;2;4;5;6m\u2580\u2580\x1b[0m\n"
            "\x1b[0;38;2;7;8;9m\u2580\x1b[0;38;2;10;11;12m\u2580\x1b[0m\n");
  // Half of alpha and more shows.
  WritePNG(At("b.png"), {4, 2, 2, {9, 127, 9, 128, 9, 0, 9, 255, 8, 127, 8, 127, 8, 255, 8, 255}});
  EXPECT_EQ(Run({"show", "b.png", "--width", "4"}).Out,
            "\x1b[0m \x1b[0;38;2;9;9;9m\u2580\x1b[0;38;2;8;8;8m\u2584"
            "\x1b[0;38;2;9;9;9;48;2;8;8;8m\u2580\x1b[0m\n");
}

std::size_t Places(const std::string& text) {
  std::size_t count = 0;
  for (auto at = text.find("\u2580"); at != text.npos; at = text.find("\u2580", at + 1)) ++count;
  return count;
}

TEST_F(Shown, FitsTheWindow) {
  WritePNG(At("a.png"), {40, 40, 1, Bytes(1600, 77)});
  EXPECT_EQ(Places(Run({"show", "a.png"}).Out), 80u * 40) << "without a window it is 80 columns wide";
  EXPECT_EQ(Places(Run({"show", "a.png", "--width", "6"}).Out), 6u * 3);

  winsize window{5, 12, 0, 0};
  int ours = -1, terminal = -1;
  ASSERT_EQ(openpty(&ours, &terminal, nullptr, nullptr, &window), 0);
  EXPECT_EQ(WaitFor(Start({"show", "a.png"}, terminal, terminal)), 0);
  std::string text(4096, '\0');
  text.resize(std::size_t(std::max<ssize_t>(read(ours, text.data(), text.size()), 0)));
  EXPECT_EQ(Places(text), 8u * 4) << "a line of the 5 stays for the prompt";
  close(ours);
  close(terminal);
}

TEST_F(Shown, NeedsAnImage) {
  Fail({"show", "none.png"}, "none.png", "No such file");
  WritePNG(At("high.png"), Noise(1, 600, 1));
  Fail({"show", "high.png", "--width", "60"}, "high.png", "too tall");
}

}

}
