// A plug-in whose diagnostics misbehave when they are described.
#include "tests/misbehaving/misbehaviour.h"

#include <cstdlib>
#include <stdexcept>

namespace quazor::misbehaving {

namespace {

// True from the moment that "First" is described: a host that describes everything comes to it before the others.
bool firstIsDescribed = false;

[[gnu::constructor]] void registerAll() {
  addDiagnostic("First", {.inDescription = [] { firstIsDescribed = true; }});
  addDiagnostic("CrashWhenRunIsDescribed", {.inDescription = [] {
                  if (!firstIsDescribed) crash();
                }});
  addDiagnostic("CrashWhenDescribed", {.inDescription = crash});
  addDiagnostic("ExitWhenDescribed", {.inDescription = [] { std::exit(0); }});
  addDiagnostic("ThrowWhenDescribed", {.inDescription = [] { throw std::runtime_error("the lamp is out"); }});
}

}  // namespace

}  // namespace quazor::misbehaving
