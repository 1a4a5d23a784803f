// A plug-in whose diagnostics misbehave when they run.
#include "tests/misbehaving/misbehaviour.h"

namespace quazor::misbehaving {

namespace {

[[gnu::constructor]] void registerAll() {
  addEndings();
  addDescriptors();
  addProcesses();
  addEscapes();
  addResults();
}

}  // namespace

}  // namespace quazor::misbehaving
