// Environment variables in tests.
#pragma once

#include <stdlib.h>

#include <optional>
#include <string>

namespace quazor {

// Sets the variable, or unsets it if the value is null, and restores it at the end of its lifetime.
class EnvironmentVariable {
 public:
  EnvironmentVariable(std::string name, const char* value) : name_(std::move(name)) {
    if (const char* const before = ::getenv(name_.c_str())) before_ = before;
    set(value);
  }
  EnvironmentVariable(const EnvironmentVariable&) = delete;
  EnvironmentVariable& operator=(const EnvironmentVariable&) = delete;
  ~EnvironmentVariable() { set(before_ ? before_->c_str() : nullptr); }

 private:
  void set(const char* value) {
    if (value == nullptr) {
      ::unsetenv(name_.c_str());
    } else {
      ::setenv(name_.c_str(), value, 1);
    }
  }

  const std::string name_;
  std::optional<std::string> before_;
};

}  // namespace quazor
