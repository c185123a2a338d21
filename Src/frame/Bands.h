// Spreads the rows of a kernel over the host's processors.
#pragma once

#include "frame/SeededBug.h"

namespace vexel {

inline constexpr int kBandRows = 32;

// Work in pieces. The slot order is part of the contract with the host's fan-out.
class Task {
 public:
  virtual int PieceCount() = 0;
  virtual void ExecutePiece(int piece) = 0;

 protected:
  ~Task() = default;
};

// Runs all pieces and returns when they are done. Without an executor (before VX_Initialize) they run on the calling
// thread in order. Pieces run under the entry points' floating-point mode on every worker. Nothing that a piece throws
// comes out: the other pieces still run, and the result is false.
bool RunTask(Task& task) noexcept;

// Calls rows(first, end) for bands of 32 rows, in parallel; 32 rows or fewer run inline without a task. False if a band
// on another thread threw; what an inline call throws comes out.
template <class Rows>
bool ForEachBand(int rowCount, Rows&& rows) {
  if (rowCount <= kBandRows) {
    if (rowCount > 0) rows(0, rowCount);
    return true;
  }
  struct BandTask final : Task {
    BandTask(int count, Rows& f) : rowCount(count), rows(f) {}
    int PieceCount() override {
      return rowCount / kBandRows + (rowCount % kBandRows != 0 && !Has(SeededBug::LastBandLost));
    }
    void ExecutePiece(int piece) override {
      const int first = piece * kBandRows;
      rows(first, rowCount - first < kBandRows ? rowCount : first + kBandRows);
    }
    int rowCount;
    Rows& rows;
  } task(rowCount, rows);
  return RunTask(task);
}

}  // namespace vexel
