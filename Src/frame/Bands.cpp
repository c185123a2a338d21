#include "frame/Bands.h"

#include <atomic>
#include <cstdint>
#include <xmmintrin.h>

#include "frame/FpModeGuard.h"
#include "frame/Lifecycle.h"
#include "zovcore/Threads.h"

namespace vexel {
namespace {

// Workers are the host's threads: their floating-point mode is set and put back per piece, and nothing is thrown at
// them. They round, and take denormals, as the caller does: else results would tell who made which piece.
class PieceRunner {
 public:
  explicit PieceRunner(Task& task) noexcept : mTask(task), mCallersMode(_mm_getcsr() & kResultBits) {}
  void Run(int piece) noexcept try {
    const FpModeGuard guard;
    _mm_setcsr((_mm_getcsr() & ~kResultBits) | mCallersMode);
    mTask.ExecutePiece(piece);
  } catch (...) {
    mFailed.store(true, std::memory_order_relaxed);
  }
  bool Succeeded() const noexcept { return !mFailed.load(std::memory_order_relaxed); }

 private:
  static constexpr uint32_t kResultBits = 0x6040;  // rounding, denormals are zeros

  Task& mTask;
  const uint32_t mCallersMode;
  std::atomic<bool> mFailed{false};
};

}  // namespace

bool RunTask(Task& task) noexcept try {
  const int count = task.PieceCount();
  PieceRunner runner(task);
  if (count <= 1 || !HasExecutor()) {
    for (int i = 0; i < count; ++i) runner.Run(i);
  } else {
    // One captured pointer: small enough for the function object's own storage.
    zovcore::threads::ExecuteCPUBoundTaskOnAllProcessors([r = &runner](int piece) { r->Run(piece); }, count);
  }
  return runner.Succeeded();
} catch (...) {
  return false;
}

}  // namespace vexel
