// The embedded host.
#include <stdlib.h>
#include <unistd.h>

#include <fstream>
#include <thread>

#include "frame/RuntimeRandom.h"
#include "support/Test.h"
#include "vexel_host/host.h"
#include "zovcore/Config.h"
#include "zovcore/Debug.h"
#include "zovcore/Utility.h"

namespace vexel {
namespace {

using zovcore::utility::MemoryRecycler;

struct RawBlock {
  explicit RawBlock(size_t bytes) : memory(MemoryRecycler::Allocate(bytes, &size)) {}
  void Free() { MemoryRecycler::Recycle(memory, size); }
  size_t size = 0;
  void* memory;
};

TEST(Recycler, GivesTheSameFrameBackAndFitsWithinAnEighth) {
  vexel_host::TrimMemory();
  EXPECT_EQ(vexel_host::CachedBytes(), 0u);
  const size_t live = vexel_host::LiveBytes();
  for (const size_t bytes : {size_t{1}, size_t{1024}, size_t{1025}, size_t{262143}, size_t{262145},
                             size_t{1920 * 1080 * 4}, size_t{3840} * 2160 * 16}) {
    vexel_host::TrimMemory();
    RawBlock block(bytes);
    ASSERT_NE(block.memory, nullptr);
    EXPECT_EQ(reinterpret_cast<uintptr_t>(block.memory) % 64, 0u);
    EXPECT_GE(block.size, bytes);
    EXPECT_LE(block.size, std::max<size_t>(1024, bytes + bytes / 8));
    EXPECT_EQ(vexel_host::LiveBytes(), live + block.size);
    std::memset(block.memory, 1, bytes);
    block.Free();
    EXPECT_EQ(vexel_host::LiveBytes(), live);
    EXPECT_GE(vexel_host::CachedBytes(), block.size);
    // The same again, and of a mapped block a little less, as the random placement makes it.
    for (const size_t again : {bytes, block.size > 262144 ? bytes - bytes / 64 : bytes}) {
      RawBlock second(again);
      EXPECT_EQ(second.memory, block.memory) << bytes;
      second.Free();
    }
  }
  vexel_host::TrimMemory();
  EXPECT_EQ(vexel_host::CachedBytes(), 0u);
}

TEST(Recycler, KeepsNoMoreThanItsLimitAndDropsTheOldest) {
  constexpr size_t kBytes = 1 << 20;
  vexel_host::TrimMemory();
  vexel_host::SetCacheLimit(4 * kBytes - 1);
  std::vector<RawBlock> blocks;
  for (int i = 0; i < 5; ++i) blocks.emplace_back(kBytes);
  for (RawBlock& block : blocks) block.Free();
  EXPECT_EQ(vexel_host::CachedBytes(), 3 * kBytes);
  for (int i = 4; i >= 2; --i) EXPECT_EQ(RawBlock(kBytes).memory, blocks[static_cast<size_t>(i)].memory);
  EXPECT_EQ(vexel_host::CachedBytes(), 0u);
  for (size_t i = 2; i < 5; ++i) blocks[i].Free();
  vexel_host::SetCacheLimit(kBytes);
  EXPECT_EQ(vexel_host::CachedBytes(), kBytes);
  RawBlock large(2 * kBytes);
  large.Free();
  EXPECT_EQ(vexel_host::CachedBytes(), 0u) << "what is larger than the limit is not kept, and pushes the older out";
  vexel_host::SetCacheLimit(size_t{1} << 30);
}

TEST(Recycler, RefusesWhatCannotBeHad) {
  size_t size = 1;
  EXPECT_EQ(MemoryRecycler::Allocate(0, &size), nullptr);
  EXPECT_EQ(size, 0u);
  for (const size_t bytes : {SIZE_MAX, SIZE_MAX / 2, size_t{1} << 47, (size_t{1} << 46) + 1}) {
    size = 1;
    EXPECT_EQ(MemoryRecycler::Allocate(bytes, &size), nullptr) << bytes;
    EXPECT_EQ(size, 0u);
  }
  MemoryRecycler::Recycle(nullptr, 5);
}

// Nobody else writes into a block that is ours.
TEST(Recycler, IsSafeFromManyThreads) {
  const size_t live = vexel_host::LiveBytes();
  vexel_host::SetCacheLimit(8 << 20);
  std::vector<std::thread> threads;
  for (int t = 0; t < 8; ++t)
    threads.emplace_back([t] {
      testing::Random random(static_cast<uint64_t>(t));
      std::vector<std::pair<RawBlock, size_t>> held;
      const auto ends = [](const auto& each) {
        auto* const memory = static_cast<uint8_t*>(each.first.memory);
        return std::pair{memory, memory + each.second - 1};
      };
      for (int i = 0; i < 2000 || !held.empty(); ++i) {
        if (i >= 2000 || held.size() > 8) {
          const auto at = held.begin() + random.Int(0, static_cast<int64_t>(held.size()) - 1);
          ASSERT_TRUE(*ends(*at).first == t && *ends(*at).second == t);
          at->first.Free();
          held.erase(at);
        }
        if (i >= 2000) continue;
        const auto bytes = static_cast<size_t>(random.Int(1, random.OneIn(8) ? 1 << 20 : 1 << 14));
        held.emplace_back(RawBlock(bytes), bytes);
        ASSERT_NE(held.back().first.memory, nullptr);
        *ends(held.back()).first = *ends(held.back()).second = static_cast<uint8_t>(t);
      }
    });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(vexel_host::LiveBytes(), live);
  EXPECT_LE(vexel_host::CachedBytes(), size_t{8} << 20);
  vexel_host::SetCacheLimit(size_t{1} << 30);
}

TEST(Recycler, FailsOnRequest) {
  for (const bool sticky : {false, true}) {
    vexel_host::FailAllocation(2, sticky);
    std::vector<RawBlock> blocks;
    for (int i = 0; i < 5; ++i) {
      if (i == 4) vexel_host::FailAllocation(0, false);
      const RawBlock& block = blocks.emplace_back(100);
      const bool fails = i == 1 || (sticky && (i == 2 || i == 3));
      EXPECT_EQ(block.memory == nullptr, fails) << i;
      EXPECT_EQ(block.size == 0, fails) << i;
    }
    for (RawBlock& block : blocks) block.Free();
  }
}

TEST(Recycler, MayBeReplaced) {
  struct Counting : vexel_host::Allocator {
    void* Allocate(size_t bytes, size_t* rawSize) noexcept override {
      ++out;
      *rawSize = bytes;
      return std::malloc(bytes);
    }
    void Recycle(void* block, size_t) noexcept override {
      --out;
      std::free(block);
    }
    int out = 0;
  } counting;
  ASSERT_EQ(vexel_host::LiveBytes(), 0u) << "an earlier test leaks";
  RawBlock before(100);
  EXPECT_FALSE(vexel_host::SetAllocator(&counting)) << "a block is out";
  before.Free();
  EXPECT_TRUE(vexel_host::SetAllocator(&counting));
  RawBlock block(12345);
  EXPECT_EQ(counting.out, 1);
  EXPECT_EQ(block.size, 12345u);
  EXPECT_FALSE(vexel_host::SetAllocator(nullptr));
  block.Free();
  EXPECT_EQ(counting.out, 0);
  EXPECT_TRUE(vexel_host::SetAllocator(nullptr));
}

// Where blocks are placed: PixelBuffers.
TEST(TransientMemory, RefusesOverflow) {
  for (const size_t bytes : {size_t{0}, SIZE_MAX, SIZE_MAX - 14, SIZE_MAX - 8080}) {
    size_t rawSize = 1;
    void* raw = &rawSize;
    EXPECT_EQ(VX_AllocateTransientMemoryBlock(bytes, &raw, &rawSize), nullptr) << bytes;
    EXPECT_EQ(raw, nullptr);
    EXPECT_EQ(rawSize, 0u);
  }
  VX_FreeTransientMemoryBlock(nullptr, 17);
}

TEST(RuntimeRandom, RepeatsTheClassicSequencePerThread) {
  const int classic[] = {41, 18467, 6334, 26500, 19169, 15724, 11478, 29358, 26962, 24464};
  SeedRuntimeRandom(1);
  for (const int value : classic) EXPECT_EQ(RuntimeRandom(), value);
  std::thread([&] {
    for (const int value : classic) EXPECT_EQ(RuntimeRandom(), value) << "a new thread begins as if seeded with 1";
  }).join();
  EXPECT_EQ(RuntimeRandom(), 5705) << "and disturbs no other";
  for (int i = 0; i < 100000; ++i) {
    const int value = RuntimeRandom();
    ASSERT_TRUE(value >= 0 && value <= 32767);
  }
}

TEST(Debug, EntriesComeFromTheFileAndFromCode) {
  ::testing::FLAGS_gtest_death_test_style = "threadsafe";  // a new process, so that the file is read
  const std::string path = ::testing::TempDir() + "vexel_settings_" + std::to_string(getpid());
  std::ofstream(path) << "# comment=1\n\n  VX.one = first  \nVX.two=a=b\r\nnonsense\nVX.one=last\nVX.empty=\n";
  setenv("VEXEL_DEBUG_DATABASE", path.c_str(), 1);
  EXPECT_EXIT(
      {
        auto& database = zovcore::debug::DebugDatabase::Instance();
        const auto is = [&](const char* key, const char* text) { return database.GetEntry(key, "none") == text; };
        bool good = is("VX.one", "last") && is("VX.two", "a=b") && is("VX.empty", "") && is("nonsense", "none") &&
                    is("# comment", "none");
        vexel_host::SetDebugEntry("VX.one", "set");
        good = good && is("VX.one", "set");
        vexel_host::RemoveDebugEntry("VX.one");
        std::_Exit(good && is("VX.one", "none") ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
  unsetenv("VEXEL_DEBUG_DATABASE");
  std::remove(path.c_str());
}

TEST(Debug, ContractErrorsAreThrownAndTraced) {
  std::string traced;
  vexel_host::SetTraceSink([&](std::string_view line) { traced += line; });
  const bool attached = zovcore::debug::IsDebuggerAttached();
  EXPECT_EQ(zovcore::debug::BreakAfterContractDialog("width >= 10", "Kernel.cpp", "Scale", 42), attached);
  EXPECT_EQ(traced, "Kernel.cpp:42: Scale: contract broken: width >= 10\n");
  traced.clear();
  const auto expectError = [](const char* text, int level, auto&& call) {
    try {
      call();
      FAIL();
    } catch (const zovcore::config::Error& error) {
      EXPECT_STREQ(error.what(), text);
      EXPECT_EQ(error.Level(), level);
      EXPECT_EQ(error.Code(), 105);
      EXPECT_EQ(error.Subcode(), 25);
    }
  };
  using zovcore::config::ThrowError;
  expectError("broken!", 0, [] { ThrowError(0, "$$$/zovcore/Contract=broken!", 105, 25, true, {}, {}, {}, {}); });
  EXPECT_EQ(traced, "broken!\n");
  traced.clear();
  expectError("two and one %2, %5%", 1,
              [] { ThrowError(1, "%2 and %1, %5%", 105, 25, false, {"one %2"}, {"two"}, {}, {}); });
  EXPECT_EQ(traced, "");
  vexel_host::SetTraceSink({});
}

TEST(Debug, TraceIsOnWithASinkOrASetting) {
  using zovcore::debug::TraceChangeCount;
  using zovcore::debug::TraceEnabled;
  EXPECT_FALSE(TraceEnabled("VX.Test", 5, true));
  int changes = TraceChangeCount();
  vexel_host::SetTraceSink([](std::string_view) {});
  EXPECT_NE(TraceChangeCount(), changes);
  EXPECT_TRUE(TraceEnabled("VX.Test", 5, true));
  EXPECT_FALSE(TraceEnabled("VX.Test", 5, false));
  changes = TraceChangeCount();
  vexel_host::SetDebugEntry("Trace", "7");
  EXPECT_NE(TraceChangeCount(), changes);
  EXPECT_FALSE(TraceEnabled("VX.Test", 6, true));
  EXPECT_TRUE(TraceEnabled("VX.Test", 7, false));
  vexel_host::SetDebugEntry("Trace.VX.Test", "true");
  EXPECT_TRUE(TraceEnabled("VX.Test", 0, false));
  EXPECT_FALSE(TraceEnabled("VX.Other", 0, true));
  vexel_host::SetTraceSink({});
  EXPECT_TRUE(TraceEnabled("VX.Test", 0, false));
  for (const char* key : {"Trace", "Trace.VX.Test"}) {
    changes = TraceChangeCount();
    vexel_host::RemoveDebugEntry(key);
    EXPECT_NE(TraceChangeCount(), changes);
  }
}

}  // namespace
}  // namespace vexel
