#include "base/text/name_list.h"

#include <algorithm>

namespace quazor {

std::string listText(const std::vector<std::string>& names, std::size_t most) {
  const std::size_t listed = std::min(names.size(), most);
  std::string text;
  for (std::size_t i = 0; i < listed; ++i) text += (i == 0 ? "" : ", ") + names[i];
  if (names.size() > listed) text += " and " + std::to_string(names.size() - listed) + " more";
  return text;
}

}  // namespace quazor
