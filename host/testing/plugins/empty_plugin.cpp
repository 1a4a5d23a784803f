// A plug-in for tests of the host: it registers nothing.
#include "contract/lab.h"

namespace {

[[gnu::constructor, gnu::used]] void registerNothing() { static_cast<void>(quazor::QZLab::defaultLab()); }

}  // namespace
