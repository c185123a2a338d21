// Runs all tests with the kernels limited to one variant: --variant=plain, ssse3, sse4.1, avx2 or avx512.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <string_view>

#include "frame/KernelVariant.h"
#include "vexel/vexel.h"

using namespace vexel;

int main(int argc, char** argv) {
  testing::InitGoogleMock(&argc, argv);
  std::string_view name;
  for (int i = 1; i < argc; ++i) {
    const std::string_view argument = argv[i];
    constexpr std::string_view kVariant = "--variant=";
    if (argument.substr(0, kVariant.size()) != kVariant) {
      std::fprintf(stderr, "vexel_tests: unknown argument %s\n", argv[i]);
      return 2;
    }
    name = argument.substr(kVariant.size());
  }
  VX_Initialize();
  int variant = 0;
  while (variant < kKernelVariantCount && name != KernelVariantName(static_cast<KernelVariant>(variant))) ++variant;
  if (variant < kKernelVariantCount) {
    if (static_cast<KernelVariant>(variant) > ProcessorVariant()) {
      std::printf("SKIPPED: this processor has no %s; its best is %s\n", name.data(),
                  KernelVariantName(ProcessorVariant()));
      VX_Terminate();
      return 0;
    }
    LimitKernelVariant(static_cast<KernelVariant>(variant));
  } else if (!name.empty()) {
    std::fprintf(stderr, "vexel_tests: unknown variant %s\n", name.data());
    return 2;
  }
  const int failed = RUN_ALL_TESTS();
  VX_Terminate();
  return failed;
}
