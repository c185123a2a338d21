#if !defined(_WIN32)
#include "System.h"

#include <dlfcn.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

namespace vexel_host::system {
namespace {

constexpr size_t kHugePage = size_t{2} << 20;

}  // namespace

void* MapMemory(size_t bytes) noexcept {
  const bool huge = bytes >= 2 * kHugePage;
  // Mapped longer, then trimmed at both ends, to begin at a huge page.
  const size_t mapped = huge ? bytes + kHugePage : bytes;
  void* const pages = mmap(nullptr, mapped, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (pages == MAP_FAILED) return nullptr;
  if (!huge) return pages;
  const auto begin = reinterpret_cast<uintptr_t>(pages);
  const uintptr_t aligned = (begin + kHugePage - 1) & ~(kHugePage - 1);
  if (aligned != begin) munmap(pages, aligned - begin);
  munmap(reinterpret_cast<void*>(aligned + bytes), begin + mapped - (aligned + bytes));
  madvise(reinterpret_cast<void*>(aligned), bytes, MADV_HUGEPAGE);
  return reinterpret_cast<void*>(aligned);
}

void UnmapMemory(void* pages, size_t bytes) noexcept { munmap(pages, bytes); }

void* AlignedMalloc(size_t bytes, size_t alignment) noexcept {
  void* block = nullptr;
  return posix_memalign(&block, alignment, bytes) == 0 ? block : nullptr;
}

void AlignedFree(void* block) noexcept { std::free(block); }

uint64_t PhysicalMemory() noexcept {
  const long pages = sysconf(_SC_PHYS_PAGES), pageBytes = sysconf(_SC_PAGESIZE);
  return pages > 0 && pageBytes > 0 ? static_cast<uint64_t>(pages) * static_cast<uint64_t>(pageBytes) : 0;
}

int64_t CoarseMilliseconds() noexcept {
  timespec now;
  clock_gettime(CLOCK_MONOTONIC_COARSE, &now);
  return int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1000000;
}

uint64_t CurrentThread() noexcept { return static_cast<uint64_t>(syscall(SYS_gettid)); }

bool IsDebuggerAttached() noexcept try {
  std::ifstream status("/proc/self/status");
  for (std::string word; status >> word;)
    if (word == "TracerPid:") return (status >> word) && word != "0";
  return false;
} catch (...) {
  return false;
}

std::string ProgramDirectory() {
  std::error_code error;
  const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
  return error ? std::string(".") : program.parent_path().string();
}

void* LoadModule(const std::string& path) { return dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL); }
void* FindFunction(void* module, const char* name) { return dlsym(module, name); }
void UnloadModule(void* module) { dlclose(module); }

}  // namespace vexel_host::system
#endif
