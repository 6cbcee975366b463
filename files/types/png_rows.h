#pragma once
#include <cstddef>
#include <cstdint>

namespace picturezor::files {

/// The filters of a PNG row, by the number before it.
enum class RowFilter : std::uint8_t { None, Sub, Up, Average, Paeth };

/// The filter byte and the filtered row, `1 + bytes` to `out`: by that of Sub, Up and Paeth whose sum of
/// distances from zero is least. `above` is the row above, zeros for the first one; `step` the bytes of a
/// pixel; `spare` has room for `1 + bytes`.
void FilterRow(const std::uint8_t* row, const std::uint8_t* above, std::uint8_t* out, std::uint8_t* spare,
               std::size_t bytes, int step);

}
