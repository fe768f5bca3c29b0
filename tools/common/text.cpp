#include "tools/common/text.h"

#include <strings.h>

#include <algorithm>
#include <utility>

namespace {

constexpr size_t kNearestCount = 3;

// Insertions, deletions, replacements and swaps of neighbours: "htpt" is one mistake away from
// "http".
size_t EditDistance(std::string_view a, std::string_view b) {
  std::vector<std::vector<size_t>> cost(a.size() + 1, std::vector<size_t>(b.size() + 1));
  for (size_t i = 0; i <= a.size(); ++i) {
    for (size_t j = 0; j <= b.size(); ++j) {
      if (i == 0 || j == 0) {
        cost[i][j] = i + j;
        continue;
      }
      const size_t replaced = cost[i - 1][j - 1] + (a[i - 1] == b[j - 1] ? 0 : 1);
      cost[i][j] = std::min({cost[i - 1][j] + 1, cost[i][j - 1] + 1, replaced});
      if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1]) {
        cost[i][j] = std::min(cost[i][j], cost[i - 2][j - 2] + 1);
      }
    }
  }
  return cost[a.size()][b.size()];
}

}  // namespace

std::string LowerCase(std::string_view text) {
  std::string result(text);
  for (char& letter : result) {
    if (letter >= 'A' && letter <= 'Z') letter = static_cast<char>(letter - 'A' + 'a');
  }
  return result;
}

bool EqualsIgnoringCase(std::string_view left, std::string_view right) {
  return left.size() == right.size() && strncasecmp(left.data(), right.data(), left.size()) == 0;
}

std::string DidYouMean(std::string_view text, const std::vector<std::string>& names) {
  const std::string typed = LowerCase(text.substr(0, 64));  // nothing longer is near a name
  std::vector<std::pair<size_t, std::string>> ranked;
  for (const std::string& name : names) {
    const size_t distance = EditDistance(typed, name);
    if (distance * 2 <= std::max(typed.size(), name.size())) ranked.emplace_back(distance, name);
  }
  std::stable_sort(ranked.begin(), ranked.end(),
                   [](const auto& a, const auto& b) { return a.first < b.first; });
  std::string nearest;
  for (size_t i = 0; i < ranked.size() && i < kNearestCount; ++i) {
    // Beside a name that is one letter away, one that is three away is not what was meant.
    if (ranked[i].first > ranked.front().first + 1) break;
    nearest += (i == 0 ? "did you mean " : ", ") + ranked[i].second;
  }
  return nearest.empty() ? "" : nearest + "?";
}
