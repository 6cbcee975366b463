#pragma once
#include <string_view>

namespace picturezor::tiles {

// The files in page/, as they stand there.
extern const std::string_view PyramidHTML, PyramidCSS, PyramidJS, ViewHTML, ViewCSS, ViewJS;

}
