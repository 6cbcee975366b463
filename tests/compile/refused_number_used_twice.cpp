// refused: ARowNumberIsUsedTwice
#include "frame/method.h"

namespace zor {

Boolean Works(PictureZOR* self, Integer count);

constexpr MethodRow Rows[] = {Method<1, "Works(count as integer) as boolean", Works>};
constexpr MethodRow More[] = {Method<1, "Works(number as integer) as boolean", Works>};
constexpr auto Table = InTableOrder(Rows, More);

}
