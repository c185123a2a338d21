// Options that every command that computes has: --threads and --isa.
#pragma once

#include <CLI/CLI.hpp>

#include <string>

namespace tool {

struct RunOptions {
  int threads = 0;  // 0 = one per processor
  std::string isa;  // empty = the best the processor has

  void AddTo(CLI::App& command, const std::string& threadsUnlessSaid = "one per processor");
  // Limits the library's threads and kernels. Throws ToolError when the processor cannot run what was asked for.
  void Apply() const;
  int ThreadCount() const;
};

}  // namespace tool
