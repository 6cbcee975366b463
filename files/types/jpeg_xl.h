#pragma once
#include <string_view>

namespace picturezor::files {

using namespace std::string_view_literals;

/// How a JPEG XL file begins that has boxes around the picture, and one that is the picture alone.
constexpr auto BoxedMagic = "\0\0\0\x0CJXL \r\n\x87\n"sv, BareMagic = "\xFF\x0A"sv;

}
