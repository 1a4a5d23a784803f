// refused with: int ?\*.*Value|Value.*int ?\*
#include "contract/value.h"

int number = 1;
#ifdef CORRECTED
const quazor::Value value = number;
#else
const quazor::Value value = &number;
#endif
