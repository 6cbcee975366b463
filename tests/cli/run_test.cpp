#include <fstream>

#include "command_test_support.h"

namespace picturezor::tests {

namespace {

using testing::HasSubstr;

class Runs : public CommandTest {
 protected:
  /// What `run` with these steps makes of a file.
  Raster Made(const std::string& in, const std::string& steps, Arguments options = {}) {
    std::ofstream(At("steps")) << steps << "\n";
    options.insert(options.begin(), {"run", in, "-q", "-o", "out.png", "--steps", "steps"});
    Do(options);
    return ReadPNG(At("out.png"));
  }
};

// Catches a step that says too little of the rows that it needs, and one that isn't the same on a view,
// behind other steps or in a band: large pictures go through in many bands, or part by part where memory is
// short.
TEST_F(Runs, AreTheSameInBandsAndInWholePictures) {
  const struct {
    const char *Steps, *In = "in.png";
  } cases[] = {
      {"scale --percent 61"},
      {"scale --fit 900x900 --kernel box"},
      {"scale --width 50 --fast"},
      {"crop --rect 5,300,150,401"},
      {"convert --format graya"},
      {"convert --format cmyk : convert --format gray", "gray.png"},
      {"mirror --horizontal"},
      {"mirror --vertical"},
      {"rotate --angle 90"},
      {"rotate --angle 7 --background 336699"},
      {"combine over.png --at 30,-7"},
      {"combine over.png --at 30,400 --premultiplied"},
      {"filter invert"},
      {"filter auto-level"},
      {"filter solarize"},
      {"filter gamma --gamma 2.2,1,0.4"},
      {"filter gain --gain 0.8"},
      {"filter transfer --table 5,4,3,2,1"},
      {"filter matrix --weights 0,-1,0,-1,5,-1,0,-1,0"},
      {"filter blur --radius 4 --iterations 3"},
      {"filter blur --radius 9 --only-horizontal"},
      {"filter soft-blur"},
      {"filter stamp"},
      {"filter unsharp --radius 5"},
      {"filter oil --range 2"},
      {"filter engrave --level -3"},
      {"filter neon"},
      {"filter dither --pattern cluster3"},
      {"filter dither --pattern cluster8 --levels 4"},
      {"filter dither --pattern halftone : crop --rect 3,333,90,90 : filter dither"},
      {"crop --rect 5,33,150,701 : scale --fit 120x500 : filter unsharp --amount 0.5 : rotate --angle 90"},
      {"scale --percent 120 : filter blur : combine over.png --at 9,70 : filter neon"},
      {"mirror --horizontal : filter oil --range 1 : crop --rect 10,500,140,300 : filter engrave"},
      {"rotate --angle -3 : filter invert : scale --height 333 : mirror --vertical"},
      {"filter stamp --radius 12 : filter soft-blur : convert --format rgba : filter matrix --weights @file"},
      {"crop --rect 0,0,150,900 : filter blur --radius 2", "upright.jpg"},
  };
  WritePNG(At("in.png"), Noise(160, 1100, 3));
  WritePNG(At("gray.png"), Noise(160, 1100, 1));
  WriteJPEG(At("upright.jpg"), Waves(1000, 160, 3), {.Orientation = 6});
  WritePNG(At("over.png"), Noise(60, 200, 4));
  std::ofstream(At("file")) << "1 2 1\n2 4 2\n1 2 1\n";
  for (const auto& [steps, in] : cases) {
    SCOPED_TRACE(steps);
    const Raster whole = Made(in, steps, {"--store", "memory", "--threads", "1"});
    ASSERT_FALSE(whole.Samples.empty());
    for (const Arguments& options :
         {Arguments{"--threads", "2"}, {"--threads", "3", "--memory-limit", "200K"}})
      EXPECT_TRUE(Made(in, steps, options) == whole) << testing::PrintToString(options);
    EXPECT_TRUE(Made(in, steps, {"--store", "mapped"}) == whole) << "mapped";
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
  EXPECT_EQ(Made("in.png", text), ReadPNG(At("d.png")));
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
