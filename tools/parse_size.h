// Numbers and sizes of the command line.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace tool {

// Reads a whole decimal number; throws ToolError with `message` otherwise.
int64_t ParseNumber(std::string_view text, const std::string& message);

// Reads WIDTHxHEIGHT, both at least 1; throws ToolError otherwise.
std::pair<int, int> ParseSize(const std::string& text);

}  // namespace tool
