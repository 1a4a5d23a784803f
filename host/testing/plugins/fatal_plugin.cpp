// A plug-in for tests of the host: loading it ends the process or never returns. The environment variable FATAL_PLUGIN
// selects the behaviour: "hang"; "round", which only changes how numbers are rounded; or "=" and a line that it writes
// to the connection to quazor before it hangs.
#include <unistd.h>

#include <cfenv>
#include <cstdlib>
#include <string>
#include <string_view>

namespace {

[[gnu::constructor]] void endTheProcess() {
  const char* const way = std::getenv("FATAL_PLUGIN");
  if (way == nullptr) std::abort();
  if (std::string_view(way) == "round") {
    std::fesetround(FE_UPWARD);
    return;
  }
  if (*way == '=') {
    const std::string line = std::string(way + 1) + "\n";
    constexpr int kConnection = 250;
    if (::write(kConnection, line.data(), line.size()) < 0) std::abort();
  }
  for (;;) ::pause();
}

}  // namespace
