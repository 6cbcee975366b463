#include <gtest/gtest.h>

#include "picturezor/picture.h"

namespace picturezor {
namespace {

/// How many there are.
template <class Value>
std::size_t Expect(const std::string& prefix, std::initializer_list<std::pair<const char*, Value>> names,
                   const std::string& suffix = "") {
  for (const auto& [name, value] : names)
    EXPECT_EQ(Host::Constant("PictureZOR", prefix + name + suffix), std::int64_t(value)) << name;
  return names.size();
}

// Catches an enumeration of the C++ class that has drifted from the constants of the module.
TEST(Constants, AreTheEnumerationsOfThePictureClass) {
  std::size_t known = 0;
#define NAMED(Of) {#Of, Format::Of}
  known += Expect<Format>("ImageFormat",
                          {NAMED(Unknown), NAMED(RGB), NAMED(RGBA), NAMED(RGBX), NAMED(ARGB), NAMED(XRGB),
                           NAMED(BGR), NAMED(BGRA), NAMED(BGRX), NAMED(ABGR), NAMED(XBGR)});
  known += Expect<Format>("ImageFormat", {NAMED(G), NAMED(GA), NAMED(AG), NAMED(Scaling1), NAMED(Scaling2),
                                          NAMED(Scaling3), NAMED(Scaling4), NAMED(Scaling5), NAMED(Scaling6),
                                          NAMED(Scaling7), NAMED(Scaling8), NAMED(Buffer)});
  known += Expect<Format>("ImageFormat", {NAMED(RofRGB), NAMED(GofRGB), NAMED(BofRGB), NAMED(RofRGBA),
                                          NAMED(GofRGBA), NAMED(BofRGBA), NAMED(AofRGBA), NAMED(AofARGB),
                                          NAMED(RofARGB), NAMED(GofARGB), NAMED(BofARGB)});
  known += Expect<Format>("ImageFormat", {NAMED(BofBGR), NAMED(GofBGR), NAMED(RofBGR), NAMED(BofBGRA),
                                          NAMED(GofBGRA), NAMED(RofBGRA), NAMED(AofBGRA), NAMED(AofABGR),
                                          NAMED(BofABGR), NAMED(GofABGR), NAMED(RofABGR)});
  known +=
      Expect<Format>("ImageFormat", {NAMED(CMYK), NAMED(CMYKA), NAMED(ACMYK), NAMED(CMYKX), NAMED(XCMYK),
                                     NAMED(KYMC), NAMED(KYMCA), NAMED(AKYMC), NAMED(KYMCX), NAMED(XKYMC)});
#undef NAMED
  known += Expect<Format>("ImageFormat", {{"1of3", Format::OneOf3},
                                          {"2of3", Format::TwoOf3},
                                          {"3of3", Format::ThreeOf3},
                                          {"1of4", Format::OneOf4},
                                          {"2of4", Format::TwoOf4},
                                          {"3of4", Format::ThreeOf4},
                                          {"4of4", Format::FourOf4}});
  known += Expect<Kernel>("Scale", {{"Triangle", Kernel::Triangle},
                                    {"Box", Kernel::Box},
                                    {"Lanczos3", Kernel::Lanczos3},
                                    {"Lanczos8", Kernel::Lanczos8},
                                    {"Mitchell", Kernel::Mitchell},
                                    {"Poly3", Kernel::Poly3},
                                    {"Cubic", Kernel::Cubic}});
  known += Expect<DitherMatrix>("Dither",
                                {{"Magic2x2", DitherMatrix::Magic2x2},
                                 {"Magic4x4", DitherMatrix::Magic4x4},
                                 {"Ordered4x4", DitherMatrix::Ordered4x4},
                                 {"Lines4x4", DitherMatrix::Lines4x4},
                                 {"90Halftone6x6", DitherMatrix::Halftone90_6x6},
                                 {"Ordered6x6", DitherMatrix::Ordered6x6},
                                 {"Ordered8x8", DitherMatrix::Ordered8x8},
                                 {"Cluster3", DitherMatrix::Cluster3},
                                 {"Cluster4", DitherMatrix::Cluster4},
                                 {"Cluster8", DitherMatrix::Cluster8}},
                                "Matrix");
  EXPECT_EQ(known, Host::ConstantDeclarations("PictureZOR").size());
}

}
}
