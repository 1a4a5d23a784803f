// refused with: constant expression
#include "contract/message_format.h"

std::string message(const char* text) {
#ifdef CORRECTED
  return quazor::formatMessage("%@", text);
#else
  return quazor::formatMessage(text);
#endif
}
