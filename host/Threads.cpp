#include "zovcore/Threads.h"

#include <algorithm>
#include <atomic>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include <oneapi/tbb/global_control.h>
#include <oneapi/tbb/parallel_for.h>
#include <oneapi/tbb/partitioner.h>
#include <oneapi/tbb/task_arena.h>
#include <oneapi/tbb/task_group.h>

#include "Sanitizers.h"
#include "System.h"
#include "vexel_host/host.h"

namespace zovcore::threads {
namespace {

// A limited number of threads; `raised` lets oneTBB make more threads than there are processors.
struct Crew {
  explicit Crew(int threads) : limit(threads), arena(threads) {
    if (static_cast<unsigned>(threads) > std::thread::hardware_concurrency())
      raised = std::make_unique<tbb::global_control>(tbb::global_control::max_allowed_parallelism, threads);
  }
  const int limit;
  std::unique_ptr<tbb::global_control> raised;
  tbb::task_arena arena;
};

struct State {
  std::mutex mutex;
  boost::shared_ptr<AsyncExecutor> own;  // set by the program; null: oneTBB
  std::shared_ptr<Crew> crew;            // null: no limit
  std::shared_ptr<Crew> CurrentCrew() {
    const std::lock_guard lock(mutex);
    return crew;
  }
};

State& GetState() {
  static auto& state = *new State;
  return state;
}

void RunInOrder(const boost::function<void(int)>& function, int count) {
  for (int i = 0; i < count; ++i) function(i);
}

#if defined(VX_HOST_TSAN)
// oneTBB is not instrumented: ThreadSanitizer would not see how it hands pieces over and back. Plain threads do the
// work.
void RunParallel(const boost::function<void(int)>& function, int count, Crew* crew) {
  std::atomic<int> next{0};
  const auto work = [&] {
    for (int i; (i = next.fetch_add(1)) < count;) function(i);
  };
  std::vector<std::thread> others;
  for (int i = 1; i < std::min(crew ? crew->limit : 4, count); ++i) others.emplace_back(work);
  work();
  for (std::thread& other : others) other.join();
}
#else
// Bands differ in cost, so each piece is handed out alone. Isolated: a thread that waits for its own pieces must not
// pick up pieces of an unrelated call, whose stack and thread-local state would pile up on its own. The pieces run in
// the caller's floating-point mode; otherwise it would be that of the thread's first call of oneTBB, whenever that was.
void RunParallel(const boost::function<void(int)>& function, int count, Crew* crew) {
  tbb::task_group_context context;
  context.capture_fp_settings();
  const auto run = [&] {
    tbb::this_task_arena::isolate([&] {
      tbb::parallel_for(
          tbb::blocked_range<int>(0, count, 1),
          [&function](const tbb::blocked_range<int>& range) {
            for (int i = range.begin(); i != range.end(); ++i) function(i);
          },
          tbb::simple_partitioner(), context);
    });
  };
  // Without a limit the caller's own arena serves, and with it whatever limit the program has set there.
  if (crew)
    crew->arena.execute(run);
  else
    run();
}
#endif

class TbbExecutor final : public AsyncExecutor {
 public:
  void RunPieces(const boost::function<void(int)>& function, int count) override {
    const std::shared_ptr<Crew> crew = GetState().CurrentCrew();
    if (count <= 1 || (crew && crew->limit == 1))
      RunInOrder(function, count);
    else
      RunParallel(function, count, crew.get());
  }
};

const boost::shared_ptr<AsyncExecutor>& SharedTbbExecutor() {
  static const auto& executor = *new boost::shared_ptr<AsyncExecutor>(new TbbExecutor);
  return executor;
}

}  // namespace

AsyncExecutor::~AsyncExecutor() = default;

boost::shared_ptr<AsyncExecutor> CreateCPUBoundExecutor() {
  State& state = GetState();
  const std::lock_guard lock(state.mutex);
  return state.own ? state.own : SharedTbbExecutor();
}

void ExecuteCPUBoundTaskOnAllProcessors(const boost::function<void(int)>& function, int count) {
  if (count > 0) CreateCPUBoundExecutor()->RunPieces(function, count);
}

uint64_t GetCurrentThreadID() { return vexel_host::system::CurrentThread(); }

}  // namespace zovcore::threads

namespace vexel_host {

void SetExecutor(boost::shared_ptr<zovcore::threads::AsyncExecutor> executor) {
  auto& state = zovcore::threads::GetState();
  const std::lock_guard lock(state.mutex);
  state.own.swap(executor);
}

void SetThreadLimit(int threads) {
  auto& state = zovcore::threads::GetState();
  auto crew = threads > 0 ? std::make_shared<zovcore::threads::Crew>(threads) : nullptr;
  const std::lock_guard lock(state.mutex);
  state.crew.swap(crew);
}

int ThreadLimit() {
  const auto crew = zovcore::threads::GetState().CurrentCrew();
  return crew ? crew->limit : 0;
}

}  // namespace vexel_host
