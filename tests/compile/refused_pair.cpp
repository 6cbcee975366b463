// refused: converted constant expression
#include "image/conversion.h"

namespace zor {

constexpr FamilyPair Unfit = Pair<Family::Gray, Family::CMYK, GrayToAll>;

}
