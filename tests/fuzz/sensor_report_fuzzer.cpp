// Arbitrary input reports in any order, mixed with errors, closes and removals: only complete images reach the
// receiver, with the values in their bytes, and nothing follows an error.
#include "diagnostics/sensor_images/nimbe_image_experiment.h"
#include "tests/fuzz/byte_input.h"
#include "tests/fuzz/fuzzing.h"
#include "tests/support/fake_sensor.h"

#include <algorithm>
#include <bit>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// The record as a struct in this machine's layout, an independent way to read it.
struct Record {
  std::uint8_t reportID;
  std::uint8_t reserved1;
  std::uint16_t reserved2;
  std::uint32_t frameID;
  std::uint32_t reserved3;
  std::uint32_t timestamp;
  std::int32_t scanI[48];
  std::int32_t scanQ[48];
  std::int32_t secondScan[96];
  std::uint32_t reserved4;
  std::uint32_t temperature;
};
static_assert(sizeof(Record) == 792 && std::endian::native == std::endian::little);

void requireSamples(const Array& samples, const std::int32_t (&expected)[48]) {
  require(samples.size() == 48, "a scan has 48 samples");
  for (std::size_t i = 0; i < 48; ++i) require(samples[i] == Value(expected[i]), "a sample is what its bytes say");
}

void requireImage(const Value& frameID, const Array& scanI, const Array& scanQ, const Value& temperature,
                  const Value& timestamp, const Bytes& report) {
  Record record;
  std::memcpy(&record, report.data(), sizeof record);
  require(frameID == Value(record.frameID), "the frame ID is what its bytes say");
  require(timestamp == Value(record.timestamp), "the timestamp is what its bytes say");
  require(temperature.floatNumber() != nullptr, "the temperature is a 32-bit float");
  require(std::bit_cast<std::uint32_t>(*temperature.floatNumber()) == record.temperature,
          "the temperature is what its bytes say");
  requireSamples(scanI, record.scanI);
  requireSamples(scanQ, record.scanQ);
}

class Input : public ByteInput {
 public:
  using ByteInput::ByteInput;

  struct Report {
    std::uint8_t reportID;
    Bytes data;  // exactly as long as the report, so that a read past the end is detected

    bool isImage() const { return reportID == 0x76 && data.size() >= 792; }
  };
  // Half of them are image reports by ID; the length is right, nearly right, or arbitrary. The input contains some of
  // the bytes; the others are derived from one byte.
  Report report() {
    const std::uint8_t choice = byte();
    Report report{(choice & 1) != 0 ? std::uint8_t{0x76} : byte(), Bytes(length(choice))};
    const std::uint8_t pattern = byte();
    for (std::size_t i = 0; i < report.data.size(); ++i) {
      report.data[i] = static_cast<std::uint8_t>(pattern * (i + 1));
    }
    if (report.data.empty()) return report;
    const std::size_t begin = number() % report.data.size();
    const std::size_t count = std::min<std::size_t>(byte(), report.data.size() - begin);
    for (std::size_t i = 0; i < count; ++i) report.data[begin + i] = byte();
    return report;
  }

 private:
  std::size_t length(std::uint8_t choice) {
    if ((choice & 2) != 0) return 792;
    return (choice & 4) != 0 ? 788 + byte() % 8 : number();
  }
};

DiagnosticErrorPtr someError() { return makeError("BenchErrorDomain", 7, "Broken."); }

// Records the last call and performs a planned reaction during it.
class Receiver final : public QZNimbeImageStreamDelegate {
 public:
  void handleImage(std::shared_ptr<QZNimbeCorvaneImage> image) override {
    lastImage = std::move(image);
    ++images;
    if (during) std::exchange(during, nullptr)();
  }
  void streamDidError(DiagnosticErrorPtr error) override {
    lastError = std::move(error);
    ++errors;
    if (during) std::exchange(during, nullptr)();
  }

  std::function<void()> during;
  std::shared_ptr<QZNimbeCorvaneImage> lastImage;
  DiagnosticErrorPtr lastError;
  std::size_t images = 0;
  std::size_t errors = 0;
};

// A stream whose reports are delivered at once, and the expected deliveries.
class StreamRun {
 public:
  explicit StreamRun(bool careless) {
    sensor_.device->careless = careless;
    open();
  }

  void step(Input& input) {
    const std::size_t images = receiver_->images;
    const std::size_t errors = receiver_->errors;
    const bool heard = listening_ && hasReceiver_;
    switch (input.byte() % 8) {
      case 0: stream_ != nullptr ? close() : open(); break;
      case 1: open(); break;
      case 2: setReceiver(!hasReceiver_); break;
      case 3: drop(); break;
      case 4: planReaction(input.byte()); break;
      case 5: {
        const DiagnosticErrorPtr error = someError();
        sensor_.device->deliverError(error);
        listening_ = false;
        require(receiver_->errors == errors + (heard ? 1 : 0), "an error comes once, to who listens");
        require(!heard || receiver_->lastError == error, "an error is handed on as it is");
        require(receiver_->images == images, "no image comes with an error");
        return;
      }
      default: {
        const Input::Report report = input.report();
        sensor_.device->deliver(report.reportID, report.data);
        require(receiver_->images == images + (heard && report.isImage() ? 1 : 0), "images come, and nothing else");
        if (receiver_->images != images) {
          const QZNimbeCorvaneImage& image = *receiver_->lastImage;
          requireImage(image.frameID(), image.dScanI(), image.dScanQ(), image.tmonDataInC(),
                       image.timestampInMilliseconds(), report.data);
        }
        require(receiver_->errors == errors, "no error comes with a report");
        return;
      }
    }
    require(receiver_->images == images && receiver_->errors == errors, "nothing comes but from the device");
  }

 private:
  void open() {
    if (stream_ == nullptr) stream_ = std::make_shared<QZNimbeImageStream>(sensor_.platform());
    setReceiver(true);
    if (listening_) close();
    require(stream_->openWithRunLoop(sensor_.loop, nullptr), "the stream opens");
    listening_ = true;
  }
  void close() {
    stream_->close();
    listening_ = false;
  }
  void drop() {
    stream_.reset();
    listening_ = false;
  }
  void setReceiver(bool there) {
    hasReceiver_ = there;
    if (stream_ == nullptr) return;
    if (there) {
      stream_->setDelegate(receiver_);
    } else {
      stream_->setDelegate({});
    }
  }
  // Plans the receiver's reaction to the next call.
  void planReaction(std::uint8_t choice) {
    receiver_->during = [this, choice] {
      if ((choice & 1) != 0) setReceiver(false);
      if ((choice & 2) != 0 && stream_ != nullptr) close();
      if ((choice & 4) != 0) drop();
    };
  }

  FakeSensor sensor_{{}};
  std::shared_ptr<Receiver> receiver_ = std::make_shared<Receiver>();
  std::shared_ptr<QZNimbeImageStream> stream_;
  bool hasReceiver_ = true;
  bool listening_ = false;
};

// A complete run of the experiment on a device that sends a batch of reports every millisecond, and the expected
// result.
class ExperimentRun {
 public:
  ExperimentRun(Input& input, bool careless) : images_(input.byte()), timeout_(input.byte() % 3) {
    sensor_.device->careless = careless;
    while (!input.empty() && batches_ < kMaxBatches) planBatch(input);
  }

  void run() {
    auto experiment = std::make_shared<QZNimbeImageExperiment>(sensor_.platform());
    const std::weak_ptr<QZNimbeImageExperiment> watched = experiment;
    require(experiment->setupWithParameters({{"images", images_}, {"timeout", timeout_}}, nullptr, nullptr),
            "the experiment is set up");
    DiagnosticErrorPtr error;
    const auto result = experiment->run(&error);
    requireOutcome(result.get(), error);
    require(!sensor_.device->hasReceiver() && !sensor_.device->isOpen() && !sensor_.device->isScheduled(),
            "the stream is closed after the run");
    require(sensor_.loop.observers() == 0 && sensor_.loop.lastObserver().expired(), "the observer is released");
    sensor_.device->deliver(0x76, imageReport(1));
    experiment.reset();
    require(watched.expired(), "nobody holds the experiment");
  }

 private:
  static constexpr std::size_t kMaxBatches = 64;

  void planBatch(Input& input) {
    std::vector<std::function<void()>> actions;
    const auto add = [&](std::function<void()> action) { actions.push_back(std::move(action)); };
    std::vector<Bytes> images;
    const std::size_t count = 1 + input.byte() % 4;
    for (std::size_t i = 0; i < count; ++i) planEvent(input, add, images);
    if (!ended_ && timeout_ > 0) expectBatch(images);
    sensor_.loop.at(std::chrono::milliseconds(++batches_), [actions = std::move(actions)] {
      for (const auto& action : actions) action();
    });
  }

  template <class Add>
  void planEvent(Input& input, const Add& add, std::vector<Bytes>& images) {
    switch (input.byte() % 16) {
      case 0: {
        const DiagnosticErrorPtr error = someError();
        add([this, error] { sensor_.device->sendError(error); });
        if (batchError_ == nullptr) batchError_ = error;
        return;
      }
      case 1:
        add([this] { sensor_.loop.stop(); });
        batchStops_ = true;
        return;
      case 2:
        add([this] { sensor_.device->unscheduleFromRunLoop(sensor_.loop, kRunLoopDefaultMode); });
        batchRemoves_ = true;
        return;
      default: {
        const Input::Report report = input.report();
        add([this, report] { sensor_.device->send(report.reportID, report.data); });
        if (report.isImage() && batchError_ == nullptr) images.push_back(report.data);
        return;
      }
    }
  }

  // A device that was unscheduled does not deliver the rest of its batch.
  void expectBatch(const std::vector<Bytes>& images) {
    if (!batchRemoves_) {
      expectedImages_.insert(expectedImages_.end(), images.begin(), images.end());
      expectedError_ = batchError_;
      if (!images.empty() && expectedImages_.size() >= images_) ended_ = true;
    }
    ended_ = ended_ || batchRemoves_ || batchStops_ || expectedError_ != nullptr;
    batchError_ = nullptr;
  }

  void requireOutcome(const QZExperimentResult* result, const DiagnosticErrorPtr& error) const {
    if (!ended_) {
      require(result == nullptr && error != nullptr, "a run that is too long fails");
      require(error->localizedDescription() == "Timed out after " + std::to_string(timeout_) + " seconds.",
              "a run that is too long says so");
      return;
    }
    if (expectedError_ != nullptr) {
      require(result == nullptr && error == expectedError_, "the first error of the device is the run's");
      return;
    }
    require(result != nullptr && error == nullptr, "the run succeeds");
    const Array& images = *result->auxiliaryData().find("images")->array();
    require(images.size() == expectedImages_.size(), "the result has every image and no other");
    for (std::size_t i = 0; i < images.size(); ++i) {
      const auto entry = [&](const char* key) { return *entryOf(&images[i], key); };
      requireImage(entry("frameID"), *entry("dScanI").array(), *entry("dScanQ").array(), entry("tmonDataInC"),
                   entry("timestampInMilliseconds"), expectedImages_[i]);
    }
  }

  FakeSensor sensor_{{}};
  std::size_t images_;
  std::size_t timeout_;
  std::size_t batches_ = 0;
  // In the batch that is being planned.
  bool batchStops_ = false;
  bool batchRemoves_ = false;
  DiagnosticErrorPtr batchError_;
  // In the whole run.
  std::vector<Bytes> expectedImages_;
  DiagnosticErrorPtr expectedError_;
  bool ended_ = false;
};

}  // namespace
}  // namespace quazor

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  quazor::Input input(data, size);
  const std::uint8_t kind = input.byte();
  const bool careless = (kind & 2) != 0;
  if ((kind & 1) != 0) {
    quazor::ExperimentRun(input, careless).run();
    return 0;
  }
  quazor::StreamRun run(careless);
  while (!input.empty()) run.step(input);
  return 0;
}
