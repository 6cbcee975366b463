#include <fstream>

#include "command_test_support.h"

namespace picturezor::tests {

namespace {

using testing::HasSubstr;

class Runs : public CommandTest {
 protected:
  /// How `run` with these steps ended, and the bytes that it made of a file.
  std::pair<Outcome, Bytes> Made(const std::string& in, const std::string& steps, const std::string& options,
                                 const std::string& out = "out.tif") {
    std::ofstream(At("steps")) << steps << "\n";
    std::filesystem::remove(At(out));
    const Outcome outcome = Run(Words("run " + in + " -q --steps steps -o " + out + " " + options));
    return {outcome, ReadBytes(At(out))};
  }
};

class Ways : public Runs, public testing::WithParamInterface<std::string> {};
INSTANTIATE_TEST_SUITE_P(Files, Ways, testing::Values("rows.png", "turned.jpg", "tiles.tif", "strips.tif"));

// Catches a step that says too little of the rows that it needs, and pixels that depend on the way that they
// take through the program: whole in memory, in many bands, part by part where memory is short, through
// temporary files. And a temporary file where none is needed: there is no place for one.
TEST_P(Ways, GiveTheSameBytes) {
  const struct {
    const char* Steps;
    bool NeedsFiles = false;
  } cases[] = {
      {"scale --width 60"},
      {"scale --percent 61", true},
      {"scale --percent 130 --kernel cubic", true},
      {"scale --fit 900x900 --kernel box", true},
      {"scale --height 40 --kernel box"},
      {"scale --fit 77x300 --fast"},
      {"crop --rect 11,7,120,90"},
      {"convert"},
      {"convert --format gray"},
      {"convert --format graya"},
      {"convert --format gray : convert --format cmyk : convert --format gray", true},
      {"mirror --horizontal"},
      {"mirror --vertical", true},
      {"mirror --horizontal --vertical", true},
      {"rotate --angle 0"},
      {"rotate --angle 90", true},
      {"rotate --angle 180", true},
      {"rotate --angle -90", true},
      {"rotate --angle 33.3 --background 204060", true},
      {"combine over.png --at 100,70"},
      {"combine over.png --at 30,-7"},
      {"combine over.png --at -9,-12 --premultiplied"},
      {"combine over.png --mask-colour 808080"},
      {"combine over.png --fore ff8000 --at 30,150"},
      {"combine over.png --mask mask.png --at 3,1"},
      {"filter invert"},
      {"filter auto-level", true},
      {"filter solarize"},
      {"filter gamma --gamma 2.2"},
      {"filter gamma --gamma 2.2,1,0.4"},
      {"filter gain --gain 0.7 --bias 0.4"},
      {"filter transfer --table 5,4,3,2,1"},
      {"filter matrix --weights 0,-1,0,-1,5,-1,0,-1,0"},
      {"filter matrix --weights @file --scale 0.06"},
      {"filter blur --radius 3 --iterations 2", true},
      {"filter blur --radius 9 --only-horizontal", true},
      {"filter soft-blur --radius 0.4"},
      {"filter stamp --radius 6 --threshold 0.4", true},
      {"filter unsharp --radius 5", true},
      {"filter oil --range 2 --levels 16"},
      {"filter engrave --level -3"},
      {"filter neon"},
      {"filter dither --pattern cluster3 --levels 3"},
      {"filter dither --pattern cluster8 --levels 4", true},
      {"filter dither --pattern halftone : crop --rect 3,133,90,90 : filter dither", true},
      {"crop --rect 5,33,150,201 : scale --fit 120x500 : filter unsharp --amount 0.5 : rotate --angle 90",
       true},
      {"scale --percent 120 : filter blur : combine over.png --at 9,70 : filter neon", true},
      {"mirror --horizontal : filter oil --range 1 : crop --rect 10,100,140,150 : filter engrave", true},
      {"rotate --angle -3 : filter invert : scale --height 333 : mirror --vertical", true},
      {"filter stamp --radius 12 : filter soft-blur : convert --format rgba : filter matrix --weights @file",
       true},
      {"crop --rect 0,0,150,160 : filter blur --radius 2", true},
  };
  WritePNG(At("rows.png"), Noise(160, 1100, 3));
  WriteJPEG(At("turned.jpg"), Waves(301, 280, 3), {.Orientation = 6});
  WriteTIFF(At("tiles.tif"), Noise(290, 300, 4), {.Compression = 5, .Tile = 64, .CMYK = true});
  WriteTIFF(At("strips.tif"), Noise(260, 310, 2), {.Compression = 5, .RowsPerStrip = 9});
  WritePNG(At("over.png"), Noise(90, 80, 4));
  WritePNG(At("mask.png"), Noise(90, 80, 1));
  std::ofstream(At("file")) << "1 2 1\n2 4 2\n1 2 1\n";
  const std::string& file = GetParam();
  for (const auto& [steps, needsFiles] : cases) {
    SCOPED_TRACE(steps);
    const auto [whole, expected] = Made(file, steps, "--store memory --threads 2");
    EXPECT_TRUE(whole.Code == 0 || file.ends_with(".tif")) << whole.Error;
    std::vector<const char*> ways = {"--threads 3 --memory-limit 120K"};
    if (file == "rows.png") ways.push_back("--store mapped --threads 1");
    if (!needsFiles && file != "turned.jpg" && whole.Code == 0)
      ways.push_back("--memory-limit 120K --temp-dir nowhere");
    for (const char* way : ways) {
      const auto [outcome, bytes] = Made(file, steps, way);
      EXPECT_EQ(outcome.Code, whole.Code) << way << ": " << outcome.Error;
      EXPECT_TRUE(bytes == expected) << way;
    }
  }
}

TEST_F(Runs, DoWhatCommandsOneAfterTheOtherDo) {
  WritePNG(At("in.png"), Noise(90, 70, 4));
  Do({"crop", "in.png", "--rect", "10,5,60,50", "-o", "a.png"});
  Do({"scale", "a.png", "--fit", "40x40", "-o", "b.png"});
  Do({"filter", "unsharp", "b.png", "--amount", "0.5", "-o", "c.png"});
  Do({"rotate", "c.png", "--angle", "90", "-o", "d.png"});
  Do({"run", "in.png", "-o", "e.png", "crop", "--rect", "10,5,60,50", ":", "scale", "--fit=40x40", ":",
      "filter", "unsharp", "--amount", "0.5", ":", "rotate", "--angle", "90"});
  EXPECT_EQ(ReadPNG(At("e.png")), ReadPNG(At("d.png")));
  const std::string text =
      "# a page\n\ncrop --rect '10,5,60,50' : scale --fit \"40x40\"  # smaller\n"
      "filter unsharp --amount 0.5\r\nrotate --angle 90 --background \"#\\1\\02030\"";
  Made("in.png", text, "", "f.png");
  EXPECT_EQ(ReadPNG(At("f.png")), ReadPNG(At("d.png")));
}

// Before any work: the image isn't even there, unless the mistake depends on it.
TEST_F(Runs, TellWhichStepIsWrong) {
  const struct {
    int Code;
    const char *Steps, *Reason;
  } cases[] = {
      {3, "", "steps: there are no steps in it"},
      {3, "# nothing", "steps: there are no steps in it"},
      {3, "mirror --vertical :", "steps:1: step 2: the step is missing"},
      {3, ": mirror", "steps:1: step 1: the step is missing"},
      {3, "mirror --vertical\n\nsharpen", "steps:3: step 2: there is no step sharpen"},
      {3, "filter", "steps:1: step 1: there is no step filter"},
      {3, "filter sharpen", "steps:1: step 1: there is no step filter sharpen"},
      {3, "mirror --vertical : scale --size 5", "steps:1: step 2 (scale): it has no option --size"},
      {3, "scale --width", "steps:1: step 1 (scale): --width: its value is missing"},
      {3, "scale --width 0", "steps:1: step 1 (scale): --width: 0 isn't from 1 to 400000000"},
      {3, "scale --width 5 --width=6", "steps:1: step 1 (scale): --width is given twice"},
      {3, "scale --width 5 6", "steps:1: step 1 (scale): unexpected argument 6"},
      {3, "mirror --vertical=no", "steps:1: step 1 (mirror): --vertical: it takes no value"},
      {3, "\nmirror\nrotate", "steps:2: step 1 (mirror): give --horizontal"},
      {3, "\nmirror --vertical\nrotate", "steps:3: step 2 (rotate): --angle is required"},
      {3, "filter blur --radius '2", "steps:1: a quote isn't closed"},
      {2, "combine none.png", "steps:1: step 1 (combine): none.png: No such file"},
      {2, "rotate --angle 90 : crop --rect 0,0,9,5",
       "gray.png: steps:1: step 2 (crop): the rectangle 0,0,9,5 doesn't lie within 5 x 9"},
      {2, "mirror --vertical\nfilter auto-level",
       "gray.png: steps:2: step 2 (filter auto-level): auto-level supports only RGB"},
      {3, "filter gamma --gamma 1,2,3", "steps:1: step 1 (filter gamma): --gamma: a gray image has one"},
      {2, "convert --format cmyk", "out.png: PNG can't hold CMYK"},
  };
  WritePNG(At("gray.png"), Noise(9, 5, 1));
  for (const auto& [code, steps, reason] : cases) {
    SCOPED_TRACE(steps);
    std::ofstream(At("steps")) << steps;
    const Outcome outcome = Run({"run", "gray.png", "-o", "out.png", "--steps", "steps"});
    EXPECT_EQ(outcome.Code, code);
    EXPECT_THAT(outcome.Error, testing::StartsWith(std::string("picturezor: ") + reason));
    EXPECT_EQ(std::ranges::count(outcome.Error, '\n'), 1);
    EXPECT_THAT(Files(), testing::ElementsAre("gray.png", "steps"));
  }
  EXPECT_EQ(Run({"run", "gray.png", "-o", "out.png"}).Code, 3);
  EXPECT_EQ(Run({"run", "gray.png", "-o", "out.png", "--steps", "steps", "mirror", "--vertical"}).Code, 3);
  EXPECT_THAT(Run({"run", "none.png", "-o", "out.png", "mirror", "--vertical", ":", "scale", "--wide"}).Error,
              HasSubstr("step 2 (scale): it has no option --wide"));
  EXPECT_THAT(Run({"run", "none.png", "-o", "out.png", "--steps", "nowhere"}).Error,
              HasSubstr("nowhere: it can't be read"));
}

// What bash offers behind a command line, by the program's own script.
TEST_F(Runs, AreCompletedByTheShell) {
  const struct {
    const char *Line, *Offered;
  } cases[] = {
      {"thumbnail --jo", "--jobs"},
      {"scale --ker", "--kernel"},
      {"scale in.png --kernel lan", "lanczos3 lanczos8"},
      {"filter so", "solarize soft-blur"},
      {"filter blur --it", "--iterations"},
      {"run in.png --ste", "--steps"},
      {"run in.png -o out.png crop --re", "--rect"},
      {"run in.png -o out.png crop --rect 0,0,5,5 : filt", "filter"},
      {"run in.png -o out.png crop --rect 0,0,5,5 : filter uns", "unsharp"},
      {"run in.png -o out.png rotate --angle 9 : filter dither --pattern clus", "cluster3 cluster4 cluster8"},
      {"run in.png -o out.png filter blur : mirror --o", ""},
      {"convert i", ""},
  };
  const std::string script = Run({"completion", "bash"}).Out;
  for (const auto& [line, offered] : cases) {
    std::ofstream(At("try")) << script << "COMP_WORDS=(picturezor " << line << ")\n"
                             << "COMP_CWORD=$((${#COMP_WORDS[@]} - 1))\n_picturezor\n"
                             << "[ \"${COMPREPLY[*]}\" = '" << offered
                             << "' ] || { echo \"${COMPREPLY[*]}\"; exit 1; }\n";
    EXPECT_EQ(std::system(("bash '" + At("try").string() + "'").c_str()), 0) << line;
  }
}

TEST_F(Runs, StandOnTheirPage) {
  const Bytes page = ReadBytes(PICTUREZOR_SOURCE_DIR "/docs/steps.md");
  const std::string list = Run({"run", "--list"}).Out;
  ASSERT_THAT(list, HasSubstr("\nfilter dither: "));
  EXPECT_NE(std::string(page.begin(), page.end()).find("```text\n" + list + "```"), std::string::npos)
      << list;
}

}

}
