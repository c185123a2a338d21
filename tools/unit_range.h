// Numbers on the command line that may be 0 to 1.
#pragma once

#include <CLI/CLI.hpp>

#include <string>

namespace tool {

// CLI::Range lets NaN through, which is neither below nor above anything.
inline CLI::Validator FromZeroToOne() {
  return CLI::Validator(
      [](std::string& text) {
        float value = 0;
        return CLI::detail::lexical_cast(text, value) && value >= 0 && value <= 1
                   ? std::string()
                   : "\"" + text + "\" is not a number from 0 to 1";
      },
      "0..1");
}

}  // namespace tool
