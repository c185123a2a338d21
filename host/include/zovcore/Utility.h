// The host's recycling allocator and module lookup.
#pragma once

#include <cstddef>
#include <string>

#include "zovcore/Export.h"

namespace zovcore::utility {

// Memory for pictures and scratch. Freed blocks are kept for the next request of about that size, so that big frames
// are not mapped anew each time; what is kept is bounded and goes back to the system after a while. Thread-safe.
class ZOV_API MemoryRecycler {
 public:
  // At least `bytes` bytes, aligned to 64; *rawSize is the size of the block, which Recycle wants back. Null (and 0)
  // when out of memory or when bytes is 0.
  static void* Allocate(size_t bytes, size_t* rawSize) noexcept;
  // Null is ignored.
  static void Recycle(void* block, size_t rawSize) noexcept;
};

// The directory of the application's modules, without a separator at the end: what vexel_host::SetModulesDirectory set,
// else the directory of the running program.
ZOV_API std::string ApplicationModulesDirectory();
// Loads a module by path (UTF-8); null if that fails.
ZOV_API void* LoadModule(const std::string& path);
// The address of a function by name; null if the module has none.
ZOV_API void* FindModuleFunction(void* module, const char* name);
// Null is ignored.
ZOV_API void UnloadModule(void* module);

}  // namespace zovcore::utility
