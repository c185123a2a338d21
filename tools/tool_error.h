// The one error the commands throw: a sentence for the user. main() prints it and exits with status 1.
#pragma once

#include <stdexcept>
#include <string>

#include "vexel/vexel.h"

namespace tool {

class ToolError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// A result for the user: "VX_ErrFormatNotHandled (-1000)".
inline std::string ResultText(VX_Result result) {
  return std::string(VX_ResultName(result)) + " (" + std::to_string(result) + ")";
}

// Throws ToolError, "WHAT: RESULT" and what it means here, unless the library did it.
inline void CheckResult(VX_Result result, const std::string& what, const std::string& meaning = {}) {
  if (result != VX_Success) throw ToolError(what + ": " + ResultText(result) + meaning);
}

}  // namespace tool
