// refused: could not convert template argument|no matches converting
#include "image/conversion.h"

namespace zor {

constexpr FamilyPair Unfit = Pair<Family::Gray, Family::CMYK, GrayToAll>;

}
