#include "backends/capture/capture_session_conformance.h"
#include "backends/simulated/errors/capture_error.h"
#include "backends/simulated/simulated_phone.h"

namespace quazor {
namespace {

// The four cameras that the suite requires, in virtual time.
class SimulatedCaptureUnderTest {
 public:
  std::shared_ptr<CaptureService> service() { return phone_.platform().capture; }
  std::shared_ptr<CaptureService> serviceWithoutDevice() {
    Scenario scenario;
    scenario.device.present = false;
    return SimulatedPhone(scenario, PhoneTime::kVirtual, 1).platform().capture;
  }
  std::string refusal(CaptureRefusal reason) {
    const auto code = static_cast<std::int64_t>(codeOf(reason));
    return std::string(SimulatedCaptureErrorDomain) + " " + std::to_string(code);
  }
  void pass(std::chrono::milliseconds time) { phone_.platform().clock->sleep(time); }

 private:
  static Scenario scenario() {
    Scenario scenario;
    for (const std::string_view port : {port_type::BackFacingCamera, port_type::BackFacingTelephotoCamera,
                                        port_type::BackFacingSuperWideCamera, port_type::FrontFacingInfraredCamera}) {
      Camera camera;
      camera.id = port;
      camera.port = port;
      camera.formats = {{30}, {60}};
      scenario.cameras.push_back(std::move(camera));
    }
    scenario.cameras[3].projector.emplace();
    const auto id = [&](std::size_t index) { return scenario.cameras[index].id; };
    scenario.groups = {{"back", {id(0), id(1), id(2)}, id(0), true}};
    return scenario;
  }
  static CaptureErrorCode codeOf(CaptureRefusal reason) {
    switch (reason) {
      case CaptureRefusal::kNoDevice: return CaptureErrorCode::kNoDevice;
      case CaptureRefusal::kUnknownProperty: return CaptureErrorCode::kUnknownProperty;
      case CaptureRefusal::kReadOnlyProperty: return CaptureErrorCode::kReadOnlyProperty;
      case CaptureRefusal::kWrongType: return CaptureErrorCode::kWrongType;
      case CaptureRefusal::kOutOfRange: return CaptureErrorCode::kOutOfRange;
      case CaptureRefusal::kUnsupported: return CaptureErrorCode::kUnsupported;
      case CaptureRefusal::kNotControlled: return CaptureErrorCode::kNotControlled;
      case CaptureRefusal::kControlledByAnother: return CaptureErrorCode::kControlledByAnother;
      case CaptureRefusal::kWrongState: return CaptureErrorCode::kWrongState;
      case CaptureRefusal::kUnreadableProperty: return CaptureErrorCode::kUnreadableProperty;
      case CaptureRefusal::kForeignObject: return CaptureErrorCode::kForeignObject;
      case CaptureRefusal::kInvalidated: return CaptureErrorCode::kInvalidated;
    }
    return {};
  }

  SimulatedPhone phone_{scenario(), PhoneTime::kVirtual, 1};
};

INSTANTIATE_TYPED_TEST_SUITE_P(Simulated, CaptureConformance, SimulatedCaptureUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Simulated, CaptureSessionConformance, SimulatedCaptureUnderTest);

}  // namespace
}  // namespace quazor
