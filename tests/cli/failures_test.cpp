#include <fcntl.h>
#include <unistd.h>

#include <csignal>
#include <fstream>

#include "command_test_support.h"

namespace picturezor::tests {

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

using Failures = CommandTest;

TEST_F(Failures, AFileThatIsCutAnywhereIsRefused) {
  const Raster picture = Waves(48, 32, 3);
  WritePNG(At("whole.png"), picture);
  WriteJPEG(At("whole.jpg"), picture, {.Profile = Profile("RGB ")});
  WriteJPEG(At("progressive.jpg"), picture, {.Quality = 50, .Progressive = true});
  WriteTIFF(At("whole.tif"), picture, {.DensityPerInch = 72, .Profile = Profile("RGB ")});
  WriteTIFF(At("deflate.tif"), picture, {.Compression = 8, .RowsPerStrip = 1000});
  for (const auto& name : Files()) {
    const Bytes whole = ReadBytes(At(name));
    const std::string cut = "cut" + std::filesystem::path(name).extension().string();
    Do({"convert", name, "-q", "-o", "whole-out.png"});
    std::filesystem::remove(At("whole-out.png"));
    // All places near both ends, and some between.
    for (std::size_t size = 0; size < whole.size(); size += size < 10 || size + 10 >= whole.size() ? 1 : 97) {
      SCOPED_TRACE(testing::Message() << name << " cut to " << size << " of " << whole.size());
      WriteBytes(At(cut), Bytes(whole.begin(), whole.begin() + std::ptrdiff_t(size)));
      Fail({"convert", cut, "-q", "-o", "out.png"}, cut, "");
      if (HasFailure()) return;
    }
    std::filesystem::remove(At(cut));
  }
}

TEST_F(Failures, DamageIsNoticed) {
  for (const std::string name : {"a.png", "a.tif"}) {
    const Raster picture = Noise(64, 64, 3);
    WritePNG(At("a.png"), picture);
    WriteTIFF(At("a.tif"), picture, {.Compression = 8});
    Bytes bytes = ReadBytes(At(name));
    for (std::size_t i = bytes.size() / 2; i < bytes.size() / 2 + 8; ++i) bytes[i] ^= 0x55;
    WriteBytes(At(name), bytes);
    Fail({"convert", name, "-o", "out.png"}, name, "corrupt");
  }
}

TEST_F(Failures, BadInput) {
  WriteBytes(At("text.png"), {'h', 'e', 'l', 'l', 'o', ' ', 'y', 'o', 'u'});
  WriteBytes(At("empty.jpg"), {});
  // 100 bytes that claim 2^31 - 1 columns and rows.
  Bytes huge = {0x89, 'P',  'N',  'G',  13,   10,   26,   10,   0,    0,    0,   13,  'I', 'H',
                'D',  'R',  0x7F, 0xFF, 0xFF, 0xFF, 0x7F, 0xFF, 0xFF, 0xFF, 8,   2,   0,   0,
                0,    0x9B, 0xAB, 0x9C, 0x31, 0,    0,    0,    55,   'I',  'D', 'A', 'T'};
  huge.resize(100);
  WriteBytes(At("huge.png"), huge);
  Bytes wide = huge;
  // 60000 x 60000, with the check sum for it.
  for (const std::size_t at : {16, 20}) {
    wide[at] = wide[at + 1] = 0;
    wide[at + 2] = 0xEA;
    wide[at + 3] = 0x60;
  }
  const std::uint8_t sum[] = {0x0F, 0xB0, 0xE2, 0x15};
  std::copy(std::begin(sum), std::end(sum), wide.begin() + 29);
  WriteBytes(At("wide.png"), wide);
  std::filesystem::create_directory(At("folder.png"));
  WritePNG(At("good.png"), Noise(8, 8, 3));
  const struct {
    std::string In, Reason;
  } cases[] = {{"missing.png", "No such file"},
               {"folder.png", "directory"},
               {"text.png", "not a PNG, JPEG, TIFF, WebP, JPEG XL, AVIF, HEIC, JPEG 2000 or PNM image"},
               {"empty.jpg", "empty"},
               {"huge.png", "pixels are too many"},
               {"wide.png", "which 100 bytes can't hold"},
               {"/dev/null", "not a regular file"}};
  for (const auto& [in, reason] : cases) {
    SCOPED_TRACE(in);
    Fail({"convert", in, "-o", "out.png"}, in, reason);
    EXPECT_EQ(Run({"info", in}).Code, 2);
  }
  Fail({"convert", "good.png", "-o", "nowhere/out.png"}, "nowhere/out.png", "No such file");
  Fail({"convert", "good.png", "-o", "folder.png"}, "folder.png", "directory");
  Fail({"convert", "good.png", "--store", "mapped", "--temp-dir", "nowhere", "-o", "o.png"}, "nowhere",
       "No such file");
}

TEST_F(Failures, WrongCommandLines) {
  const struct {
    const char* Command;
    std::vector<const char*> Wrong;
  } cases[] = {
      {"convert",
       {"--format hsv", "--store tape", "--memory-limit much", "--memory-limit -1M", "--quality 101",
        "--frobnicate", "--compression lzw", "--compression 10"}},
      {"scale",
       {"", "--width 0", "--width -5", "--width 99999999999999999999", "--width ten",
        "--width 4 --kernel sharp", "--width 4 --fit 4x4", "--width 4 --threads 33",
        "--width 4 --fast --kernel box", "--fit 4x", "--fit 0x4", "--percent 0", "--percent nan",
        "--percent 1e300"}},
      {"crop", {"--rect 0,0,0,5", "--rect 0,0,5,-5", "--rect 1,2,3", "--rect 1,2,3,4,5", "--rect a,b,c,d"}},
      {"mirror", {""}},
      {"rotate", {"", "--angle nan", "--angle inf", "--angle 12x", "--angle 12 --background red"}},
      {"combine a.png", {"--fore 12345", "--at 1", "--at a,b", "--fore 000000 --mask a.png"}},
      {"filter gamma", {"", "--gamma nan", "--gamma 0", "--gamma 1,2"}},
      {"filter transfer", {"", "--red 1", "--table 1,x", "--table 4294967296"}},
      {"filter",
       {"sharpen-it", "gain --gain inf", "matrix --weights 1,2", "matrix --weights ''", "blur --radius 0",
        "blur --only-horizontal --only-vertical", "dither --levels 1", "dither --pattern stripes",
        "stamp --black red", "invert --radius 2"}},
      {"thumbnail",
       {"", "--size 0", "--size 5 --name {side}.png", "--size 5 --name {stem}",
        "--size 5 --name {stem}.gif"}},
      {"channels", {""}},
      {"tiles",
       {"--format tif", "--layout iiif --overlap 1", "--tile 4", "--kernel gauss", "--part 1/2", "--part 2/1",
        "--part 1/1x", "--part 1/1 --join 1", "--part 1/1 --resume", "--part 1/1 --use-levels",
        "--part 1/1 --kernel cubic"}},
  };
  std::vector<std::string> lines;
  for (const char* line :
       {"", "paint", "filter", "convert a.png", "show a.png --width 0", "convert a.png -o b.gif",
        "convert a.png -o b.jpg --tile 64", "convert a.png -o b.jpg --pyramid",
        "convert a.png -o b.tif --tile 20", "tiles a.png --resume -o p.zip"})
    lines.push_back(line);
  for (const auto& [command, wrong] : cases)
    for (const std::string options : wrong) lines.push_back(command + (" " + options) + " a.png -o b.png");
  WritePNG(At("a.png"), Noise(8, 8, 3));
  for (const std::string& line : lines) {
    SCOPED_TRACE(line);
    const Outcome outcome = Run(Words(line));
    EXPECT_EQ(outcome.Code, 3);
    EXPECT_THAT(outcome.Error, testing::MatchesRegex("picturezor: [^\n]+\n"));
    EXPECT_THAT(Files(), ElementsAre("a.png"));
  }
  EXPECT_THAT(Run({"filter", "sharpen-it", "a.png"}).Error,
              HasSubstr(": sharpen-it: there is no such filter"));
  EXPECT_EQ(Run({"--help"}).Code, 0);
  EXPECT_THAT(Run({"scale", "--help"}).Out, HasSubstr("Examples:"));
  EXPECT_THAT(Run({"--version"}).Out, HasSubstr("picturezor 1."));
}

TEST_F(Failures, AnOlderFileStaysUntilTheNewOneIsComplete) {
  const Raster old = Noise(5, 5, 1), picture = Noise(40, 40, 3);
  WritePNG(At("old.png"), old);
  WritePNG(At("in.png"), picture);
  Bytes cut = ReadBytes(At("in.png"));
  cut.resize(cut.size() - 30);
  WriteBytes(At("cut.png"), cut);
  Fail({"convert", "cut.png", "-o", "old.png"}, "cut.png", "cut off");
  EXPECT_EQ(ReadPNG(At("old.png")), old);
  // Into itself, through a link, with its permissions.
  std::filesystem::create_symlink("old.png", At("link.png"));
  std::filesystem::permissions(At("old.png"),
                               std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
  Do({"convert", "in.png", "-o", "link.png"});
  EXPECT_TRUE(std::filesystem::is_symlink(At("link.png")));
  EXPECT_EQ(ReadPNG(At("old.png")), picture);
  EXPECT_EQ(int(std::filesystem::status(At("old.png")).permissions()), 0600);
  Do({"convert", "in.png", "--format", "gray", "-o", "in.png"});
  EXPECT_EQ(ReadPNG(At("in.png")).Channels, 1);
}

TEST_F(Failures, NoRoomOnTheDisk) {
  const Raster picture = Noise(300, 300, 3);
  WritePNG(At("in.png"), picture);
  for (const std::string out : {"out.png", "out.jpg", "out.tif"}) {
    const Outcome outcome = Run({"convert", "in.png", "-o", out, "--quality", "100"}, 100'000);
    EXPECT_EQ(outcome.Code, 2);
    EXPECT_EQ(outcome.Error, "picturezor: " + out + ": File too large\n");
    EXPECT_THAT(Files(), ElementsAre("in.png"));
  }
  const Outcome outcome = Run({"convert", "in.png", "-o", "out.png", "--store", "mapped"}, 100'000);
  EXPECT_EQ(outcome.Code, 2);
  EXPECT_THAT(outcome.Error, HasSubstr("no temporary file of 2 MB can be made there"));
  const Outcome turned =
      Run({"rotate", "in.png", "--angle", "90", "-o", "out.png", "--memory-limit", "9K"}, 100'000);
  EXPECT_EQ(turned.Code, 2);
  EXPECT_EQ(turned.Error, "picturezor: " + Temporary.string() + ": a temporary file: File too large\n");
}

/// Whether a process has a file open in a directory beside the one that it reads.
bool Writes(pid_t process, const std::filesystem::path& directory, const std::filesystem::path& read) {
  std::error_code gone;
  const std::filesystem::path files = "/proc/" + std::to_string(process) + "/fd";
  for (std::filesystem::directory_iterator file(files, gone), end; !gone && file != end;
       file.increment(gone)) {
    const auto target = std::filesystem::read_symlink(*file, gone);
    if (!gone && target.string().starts_with(directory.string() + "/") && target != read) return true;
  }
  return false;
}

TEST_F(Failures, ASignalLeavesNothingBehind) {
  WriteEmptyTIFF(At("big.tif"), 16000, 16000);
  const Arguments ways[] = {{"convert", "--store", "mapped", "--format", "rgba"},
                            {"rotate", "--angle", "90", "--memory-limit", "1M"},
                            {"filter", "blur", "--radius", "9", "--memory-limit", "1M"}};
  for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGKILL})
    for (Arguments arguments : ways) {
      SCOPED_TRACE(testing::PrintToString(arguments) + ", " + std::to_string(signal));
      for (const char* more : {"big.tif", "-o", "out.png"}) arguments.push_back(more);
      const int null = open("/dev/null", O_RDWR);
      const pid_t process = Start(arguments, null, null);
      close(null);
      while (!Writes(process, Directory, At("big.tif")) && kill(process, 0) == 0) usleep(1000);
      kill(process, signal);
      EXPECT_EQ(WaitFor(process), -signal);
      EXPECT_THAT(Files(), ElementsAre("big.tif"));
      EXPECT_TRUE(std::filesystem::is_empty(Temporary));
    }
}

}

}
