// Keeps plug-ins from rights that their user does not have.
#pragma once

namespace quazor {

// Empties the permitted, effective, inheritable and ambient capabilities of this process (capabilities(7)), and so
// those of its children, unless its user is root. The program may have got them from its file or from the program that
// started it; no plug-in may. To be called before other threads exist.
//
// Throws std::system_error if the system refuses.
void dropCapabilities();

}  // namespace quazor
