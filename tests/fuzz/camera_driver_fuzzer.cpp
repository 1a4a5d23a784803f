// A camera whose driver answers nonsense, and metadata blocks of any content: a camera opens, streams and closes or
// gives an error, frames have only what their buffers say, and nothing stays open.
#include "backends/linux/capture/camera_device.h"
#include "backends/linux/media/media_for_tests.h"
#include "base/text/hexadecimal.h"
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

// A control of the fake camera, by its name or by its number, or one that it does not have.
std::string controlFrom(ByteInput& input, const char* name, std::uint32_t id) {
  const std::uint8_t choice = input.byte();
  if (choice < 0x80) return name;
  return "0x" + hexadecimalNumber(choice < 0xF0 ? id : input.word(), 8);
}

std::vector<FormatBinding> formatsFrom(ByteInput& input) {
  constexpr const char* kCodes[] = {"YUYV", "GREY", "NM12", "Y16 -BE"};
  constexpr std::uint32_t kHeights[] = {360, 480, 361, 65536};
  std::vector<FormatBinding> formats;
  const std::size_t count = input.byte() % 4;
  for (std::size_t i = 0; i < count; ++i) {
    FormatBinding format{input.byte() % 4U, kCodes[input.byte() % 4], 640, kHeights[input.byte() % 4], {}};
    const std::uint32_t denominator = input.byte();
    if (denominator != 0) format.interval = FrameInterval{1U + input.byte() % 4U, denominator};
    formats.push_back(std::move(format));
  }
  return formats;
}

MetadataBinding metadataFrom(ByteInput& input) {
  MetadataBinding metadata;
  metadata.node = VideoNodeMatch{{}, "fake metadata", {}};
  metadata.constants = Dictionary{{"Fixed", 7}};
  metadata.controls = {{"Power", controlFrom(input, "Power", V4L2_CID_FLASH_TORCH_INTENSITY)}};
  constexpr std::uint32_t kWidths[] = {1, 2, 4, 8};
  for (std::size_t i = 0; i < 3; ++i) {
    MetadataField field{"Field" + std::to_string(i), input.byte(), kWidths[input.byte() % 4], input.byte() % 64U, {}};
    if (input.byte() % 2 == 1) field.mask = input.word();
    metadata.fields.push_back(std::move(field));
  }
  constexpr const char* kFormats[] = {nullptr, nullptr, "FAKE", "UVCH"};
  if (const char* const format = kFormats[input.byte() % 4]) metadata.format = format;
  if (input.byte() % 2 == 1) metadata.pairing = MetadataPairing::kSequence;
  return metadata;
}

CameraBinding bindingFrom(ByteInput& input, bool isOfBoard) {
  CameraBinding camera = isOfBoard ? FakeBoard::binding() : CameraBinding();
  camera.port = port_type::FrontFacingInfraredCamera;
  camera.node = VideoNodeMatch{{}, "fake camera", {}};
  camera.width = 640;
  camera.height = 360;
  const std::string light = controlFrom(input, "Strobe", V4L2_CID_FLASH_LED_MODE);
  camera.projector = ProjectorBinding{{{light, 1}}, {{light, 0}}, {}, {}, "Power"};
  camera.metadata = metadataFrom(input);
  const std::uint8_t choice = input.byte();
  if ((choice & 1) != 0) camera.formats = formatsFrom(input);
  if ((choice & 2) != 0) camera.controls = {{controlFrom(input, "Wide", V4L2_CID_PIXEL_RATE), -5}};
  if ((choice & 4) != 0) {
    const std::string count = controlFrom(input, "Power", V4L2_CID_FLASH_TORCH_INTENSITY);
    camera.errorCounters = {{"I2CErrorCount", {}, count}};
  }
  if (!isOfBoard || (choice & 8) == 0) return camera;
  // Settings that the path does not have.
  camera.media->subdevices = {"Flash"};
  if ((choice & 16) != 0) camera.media->links.push_back({{"Sensor A", input.byte()}, {"Scaler", input.byte()}, true});
  if ((choice & 32) != 0) {
    const PadFormat format{input.word(), 1U + input.byte() * 16U, 1U + input.byte() * 16U};
    camera.media->pads.push_back({{"Scaler", input.byte()}, format, {}, FrameInterval{1, 1U + input.byte()}});
  }
  return camera;
}

enum class FakeKind : std::uint8_t { kUsb, kMultiplanar, kBoard };

std::vector<FakeControl> ownControls() {
  return {{V4L2_CID_FLASH_LED_MODE, "Strobe", 0, 2, 2},
          {V4L2_CID_FLASH_TORCH_INTENSITY, "Power", 0, 100, 5},
          {V4L2_CID_EXPOSURE_AUTO, "Exposure", 0, 3, 3, V4L2_CTRL_TYPE_MENU},
          {V4L2_CID_PIXEL_RATE, "Wide", -10, 1LL << 40, 9, V4L2_CTRL_TYPE_INTEGER64}};
}

// Returns the path of the camera's video node.
std::string connect(const std::shared_ptr<FakeV4l2Api>& kernel, FakeKind kind) {
  FakeNode metadata = fakeMetadata("usb-fake");
  metadata.card = "fake metadata";
  const std::string metadataNode = kernel->add(1, std::move(metadata));
  if (kind == FakeKind::kBoard) {
    const FakeBoard board(kernel);
    return kernel->with(board.camera, [&](FakeNode& node) {
      node.controls = ownControls();
      node.metadataNode = metadataNode;
      return node.path;
    });
  }
  FakeNode camera = kind == FakeKind::kMultiplanar ? fakeMultiplanarCamera("usb-fake") : fakeCamera("usb-fake");
  camera.driver = "uvcvideo";
  camera.controls = ownControls();
  camera.metadataNode = metadataNode;
  return kernel->add(0, std::move(camera));
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
void stream(HostileKernel& kernel, const std::string& video, CameraRun& run, ByteInput& input) {
  bool goesOn = true;
  for (int i = 0; i < 12 && goesOn; ++i) {
    std::vector<std::uint8_t> block = input.bytes(input.byte() % (kMetadataBytes + 1));
    kernel.with(video, [&](FakeNode& node) {
      node.metadata = std::move(block);
      return 0;
    });
    switch (input.byte() % 8) {
      case 5: kernel.skip(video, input.byte()); break;
      case 6: kernel.produce(video, V4L2_BUF_FLAG_ERROR); break;
      case 7: kernel.disconnect(video); break;
      default: kernel.produce(video);
    }
    std::vector<pollfd> polled;
    run.watch(polled);
    for (pollfd& one : polled) one.revents = static_cast<short>((input.byte() & POLLERR) | POLLIN);
    goesOn = run.serve(polled);
    succeeds([&](auto* error) { return run.errorCounters(error).has_value(); });
  }
}

void use(const std::shared_ptr<HostileKernel>& kernel, const std::string& video, const CameraBinding& binding,
         ByteInput& input) {
  auto cameras = std::make_shared<LinuxCameras>(kernel, kernel->roots());
  cameras->nodes = videoNodes(cameras->kernel, kernel->roots());
  LinuxCamera camera(binding, cameras);
  CameraSettings settings;
  settings.formatIndex = input.byte() % 4;
  if (!succeeds([&](auto* error) { return camera.open(settings, error); })) return;
  settings.minimumRate = settings.maximumRate = Value(30);
  std::size_t frames = 0;
  auto handler = std::make_shared<PixelBufferHandler>([&](PixelBuffer& buffer, MediaTime) {
    ++frames;
    const std::optional<Value> metadata = buffer.attachment(capture_key::MetadataDictionary);
    require(metadata && metadata->dictionary() != nullptr, "a frame has a dictionary");
    const std::size_t bound = binding.metadata.constants.size() + binding.metadata.controls.size();
    require(metadata->dictionary()->size() <= bound + binding.metadata.fields.size(), "and nothing that is not bound");
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
    stream(*kernel, video, *run, input);
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
  constexpr FakeKind kKinds[] = {FakeKind::kUsb, FakeKind::kUsb, FakeKind::kMultiplanar, FakeKind::kBoard};
  const FakeKind kind = kKinds[input.byte() % 4];
  const CameraBinding binding = bindingFrom(input, kind == FakeKind::kBoard);
  const auto kernel = std::make_shared<HostileKernel>(input);
  use(kernel, connect(kernel, kind), binding, input);
  require(kernel->calls() < 1'000'000, "a driver cannot keep the program busy");
  require(kernel->guards() == 0, "no projector stays guarded");
  require(kernel->isIdle(), "nothing stays open, mapped, requested or locked");
  return 0;
}
