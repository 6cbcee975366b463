#pragma once
#include <atomic>
#include <condition_variable>
#include <deque>
#include <exception>
#include <mutex>
#include <thread>
#include <vector>

#include "band_chain.h"
#include "rows.h"

namespace picturezor::flow {

/// How a picture is cut into bands.
struct BandSizes {
  /// Rows of the result in a band, the last one perhaps fewer.
  std::int32_t Rows = 1;
  /// Bands in memory at a time.
  int InFlight = 2;
};

/// So that bands take about `memory` bytes on a number of threads: long ones where a band needs many rows
/// around it, otherwise as short as is worth the way from thread to thread.
BandSizes ChooseBands(const BandChain& chain, int threads, std::int64_t memory);

/// The result of operations on bands: a thread reads the source ahead, others work on bands, each with
/// pictures of its own, and the result comes in order. The same whatever the number of threads. Without
/// operations the source alone is read ahead.
class BandRows final : public Rows {
 public:
  /// From the row `first` of the result on.
  BandRows(const RowSource& source, const BandChain& chain, int threads, const BandSizes& sizes,
           std::int64_t first);
  ~BandRows() override;
  RowBlock Next(std::uint8_t* room, std::ptrdiff_t stride, std::int32_t most) override;

 private:
  /// A band on its way.
  struct Band {
    RowRange Rows;
    Picture Source, Result;
    bool Done = false;
    std::exception_ptr Failed;
  };

  void ReadAhead();
  /// Of the next band, and where the one behind it begins.
  Picture ReadBand(RowRange rows, std::int64_t nextFirst);
  Picture SourcePicture(std::int32_t rows);
  void Work();
  /// Takes the next band in hand.
  void GoOn();
  void Stop();

  const RowSource From;
  const BandChain Chain;
  const BandSizes Sizes;
  const std::int64_t FirstRow;

  // The reading thread's: the last rows read, which the next band begins with, and the row behind them.
  std::unique_ptr<Rows> Source;
  Bytes Kept;
  std::int64_t RowsRead = 0;

  std::mutex Access;
  std::condition_variable Changed;
  /// In order; `Started` of them are being worked on or done.
  std::deque<std::unique_ptr<Band>> Bands;
  std::size_t Started = 0;
  /// Pictures for later bands.
  std::vector<Picture> Spare;
  std::atomic<bool> Stopped = false;

  // The consumer's.
  std::unique_ptr<Band> InHand;
  const std::uint8_t* Samples = nullptr;
  std::int64_t RowSize = 0, NextRow = 0;

  std::vector<std::thread> Threads;
};

}
