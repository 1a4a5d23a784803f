// refused with: deleted
#include "contract/value.h"

#ifdef CORRECTED
const std::optional<quazor::Value> value;
#else
const quazor::Value value = nullptr;
#endif
