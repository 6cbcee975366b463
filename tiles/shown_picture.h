#pragma once
#include <atomic>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

#include "adjustments.h"
#include "grid.h"
#include "planes.h"
#include "rows.h"

namespace picturezor::tiles {

/// A picture of any size whose parts are asked for at the sizes of a grid. Parts of the file that cost little
/// are read when they are asked for, smaller copies in it included; what that can't serve is made on a
/// thread, from the top down, in temporary files, and until it is there a small version stands for it.
class ShownPicture {
 public:
  /// Throws files::Failure where the file can't be read.
  ShownPicture(const Opener& opener, const files::StoreOptions& stores);
  ~ShownPicture();
  ShownPicture(const ShownPicture&) = delete;

  const flow::Shape& About() const { return Of; }
  const Grid& Cut() const { return Grids; }

  struct State {
    /// Rows of the picture that have been read for the pyramid; all where none is needed.
    std::int32_t Rows = 0;
    bool Done = false;
    /// What kept it from being made.
    std::string Failed;
  };
  State Progress() const;

  struct Part {
    Picture Of;
    /// Made of less than there will be.
    bool Rough = false;
  };
  /// A part of a level, with so many of the pixels around it as there are up to `margin` for adjustments to
  /// work on; they are cut off again. Nothing where it isn't there yet; the small version is waited for, if
  /// it takes a moment.
  std::optional<Part> PartOf(int level, const Rect& part, const Adjustments& adjustments = {});

 private:
  std::shared_ptr<Plane> PlaneFor(int level, const Rect& part) const;
  std::shared_ptr<Plane> RoughInAMoment();
  Picture Read(Plane& plane, int level, const Rect& part) const;
  SampleTable LevelTable();
  void Work();
  void MakePlanes();
  void Put(std::shared_ptr<Plane> plane);
  void RoughIs(std::shared_ptr<Plane> plane);

  const Opener Open;
  const files::StoreOptions Stores;
  flow::Shape Of;
  Grid Grids;
  mutable std::mutex Access;
  /// Largest first.
  std::vector<std::shared_ptr<Plane>> Planes;
  std::shared_ptr<Plane> Rough;
  /// Whether that is there, or never will be.
  bool RoughTried = false;
  std::condition_variable Changed;
  std::string FailedWith;
  std::atomic<std::int32_t> RowsRead = 0;
  std::atomic<bool> Finished = false, Stop = false;
  std::optional<SampleTable> Levelled;
  std::thread Worker;
};

}
