#include "parse_size.h"

#include <charconv>

#include "tool_error.h"

namespace tool {

int64_t ParseNumber(std::string_view text, const std::string& message) {
  int64_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size() || value < 0) throw ToolError(message);
  return value;
}

std::pair<int, int> ParseSize(const std::string& text) {
  const std::string message = "\"" + text + "\" is not a size; write WIDTHxHEIGHT, for instance 1920x1080";
  const size_t x = text.find('x');
  if (x == std::string::npos) throw ToolError(message);
  const int64_t width = ParseNumber(std::string_view(text).substr(0, x), message);
  const int64_t height = ParseNumber(std::string_view(text).substr(x + 1), message);
  if (width < 1 || height < 1 || width > INT32_MAX || height > INT32_MAX) throw ToolError(message);
  return {static_cast<int>(width), static_cast<int>(height)};
}

}  // namespace tool
