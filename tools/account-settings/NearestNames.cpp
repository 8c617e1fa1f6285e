#include "tools/account-settings/NearestNames.h"

#include <fmt/format.h>

#include <algorithm>
#include <numeric>
#include <utility>

#include "tools/common/Text.h"

namespace tools {
namespace {

// How many letters must be put in, taken out or replaced to make one text of the other, whatever
// the case of the letters.
std::size_t distance(std::string_view a, std::string_view b) {
  const std::string first = upperCased(a);
  const std::string second = upperCased(b);
  std::vector<std::size_t> row(second.size() + 1);
  std::iota(row.begin(), row.end(), 0U);
  for (std::size_t i = 0; i < first.size(); ++i) {
    std::size_t diagonal = std::exchange(row[0], i + 1);
    for (std::size_t j = 0; j < second.size(); ++j) {
      const std::size_t replaced = diagonal + (first[i] == second[j] ? 0 : 1);
      diagonal = row[j + 1];
      row[j + 1] = std::min({replaced, diagonal + 1, row[j] + 1});
    }
  }
  return row.back();
}

bool beginsWith(std::string_view name, std::string_view wanted) {
  return !wanted.empty() && name.size() > wanted.size() &&
         equalsIgnoringCase(name.substr(0, wanted.size()), wanted);
}

}  // namespace

std::string suggestion(std::string_view wanted, const std::vector<std::string>& names) {
  constexpr std::size_t kLongest = 200;  // of a name that is compared letter by letter
  std::vector<std::pair<std::size_t, std::string>> near;
  if (wanted.size() > kLongest) return {};
  for (const std::string& name : names) {
    if (name.empty() || name.size() > kLongest) continue;
    const std::size_t far = beginsWith(name, wanted) ? 1 : distance(wanted, name);
    if (far <= std::max<std::size_t>(1, wanted.size() / 3)) near.emplace_back(far, name);
  }
  if (near.empty()) return {};
  std::sort(near.begin(), near.end());
  near.resize(std::min<std::size_t>(near.size(), 3));
  std::string shown;
  for (const auto& [far, name] : near) shown += (shown.empty() ? "\"" : ", \"") + name + '"';
  return fmt::format(" (did you mean {}?)", shown);
}

}  // namespace tools
