#include <algorithm>

#include "composition/composition.h"
#include "exchange/exchange.h"
#include "filters/filters.h"
#include "frame/classes.h"
#include "frame/property.h"
#include "geometry/geometry.h"
#include "image/formats.h"
#include "image/image.h"
#include "scale/scale.h"

namespace zor {
namespace {

constexpr auto Methods = InTableOrder(ImageMethods, ScaleMethods, GeometryMethods, FilterMethods,
                                      ExchangeMethods, CompositionMethods);
static_assert(Methods.size() == 120);
MethodRecord MethodTable[Methods.size()];

constexpr auto SharedMethods = InTableOrder(SharedPictureMethods);
MethodRecord SharedMethodTable[SharedMethods.size()];

using P = PictureData;
// clang-format off
constexpr PropertyRow Properties[] = {
    FieldProperty<"YieldTicks", &P::YieldTicks, Access::ReadWrite>,
    FieldProperty<"RedOffset", &P::RedOffset>,
    FieldProperty<"GreenOffset", &P::GreenOffset>,
    FieldProperty<"BlueOffset", &P::BlueOffset>,
    FieldProperty<"GrayOffset", &P::GrayOffset>,
    FieldProperty<"AlphaOffset", &P::AlphaOffset>,
    FieldProperty<"Width", &P::Width>,
    FieldProperty<"Height", &P::Height>,
    FieldProperty<"PixelSize", &P::PixelSize>,
    FieldProperty<"RowSize", &P::RowSize>,
    FieldProperty<"ImageFormat", &P::ImageFormat>,
    GetterProperty<"ImageFormatString", ImageFormatString>,
    FieldProperty<"MappingBlockSize", &P::MappingBlockSize, Access::ReadWrite, PropertyFlags, SetMappingBlockSize>,
    FieldProperty<"RowOffset", &P::RowOffset>,
    FieldProperty<"DebugPictureEnabled", &P::DebugPictureEnabled, Access::ReadWrite, PicturePropertyFlags>,
    GetterProperty<"DebugPicture", DebugPicture, PicturePropertyFlags>,
    FieldProperty<"IsGray", &P::IsGray>,
    FieldProperty<"IsRGB", &P::IsRGB>,
    FieldProperty<"HasGreen", &P::HasGreen>,
    FieldProperty<"HasRed", &P::HasRed>,
    FieldProperty<"HasBlue", &P::HasBlue>,
    FieldProperty<"HasGray", &P::HasGray>,
    FieldProperty<"HasAlpha", &P::HasAlpha>,
    FieldProperty<"Valid", &P::Valid>,
    FieldProperty<"IsMapping", &P::IsMapping>,
    FieldProperty<"ChannelCount", &P::ChannelCount>,
    FieldProperty<"IsCMYK", &P::IsCMYK>,
    FieldProperty<"HasCyan", &P::HasCyan>,
    FieldProperty<"HasYellow", &P::HasYellow>,
    FieldProperty<"HasMagenta", &P::HasMagenta>,
    FieldProperty<"HasBlack", &P::HasBlack>,
    FieldProperty<"CyanOffset", &P::CyanOffset>,
    FieldProperty<"YellowOffset", &P::YellowOffset>,
    FieldProperty<"MagentaOffset", &P::MagentaOffset>,
    FieldProperty<"BlackOffset", &P::BlackOffset>,
    FieldProperty<"Parent", &P::Parent>,
    FieldProperty<"Factory", &P::Factory, Access::ReadWrite>,
    FieldProperty<"Target", &P::Target, Access::ReadOnly, PicturePropertyFlags>,
    GetterProperty<"Memory", Memory>,
    FieldProperty<"MemoryTarget", &P::MemoryTarget>,
    GetterProperty<"TotalSize", TotalSize>,
};
// clang-format on
static_assert(std::size(Properties) == 41);
PropertyRecord PropertyTable[std::size(Properties)];

constexpr std::size_t ConstantCount =
    std::size(FormatConstants) + std::size(KernelConstants) + std::size(DitherConstants);
static_assert(ConstantCount == 79);
ConstantRecord ConstantTable[ConstantCount];

}

ClassRecord PictureClass;

void WritePictureClass() {
  for (std::size_t i = 0; i < Methods.size(); ++i) Methods[i].Write(MethodTable[i]);
  for (std::size_t i = 0; i < SharedMethods.size(); ++i) SharedMethods[i].Write(SharedMethodTable[i]);
  for (std::size_t i = 0; i < std::size(Properties); ++i) Properties[i].Write(PropertyTable[i]);
  ConstantRecord* end = std::ranges::copy(FormatConstants, ConstantTable).out;
  end = std::ranges::copy(KernelConstants, end).out;
  std::ranges::copy(DitherConstants, end);

  PictureClass = {};
  PictureClass.Version = RecordVersion;
  PictureClass.ClassName = "PictureZOR";
  PictureClass.DataSize = PictureDataSize;
  PictureClass.DestructorFunction = reinterpret_cast<Word>(Close);
  PictureClass.Properties = PropertyTable;
  PictureClass.PropertyCount = std::size(PropertyTable);
  PictureClass.Methods = MethodTable;
  PictureClass.MethodCount = std::size(MethodTable);
  PictureClass.Constants = ConstantTable;
  PictureClass.ConstantCount = ConstantCount;
  PictureClass.ClassFlags = PlainFlags;
  PictureClass.SharedMethods = SharedMethodTable;
  PictureClass.SharedMethodCount = std::size(SharedMethodTable);
}

}
