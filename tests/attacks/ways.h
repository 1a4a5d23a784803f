// Ways of misbehaving, each with a name.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace quazor::attacks {

struct Way {
  std::string name;
  void (*act)();
};

std::vector<Way> endings();       // that end the process or never return
std::vector<Way> exceptions();    // that throw
std::vector<Way> intrusions();    // that use what belongs to the host
std::vector<Way> disturbances();  // that change the process, and return

// Kills this process by a signal; for ways like "signal11".
void endBySignal(int signal);

// A text that is hard to print, to write or to read back. `kind` is one of those in texts.py.
std::string oddText(std::string_view kind);

// The file for this attack in the folder that the environment names.
std::string stateFile(std::string_view name);

[[noreturn]] void hang();

}  // namespace quazor::attacks
