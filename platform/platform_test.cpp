#include "platform/platform.h"

#include "platform/media_time.h"
#include "platform/pixel_buffer.h"

#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

// Implementations without hardware that use only the interfaces, as a host would write them.

// Tells when it is destroyed.
template <class Interface>
class Watched : public Interface {
 public:
  explicit Watched(bool& destroyed) : destroyed_(destroyed) {}
  ~Watched() override { destroyed_ = true; }

 private:
  bool& destroyed_;
};

template <class Interface>
class Propertyless : public Watched<Interface> {
 public:
  using Watched<Interface>::Watched;
  std::string description() const override { return "nothing"; }
  std::optional<Value> valueForProperty(std::string_view /*key*/, DiagnosticErrorPtr* /*error*/) override {
    return std::nullopt;
  }
  bool setValue(const Value& /*value*/, std::string_view /*key*/, DiagnosticErrorPtr* /*error*/) override {
    return false;
  }
};

class Stream final : public Propertyless<CaptureStream> {
 public:
  using Propertyless::Propertyless;
  bool start(DiagnosticErrorPtr* /*error*/) override { return true; }
  bool stop(DiagnosticErrorPtr* /*error*/) override { return true; }
};

class Group final : public Propertyless<SynchronizedStreamsGroup> {
 public:
  using Propertyless::Propertyless;
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* /*error*/) override { return CaptureStreams{}; }
};

class Device final : public Propertyless<CaptureDevice> {
 public:
  using Propertyless::Propertyless;
  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* /*error*/) override { return CaptureStreams{}; }
  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* /*error*/) override {
    return SynchronizedStreamsGroups{};
  }
  bool requestControlOfStreams(const CaptureStreams& /*streams*/, DiagnosticErrorPtr* /*error*/) override {
    return true;
  }
  bool relinquishControlOfStreams(const CaptureStreams& /*streams*/, DiagnosticErrorPtr* /*error*/) override {
    return true;
  }
  bool invalidate(DiagnosticErrorPtr* /*error*/) override { return true; }
};

class PlugIn final : public Watched<CapturePlugIn> {
 public:
  using Watched::Watched;
  std::string description() const override { return "plug-in"; }
  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* /*error*/) override { return nullptr; }
};

class Capture final : public Watched<CaptureService> {
 public:
  using Watched::Watched;
  std::shared_ptr<CapturePlugIn> createPlugIn() override { return nullptr; }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override { return nullptr; }
};

class StoppedClock final : public Watched<Clock> {
 public:
  using Watched::Watched;
  std::chrono::nanoseconds now() const override { return std::chrono::nanoseconds(5); }
  Date date() const override { return Date{}; }
  void sleep(std::chrono::nanoseconds /*duration*/) override {}
};

class ImmediateQueue final : public Watched<SerialQueue> {
 public:
  using Watched::Watched;
  void async(Task task) override { task(); }
  void asyncAfter(std::chrono::nanoseconds /*delay*/, Task task) override { task(); }
};

class OpenSemaphore final : public Watched<Semaphore> {
 public:
  using Watched::Watched;
  void signal() override {}
  void wait() override {}
};

class NoConcurrency final : public Watched<Concurrency> {
 public:
  using Watched::Watched;
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view /*label*/, QualityOfService /*quality*/) override {
    return nullptr;
  }
  std::shared_ptr<Semaphore> makeSemaphore(long /*count*/) override { return nullptr; }
};

class Snapshot final : public Watched<ReportSnapshot> {
 public:
  using Watched::Watched;
  const std::vector<ReportSample>& samples() const override { return samples_; }
  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& /*baseline*/,
                                                             DiagnosticErrorPtr* /*error*/) const override {
    return nullptr;
  }

 private:
  std::vector<ReportSample> samples_;
};

class ChannelSet final : public Watched<ReportChannelSet> {
 public:
  using Watched::Watched;
  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& /*keep*/) const override {
    return nullptr;
  }
  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* /*error*/) const override { return nullptr; }
};

class Reports final : public Watched<ReportFacility> {
 public:
  using Watched::Watched;
  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* /*error*/) override {
    return nullptr;
  }
};

template <class Interface, class Implementation>
bool isDestroyedThroughItsInterface() {
  bool destroyed = false;
  Interface* const object = new Implementation(destroyed);
  delete object;
  return destroyed;
}

TEST(PlatformInterfacesTest, EveryOneDestroysItsImplementation) {
  EXPECT_TRUE((isDestroyedThroughItsInterface<Object, Stream>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<CaptureObject, Stream>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<CaptureStream, Stream>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<SynchronizedStreamsGroup, Group>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<CaptureDevice, Device>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<CapturePlugIn, PlugIn>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<CaptureService, Capture>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<Clock, StoppedClock>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<SerialQueue, ImmediateQueue>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<Semaphore, OpenSemaphore>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<Concurrency, NoConcurrency>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<ReportSnapshot, Snapshot>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<ReportChannelSet, ChannelSet>()));
  EXPECT_TRUE((isDestroyedThroughItsInterface<ReportFacility, Reports>()));
}

TEST(PlatformInterfacesTest, AStreamInAValueIsTheSameStream) {
  bool destroyed = false;
  const auto stream = std::make_shared<Stream>(destroyed);
  const Value value(stream);
  EXPECT_EQ(std::dynamic_pointer_cast<CaptureStream>(value.object()), stream);
  EXPECT_EQ(value, Value(std::static_pointer_cast<CaptureObject>(stream)));
}

TEST(ReportSampleTest, LeadsToItsChannelsDescriptionAndCount) {
  const auto description =
      std::make_shared<const ReportChannelDescription>(ReportChannelDescription{"K42ISP", "K42ISP Events", "Latch"});
  const ReportSample counted(ReportChannel(description, Value(3U)));
  EXPECT_EQ(&counted.channel().channelDescription(), description.get());
  EXPECT_EQ(counted.channel().channelDescription().subGroupName, "K42ISP Events");
  EXPECT_EQ(counted.channel().count(), Value(3U));
  EXPECT_EQ(ReportSample(ReportChannel(description, std::nullopt)).channel().count(), std::nullopt);
}

TEST(MediaTimeTest, IsAValidZeroWhenItIsMade) {
  const MediaTime time;
  EXPECT_EQ(time.seconds(), 0.0);
  EXPECT_EQ(time.flags, MediaTime::kValid);
}

TEST(MediaTimeTest, SecondsAreTheValueOverTheTimescale) {
  EXPECT_EQ((MediaTime{90, 60, MediaTime::kValid, 0}).seconds(), 1.5);
  EXPECT_EQ((MediaTime{-1, 4, MediaTime::kValid, 0}).seconds(), -0.25);
  EXPECT_EQ((MediaTime{1'000'000'007, 1'000'000'000, MediaTime::kValid, 0}).seconds(), 1.000000007);
}

TEST(MediaTimeTest, IsEqualInAllItsParts) {
  const MediaTime time{1, 2, 1, 3};
  EXPECT_EQ(time, (MediaTime{1, 2, 1, 3}));
  EXPECT_FALSE(time == (MediaTime{2, 2, 1, 3}));
  EXPECT_FALSE(time == (MediaTime{1, 4, 1, 3}));
  EXPECT_FALSE(time == (MediaTime{1, 2, 0, 3}));
  EXPECT_FALSE(time == (MediaTime{1, 2, 1, 0}));
}

// A buffer on the stack that counts its references.
class CountedBuffer final : public PixelBuffer {
 public:
  void retain() override { ++references; }
  void release() override { --references; }
  std::optional<Value> attachment(std::string_view /*key*/) const override { return std::nullopt; }

  int references = 1;
};

TEST(HandlerTest, APixelBufferHandlerPassesTheFrameOn) {
  CountedBuffer buffer;
  MediaTime seen;
  const PixelBufferHandler handler([&seen](PixelBuffer& frame, MediaTime time) {
    frame.retain();
    seen = time;
  });
  handler(buffer, MediaTime{7, 30, MediaTime::kValid, 0});
  EXPECT_EQ(buffer.references, 2);
  EXPECT_EQ(seen, (MediaTime{7, 30, MediaTime::kValid, 0}));
  EXPECT_EQ(handler.description(), "<PixelBufferHandler>");
}

TEST(HandlerTest, AnEventHandlerPassesTheEventOn) {
  std::int32_t seenEvent = 0;
  MediaTime seenTime;
  std::optional<Value> seenInfo;
  const EventHandler handler([&](std::int32_t event, MediaTime time, const Value* info) {
    seenEvent = event;
    seenTime = time;
    seenInfo = info == nullptr ? std::nullopt : std::optional(*info);
  });
  const Value info("overheated");
  handler(-4, MediaTime{1, 2, MediaTime::kValid, 0}, &info);
  EXPECT_EQ(seenEvent, -4);
  EXPECT_EQ(seenTime.seconds(), 0.5);
  EXPECT_EQ(seenInfo, info);
  handler(5, MediaTime{}, nullptr);
  EXPECT_EQ(seenEvent, 5);
  EXPECT_EQ(seenInfo, std::nullopt);
  EXPECT_EQ(handler.description(), "<EventHandler>");
}

class PlatformTest : public testing::Test {
 protected:
  void TearDown() override { installPlatform({}); }

  bool captureDestroyed_ = false;
  bool clockDestroyed_ = false;
  bool concurrencyDestroyed_ = false;
  bool reportsDestroyed_ = false;
};

TEST_F(PlatformTest, IsEmptyUntilOneIsInstalled) {
  EXPECT_EQ(installedPlatform().capture, nullptr);
  EXPECT_EQ(installedPlatform().clock, nullptr);
  EXPECT_EQ(installedPlatform().concurrency, nullptr);
  EXPECT_EQ(installedPlatform().reports, nullptr);
}

TEST_F(PlatformTest, TheInstalledServicesAreTheOnesHandedOver) {
  const Platform platform{std::make_shared<Capture>(captureDestroyed_), std::make_shared<StoppedClock>(clockDestroyed_),
                          std::make_shared<NoConcurrency>(concurrencyDestroyed_),
                          std::make_shared<Reports>(reportsDestroyed_)};
  installPlatform(platform);
  EXPECT_EQ(installedPlatform().capture, platform.capture);
  EXPECT_EQ(installedPlatform().clock, platform.clock);
  EXPECT_EQ(installedPlatform().concurrency, platform.concurrency);
  EXPECT_EQ(installedPlatform().reports, platform.reports);
}

TEST_F(PlatformTest, InstallingAnotherOneLetsTheOneBeforeGo) {
  installPlatform({std::make_shared<Capture>(captureDestroyed_), std::make_shared<StoppedClock>(clockDestroyed_),
                   std::make_shared<NoConcurrency>(concurrencyDestroyed_),
                   std::make_shared<Reports>(reportsDestroyed_)});
  EXPECT_FALSE(captureDestroyed_ || clockDestroyed_ || concurrencyDestroyed_ || reportsDestroyed_);
  installPlatform({});
  EXPECT_TRUE(captureDestroyed_ && clockDestroyed_ && concurrencyDestroyed_ && reportsDestroyed_);
}

}  // namespace
}  // namespace quazor
