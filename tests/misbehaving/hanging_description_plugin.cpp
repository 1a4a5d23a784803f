// A plug-in whose diagnostic never ends its description. It is alone, as hosts describe all that a plug-in has.
#include "tests/misbehaving/misbehaviour.h"

namespace quazor::misbehaving {

namespace {

[[gnu::constructor]] void registerAll() { addDiagnostic("HangWhenDescribed", {.inDescription = sleepForEver}); }

}  // namespace

}  // namespace quazor::misbehaving
