// refused: ATypeIsNotKnown
#include "frame/method.h"

namespace zor {

Boolean Works(PictureZOR* self, Integer count);

constexpr MethodRow Rows[] = {Method<1, "Works(count as number) as boolean", Works>};

}
