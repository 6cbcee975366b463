#pragma once
#include "run.h"

namespace picturezor::flow {

/// Lets the reader of a file do what it can of a chain's beginning, before any row is asked for: it reads
/// the part that is cut out alone, or gives a smaller picture where that will do. What is left of the chain
/// gives what the whole chain would. Throws files::Failure where the first operation isn't there for the
/// picture.
void LetReaderBegin(OpenFile& file, Chain& chain);

}
