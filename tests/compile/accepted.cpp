#include "frame/method.h"
#include "image/conversion.h"

// The same shapes as in the refused sources, with nothing wrong: what keeps those from being refused for some
// other reason.

namespace zor {

Boolean Works(PictureZOR* self, Integer count, Double part);

constexpr MethodRow Rows[] = {Method<1, "Works(count as integer, part as double) as boolean", Works>};
constexpr MethodRow More[] = {Method<2, "Works(a as integer, b as double = 1) as boolean", Works>};
constexpr auto Table = InTableOrder(Rows, More);

constexpr FamilyPair Fits = Pair<Family::Gray, Family::RGB, GrayToAll>;

}
