// refused with: theFormatHasMorePlaceholdersThanArguments
#include "contract/diagnostic_error.h"

void refuse(quazor::DiagnosticErrorPtr* error) {
#ifdef CORRECTED
  quazor::fail(error, quazor::QZErrorDomain, 5, nullptr, "no lamp %@", "front");
#else
  quazor::fail(error, quazor::QZErrorDomain, 5, nullptr, "no lamp %@");
#endif
}
