#include "frame/Trace.h"

#include <sstream>

#include "zovcore/Debug.h"
#include "zovcore/Threads.h"

namespace vexel {

bool TraceSite::Enabled() noexcept try {
  const int64_t changes = static_cast<uint32_t>(zovcore::debug::TraceChangeCount());
  int64_t answer = mAnswer.load(std::memory_order_relaxed);
  if (answer < 0 || answer >> 1 != changes) {
    answer = changes << 1 | (zovcore::debug::TraceEnabled(mCategory, mLevel, true) ? 1 : 0);
    mAnswer.store(answer, std::memory_order_relaxed);
  }
  return (answer & 1) != 0;
} catch (...) {
  return false;
}

void TraceSite::Line(std::string_view text) const noexcept try {
  std::ostringstream line;
  line << "<" << zovcore::threads::GetCurrentThreadID() << "> <" << mCategory << "> <" << mLevel << "> " << text
       << "\n";
  zovcore::debug::Trace(line.str());
} catch (...) {
  // a line that cannot be built is a line lost
}

}  // namespace vexel
