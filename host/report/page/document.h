// The frame of a page. All arguments but the kind and the library are HTML.
#pragma once

#include "host/model/run_event.h"
#include "host/report/page/plot_library.h"

#include <string>

namespace quazor {

// The whole file, with the policy and the style; with a library, also with it and the script that draws with it.
std::string document(const std::string& title, const std::string& body, const PlotLibrary* library = nullptr);

// The head of the page: what counts, before everything else. The kind, "pass", "fail", "error" or "skip", is its
// colour. `device`, which may be empty, stands beside the word.
std::string bannerOf(const std::string& kind, const std::string& word, const std::string& device,
                     const std::string& sentence, const std::string& facts);

std::string footerOf(const RunStarted& run, const PlotLibrary* library = nullptr);

}  // namespace quazor
