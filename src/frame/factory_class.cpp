#include "frame/classes.h"
#include "image/image.h"

namespace zor {
namespace {

constexpr auto SharedMethods = InTableOrder(SharedFactoryMethods);
MethodRecord SharedMethodTable[SharedMethods.size()];
EventRecord EventTable[1];

}

ClassRecord FactoryClass;

void WriteFactoryClass() {
  for (std::size_t i = 0; i < SharedMethods.size(); ++i) SharedMethods[i].Write(SharedMethodTable[i]);
  EventTable[0] = {NewPictureEvent.Characters, 0};

  FactoryClass = {};
  FactoryClass.Version = RecordVersion;
  FactoryClass.ClassName = "PictureFactoryZOR";
  FactoryClass.Events = EventTable;
  FactoryClass.EventCount = std::size(EventTable);
  FactoryClass.ClassFlags = PlainFlags;
  FactoryClass.SharedMethods = SharedMethodTable;
  FactoryClass.SharedMethodCount = std::size(SharedMethodTable);
}

}
