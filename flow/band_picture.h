#pragma once
#include "band_chain.h"
#include "progress.h"

namespace picturezor::flow {

/// What operations on bands make of a part of a picture in memory that isn't a view and stays as it is: bands
/// of `rows` rows of the result, on a number of threads. The result, in memory too, has the size and format
/// that the chain gives.
void ApplyBands(const Picture& source, const Rect& part, const BandChain& chain, std::int32_t rows,
                int threads, const Picture& result, files::Progress& progress);

}
