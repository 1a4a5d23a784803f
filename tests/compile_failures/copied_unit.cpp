// refused with: deleted
#include "contract/unit.h"

#ifdef CORRECTED
const quazor::QZUnit& unit = quazor::QZDimensionlessUnit::frames();
#else
const quazor::QZUnit unit = quazor::QZDimensionlessUnit::frames();
#endif
