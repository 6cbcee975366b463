// refused: converted constant expression
#include "frame/method.h"

namespace zor {

Integer Works(PictureZOR* self, Integer count);

constexpr MethodRow Rows[] = {Method<1, "Works(count as integer) as boolean", Works>};

}
