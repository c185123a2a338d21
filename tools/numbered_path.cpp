#include "numbered_path.h"

#include <algorithm>
#include <charconv>
#include <filesystem>
#include <string_view>
#include <system_error>

namespace tool {

std::string NumberedPath::At(int64_t number) const {
  std::string digits = std::to_string(number);
  if (const size_t least = static_cast<size_t>(columns); digits.size() < least)
    digits.insert(0, least - digits.size(), filler);
  return before + digits + after;
}

std::optional<int64_t> NumberedPath::FirstThere() const {
  namespace fs = std::filesystem;
  const fs::path start(before);
  const std::string prefix = start.filename().string();
  std::optional<int64_t> first;
  std::error_code error;
  for (const fs::directory_entry& entry :
       fs::directory_iterator(start.has_parent_path() ? start.parent_path() : fs::path("."), error)) {
    const std::string name = entry.path().filename().string();
    if (!name.starts_with(prefix) || !name.ends_with(after)) continue;
    int64_t number = 0;
    std::from_chars(name.data() + std::min(name.find_first_not_of(' ', prefix.size()), name.size()),
                    name.data() + name.size(), number);
    if (number >= 0 && name == At(number).substr(before.size() - prefix.size()) && !entry.is_directory(error))
      first = std::min(first.value_or(number), number);
  }
  return first;
}

std::optional<NumberedPath> ParseNumberedPath(const std::string& path) {
  const size_t percent = path.find('%'), d = path.find_first_not_of("0123456789", percent + 1);
  if (percent == std::string::npos || d == std::string::npos || path[d] != 'd' || d - percent > 3) return std::nullopt;
  NumberedPath parts{path.substr(0, percent), path.substr(d + 1), 0, path[percent + 1] == '0' ? '0' : ' '};
  std::from_chars(&path[percent + 1], &path[d], parts.columns);
  return parts;
}

}  // namespace tool
