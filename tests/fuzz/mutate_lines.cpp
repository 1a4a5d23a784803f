// Hooks of the fuzzers that take lines of JSON.
#include "tests/fuzz/fuzzing.h"
#include "tests/fuzz/json_mutation.h"

#include <cstring>
#include <string>

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t maxSize);

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size, std::size_t maxSize,
                                               unsigned seed) {
  static quazor::JsonMutation mutation(LLVMFuzzerMutate);
  mutation.seed(seed);
  if (size == 0 || mutation.chance(5)) return LLVMFuzzerMutate(data, size, maxSize);
  const std::string text = quazor::mutatedLines(mutation, quazor::asText(data, size));
  if (text.size() > maxSize) return LLVMFuzzerMutate(data, size, maxSize);
  std::memcpy(data, text.data(), text.size());
  return text.size();
}
