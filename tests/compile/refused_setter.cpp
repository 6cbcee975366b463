// refused: converted constant expression
#include "frame/method.h"

namespace zor {

MemoryBlock* Row(PictureZOR* self, Integer index);
void SetRow(PictureZOR* self, MemoryBlock* value);

constexpr MethodRow Rows[] = {Method<1, "Row(index as integer) as memoryblock", Row, PlainFlags, SetRow>};

}
