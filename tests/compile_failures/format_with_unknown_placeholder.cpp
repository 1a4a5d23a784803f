// refused with: theFormatHasAPlaceholderThatIsNotKnown
#include "contract/message_format.h"

#ifdef CORRECTED
const std::string message = quazor::formatMessage("lamp %@", "front");
#else
const std::string message = quazor::formatMessage("lamp %s", "front");
#endif
