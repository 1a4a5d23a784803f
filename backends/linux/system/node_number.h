// The numbers in the names of device nodes.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace quazor {

// The 7 of "video7", if `kind` is "video"; nothing for names of another form.
std::optional<std::uint32_t> nodeNumber(std::string_view name, std::string_view kind);

}  // namespace quazor
