#include <gmock/gmock.h>

#include <algorithm>
#include <cstring>

#include "exchange_test_support.h"

// Which pictures the module can open, what it asks the host for, and that nothing is left when it can't.

namespace picturezor {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

/// Whether a picture's colours reach an image.
bool Opens(const HostPicture& picture) {
  const Picture image(picture.Width(), picture.Height(), Format::RGB);
  image.DrawPictureRGB(picture);
  const bool reached = Packed(image) == picture.RGB();
  EXPECT_TRUE(reached || Packed(image) == Samples(Packed(image).size())) << "half drawn";
  return reached;
}

HostPicture Small(PictureForm form) { return NoisePicture(5, 4, form, unsigned(form) + 1); }

// Catches a call of the host in a pixel or row loop, and another order of giving back.
TEST(Locks, AskTheHostOncePerOperation) {
  InHost(PictureForm::GWorld24, [] {
    const Picture image(50, 40, Format::RGB);
    EXPECT_THAT(ServicesOf([&] { image.CopyPicture(); }),
                ElementsAre("newPicture", "lockPictureDescription", "GetGWorldPixMap", "GetPixDepth",
                            "LockPixels", "GetPixBaseAddr", "GetPixRowBytes", "UnlockPixels",
                            "unlockPictureDescription", "REALPictureClearCache", "REALPictureClearCache"));
    const HostPicture picture(50, 40);
    EXPECT_THAT(ServicesOf([&] {
                  image.DrawPictureRGB(picture, {0, 0, 50, 40}, 0, 3);
                }),
                ElementsAre("lockPictureDescription", "GetGWorldPixMap", "GetPixDepth", "LockPixels",
                            "GetPixBaseAddr", "GetPixRowBytes", "UnlockPixels", "unlockPictureDescription"));
  });
  InHost(PictureForm::Rows, [] {
    const Picture image(50, 40, Format::RGB);
    EXPECT_THAT(ServicesOf([&] { image.CopyPicture(); }),
                ElementsAre("newPicture", "lockPictureDescription", "unlockPictureDescription",
                            "REALLockPictureDescription", "unlockPictureDescription", "REALPictureClearCache",
                            "REALPictureClearCache"));
    // The path is known from now on.
    EXPECT_THAT(ServicesOf([&] { image.CopyPicture(); }), Not(Contains("lockPictureDescription")));
    EXPECT_THAT(ServicesOf([&] { image.DrawPictureRGB(HostPicture(3, 3)); }),
                Not(Contains("lockPictureDescription")));
  });
}

TEST(Locks, TheFirstPictureDecides) {
  InHost(PictureForm::GWorld32, [] {
    EXPECT_FALSE(Opens(Small(PictureForm::None))) << "it decides nothing";
    EXPECT_TRUE(Opens(Small(PictureForm::GWorld32)));
    EXPECT_FALSE(Opens(Small(PictureForm::Rows)));
    EXPECT_TRUE(Opens(Small(PictureForm::Form3)));
  });
  InHost(PictureForm::GWorld32, [] {
    EXPECT_TRUE(Opens(Small(PictureForm::Form2))) << "it is drawn into a fresh one";
    EXPECT_FALSE(Opens(Small(PictureForm::Rows)));
  });
  InHost(PictureForm::GWorld32, [] {
    EXPECT_FALSE(Opens(Small(PictureForm::GWorld16)));
    EXPECT_FALSE(Opens(Small(PictureForm::Rows))) << "a GWorld was seen, though it couldn't be opened";
  });
  InHost(PictureForm::Rows, [] {
    EXPECT_FALSE(Opens(Small(PictureForm::None)));
    EXPECT_TRUE(Opens(Small(PictureForm::Rows)));
    for (const PictureForm form : {PictureForm::GWorld32, PictureForm::Form1})
      EXPECT_FALSE(Opens(Small(form)));
  });
}

// A new picture is written as it is or not at all.
TEST(Locks, NewPicturesAreNotConverted) {
  for (const PictureForm form : {PictureForm::Form1, PictureForm::None, PictureForm::GWorld16})
    InHost(form, [&] {
      const Picture image(3, 3, Format::RGBA);
      const auto asked = ServicesOf([&] { EXPECT_FALSE(image.CopyPictureWithMask()); });
      EXPECT_EQ(std::ranges::count(asked, "newPicture"), 2);
      EXPECT_THAT(asked, Not(Contains("DrawPicture")));
    });
}

// Nor is one that can't hold what was asked for.
TEST(Locks, NewPicturesAreLargeEnough) {
  for (const PictureForm form : {PictureForm::GWorld32, PictureForm::Rows})
    InHost(form, [] {
      const Picture image(5, 4, Format::RGBA);
      for (const auto& [columns, rows] : {std::pair{1, 0}, {0, 1}, {-1, -1}}) {
        model::TheRuntime().MissingColumns = columns;
        model::TheRuntime().MissingRows = rows;
        EXPECT_EQ(bool(image.CopyPictureWithMask()), columns < 0);
        EXPECT_EQ(Host::Count().OpenDescriptions, 0);
      }
    });
}

// Catches an endless conversion on a host that makes nothing but pictures which need one.
TEST(Locks, AConversionIsNotConverted) {
  InHost(PictureForm::Form2, [] { EXPECT_FALSE(Opens(Small(PictureForm::Form2))); });
  InHost(PictureForm::Rows,
         [] { EXPECT_FALSE(Opens(Small(PictureForm::Form2))) << "a GWorld was expected"; });
}

TEST(Locks, AConversionGoesOnWithoutGraphics) {
  InHost(PictureForm::GWorld32, [] {
    const HostPicture picture = Small(PictureForm::Form1);
    for (const char* hidden : {"pluginPictureGraphicsGetter", "DrawPicture"}) {
      // The fresh picture is opened as the host made it: white.
      Host::Hide(hidden);
      const Picture image(5, 4, Format::RGB);
      image.DrawPictureRGB(picture);
      EXPECT_EQ(Packed(image), Samples(5 * 4 * 3, 255)) << hidden;
      Host::Hide(hidden, false);
    }
    EXPECT_TRUE(Opens(picture));
    Host::Hide("newPicture");
    EXPECT_FALSE(Opens(picture));
  });
}

TEST(Locks, LeaveNothingWhenTheHostRefuses) {
  const struct {
    const char* Service;
    PictureForm Form;
    bool Exports, Imports;
  } cases[] = {
      {"newPicture", PictureForm::GWorld32, false, true},
      {"lockPictureDescription", PictureForm::GWorld32, false, false},
      {"GetGWorldPixMap", PictureForm::GWorld32, false, false},
      {"GetPixDepth", PictureForm::GWorld24, false, false},
      {"LockPixels", PictureForm::GWorld24, false, false},
      {"GetPixBaseAddr", PictureForm::GWorld32, false, false},
      {"REALLockPictureDescription", PictureForm::Rows, false, false},
      {"REALPictureClearCache", PictureForm::Rows, true, true},
      {"REALGetPictureMask", PictureForm::Rows, true, true},
      {"REALGetPropValueInt", PictureForm::Rows, true, false},
  };
  for (const auto& [service, form, exports, imports] : cases)
    for (const bool late : {false, true})
      InHost(form, [&] {
        SCOPED_TRACE(testing::Message() << service << (late ? " after it worked" : " never there"));
        const Picture image = NoisePicture(5, 4, Format::RGBA, 1);
        // An unlock that answers no lock is the price of a lock that isn't there.
        const bool uneven = !std::strcmp(service, "lockPictureDescription");
        if (late) {
          EXPECT_TRUE(image.CopyPictureWithMask().Mask());
          EXPECT_TRUE(Opens(Small(form)));
        }
        Host::Hide(service);
        if (uneven) Host::Hide("unlockPictureDescription");
        EXPECT_EQ(bool(image.CopyPictureWithMask()), exports);
        EXPECT_EQ(Opens(Small(form)), imports);
        const HostPicture masked = Small(form);
        GiveMask(masked, Small(form));
        image.DrawMaskedPictureApplyMaskRGB(masked);
      });
}

template <class T>
void Put(const HostPicture& picture, std::size_t at, T value) {
  std::memcpy(Inside(picture).Record.data() + at, &value, sizeof value);
}

TEST(Locks, RefuseARecordOfAnotherKind) {
  InHost(PictureForm::Rows, [] {
    for (int change = 0; change < 4; ++change) {
      SCOPED_TRACE(change);
      const HostPicture picture = Small(PictureForm::Rows);
      EXPECT_TRUE(Opens(picture));
      if (change == 0) Put(picture, zor::RowRecord::Zero, 1);
      if (change == 1) Put(picture, zor::RowRecord::NotZero, 0);
      if (change == 2) Put<void*>(picture, zor::RowRecord::Rows, nullptr);
      // Whatever else the record says, the description has the size.
      if (change == 3) Put(picture, zor::RowRecord::Width, 1);
      EXPECT_EQ(Opens(picture), change == 3);
    }
  });
}

// Masks of a host that can't draw are copied row by row, between pictures that agree.
TEST(Locks, CopyRowsOnlyBetweenAlikePictures) {
  InHost(PictureForm::Rows, [] {
    Host::Hide("DrawPicture");
    const Picture image = NoisePicture(5, 4, Format::GA, 2);
    // The mask is as large as its picture and not as large as what was asked for.
    const HostPicture clipped = image.CopyPictureWithMask({1, 0, 20, 20});
    EXPECT_EQ(clipped.Mask().RGB(), image.CopyMask({1, 0, 20, 20}).RGB());
    EXPECT_EQ(Inside(clipped.Mask()).CacheClears, 1);
    Host::Hide("pluginPictureGraphicsGetter");
    EXPECT_EQ(image.CopyPictureWithMask().Mask().RGB(), image.CopyMask().RGB());
  });
}

}
}
