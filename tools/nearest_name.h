// Suggestions for mistyped names.
#pragma once

#include <string>
#include <vector>

namespace tool {

// Whether two names differ in case at most.
bool SameName(const std::string& a, const std::string& b);

// "; did you mean a, b?" with the few of `names` that are nearest to `name`, ignoring case, best first: those of which
// it is a part, then by edit distance. Nothing where less than half of `name` is right.
std::string DidYouMean(const std::string& name, const std::vector<std::string>& names);

}  // namespace tool
