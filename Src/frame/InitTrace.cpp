#include "frame/InitTrace.h"

#include <atomic>
#include <cstdint>
#include <sstream>

#include "zovcore/Debug.h"
#include "zovcore/Threads.h"

namespace vexel {
namespace {

constexpr const char* kCategory = "VX.InitIpp";
constexpr int kLevel = 5;

// The host's answer, asked for again when its count of changes has moved. Count and answer share a word, so that a
// reader never joins an old answer to a new count.
class CachedTraceSwitch {
 public:
  bool Enabled() {
    const int64_t count = zovcore::debug::TraceChangeCount();
    const int64_t seen = mSeen.load(std::memory_order_relaxed);
    if (seen >= 0 && seen >> 1 == (count & kCountMask)) return (seen & 1) != 0;
    const bool enabled = zovcore::debug::TraceEnabled(kCategory, kLevel, true);
    mSeen.store((count & kCountMask) << 1 | (enabled ? 1 : 0), std::memory_order_relaxed);
    return enabled;
  }

 private:
  static constexpr int64_t kCountMask = 0xFFFFFFFF;
  std::atomic<int64_t> mSeen{-1};
};

}  // namespace

void TraceInitWarning(primitives::Status status) noexcept try {
  if (static_cast<int32_t>(status) <= 0) return;
  static CachedTraceSwitch traceSwitch;
  if (!traceSwitch.Enabled()) return;
  std::ostringstream line;
  line << "<" << zovcore::threads::GetCurrentThreadID() << "> <" << kCategory << "> <" << kLevel
       << "> ippInit warning: " << primitives::StatusText(status) << std::endl;
  zovcore::debug::Trace(line.str());
} catch (...) {
  // A line that cannot be traced is no reason not to start.
}

}  // namespace vexel
