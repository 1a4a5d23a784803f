// quazor: runs hardware diagnostics from the command line.
#include "host/cli/installation.h"
#include "host/command/commands.h"
#include "host/error/exit_code.h"
#include "host/system/capabilities.h"
#include "host/system/standard_descriptors.h"
#include "host/system/write_signals.h"

#include <langinfo.h>
#include <locale.h>
#include <unistd.h>

#include <cstdlib>
#include <exception>
#include <iostream>
#include <string>
#include <string_view>
#include <vector>

namespace {

// Colour requires a terminal that supports it, and a user who has not disabled it (https://no-color.org).
bool wantsColour() {
  const char* const noColour = std::getenv("NO_COLOR");
  if (noColour != nullptr && *noColour != '\0') return false;
  const char* const terminal = std::getenv("TERM");
  return isatty(STDOUT_FILENO) == 1 && terminal != nullptr && std::string_view(terminal) != "dumb";
}

// True if the locale of the environment uses UTF-8. Does not change the program's own locale.
bool writesUtf8() {
  const locale_t locale = newlocale(LC_CTYPE_MASK, "", nullptr);
  if (locale == nullptr) return false;  // that locale is not installed
  const bool utf8 = std::string_view(nl_langinfo_l(CODESET, locale)) == "UTF-8";
  freelocale(locale);
  return utf8;
}

}  // namespace

int main(int argc, char** argv) {
  try {
    quazor::dropCapabilities();
    quazor::openStandardDescriptors();
    quazor::failWritesWithoutSignals();
    quazor::Console console{std::cout, std::cerr, wantsColour(), isatty(STDERR_FILENO) == 1, writesUtf8()};
    const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
    return static_cast<int>(quazor::runProgram(arguments, quazor::Installation::ofThisProgram(), console));
  } catch (const std::exception& exception) {
    std::cerr << "quazor: internal error: " << exception.what() << '\n';
  } catch (...) {
    std::cerr << "quazor: internal error\n";
  }
  return static_cast<int>(quazor::ExitCode::kInternal);
}
