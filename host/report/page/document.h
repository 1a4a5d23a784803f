// The frame of a page. All arguments but the kind are HTML.
#pragma once

#include "host/model/run_event.h"

#include <string>

namespace quazor {

// The whole file, with the policy and the style.
std::string document(const std::string& title, const std::string& body);

// The head of the page: what counts, before everything else. The kind, "pass", "fail", "error" or "skip", is its
// colour. `device`, which may be empty, stands beside the word.
std::string bannerOf(const std::string& kind, const std::string& word, const std::string& device,
                     const std::string& sentence, const std::string& facts);

std::string footerOf(const RunStarted& run);

}  // namespace quazor
