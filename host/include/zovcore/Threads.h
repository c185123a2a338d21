// The host's executor and its fan-out over the processors.
#pragma once

#include <cstdint>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "zovcore/Export.h"

namespace zovcore::threads {

// Runs work on the host's threads.
class ZOV_API AsyncExecutor {
 public:
  virtual ~AsyncExecutor();
  // Calls function(0) to function(count - 1), each once, in any order and on any threads; returns when all are done.
  // The calling thread may take part. May be called from many threads at once and from inside a piece.
  virtual void RunPieces(const boost::function<void(int)>& function, int count) = 0;
};

// The executor for work that keeps a processor busy: the one that was set with vexel_host::SetExecutor, else one over
// oneTBB. Holding it keeps its threads ready.
ZOV_API boost::shared_ptr<AsyncExecutor> CreateCPUBoundExecutor();

// Runs the pieces on the CPU-bound executor and returns when all are done. An exception of a piece comes out here,
// after which the other pieces may or may not have run.
ZOV_API void ExecuteCPUBoundTaskOnAllProcessors(const boost::function<void(int)>& function, int count);

// The system's number of the calling thread.
ZOV_API uint64_t GetCurrentThreadID();

}  // namespace zovcore::threads
