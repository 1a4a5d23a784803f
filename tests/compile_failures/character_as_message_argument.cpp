// refused with: MessageArgument
#include "contract/message_format.h"

#ifdef CORRECTED
const std::string message = quazor::formatMessage("%@", "a");
#else
const std::string message = quazor::formatMessage("%@", 'a');
#endif
