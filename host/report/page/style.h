// The style sheet of a page.
#pragma once

#include <string_view>

namespace quazor {

// For light and dark screens, narrow ones and paper. Nothing in it is taken from elsewhere.
std::string_view pageStyle();

}  // namespace quazor
