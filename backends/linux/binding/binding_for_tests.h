// A fixture that reads bindings from texts, for the tests of this folder.
#pragma once

#include "backends/linux/binding/binding.h"
#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

namespace quazor {

class BindingTest : public ::testing::Test {
 protected:
  BindingTest()
      : file_(std::filesystem::path(::testing::TempDir()) /
              ("quazor-binding-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()))) {}
  ~BindingTest() override { std::filesystem::remove(file_); }

  Binding read(std::string_view text) {
    std::ofstream(file_, std::ios::binary) << text;
    return readBinding(file_);
  }
  // The error message, with "F" for the file; "nothing" if the text is valid.
  std::string problemOf(std::string_view text) {
    std::string problem = thrownText<InputError>([&] { read(text); });
    const std::size_t at = problem.find(file_.string());
    return at == std::string::npos ? problem : problem.replace(at, file_.string().size(), "F");
  }

  const std::filesystem::path file_;
};

// A binding with an additional entry on its second line.
inline std::string with(const std::string& entry) { return "{\"title\": \"t\",\n" + entry + "}"; }
// A binding with a camera that has an additional entry on its third line.
inline std::string withCamera(const std::string& entry) {
  return with(R"("cameras": {"BackFacingCamera": {"node": {"card": "c"}, "size": {"width": 4, "height": 2},)"
              "\n" +
              entry + "}}");
}
// A text that is refused, and the problem.
struct Refused {
  const char* what;
  std::string text;
  std::string problem;
};

}  // namespace quazor
