// refused with: char.*Value|Value.*char
#include "contract/value.h"

#ifdef CORRECTED
const quazor::Value value = "a";
#else
const quazor::Value value = 'a';
#endif
