// The embedded host's controls: how a program gives the library its own threads, memory and trace, and how tests make
// allocations fail. All functions are thread-safe; what they change holds for the whole process.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

#include <boost/shared_ptr.hpp>

#include "zovcore/Export.h"
#include "zovcore/Threads.h"

namespace vexel_host {

// ---- Threads

// Fan-outs run on `executor` from now on; VX_Initialize holds a reference to it until the matching VX_Terminate. Null
// goes back to the host's own threads.
ZOV_API void SetExecutor(boost::shared_ptr<zovcore::threads::AsyncExecutor> executor);

// The host's own threads that work at the same time, the calling one included; 0 means one per processor. Fan-outs that
// are under way keep the old limit.
ZOV_API void SetThreadLimit(int threads);
ZOV_API int ThreadLimit();

// ---- Memory

// A source of memory in place of the host's recycling allocator.
class ZOV_API Allocator {
 public:
  virtual ~Allocator();
  // At least `bytes` (never 0) bytes, aligned to 16, or null; *rawSize receives the block's size, at least `bytes`.
  virtual void* Allocate(size_t bytes, size_t* rawSize) noexcept = 0;
  virtual void Recycle(void* block, size_t rawSize) noexcept = 0;
};

// Takes memory from `allocator` from now on, which must outlive its use; null goes back to the host's own. False, with
// nothing changed, while blocks are out, since they must go back where they came from.
ZOV_API bool SetAllocator(Allocator* allocator);

// Bytes in blocks that are out, and in blocks kept for reuse.
ZOV_API size_t LiveBytes();
ZOV_API size_t CachedBytes();
// The most that is kept for reuse; at first a quarter of the machine's memory, 4 GiB at most.
ZOV_API void SetCacheLimit(size_t bytes);
// Gives everything kept for reuse back to the system.
ZOV_API void TrimMemory();

// For tests: the n-th allocation from now on (1 is the next) fails; with sticky set, all after it as well. 0 ends it.
ZOV_API void FailAllocation(uint64_t nth, bool sticky);
// Allocations asked for since the process started, failed ones included.
ZOV_API uint64_t AllocationCount();

// ---- Trace, settings, modules

// Receives each trace line, its end of line included, on the thread that traces. An empty function removes it.
ZOV_API void SetTraceSink(std::function<void(std::string_view line)> sink);

// Sets an entry of the debug database, for instance "VX.disableAVX2" to "true". Keys that the library reads at start-up
// must be set before VX_Initialize. RemoveDebugEntry takes it out again.
ZOV_API void SetDebugEntry(const std::string& key, const std::string& text);
ZOV_API void RemoveDebugEntry(const std::string& key);

// Where optional modules are looked for; empty goes back to the directory of the running program.
ZOV_API void SetModulesDirectory(const std::string& directory);

}  // namespace vexel_host
