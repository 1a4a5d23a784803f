// refused with: theFormatHasMorePlaceholdersThanArguments
#include "contract/message_format.h"

#ifdef CORRECTED
const std::string message = quazor::formatMessage("lamp %d of %d", 1, 2);
#else
const std::string message = quazor::formatMessage("lamp %d of %d", 1);
#endif
