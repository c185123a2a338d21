// Tells the host's trace about warnings at start-up.
#pragma once

#include "frame/ImagePrimitives.h"

namespace vexel {

// Traces a status above 0; others are passed over.
void TraceInitWarning(primitives::Status status) noexcept;

}  // namespace vexel
