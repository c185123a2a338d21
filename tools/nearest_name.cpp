#include "nearest_name.h"

#include <algorithm>
#include <cctype>
#include <numeric>

namespace tool {
namespace {

char Lower(char c) { return static_cast<char>(std::tolower(static_cast<unsigned char>(c))); }

// A part of a name stands for it.
bool Contains(const std::string& name, const std::string& part) {
  return std::search(name.begin(), name.end(), part.begin(), part.end(),
                     [](char x, char y) { return Lower(x) == Lower(y); }) != name.end();
}

// The number of insertions, deletions and replacements that turn one text into the other, ignoring case.
int EditDistance(const std::string& a, const std::string& b) {
  std::vector<int> row(b.size() + 1);
  std::iota(row.begin(), row.end(), 0);
  for (size_t i = 0; i < a.size(); ++i) {
    int diagonal = row[0];
    row[0] = static_cast<int>(i) + 1;
    for (size_t j = 0; j < b.size(); ++j) {
      const int replaced = diagonal + (Lower(a[i]) == Lower(b[j]) ? 0 : 1);
      diagonal = row[j + 1];
      row[j + 1] = std::min({replaced, row[j] + 1, diagonal + 1});
    }
  }
  return row.back();
}

}  // namespace

bool SameName(const std::string& a, const std::string& b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](char x, char y) { return Lower(x) == Lower(y); });
}

std::string DidYouMean(const std::string& name, const std::vector<std::string>& names) {
  std::vector<std::pair<int, std::string>> ranked;
  for (const std::string& candidate : names)
    ranked.emplace_back(Contains(candidate, name) ? 0 : EditDistance(name, candidate), candidate);
  std::stable_sort(ranked.begin(), ranked.end(), [](auto& a, auto& b) { return a.first < b.first; });
  if (name.empty() || 2 * static_cast<size_t>(ranked.at(0).first) > name.size()) return {};
  std::string text = "; did you mean " + ranked[0].second;
  for (size_t i = 1; i < std::min<size_t>(3, ranked.size()) && ranked[i].first <= ranked[0].first + 1; ++i)
    text += ", " + ranked[i].second;
  return text + "?";
}

}  // namespace tool
