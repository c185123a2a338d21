#include "run_options.h"

#include <thread>

#include "tool_error.h"
#include "vexel/vexel.h"

#if TOOL_HAS_EMBEDDED_HOST
#include "vexel_host/host.h"
#endif

namespace tool {
namespace {

// Debug flags of VX_SetDebugFlag.
constexpr uint32_t kSse = 2, kSse41 = 6, kAvx = 8, kAvx2 = 9;

// The most capable set first; `firstFlag` is the first feature that the set does not use.
struct Isa {
  const char* name;
  uint32_t firstFlagOff;
  bool avx512Off;
};
constexpr Isa kIsas[] = {{"plain", kSse, true},
                         {"ssse3", kSse41, true},
                         {"sse4.1", kAvx, true},
                         {"avx2", kAvx2 + 1, true},
                         {"avx512", kAvx2 + 1, false}};

bool ProcessorHas(const std::string& isa) {
#if defined(__x86_64__) || defined(__i386__)
  __builtin_cpu_init();
  if (isa == "ssse3") return __builtin_cpu_supports("ssse3");
  if (isa == "sse4.1") return __builtin_cpu_supports("sse4.1");
  if (isa == "avx2") return __builtin_cpu_supports("avx2");
  if (isa == "avx512")
    return __builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512bw") &&
           __builtin_cpu_supports("avx512dq") && __builtin_cpu_supports("avx512vl") &&
           __builtin_cpu_supports("avx512cd");
#endif
  return isa == "plain";
}

void ForceIsa(const Isa& isa) {
  if (!ProcessorHas(isa.name)) throw ToolError(std::string("this processor has no ") + isa.name);
#if TOOL_HAS_EMBEDDED_HOST
  // Read when the library starts.
  if (isa.avx512Off) vexel_host::SetDebugEntry("VX.disableAVX512", "true");
  VX_Terminate();
  VX_Initialize();
#else
  if (isa.name == std::string("avx2") && ProcessorHas("avx512"))
    throw ToolError("only the embedded host can keep to avx2 on this processor");
#endif
  for (uint32_t flag = isa.firstFlagOff; flag <= kAvx2; ++flag) VX_SetDebugFlag(flag, 0);
}

}  // namespace

void RunOptions::AddTo(CLI::App& command, const std::string& threadsUnlessSaid) {
  command.add_option("--threads", threads, "Threads to use (default: " + threadsUnlessSaid + ")")
      ->check(CLI::Range(1, 1024));
  command.add_option("--isa", isa, "Use no kernels beyond plain, ssse3, sse4.1, avx2 or avx512")
      ->check(CLI::IsMember({"plain", "ssse3", "sse4.1", "avx2", "avx512"}));
}

void RunOptions::Apply() const {
#if TOOL_HAS_EMBEDDED_HOST
  if (threads > 0) vexel_host::SetThreadLimit(threads);
#endif
  for (const Isa& candidate : kIsas)
    if (isa == candidate.name) ForceIsa(candidate);
}

int RunOptions::ThreadCount() const {
  if (threads > 0) return threads;
  const unsigned processors = std::thread::hardware_concurrency();
  return processors ? static_cast<int>(processors) : 1;
}

}  // namespace tool
