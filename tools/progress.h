// A progress bar on standard error, drawn only where that is a terminal.
#pragma once

#include <cstdint>

namespace tool {

class Progress {
 public:
  // `total` 0 if unknown.
  explicit Progress(int64_t total);
  ~Progress();
  void Show(int64_t done);

 private:
  int64_t mTotal;
  bool mTerminal;
  bool mDrawn = false;
};

}  // namespace tool
