// Names of sequences of pictures, "out_%04d.png": one number, counting frames.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace tool {

// What lies around the number.
struct NumberedPath {
  std::string before, after;
  int columns = 0;  // at least
  char filler = ' ';

  std::string At(int64_t number) const;
  // The least number of a file that is there.
  std::optional<int64_t> FirstThere() const;
};

// Of "%d", "%4d" or "%04d" in a path; nothing where there is no percent sign with a d after digits at most.
std::optional<NumberedPath> ParseNumberedPath(const std::string& path);

}  // namespace tool
