// What tells a run and a machine from others.
#pragma once

#include <string>

namespace quazor {

// 128 random bits as 32 lowercase hexadecimal digits. Throws std::system_error if the system has no random numbers.
std::string randomIdentifier();

// The host name of this machine; empty if it has none.
std::string nameOfThisMachine();

}  // namespace quazor
