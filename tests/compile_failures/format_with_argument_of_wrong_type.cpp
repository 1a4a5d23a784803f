// refused with: anArgumentDoesNotFitItsPlaceholder
#include "contract/message_format.h"

#ifdef CORRECTED
const std::string message = quazor::formatMessage("lamp %lu", 1U);
#else
const std::string message = quazor::formatMessage("lamp %lu", "one");
#endif
