#include "backends/capture/capture_session_conformance.h"
#include "backends/linux/capture/linux_capture.h"
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "backends/linux/system/linux_error.h"

#include <map>
#include <string>

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
    static const std::map<CaptureRefusal, int> kCodes{
        {CaptureRefusal::kNoDevice, 2},           {CaptureRefusal::kUnknownProperty, 10},
        {CaptureRefusal::kReadOnlyProperty, 10},  {CaptureRefusal::kWrongType, 6},
        {CaptureRefusal::kOutOfRange, 6},         {CaptureRefusal::kForeignObject, 6},
        {CaptureRefusal::kUnsupported, 5},        {CaptureRefusal::kControlledByAnother, 8},
        {CaptureRefusal::kNotControlled, 7},      {CaptureRefusal::kWrongState, 7},
        {CaptureRefusal::kUnreadableProperty, 7}, {CaptureRefusal::kInvalidated, 7}};
    return std::string(LinuxErrorDomain) + " " + std::to_string(kCodes.at(reason));
  }
  void pass(std::chrono::milliseconds time) { fake_.kernel->passTime(time); }

 private:
  FakeCameras fake_;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, CaptureConformance, LinuxCaptureUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, CaptureSessionConformance, LinuxCaptureUnderTest);

}  // namespace
}  // namespace quazor
