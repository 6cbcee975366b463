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
  BandRows(std::unique_ptr<Rows> source, BandChain chain, int threads, const BandSizes& sizes);
  ~BandRows() override;
  const std::uint8_t* Next(std::uint8_t* room) override;
  void Skip(std::int64_t count) override;

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

  const std::unique_ptr<Rows> Source;
  const BandChain Chain;
  const BandSizes Sizes;

  // The reading thread's: the last rows read, which the next band begins with, and how many have been read.
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
