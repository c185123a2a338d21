#if defined(_WIN32)
#include "frame/Platform.h"

#define WIN32_LEAN_AND_MEAN
#ifndef NOMINMAX
#define NOMINMAX
#endif
#include <windows.h>

#include <intrin.h>

#include <cstring>

#include "frame/Scratch.h"

namespace vexel::platform {
namespace {

CpuidRegisters Cpuid(uint32_t leaf, uint32_t subleaf) {
  int r[4];
  __cpuidex(r, static_cast<int>(leaf), static_cast<int>(subleaf));
  return {static_cast<uint32_t>(r[0]), static_cast<uint32_t>(r[1]), static_cast<uint32_t>(r[2]),
          static_cast<uint32_t>(r[3])};
}

__attribute__((target("xsave"))) uint64_t Xcr0() { return _xgetbv(0); }

// Records have their own lengths; the last one read must hold a whole fixed-size record.
constexpr DWORD kLeastRecordBytes = 80;

CacheInfo LargestOf(const uint8_t* records, DWORD bytes) {
  LargestUnifiedCache largest;
  while (bytes >= kLeastRecordBytes) {
    SYSTEM_LOGICAL_PROCESSOR_INFORMATION_EX record;
    std::memcpy(&record, records, kLeastRecordBytes);
    if (record.Size == 0 || record.Size > bytes) break;
    largest.Offer(record.Relationship == RelationCache && record.Cache.Type == CacheUnified, record.Cache.Level,
                  record.Cache.CacheSize);
    records += record.Size;
    bytes -= record.Size;
  }
  return largest.Best();
}

}  // namespace

const Processor kProcessor{&Cpuid, &Xcr0};

// By name: not every supported system has the function.
bool FindUnifiedCache(CacheInfo& cache) {
  using Query = BOOL(WINAPI*)(LOGICAL_PROCESSOR_RELATIONSHIP, PSYSTEM_LOGICAL_PROCESSOR_INFORMATION_EX, PDWORD);
  const HMODULE kernel = GetModuleHandleW(L"kernel32");
  const auto query =
      kernel
          ? reinterpret_cast<Query>(reinterpret_cast<void*>(GetProcAddress(kernel, "GetLogicalProcessorInformationEx")))
          : nullptr;
  if (!query) return false;
  DWORD bytes = 0;
  query(RelationCache, nullptr, &bytes);
  VX_SCRATCH(records, bytes);
  if (!records) return false;
  if (!query(RelationCache, reinterpret_cast<PSYSTEM_LOGICAL_PROCESSOR_INFORMATION_EX>(records.get()), &bytes))
    return false;
  cache = LargestOf(records.get(), bytes);
  return true;
}

}  // namespace vexel::platform
#endif
