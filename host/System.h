// What the embedded host asks of the operating system.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace vexel_host::system {

// Zeroed pages, aligned to 2 MiB and in huge pages where the system grants them if there are 4 MiB or more. Null when
// out of memory. Not for small blocks.
void* MapMemory(size_t bytes) noexcept;
void UnmapMemory(void* pages, size_t bytes) noexcept;
void* AlignedMalloc(size_t bytes, size_t alignment) noexcept;
void AlignedFree(void* block) noexcept;
uint64_t PhysicalMemory() noexcept;

// Milliseconds of a clock that never goes back; coarse, but cheap to read.
int64_t CoarseMilliseconds() noexcept;
uint64_t CurrentThread() noexcept;
bool IsDebuggerAttached() noexcept;

std::string ProgramDirectory();
void* LoadModule(const std::string& path);
void* FindFunction(void* module, const char* name);
void UnloadModule(void* module);

}  // namespace vexel_host::system
