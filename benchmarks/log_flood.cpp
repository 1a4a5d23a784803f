// A plug-in whose diagnostic LogFlood logs as many lines as its parameter "count" requests.
#include "tests/misbehaving/misbehaviour.h"

namespace {

[[gnu::constructor]] void registerAll() { quazor::misbehaving::addResults(); }

}  // namespace
