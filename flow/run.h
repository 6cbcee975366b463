#pragma once
#include <memory>
#include <vector>

#include "operation.h"
#include "progress.h"
#include "rows.h"

namespace picturezor::flow {

using Chain = std::vector<std::unique_ptr<const Operation>>;

struct RunOptions {
  /// Where pictures that have to stand whole live. With Store::Auto rows go straight from operation to
  /// operation where they can; otherwise every picture on the way stands whole, in memory or mapped.
  files::StoreOptions Stores;
  /// Threads to work on; 0 is one a processor. The result doesn't depend on it.
  int Threads = 0;
};

/// What comes out of operations one after the other. Throws files::Failure where one isn't there for what it
/// gets.
Shape ResultOf(const Shape& source, const Chain& chain);

/// The rows of the result of operations on a file's picture. The chain and the progress outlive them.
std::unique_ptr<Rows> Through(OpenFile file, const Chain& chain, const RunOptions& options,
                              files::Progress& progress);
/// The result of operations on a picture, as a picture of its own. The source stays as it is; its rows are
/// seen as pixels of `shape`, one of the formats of files. One thread at a time works with it.
Picture ResultOf(const Picture& source, const Shape& shape, const Chain& chain, const RunOptions& options,
                 files::Progress& progress);
/// All rows as a picture.
Picture Gather(Rows& rows, const files::StoreOptions& stores, files::Progress& progress);

/// Carries a file's picture through operations into another file, as pixels of `format`, one of those of
/// files to which there is a way; see files::Convertible. The writer is finished at the end.
void Run(OpenFile file, const Chain& chain, Format format, files::ImageWriter& writer,
         const RunOptions& options, files::Progress& progress);
/// The same with a picture that stays as it is, seen as above.
void Run(const Picture& source, const Shape& shape, Format format, files::ImageWriter& writer,
         const RunOptions& options, files::Progress& progress);

}
