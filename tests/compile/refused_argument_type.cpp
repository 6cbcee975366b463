// refused: converted constant expression
#include "frame/method.h"

namespace zor {

Boolean Works(PictureZOR* self, Integer count, Integer part);

constexpr MethodRow Rows[] = {Method<1, "Works(count as integer, part as double) as boolean", Works>};

}
