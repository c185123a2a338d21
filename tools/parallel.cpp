#include "parallel.h"

#include <algorithm>
#include <atomic>
#include <exception>
#include <mutex>
#include <thread>
#include <vector>

namespace tool {

void ForEach(int count, int threads, const std::function<void(int)>& work) {
  std::atomic<int> next = 0;
  std::exception_ptr error;
  std::mutex errorMutex;
  const auto run = [&] {
    for (int i; (i = next.fetch_add(1)) < count;) {
      try {
        work(i);
      } catch (...) {
        const std::lock_guard lock(errorMutex);
        if (!error) error = std::current_exception();
        next = count;
      }
    }
  };
  {
    std::vector<std::jthread> helpers;
    for (int i = 1; i < std::min(threads, count); ++i) helpers.emplace_back(run);
    run();
  }
  if (error) std::rethrow_exception(error);
}

}  // namespace tool
