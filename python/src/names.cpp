#include "handle.h"

// The enumerations of the class.

namespace picturezor::python {

const std::vector<std::pair<const char*, Format>> EnumNames<Format>::Members{{"RGB", Format::RGB},
                                                                             {"RGBA", Format::RGBA},
                                                                             {"RGBX", Format::RGBX},
                                                                             {"ARGB", Format::ARGB},
                                                                             {"XRGB", Format::XRGB},
                                                                             {"BGR", Format::BGR},
                                                                             {"BGRA", Format::BGRA},
                                                                             {"BGRX", Format::BGRX},
                                                                             {"ABGR", Format::ABGR},
                                                                             {"XBGR", Format::XBGR},
                                                                             {"G", Format::G},
                                                                             {"GA", Format::GA},
                                                                             {"AG", Format::AG},
                                                                             {"OneOf3", Format::OneOf3},
                                                                             {"TwoOf3", Format::TwoOf3},
                                                                             {"ThreeOf3", Format::ThreeOf3},
                                                                             {"OneOf4", Format::OneOf4},
                                                                             {"TwoOf4", Format::TwoOf4},
                                                                             {"ThreeOf4", Format::ThreeOf4},
                                                                             {"FourOf4", Format::FourOf4},
                                                                             {"Buffer", Format::Buffer},
                                                                             {"CMYK", Format::CMYK},
                                                                             {"CMYKA", Format::CMYKA},
                                                                             {"ACMYK", Format::ACMYK},
                                                                             {"CMYKX", Format::CMYKX},
                                                                             {"XCMYK", Format::XCMYK},
                                                                             {"KYMC", Format::KYMC},
                                                                             {"KYMCA", Format::KYMCA},
                                                                             {"AKYMC", Format::AKYMC},
                                                                             {"KYMCX", Format::KYMCX},
                                                                             {"XKYMC", Format::XKYMC},
                                                                             {"Scaling1", Format::Scaling1},
                                                                             {"Scaling2", Format::Scaling2},
                                                                             {"Scaling3", Format::Scaling3},
                                                                             {"Scaling4", Format::Scaling4},
                                                                             {"Scaling5", Format::Scaling5},
                                                                             {"Scaling6", Format::Scaling6},
                                                                             {"Scaling7", Format::Scaling7},
                                                                             {"Scaling8", Format::Scaling8}};

const std::vector<std::pair<const char*, Kernel>> EnumNames<Kernel>::Members{
    {"triangle", Kernel::Triangle}, {"box", Kernel::Box},           {"lanczos3", Kernel::Lanczos3},
    {"lanczos8", Kernel::Lanczos8}, {"mitchell", Kernel::Mitchell}, {"poly3", Kernel::Poly3},
    {"cubic", Kernel::Cubic}};

const std::vector<std::pair<const char*, DitherMatrix>> EnumNames<DitherMatrix>::Members{
    {"magic2x2", DitherMatrix::Magic2x2},       {"magic4x4", DitherMatrix::Magic4x4},
    {"ordered4x4", DitherMatrix::Ordered4x4},   {"lines4x4", DitherMatrix::Lines4x4},
    {"halftone", DitherMatrix::Halftone90_6x6}, {"ordered6x6", DitherMatrix::Ordered6x6},
    {"ordered8x8", DitherMatrix::Ordered8x8},   {"cluster3", DitherMatrix::Cluster3},
    {"cluster4", DitherMatrix::Cluster4},       {"cluster8", DitherMatrix::Cluster8}};

const std::vector<std::pair<const char*, PictureForm>> EnumNames<PictureForm>::Members{
    {"gworld32", PictureForm::GWorld32}, {"gworld24", PictureForm::GWorld24},
    {"gworld16", PictureForm::GWorld16}, {"form1", PictureForm::Form1},
    {"form2", PictureForm::Form2},       {"form3", PictureForm::Form3},
    {"rows", PictureForm::Rows},         {"none", PictureForm::None}};

namespace {

template <class Enum>
void AddEnum(py::module_& module) {
  using Names = EnumNames<Enum>;
  py::enum_<Enum> type(module, Names::Name, Names::Help);
  for (const auto& [member, value] : Names::Members) type.value(member, value);
}

}

void AddNames(py::module_& module) {
  AddEnum<Format>(module);
  AddEnum<Kernel>(module);
  AddEnum<DitherMatrix>(module);
  AddEnum<PictureForm>(module);
}

}
