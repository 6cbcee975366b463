// refused: no matching function|could not convert template argument|no matches converting
#include "frame/method.h"

namespace zor {

Boolean Works(PictureZOR* self, Integer count, Integer part);

constexpr MethodRow Rows[] = {Method<1, "Works(count as integer, part as double) as boolean", Works>};

}
