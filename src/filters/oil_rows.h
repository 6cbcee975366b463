#pragma once
#include <optional>

#include "image/filter.h"

namespace zor {

// The forms of OilFilter that carry counts along, for 1 to 256 levels and pictures that share no samples.
// False when a row can't be reached; nothing without memory, and then the destination may be done in part.

/// For ranges whose neighbourhoods can be counted in bytes.
constexpr std::int32_t NearRange = 7;
std::optional<bool> OilNear(const FilterCall& call, std::int32_t levels, std::int32_t range);
/// For any range.
std::optional<bool> OilFar(const FilterCall& call, std::int32_t levels, std::int32_t range);

}
