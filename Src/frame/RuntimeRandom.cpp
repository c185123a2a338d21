#include "frame/RuntimeRandom.h"

namespace vexel {
namespace {

thread_local RandomSequence tSequence(1);

}  // namespace

RandomSequence& RuntimeRandomSequence() noexcept { return tSequence; }

}  // namespace vexel
