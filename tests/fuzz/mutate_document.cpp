// Hooks of the fuzzers that take one JSON document.
#include "tests/fuzz/fuzzing.h"
#include "tests/fuzz/json_mutation.h"

#include <cstring>
#include <string>

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t maxSize);

namespace {

quazor::JsonMutation& mutation(unsigned seed) {
  static quazor::JsonMutation one(LLVMFuzzerMutate);
  one.seed(seed);
  return one;
}

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size, std::size_t maxSize,
                                               unsigned seed) {
  quazor::JsonMutation& json = mutation(seed);
  auto document = quazor::JsonMutation::parsed(quazor::asText(data, size));
  if (!document || json.chance(5)) return LLVMFuzzerMutate(data, size, maxSize);
  json.mutate(*document);
  const std::string text = quazor::JsonMutation::textOf(*document);
  if (text.size() > maxSize) return LLVMFuzzerMutate(data, size, maxSize);
  std::memcpy(data, text.data(), text.size());
  return text.size();
}

extern "C" std::size_t LLVMFuzzerCustomCrossOver(const std::uint8_t* one, std::size_t oneSize,
                                                 const std::uint8_t* other, std::size_t otherSize, std::uint8_t* out,
                                                 std::size_t maxSize, unsigned seed) {
  auto document = quazor::JsonMutation::parsed(quazor::asText(one, oneSize));
  const auto source = quazor::JsonMutation::parsed(quazor::asText(other, otherSize));
  if (!document || !source) return 0;
  mutation(seed).cross(*document, *source);
  const std::string text = quazor::JsonMutation::textOf(*document);
  if (text.size() > maxSize) return 0;
  std::memcpy(out, text.data(), text.size());
  return text.size();
}
