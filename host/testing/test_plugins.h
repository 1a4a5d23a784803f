// The plug-ins of host/testing/plugins/ in tests.
#pragma once

#include <filesystem>
#include <string>

namespace quazor {

inline std::filesystem::path testPlugin(const std::string& name) {
  return std::filesystem::path(QUAZOR_TEST_PLUGINS) / (name + "_plugin.so");
}

}  // namespace quazor
