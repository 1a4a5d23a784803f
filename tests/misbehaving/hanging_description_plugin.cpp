// A plug-in whose diagnostic never returns its description.
#include "tests/misbehaving/misbehaviour.h"

namespace quazor::misbehaving {

namespace {

[[gnu::constructor]] void registerAll() { addDiagnostic("HangWhenDescribed", {.inDescription = sleepForEver}); }

}  // namespace

}  // namespace quazor::misbehaving
