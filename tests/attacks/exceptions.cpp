// Ways that throw.
#include "tests/attacks/ways.h"

#include "contract/diagnostic_error.h"

#include <exception>
#include <filesystem>
#include <future>
#include <new>
#include <stdexcept>
#include <system_error>
#include <typeinfo>
#include <variant>
#include <vector>

namespace quazor::attacks {

namespace {

class Silent : public std::exception {
  const char* what() const noexcept override { return nullptr; }
};

class Derived : public std::exception {
  const char* what() const noexcept override { std::abort(); }
};

class ThrowsAtItsEnd {
 public:
  ThrowsAtItsEnd() = default;
  ThrowsAtItsEnd(const ThrowsAtItsEnd&) = default;
  ThrowsAtItsEnd& operator=(const ThrowsAtItsEnd&) = delete;
  ~ThrowsAtItsEnd() noexcept(false) {
    if (std::uncaught_exceptions() == 0) throw std::runtime_error("at its end");
  }
};

class Twice : public std::runtime_error, public std::logic_error {
 public:
  Twice() : std::runtime_error("one"), std::logic_error("two") {}
};

void throwNested(int depth) {
  try {
    if (depth == 0) throw std::runtime_error("innermost");
    throwNested(depth - 1);
  } catch (...) {
    std::throw_with_nested(std::runtime_error("outer"));
  }
}

void throwWhereNothingMayBe() noexcept {
  std::vector<int> empty;
  static_cast<void>(empty.at(1));
}

}  // namespace

std::vector<Way> exceptions() {
  return {
      {"throwEmpty", [] { throw std::runtime_error(""); }},
      {"throwLong", [] { throw std::runtime_error(std::string(1U << 20U, 'x')); }},
      {"throwBytes", [] { throw std::runtime_error(oddText("bytes")); }},
      {"throwControl", [] { throw std::runtime_error(oddText("control")); }},
      {"throwNul", [] { throw std::runtime_error(oddText("nul")); }},
      {"throwSilent", [] { throw Silent(); }},
      {"throwAbortingText", [] { throw Derived(); }},
      {"throwText", [] { throw "text"; }},
      {"throwNull", [] { throw nullptr; }},
      {"throwString", [] { throw std::string("a string"); }},
      {"throwFunction", [] { throw &std::abort; }},
      {"throwError", [] { throw errorWithMessage("Domain", 1, "thrown, not returned", nullptr); }},
      {"throwNoMemory", [] { throw std::bad_alloc(); }},
      {"throwSystem", [] { throw std::system_error(5, std::generic_category(), "system"); }},
      {"throwFiles",
       [] { throw std::filesystem::filesystem_error("gone", std::make_error_code(std::errc::io_error)); }},
      {"throwVariant", [] { throw std::bad_variant_access(); }},
      {"throwFuture", [] { throw std::future_error(std::future_errc::broken_promise); }},
      {"throwTypeInfo", [] { throw std::bad_typeid(); }},
      {"throwTwice", [] { throw Twice(); }},
      {"throwNested", [] { throwNested(1000); }},
      {"throwPointer", [] { throw static_cast<std::exception*>(nullptr); }},
      {"throwAtEnd", [] { throw ThrowsAtItsEnd(); }},
      {"throwThroughNoexcept", throwWhereNothingMayBe},
      {"terminate", std::terminate},
      {"terminateSilently",
       [] {
         std::set_terminate([] { std::exit(0); });
         std::terminate();
       }},
      {"rethrowNothing", [] { std::rethrow_exception(std::make_exception_ptr(7)); }},
  };
}

}  // namespace quazor::attacks
