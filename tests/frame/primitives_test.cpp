// Bands of rows over processors, copies of memory, primitives on images.
#include <atomic>
#include <boost/make_shared.hpp>
#include <mutex>
#include <set>
#include <stdexcept>
#include <thread>
#include <xmmintrin.h>

#include "frame/Bands.h"
#include "frame/ImagePrimitives.h"
#include "frame/StreamCopy.h"
#include "support/Processor.h"
#include "support/Test.h"
#include "vexel_host/host.h"

namespace vexel::testing {
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

// Runs pieces in a floating-point mode of its own, which must come back.
class RoundingExecutor : public zovcore::threads::AsyncExecutor {
 public:
  void RunPieces(const boost::function<void(int)>& function, int count) override {
    constexpr unsigned kOwn = 0x3F80;  // round downward, no flush to zero
    const unsigned callers = _mm_getcsr();
    _mm_setcsr(kOwn);
    for (int i = 0; i < count; ++i) {
      function(i);
      changed += _mm_getcsr() != kOwn;
    }
    _mm_setcsr(callers);
  }
  int changed = 0;
};

// Pieces see the mode of the entry points and the caller's rounding, whatever the worker's own is.
TEST(Bands, PiecesRunInTheFloatingPointMode) {
  const auto executor = boost::make_shared<RoundingExecutor>();
  for (const unsigned mode : {0x1F80u, 0x5FC0u}) {  // to nearest; upward with denormals as zeros
    const unsigned callers = _mm_getcsr();
    vexel_host::SetExecutor(executor);
    _mm_setcsr(mode);
    int wrong = 0;
    ForEachBand(64 * kBandRows, [&](int, int) {
      wrong += (_mm_getcsr() & 0xFFC0) != (mode | 0x8000);
      volatile float tiny = 1e-38f;
      tiny = tiny * 0.1f;
      wrong += tiny != 0;
    });
    const unsigned after = _mm_getcsr();
    _mm_setcsr(callers);
    vexel_host::SetExecutor(nullptr);
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(after, mode) << "exception flags included";
    EXPECT_EQ(executor->changed, 0);
  }
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

constexpr size_t kGuard = 160;
constexpr uint8_t kUntouched = 0xA5;

// Copies n bytes between all alignments that matter; guards on both sides must stay.
template <class Copy>
void CheckCopy(const Copy& copy, size_t n, const std::vector<size_t>& dstShifts, const std::vector<size_t>& srcShifts) {
  std::vector<uint8_t> src(n + 2 * kGuard), dst(src.size());
  Random(n + 1).Fill(src.data(), src.size());
  const size_t srcBase = -reinterpret_cast<uintptr_t>(src.data()) % 64,
               dstBase = -reinterpret_cast<uintptr_t>(dst.data()) % 64;
  for (const size_t d : dstShifts)
    for (const size_t s : srcShifts) {
      std::fill(dst.begin(), dst.end(), kUntouched);
      uint8_t* const to = dst.data() + dstBase + d;
      const uint8_t* const from = src.data() + srcBase + s;
      copy(to, from, n);
      ASSERT_TRUE(std::equal(from, from + n, to)) << n << " bytes, shifts " << d << " and " << s;
      const auto isUntouched = [](uint8_t byte) { return byte == kUntouched; };
      ASSERT_TRUE(std::all_of(dst.data(), to, isUntouched) && std::all_of(to + n, dst.data() + dst.size(), isUntouched))
          << n << " bytes, shifts " << d << " and " << s;
    }
}

template <class Copy>
void CheckSizes(const Copy& copy) {
  std::vector<size_t> all(65);
  for (size_t i = 0; i < all.size(); ++i) all[i] = i;
  for (const size_t n : {0, 1, 63, 64, 65, 127, 128, 129, 255, 256, 257, 1000}) CheckCopy(copy, n, all, {0, 1, 16, 33});
  for (size_t n = 0; n <= 700; ++n) CheckCopy(copy, n, {0, 5, 63}, {0, 7});
  for (const size_t n : {1023, 1024, 1025, 1535, 1536, 1537, 1663, 2303, 2304, 4095, 4096, 16384, 16385, 65537})
    CheckCopy(copy, n, {0, 1, 31}, {0, 17});
}

TEST(MemoryCopy, CopiesExactlyTheBytes) {
  CheckSizes([](void* dst, const void* src, size_t n) { ASSERT_EQ(VX_CopyMemory(dst, src, n), VX_Success); });
  EXPECT_EQ(VX_CopyMemory(nullptr, nullptr, 0), VX_Success);
}

TEST(MemoryCopy, StreamsFromHalfTheCache) {
  const auto copy = [](void* dst, const void* src, size_t n) { VX_CopyMemory(dst, src, n); };
  // With no cache known, everything of some length streams.
  for (const uint32_t cache : {0u, 8192u}) {
    const SmallCache small(cache);
    CheckSizes(copy);
    for (const size_t n : {4095, 4096, 4097}) CheckCopy(copy, n, {0, 3}, {0, 5});
  }
  for (const uint32_t n : {VX_GetCacheSize() / 2 - 1, VX_GetCacheSize() / 2}) CheckCopy(copy, n, {3}, {5});
}

TEST(MemoryCopy, StreamCopyTakesAnyAlignment) {
  const KernelVariant variant = ActiveKernelVariant();
  CheckSizes([=](void* dst, const void* src, size_t n) {
    StreamCopy(dst, src, n, variant);
    StreamFence();
  });
}

using namespace primitives;

// Large enough to go over several threads, with a cache that holds nothing, all but a part, and all of it.
template <class T>
void CheckLargeFill() {
  std::vector<T> want(4 * 501 * 301 + 1, T(9));
  for (size_t i = 0; i < want.size() - 1; ++i) want[i] = static_cast<T>(i % 4 + 100);
  const size_t bytes = want.size() * sizeof(T);
  for (const size_t cache : {size_t{1024}, bytes, 4 * bytes}) {
    const SmallCache small(static_cast<uint32_t>(cache));
    std::vector<T> large(want.size(), T(9));
    EXPECT_EQ(Fill4({T(100), T(101), T(102), T(103)}, large.data(), 501 * 4 * sizeof(T), 501, 301), Status::Ok);
    EXPECT_EQ(large, want) << cache;
  }
}

// Fills and channels one by one: fills_test.cpp, operations_test.cpp.
TEST(ImagePrimitives, LargeFillsInBandsPastTheCache) {
  CheckLargeFill<uint16_t>();
  CheckLargeFill<float>();
}

// All products, against exact arithmetic rounded by the processor in its default mode.
TEST(ImagePrimitives, MultiplyRoundsToNearestEvenAndSaturates) {
  for (const int scale : {INT_MIN, -40, -9, -8, -7, -1, 0, 1, 2, 7, 8, 9, 14, 15, 16, 17, 18, 40, INT_MAX})
    for (int constant = 0; constant < 256; ++constant) {
      uint8_t src[256], dst[256 + 4];
      for (int i = 0; i < 256; ++i) src[i] = static_cast<uint8_t>(i);
      std::fill(std::begin(dst), std::end(dst), 0xEE);
      const uint8_t constants[4] = {static_cast<uint8_t>(constant), static_cast<uint8_t>(255 - constant), 255,
                                    static_cast<uint8_t>(constant / 2)};
      ForEachVariant([&](int) {
        ASSERT_EQ(MultiplyByConstants4(src, 256, constants, dst, 256, 64, 1, scale), Status::Ok);
        for (int i = 0; i < 256; ++i) {
          const double exact = std::ldexp(i * constants[i % 4], -std::max(std::min(scale, 100), -100));
          ASSERT_EQ(dst[i], std::min(std::nearbyint(exact), 255.0))
              << i << " * " << int{constants[i % 4]} << " >> " << scale;
        }
        ASSERT_EQ(dst[256], 0xEE);
      });
    }
}

TEST(ImagePrimitives, BadArgumentsWriteNothing) {
  uint8_t image[64];
  std::fill(std::begin(image), std::end(image), 5);
  const uint8_t pixel[4] = {1, 2, 3, 4};
  EXPECT_EQ(Fill(uint8_t{1}, nullptr, 8, 8, 8), Status::NullPointer);
  for (const int bad : {0, -1, INT_MIN}) {
    EXPECT_EQ(Fill4(pixel, image, 16, bad, 1), Status::Size);
    EXPECT_EQ(Fill4(pixel, image, 16, 1, bad), Status::Size);
  }
  for (const ptrdiff_t step : {0, 15, -15}) {
    EXPECT_EQ(Fill4(pixel, image, step, 4, 2), Status::Step);
    EXPECT_EQ(SetChannel(0, uint8_t{1}, image, step, 4, 2), Status::Step);
    EXPECT_EQ(MultiplyByConstants4(image, 16, pixel, image, step, 4, 2, 0), Status::Step);
  }
  EXPECT_EQ(SetChannel(-1, uint8_t{1}, image, 16, 4, 2), Status::Channel);
  EXPECT_EQ(SetChannel(4, uint8_t{1}, image, 16, 4, 2), Status::Channel);
  EXPECT_EQ(MultiplyByConstants4(nullptr, 16, pixel, image, 16, 4, 2, 0), Status::NullPointer);
  for (const uint8_t byte : image) EXPECT_EQ(byte, 5);
  EXPECT_EQ(Fill4(pixel, image, 0, 4, 1), Status::Ok) << "one row needs no step";
}

}  // namespace
}  // namespace vexel::testing
