#include "host/report/sample_images.h"

#include <algorithm>

namespace quazor {

bool isSamples(const Value& value) {
  const Array* const elements = value.array();
  return elements != nullptr && !elements->empty() &&
         std::all_of(elements->begin(), elements->end(), [](const Value& element) { return element.isNumber(); });
}

bool isImage(const Value& value) {
  const Dictionary* const entries = value.dictionary();
  return entries != nullptr &&
         std::any_of(entries->begin(), entries->end(), [](const auto& entry) { return isSamples(entry.second); });
}

std::vector<const Dictionary*> imagesIn(const Value& value) {
  if (isImage(value)) return {value.dictionary()};
  const Array* const elements = value.array();
  if (elements == nullptr || !std::all_of(elements->begin(), elements->end(), isImage)) return {};
  std::vector<const Dictionary*> images;
  images.reserve(elements->size());
  for (const Value& element : *elements) images.push_back(element.dictionary());
  return images;
}

}  // namespace quazor
