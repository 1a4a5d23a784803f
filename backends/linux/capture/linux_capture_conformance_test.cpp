#include "backends/capture/capture_session_conformance.h"
#include "backends/linux/capture/linux_capture.h"
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "backends/linux/system/linux_error.h"

namespace quazor {
namespace {

// Fake cameras, all of which support automatic exposure.
class LinuxCaptureUnderTest {
 public:
  LinuxCaptureUnderTest() {
    for (const std::string& node : fake_.nodes) {
      fake_.kernel->with(node, [](FakeNode& camera) {
        camera.controls.insert(camera.controls.begin(), {V4L2_CID_EXPOSURE_AUTO, "Auto Exposure", 0, 3,
                                                         V4L2_EXPOSURE_AUTO, V4L2_CTRL_TYPE_MENU});
        return 0;
      });
    }
  }

  std::shared_ptr<CaptureService> service() { return fake_.capture; }
  std::shared_ptr<CaptureService> serviceWithoutDevice() { return makeLinuxCapture(Binding()); }
  std::string refusal(CaptureRefusal reason) {
    const auto code = static_cast<std::int64_t>(codeOf(reason));
    return std::string(LinuxErrorDomain) + " " + std::to_string(code);
  }
  void pass(std::chrono::milliseconds time) { fake_.kernel->passTime(time); }

 private:
  static LinuxErrorCode codeOf(CaptureRefusal reason) {
    switch (reason) {
      case CaptureRefusal::kNoDevice: return LinuxErrorCode::kNoDevice;
      case CaptureRefusal::kUnknownProperty:
      case CaptureRefusal::kReadOnlyProperty: return LinuxErrorCode::kNoSuchProperty;
      case CaptureRefusal::kWrongType:
      case CaptureRefusal::kOutOfRange:
      case CaptureRefusal::kForeignObject: return LinuxErrorCode::kBadValue;
      case CaptureRefusal::kUnsupported: return LinuxErrorCode::kNotSupported;
      case CaptureRefusal::kControlledByAnother: return LinuxErrorCode::kBusy;
      case CaptureRefusal::kNotControlled:
      case CaptureRefusal::kWrongState:
      case CaptureRefusal::kUnreadableProperty:
      case CaptureRefusal::kInvalidated: return LinuxErrorCode::kWrongState;
    }
    return {};
  }

  FakeCameras fake_;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, CaptureConformance, LinuxCaptureUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, CaptureSessionConformance, LinuxCaptureUnderTest);

}  // namespace
}  // namespace quazor
