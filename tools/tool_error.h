// The one error the commands throw: a sentence for the user. main() prints it and exits with status 1.
#pragma once

#include <stdexcept>

namespace tool {

class ToolError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace tool
