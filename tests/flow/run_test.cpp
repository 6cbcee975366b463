#include <gmock/gmock.h>

#include "flow_test_support.h"
#include "scale_passes.h"
#include "written_steps.h"

namespace picturezor::flow {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using Kind = Dependence::Kind;

std::unique_ptr<Made> Invert() {
  return std::make_unique<Made>(Dependence{.Of = Kind::Bands}, [](const Picture& picture, const Workplace&) {
    picture.Invert();
    return picture;
  });
}
std::unique_ptr<Made> Blur(int radius) {
  return std::make_unique<Made>(
      Dependence{.Of = Kind::Bands, .Reach = radius},
      [=](const Picture& picture, const Workplace&) { return picture.BoxBlurFilter({}, radius); });
}
/// Its pattern repeats itself every 8 rows.
std::unique_ptr<Made> Dither() {
  return std::make_unique<Made>(Dependence{.Of = Kind::Bands, .Period = 8},
                                [](const Picture& picture, const Workplace&) {
                                  return picture.DitherFilter(picture, DitherMatrix::Ordered8x8, 3);
                                });
}
std::unique_ptr<Made> Crop(Rect rect) {
  return std::make_unique<Made>(
      Dependence{.Of = Kind::Bands, .First = rect.Y},
      [=](const Picture& picture, const Workplace&) {
        return picture.ClipImage({rect.X, 0, rect.Width, picture.Height()});
      },
      [=](Shape& shape) {
        shape.Width = rect.Width;
        shape.Height = rect.Height;
      });
}
/// Darker from row to row.
std::unique_ptr<Made> Shade() {
  return std::make_unique<Made>(Dependence{.Of = Kind::Bands},
                                [](const Picture& picture, const Workplace& at) {
                                  for (std::int32_t y = 0; y < picture.Height(); ++y)
                                    picture.FillRect({0, y, 1, 1}, (at.FirstRow + y) % 251);
                                  return picture;
                                });
}
std::unique_ptr<Made> Turn() {
  auto turn = std::make_unique<Made>(
      Dependence{}, [](const Picture& picture, const Workplace&) { return picture.Rotate90(); },
      [](Shape& shape) { std::swap(shape.Width, shape.Height); });
  turn->Turned = 8;
  return turn;
}
std::unique_ptr<Made> Flip() {
  auto flip = std::make_unique<Made>(Dependence{}, [](const Picture& picture, const Workplace&) {
    picture.VMirror();
    return picture;
  });
  flip->Turned = 4;
  return flip;
}
std::unique_ptr<Made> Scale(std::int32_t width, std::int32_t height) {
  return std::make_unique<Made>(
      Dependence{.Of = Kind::InOrder},
      [=](const Picture& picture, const Workplace& at) {
        Picture scaled(width, height, picture.ImageFormat());
        return scaled.ScaleMT(at.Threads > 1 ? at.Threads : -1, picture, {}, Kernel::Lanczos3, width, height)
                   ? scaled
                   : Picture();
      },
      [=](Shape& shape) {
        shape.Width = width;
        shape.Height = height;
      });
}

RunOptions InMemory() {
  RunOptions options;
  options.Stores.Kind = files::Store::Memory;
  return options;
}

template <class... Operations>
Chain ChainOf(Operations... operations) {
  Chain chain;
  (chain.push_back(std::move(operations)), ...);
  return chain;
}

// Catches a band that begins elsewhere in a pattern, takes an edge of the band for one of the picture or
// lacks rows around it, rows out of order, a reader of arriving rows that sees others, and what depends on
// who did which band.
TEST(Run, GivesTheBytesOfWholePictures) {
  const struct {
    const char* Name;
    MadeFile From;
    Chain Of;
  } cases[] = {
      {"none", {300, 301}, ChainOf()},
      {"point filter", {317, 1003}, ChainOf(Invert())},
      {"by absolute rows", {301, 1003}, ChainOf(Shade(), Crop({3, 500, 100, 400}), Shade())},
      {"neighbours", {300, 900, Format::RGBA}, ChainOf(Blur(7))},
      {"neighbours over neighbours", {300, 900}, ChainOf(Blur(3), Dither(), Blur(5), Invert())},
      {"edges of a part", {300, 900}, ChainOf(Crop({10, 333, 200, 350}), Blur(4), Dither())},
      {"a part of neighbours", {300, 900}, ChainOf(Blur(4), Dither(), Crop({10, 333, 200, 5}), Blur(9))},
      {"reach beyond the picture", {100, 40}, ChainOf(Blur(60))},
      {"wide", {90001, 7}, ChainOf(Blur(2), Dither())},
      {"tall", {3, 50001, Format::G}, ChainOf(Blur(20), Dither())},
      {"mirrored", {201, 500, Format::GA, 2}, ChainOf(Invert())},
      {"orientation 3", {199, 501, Format::RGB, 3}, ChainOf()},
      {"orientation 4", {200, 500, Format::RGB, 4}, ChainOf(Blur(3))},
      {"orientation 5", {317, 203, Format::CMYKA, 5}, ChainOf(Blur(3))},
      {"orientation 6", {200, 500, Format::CMYK, 6}, ChainOf(Invert(), Crop({1, 2, 300, 150}))},
      {"orientation 7", {90, 701, Format::GA, 7}, ChainOf()},
      {"orientation 8", {7001, 9, Format::G, 8}, ChainOf(Turn())},
      {"flipped", {200, 700}, ChainOf(Blur(3), Flip(), Scale(150, 500), Flip())},
      {"scaled", {900, 1200}, ChainOf(Scale(301, 400))},
      {"scaled from anywhere",
       {.Width = 901, .Height = 6007, .StartsAnywhere = true},
       ChainOf(Scale(47, 300))},
      {"scaled up", {90, 1200, Format::GA}, ChainOf(Scale(300, 2500))},
      {"scaled between others",
       {.Width = 900, .Height = 1200, .StartsAnywhere = true},
       ChainOf(Blur(2), Scale(300, 400), Blur(3), Scale(200, 100), Invert())},
      {"whole between others",
       {400, 500},
       ChainOf(Invert(), Turn(), Blur(3), Scale(50, 100), Turn(), Dither())},
  };
  for (const auto& [name, from, chain] : cases) {
    SCOPED_TRACE(name);
    const Bytes expected = Result(from, chain, InMemory());
    ASSERT_FALSE(expected.empty());
    for (const int threads : {1, 2, 5})
      for (const std::int64_t memory : {100'000, 3'000'000, 500'000'000}) {
        RunOptions options{.Stores = {.MemoryLimit = memory, .TempDirectory = testing::TempDir()}};
        options.Threads = threads;
        EXPECT_TRUE(Result(from, chain, options) == expected)
            << threads << " threads, " << memory << " bytes";
      }
  }
}

// Catches passes that round, or number channels, otherwise than the class does.
TEST(ScalePasses, GiveTheBytesOfAWholeScale) {
  for (const Format format : {Format::G, Format::GA, Format::RGB, Format::RGBA, Format::CMYK, Format::CMYKA})
    for (const Kernel kernel : {Kernel::Box, Kernel::Lanczos3, Kernel::Mitchell})
      for (const auto& [width, height] : {std::pair{37, 203}, {301, 40}, {150, 170}}) {
        const MadeFile file{200, 180, format};
        const auto whole = std::make_unique<Made>(
            Dependence{},
            [=, w = width, h = height](const Picture& picture, const Workplace&) {
              const Picture scaled(w, h, format);
              return scaled.Scale(picture, {}, kernel, w, h) ? scaled : Picture();
            },
            [w = width, h = height](Shape& shape) { shape.Width = w, shape.Height = h; });
        Chain chain;
        chain.push_back(std::make_unique<Made>(*whole));
        const RunOptions options{.Stores = {.MemoryLimit = 50'000, .TempDirectory = testing::TempDir()}};
        EXPECT_TRUE(Result(file, ScalePasses(kernel, width, height), options) ==
                    Result(file, chain, InMemory()))
            << int(format) << ' ' << int(kernel) << ' ' << width;
      }
}

// Catches a temporary file where none is needed: there is no place for one.
TEST(Run, NeedsADiskOnlyWhereAPictureHasToStandWhole) {
  const RunOptions noDisk{.Stores = {.MemoryLimit = 1'000'000, .TempDirectory = "/nowhere"}};
  const MadeFile file{900, 3000};
  for (const Chain& chain : {ChainOf(Invert(), Crop({1, 2, 800, 2900}), Blur(3)), ChainOf(Scale(30, 100))})
    EXPECT_FALSE(Result(file, chain, noDisk).empty());
  EXPECT_THROW(Result(file, ChainOf(Turn()), noDisk), files::Failure);
}

// Catches a row of steps that takes whole pictures where the single command doesn't.
TEST(Run, WorksOnAStepOfARowAsOnOneAlone) {
  const Shape shape{900, 700, Format::RGB, {}};
  for (const char* const text :
       {"scale --width 30 --draft", "crop --rect 1,2,3,4", "mirror --vertical", "rotate --angle 90",
        "rotate --angle 7", "filter blur --radius 2", "filter dither", "filter auto-level"}) {
    SCOPED_TRACE(text);
    const auto written = steps::ParseSteps(text, "steps");
    const Chain row = steps::MakeChain(written, {});
    const auto alone = steps::MakeOperation(*written[0].Of, written[0].Texts, {});
    EXPECT_EQ(row[0]->Turns(), alone->Turns());
    EXPECT_EQ(row[0]->Parts(shape).size(), alone->Parts(shape).size());
    EXPECT_EQ(row[0]->Cuts().has_value(), alone->Cuts().has_value());
    EXPECT_EQ(row[0]->Drafted(shape).has_value(), alone->Drafted(shape).has_value());
    EXPECT_EQ(row[0]->Pictures(), alone->Pictures());
    const Dependence inRow = row[0]->DependsOn(shape), byItself = alone->DependsOn(shape);
    EXPECT_EQ(inRow.Of, byItself.Of);
    EXPECT_EQ(inRow.KeepsSource, byItself.KeepsSource);
  }
}

// Catches a file that is decoded anew for each stripe of a scale: larger pictures are scaled in one.
TEST(Run, ReadsAFileOnce) {
  for (const int height : {700, 1900, 3000}) {
    std::atomic<int> rowsRead = 0;
    const MadeFile file{.Width = 2560, .Height = height, .RowsRead = &rowsRead};
    EXPECT_FALSE(Result(file, ChainOf(Scale(1200, height / 2)), {.Stores = {}, .Threads = 2}).empty());
    EXPECT_EQ(rowsRead, height);
  }
}

/// Stops the work after some steps.
struct Impatient final : files::Progress {
  int Left;
  explicit Impatient(int left) : Left(left) {}
  void Begin(const std::string&, std::int64_t) override {}
  void Step(std::int64_t) override {
    if (Left-- == 0) throw files::Cancelled();
  }
  void Tick() override {}
};

// Catches a failure that is lost between threads, one that leaves a thread waiting, and rows made up behind
// it.
TEST(Run, EndsWithTheFirstFailure) {
  const auto bad = [] {
    return std::make_unique<Made>(Dependence{.Of = Kind::Bands},
                                  [](const Picture& picture, const Workplace& at) {
                                    if (at.FirstRow > 1500) throw files::Failure("no way");
                                    return picture;
                                  });
  };
  const struct {
    MadeFile From;
    Chain Of;
    const char* Reason;
  } cases[] = {
      {{.Width = 900, .Height = 3000, .FailsAt = 2000}, ChainOf(), "ends in row 2000"},
      {{.Width = 900, .Height = 3000, .FailsAt = 0}, ChainOf(Blur(3), Invert()), "ends in row 0"},
      {{.Width = 900, .Height = 3000, .FailsAt = 2999}, ChainOf(Scale(90, 300)), "ends in row 2999"},
      {{.Width = 900, .Height = 9000, .FailsAt = 5000, .StartsAnywhere = true},
       ChainOf(Scale(90, 900)),
       "ends in row"},
      {{900, 3000}, ChainOf(bad(), Scale(90, 300), Invert()), "no way"},
      {{.Width = 900, .Height = 3000, .FailsAt = 7}, ChainOf(Turn()), "ends in row 7"},
  };
  for (const auto& [from, chain, reason] : cases)
    for (const int threads : {1, 3}) {
      SCOPED_TRACE(reason);
      const RunOptions options{.Stores = {.MemoryLimit = 2'000'000, .TempDirectory = testing::TempDir()},
                               .Threads = threads};
      try {
        Result(from, chain, options);
        ADD_FAILURE() << "no failure";
      } catch (const files::Failure& failure) {
        EXPECT_THAT(failure.what(), HasSubstr(reason));
      }
      KeptRows rows(900 * 3);
      Impatient impatient(0);
      MadeFile sound = from;
      sound.FailsAt = INT32_MAX;
      EXPECT_THROW(
          flow::Run(sound.Open(), ChainOf(Scale(900, 2000), Invert()), Format::RGB, rows, options, impatient),
          files::Cancelled);
      EXPECT_FALSE(rows.Finished);
    }
}

}
}
