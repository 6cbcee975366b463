#pragma once
#include <memory>
#include <vector>

#include "operation.h"

namespace picturezor::flow {

/// A scale as operations none of which sees the whole picture: the pass along the rows, and that along the
/// columns, for which the picture is turned and turned back. The bytes are those of Picture::Scale.
std::vector<std::unique_ptr<const Operation>> ScalePasses(Kernel kernel, std::int32_t width,
                                                          std::int32_t height);

}
