// quazor: runs hardware diagnostics from the command line.
#include "host/cli/installation.h"
#include "host/command/commands.h"
#include "host/error/exit_code.h"
#include "host/system/capabilities.h"
#include "host/system/standard_descriptors.h"
#include "host/system/write_signals.h"
#include "host/text/terminal.h"

#include <langinfo.h>
#include <locale.h>
#include <poll.h>
#include <unistd.h>

#include <cstdlib>
#include <exception>
#include <iostream>
#include <optional>
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

// True if standard error is ready for as much as a pipe takes at once.
bool errTakesText() {
  pollfd error{STDERR_FILENO, POLLOUT, 0};
  return poll(&error, 1, 0) == 1 && (error.revents & POLLOUT) != 0;
}

}  // namespace

int main(int argc, char** argv) {
  try {
    quazor::dropCapabilities();
    quazor::openStandardDescriptors();
    quazor::failWritesWithoutSignals();
    const bool utf8 = writesUtf8();
    std::optional<quazor::TerminalStream> terminalOut;
    std::optional<quazor::TerminalStream> terminalErr;
    if (isatty(STDOUT_FILENO) == 1) terminalOut.emplace(std::cout.rdbuf(), STDOUT_FILENO, utf8);
    if (isatty(STDERR_FILENO) == 1) terminalErr.emplace(std::cerr.rdbuf(), STDERR_FILENO, utf8);
    std::ostream& out = terminalOut ? *terminalOut : std::cout;
    std::ostream& err = terminalErr ? *terminalErr : std::cerr;
    err.tie(&out);
    quazor::Console console{out, err, wantsColour(), terminalErr.has_value(), utf8, errTakesText};
    const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
    return static_cast<int>(quazor::runProgram(arguments, quazor::Installation::ofThisProgram(), console));
  } catch (const std::exception& exception) {
    std::cerr << "quazor: internal error: " << exception.what() << '\n';
  } catch (...) {
    std::cerr << "quazor: internal error\n";
  }
  return static_cast<int>(quazor::ExitCode::kInternal);
}
