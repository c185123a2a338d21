// Building resample kernels, in ns per table.
#include <string>

#include "support/Bench.h"
#include "vexel/resample_kernel.h"

void RegisterBenchmarks() {
  using vexel::bench::BenchCase;
  for (int32_t type = 1; type <= 7; ++type)
    BenchCase("resample kernel, up, type " + std::to_string(type), 1).Add("vexel", [=] {
      VX::ResampleKernel kernel(type);
      kernel.ScaleForUpSample(2);
    });
  for (const float scale : {1.0f, 0.9f, 0.5f, 0.25f})
    BenchCase("resample kernel, down to " + std::to_string(scale), 1).Add("vexel", [=] {
      VX::ResampleKernel kernel(VX::ResampleKernel::kCubicSharp);
      kernel.ScaleForDownSample(scale, scale);
    });
}
