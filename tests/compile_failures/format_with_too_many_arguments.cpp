// refused with: theFormatHasFewerPlaceholdersThanArguments
#include "contract/message_format.h"

#ifdef CORRECTED
const std::string message = quazor::formatMessage("lamp %d", 1);
#else
const std::string message = quazor::formatMessage("lamp %d", 1, 2);
#endif
