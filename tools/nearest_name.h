// Suggestions for mistyped names.
#pragma once

#include <string>
#include <vector>

namespace tool {

// Whether two names differ in case at most.
bool SameName(const std::string& a, const std::string& b);

// The few of `names` that are nearest to `name`, ignoring case, best first ("a, b, c"): those of which it is a part,
// then by edit distance.
std::string NearestNames(const std::string& name, const std::vector<std::string>& names);

}  // namespace tool
