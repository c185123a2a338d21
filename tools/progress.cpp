#include "progress.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <string>

namespace tool {

Progress::Progress(int64_t total) : mTotal(total), mTerminal(isatty(STDERR_FILENO)) {}

// Leaves a clean line to whatever is printed next.
Progress::~Progress() {
  if (mDrawn) std::fputs("\r\033[K", stderr);
}

void Progress::Show(int64_t done) {
  if (!mTerminal) return;
  mDrawn = true;
  if (mTotal > 0) {
    constexpr int kColumns = 40;
    const int filled = static_cast<int>(std::min<int64_t>(done, mTotal) * kColumns / mTotal);
    std::fprintf(stderr, "\r\033[K[%s%s] %lld/%lld", std::string(static_cast<size_t>(filled), '=').c_str(),
                 std::string(static_cast<size_t>(kColumns - filled), ' ').c_str(), static_cast<long long>(done),
                 static_cast<long long>(mTotal));
  } else {
    std::fprintf(stderr, "\r\033[K%lld frames", static_cast<long long>(done));
  }
  std::fflush(stderr);
}

}  // namespace tool
