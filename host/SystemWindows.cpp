#if defined(_WIN32)
#include "System.h"

#define WIN32_LEAN_AND_MEAN
#ifndef NOMINMAX
#define NOMINMAX
#endif
#include <windows.h>

#include <malloc.h>

namespace vexel_host::system {
namespace {

std::wstring Widen(const std::string& text) {
  const int units = MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), nullptr, 0);
  std::wstring wide(static_cast<size_t>(units), L'\0');
  MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), wide.data(), units);
  return wide;
}

std::string Narrow(const std::wstring& wide) {
  const int wideUnits = static_cast<int>(wide.size());
  const int units = WideCharToMultiByte(CP_UTF8, 0, wide.data(), wideUnits, nullptr, 0, nullptr, nullptr);
  std::string text(static_cast<size_t>(units), '\0');
  WideCharToMultiByte(CP_UTF8, 0, wide.data(), wideUnits, text.data(), units, nullptr, nullptr);
  return text;
}

}  // namespace

// Large pages need a privilege here, so ordinary ones (on 64 KiB boundaries) serve.
void* MapMemory(size_t bytes) noexcept {
  return VirtualAlloc(nullptr, bytes, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE);
}
void UnmapMemory(void* pages, size_t) noexcept { VirtualFree(pages, 0, MEM_RELEASE); }
void* AlignedMalloc(size_t bytes, size_t alignment) noexcept { return _aligned_malloc(bytes, alignment); }
void AlignedFree(void* block) noexcept { _aligned_free(block); }

uint64_t PhysicalMemory() noexcept {
  MEMORYSTATUSEX status{};
  status.dwLength = sizeof status;
  return GlobalMemoryStatusEx(&status) ? status.ullTotalPhys : 0;
}

int64_t CoarseMilliseconds() noexcept { return static_cast<int64_t>(GetTickCount64()); }

uint64_t CurrentThread() noexcept { return GetCurrentThreadId(); }
bool IsDebuggerAttached() noexcept { return IsDebuggerPresent() != 0; }

std::string ProgramDirectory() {
  std::wstring path(32768, L'\0');
  path.resize(GetModuleFileNameW(nullptr, path.data(), static_cast<DWORD>(path.size())));
  const size_t separator = path.find_last_of(L"\\/");
  return separator == std::wstring::npos ? "." : Narrow(path.substr(0, separator));
}

void* LoadModule(const std::string& path) { return LoadLibraryW(Widen(path).c_str()); }
void* FindFunction(void* module, const char* name) {
  return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(module), name));
}
void UnloadModule(void* module) { FreeLibrary(static_cast<HMODULE>(module)); }

}  // namespace vexel_host::system
#endif
