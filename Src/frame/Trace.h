// Lines for the host's trace.
#pragma once

#include <atomic>
#include <cstdint>
#include <string_view>

namespace vexel {

// A place that traces; one static object each. It remembers the host's answer until the host says that answers may have
// changed. Thread-safe; nothing is thrown.
class TraceSite {
 public:
  constexpr TraceSite(const char* category, int level) noexcept : mCategory(category), mLevel(level) {}

  bool Enabled() noexcept;
  // One line: "<thread> <category> <level> " in angle brackets each, then the text. Ask Enabled first.
  void Line(std::string_view text) const noexcept;

 private:
  const char* mCategory;
  int mLevel;
  // The change count of the last answer in the upper bits, the answer in bit 0; -1 before the first.
  std::atomic<int64_t> mAnswer{-1};
};

}  // namespace vexel
