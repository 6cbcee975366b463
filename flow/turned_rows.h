#pragma once
#include <memory>

#include "pictures.h"
#include "progress.h"
#include "rows.h"

namespace picturezor::flow {

/// A picture that has been turned or mirrored, whose rows can be read in order from any one on. It takes the
/// room of all its pixels once, in memory where they fit in the limit and on the disk otherwise, and beside
/// that some megabytes.
class TurnedRows {
 public:
  /// Reads all rows of the source. `orientation`, 3 to 8, is that of files: it tells how the source lies.
  TurnedRows(const RowSource& source, int orientation, const files::StoreOptions& stores, int threads,
             files::Progress& progress);
  ~TurnedRows();
  /// The rows of the upright picture.
  RowSource Source() const;
  /// From now on rows that have been read give their room back.
  void ReadOnce();

 private:
  class Reading;
  struct Strips;
  std::shared_ptr<Strips> Of;
};

}
