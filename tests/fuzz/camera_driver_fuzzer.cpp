// A camera whose driver answers nonsense, and metadata blocks of any content: a camera opens, streams and closes or
// gives an error, frames have only what their buffers say, and nothing stays open.
#include "backends/linux/capture/camera_device.h"
#include "contract/log_channel.h"
#include "platform/capture_keys.h"
#include "tests/fuzz/byte_input.h"
#include "tests/fuzz/fuzzing.h"
#include "tests/fuzz/hostile_kernel.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr std::size_t kMetadataBytes = 64;  // of the fake kernel's buffers

CameraBinding bindingFrom(ByteInput& input) {
  CameraBinding camera;
  camera.port = port_type::FrontFacingInfraredCamera;
  camera.node.busInfo = "usb-fake";
  camera.width = 640;
  camera.height = 360;
  camera.projector = ProjectorBinding{{{"Strobe", 1}}, {{"Strobe", 0}}, {}, {}, "Power"};
  camera.metadata.node = camera.node;
  camera.metadata.constants = Dictionary{{"Fixed", 7}};
  camera.metadata.controls = {{"Power", "Power"}};
  constexpr std::uint32_t kWidths[] = {1, 2, 4, 8};
  for (std::size_t i = 0; i < 3; ++i) {
    MetadataField field{"Field" + std::to_string(i), input.byte(), kWidths[input.byte() % 4], input.byte() % 64U, {}};
    if (input.byte() % 2 == 1) field.mask = input.word();
    camera.metadata.fields.push_back(std::move(field));
  }
  const std::uint8_t choice = input.byte();
  if ((choice & 1) != 0) camera.metadata.pairing = MetadataPairing::kSequence;
  if ((choice & 2) != 0) camera.controls = {{"Wide", -5}};
  if ((choice & 4) != 0) camera.errorCounters = {{"I2CErrorCount", {}, "Power"}};
  return camera;
}

struct FakeCamera {
  std::string video;
  std::string metadata;
};

FakeCamera connect(HostileKernel& kernel, bool isMultiplanar) {
  FakeNode metadata = fakeMetadata("usb-fake");
  FakeNode camera = isMultiplanar ? fakeMultiplanarCamera("usb-fake") : fakeCamera("usb-fake");
  camera.driver = "uvcvideo";
  camera.controls = {{V4L2_CID_FLASH_LED_MODE, "Strobe", 0, 2, 2},
                     {V4L2_CID_FLASH_TORCH_INTENSITY, "Power", 0, 100, 5},
                     {V4L2_CID_EXPOSURE_AUTO, "Exposure", 0, 3, 3, V4L2_CTRL_TYPE_MENU},
                     {V4L2_CID_PIXEL_RATE, "Wide", -10, 1LL << 40, 9, V4L2_CTRL_TYPE_INTEGER64}};
  FakeCamera made;
  camera.metadataNode = made.metadata = kernel.add(1, std::move(metadata));
  made.video = kernel.add(0, std::move(camera));
  return made;
}

// What a call that returns false leaves behind.
template <class Call>
bool succeeds(Call&& call) {
  DiagnosticErrorPtr error;
  const bool done = static_cast<bool>(call(&error));
  require(done == (error == nullptr), "a call that fails, and only that, has an error");
  if (error != nullptr) require(!error->localizedDescription().empty(), "an error says something");
  return done;
}

// Serves the stream as the poller does, on this thread.
void stream(HostileKernel& kernel, const FakeCamera& nodes, CameraRun& run, ByteInput& input) {
  bool goesOn = true;
  for (int i = 0; i < 12 && goesOn; ++i) {
    std::vector<std::uint8_t> block = input.bytes(input.byte() % (kMetadataBytes + 1));
    kernel.with(nodes.video, [&](FakeNode& node) {
      node.metadata = std::move(block);
      return 0;
    });
    switch (input.byte() % 8) {
      case 5: kernel.skip(nodes.video, input.byte()); break;
      case 6: kernel.produce(nodes.video, V4L2_BUF_FLAG_ERROR); break;
      case 7: kernel.disconnect(nodes.video); break;
      default: kernel.produce(nodes.video);
    }
    std::vector<pollfd> polled;
    run.watch(polled);
    for (pollfd& one : polled) one.revents = static_cast<short>((input.byte() & POLLERR) | POLLIN);
    goesOn = run.serve(polled);
    succeeds([&](auto* error) { return run.errorCounters(error).has_value(); });
  }
}

void use(HostileKernel& kernel, const FakeCamera& nodes, const CameraBinding& binding, ByteInput& input) {
  auto cameras =
      std::make_shared<LinuxCameras>(std::shared_ptr<V4l2Api>(std::shared_ptr<void>(), &kernel), kernel.roots());
  cameras->nodes = videoNodes(cameras->kernel, kernel.roots());
  LinuxCamera camera(binding, cameras);
  CameraSettings settings;
  if (!succeeds([&](auto* error) { return camera.open(settings, error); })) return;
  settings.minimumRate = settings.maximumRate = Value(30);
  std::size_t frames = 0;
  auto handler = std::make_shared<PixelBufferHandler>([&](PixelBuffer& buffer, MediaTime) {
    ++frames;
    const std::optional<Value> metadata = buffer.attachment(capture_key::MetadataDictionary);
    require(metadata && metadata->dictionary() != nullptr, "a frame has a dictionary");
    require(metadata->dictionary()->size() <= 2 + binding.metadata.fields.size(), "and nothing that is not bound");
  });
  const auto output = [](Value value) {
    return Dictionary{{std::string(capture_key::PrimaryScaler), std::move(value)}};
  };
  settings.outputsEnabled = output(true);
  settings.outputHandlers = output(Dictionary{{std::string(capture_key::PixelBufferHandler), handler}});
  if (input.byte() % 2 == 0) settings.lightSource = Dictionary{{std::string(capture_key::Mode), 1}};
  bool ready = succeeds([&](auto* error) { return camera.applyFormat(settings, error); });
  ready = succeeds([&](auto* error) { return camera.applyRates(settings, error); }) && ready;
  succeeds([&](auto* error) { return camera.applyAutoExposure(settings, error); });
  ready = succeeds([&](auto* error) { return camera.checkLightSource(settings, error); }) && ready;
  std::shared_ptr<CameraRun> run;
  if (ready && succeeds([&](auto* error) { return (run = camera.begin(settings, error)) != nullptr; })) {
    stream(kernel, nodes, *run, input);
    const FrameCounts counts = run->counts();
    require(counts.frames >= frames, "a frame that is delivered is counted");
    succeeds([&](auto* error) { return run->end(error); });
  }
  camera.close();
}

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace quazor;
  ByteInput input(data, size);
  const CameraBinding binding = bindingFrom(input);
  HostileKernel kernel(input);
  const FakeCamera nodes = connect(kernel, input.byte() % 4 == 3);
  use(kernel, nodes, binding, input);
  require(kernel.calls() < 1'000'000, "a driver cannot keep the program busy");
  require(kernel.guards() == 0, "no projector stays guarded");
  for (const std::string& path : {nodes.video, nodes.metadata}) {
    kernel.with(path, [](const FakeNode& node) {
      require(node.opened == 0 && node.mapped == 0 && node.lockedBy < 0, "nothing stays open, mapped or locked");
      return 0;
    });
  }
  return 0;
}
