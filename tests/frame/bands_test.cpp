#include "frame/Bands.h"

#include <gtest/gtest.h>
#include <xmmintrin.h>

#include <atomic>
#include <boost/make_shared.hpp>
#include <mutex>
#include <set>
#include <stdexcept>
#include <thread>
#include <vector>

#include "vexel_host/host.h"

namespace vexel {
namespace {

class ReverseExecutor : public zovcore::threads::AsyncExecutor {
 public:
  void RunPieces(const boost::function<void(int)>& function, int count) override {
    ++calls;
    for (int i = count; i-- > 0;) function(i);
  }
  int calls = 0;
};

// How often each row was handed out; bands must begin at multiples of 32.
std::vector<int> RowCounts(int rows) {
  std::vector<std::atomic<int>> counts(static_cast<size_t>(std::max(rows, 0)));
  EXPECT_TRUE(ForEachBand(rows, [&](int first, int end) {
    EXPECT_TRUE(first % kBandRows == 0 && end > first && end - first <= kBandRows) << first << " " << end;
    for (int r = first; r < end; ++r) ++counts[static_cast<size_t>(r)];
  }));
  return {counts.begin(), counts.end()};
}

TEST(Bands, CoverEachRowOnceWithAnyNumberOfThreads) {
  for (const int threads : {0, 1, 2, 3, 7, 16}) {
    vexel_host::SetThreadLimit(threads);
    EXPECT_EQ(vexel_host::ThreadLimit(), threads);
    for (const int rows : {-5, 0, 1, 31, 32, 33, 63, 64, 65, 96, 1000, 4321}) {
      const std::vector<int> counts = RowCounts(rows);
      EXPECT_EQ(counts, std::vector<int>(counts.size(), 1)) << rows << " rows, " << threads << " threads";
    }
  }
  vexel_host::SetThreadLimit(0);
}

TEST(Bands, NeverUseMoreThreadsThanAllowed) {
  for (const int limit : {1, 2, 5}) {
    vexel_host::SetThreadLimit(limit);
    std::mutex mutex;
    std::set<std::thread::id> threads;
    ForEachBand(64 * kBandRows, [&](int, int) {
      std::this_thread::sleep_for(std::chrono::microseconds(200));
      const std::lock_guard lock(mutex);
      threads.insert(std::this_thread::get_id());
    });
    EXPECT_LE(threads.size(), static_cast<size_t>(limit));
    EXPECT_TRUE(limit > 1 || threads.count(std::this_thread::get_id()) == 1);
  }
  vexel_host::SetThreadLimit(0);
}

TEST(Bands, FewRowsNeedNoTask) {
  const auto executor = boost::make_shared<ReverseExecutor>();
  vexel_host::SetExecutor(executor);
  RowCounts(32);
  EXPECT_EQ(executor->calls, 0);
  std::vector<int> firsts;
  ForEachBand(33, [&](int first, int end) {
    firsts.push_back(first);
    firsts.push_back(end);
  });
  EXPECT_EQ(firsts, (std::vector<int>{32, 33, 0, 32}));
  EXPECT_EQ(executor->calls, 1);
  struct OnePiece final : Task {
    int PieceCount() override { return 1; }
    void ExecutePiece(int) override { ++done; }
    int done = 0;
  } task;
  EXPECT_TRUE(RunTask(task));
  EXPECT_EQ(executor->calls, 1) << "nor does one piece";
  for (const int count : {-1, 0, 1})
    zovcore::threads::ExecuteCPUBoundTaskOnAllProcessors([&](int) { ++task.done; }, count);
  EXPECT_EQ(task.done, 2);
  vexel_host::SetExecutor(nullptr);
}

// Pieces see the mode of the entry points whatever the worker's own is, and the worker's own comes back.
TEST(Bands, PiecesRunInTheFloatingPointMode) {
  constexpr unsigned kExceptionFlags = 0x3F;
  const unsigned callers = _mm_getcsr();
  _mm_setcsr(0x5F80);  // round toward minus infinity, no flush to zero, all masked
  const unsigned before = _mm_getcsr();
  std::atomic<int> wrong{0};
  ForEachBand(64 * kBandRows, [&](int, int) {
    if ((_mm_getcsr() & 0x8020) != 0x8020) ++wrong;
    volatile float tiny = 1e-38f;
    tiny = tiny * 0.1f;
    if (tiny != 0) ++wrong;
  });
  const unsigned after = _mm_getcsr();
  _mm_setcsr(callers);
  EXPECT_EQ(wrong, 0);
  EXPECT_EQ(after, before) << "exception flags included: " << ((after ^ before) & kExceptionFlags);
  // The workers' own words: whatever a worker had, flush-to-zero must not stay on.
  std::atomic<int> left{0};
  zovcore::threads::ExecuteCPUBoundTaskOnAllProcessors(
      [&](int) {
        if (_mm_getcsr() & 0x8000) ++left;
      },
      256);
  EXPECT_EQ(left, 0);
}

TEST(Bands, ExceptionsStayInsideAndTheOtherPiecesRun) {
  for (const int threads : {1, 0}) {
    vexel_host::SetThreadLimit(threads);
    std::atomic<int> done{0};
    EXPECT_FALSE(ForEachBand(10 * kBandRows, [&](int first, int) {
      if (first == 3 * kBandRows) throw std::runtime_error("piece");
      ++done;
    }));
    EXPECT_EQ(done, 9);
  }
  vexel_host::SetThreadLimit(0);
  struct BrokenExecutor : zovcore::threads::AsyncExecutor {
    void RunPieces(const boost::function<void(int)>&, int) override { throw std::runtime_error("executor"); }
  };
  vexel_host::SetExecutor(boost::make_shared<BrokenExecutor>());
  EXPECT_FALSE(ForEachBand(100, [](int, int) {}));
  vexel_host::SetExecutor(nullptr);
}

// Bands inside bands, from several threads at once, as when operations call each other.
TEST(Bands, MayNestAndBeCalledFromManyThreads) {
  for (const int threads : {0, 2}) {
    vexel_host::SetThreadLimit(threads);
    std::atomic<int> rows{0};
    std::vector<std::thread> callers;
    for (int i = 0; i < 4; ++i)
      callers.emplace_back([&] {
        for (int repeat = 0; repeat < 20; ++repeat)
          ForEachBand(100, [&](int, int) { ForEachBand(70, [&](int first, int end) { rows += end - first; }); });
      });
    for (std::thread& caller : callers) caller.join();
    EXPECT_EQ(rows, 4 * 20 * 4 * 70);
  }
  vexel_host::SetThreadLimit(0);
}

}  // namespace
}  // namespace vexel
