// Independent pieces of work on a few threads.
#pragma once

#include <functional>

namespace tool {

// Calls work(0) to work(count - 1), each once, on up to `threads` threads, the calling one included. The first
// exception of a piece is thrown again after all threads have ended.
void ForEach(int count, int threads, const std::function<void(int)>& work);

}  // namespace tool
