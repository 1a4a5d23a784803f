#include "host/plugin/null_platform.h"

namespace quazor {

namespace {

class NoCapture final : public CaptureService {
 public:
  std::shared_ptr<CapturePlugIn> createPlugIn() override { return nullptr; }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override { return nullptr; }
};

class NoReports final : public ReportFacility {
 public:
  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* /*error*/) override {
    return nullptr;
  }
};

class StoppedClock final : public Clock {
 public:
  std::chrono::nanoseconds now() const override { return {}; }
  Date date() const override { return {}; }
  void sleep(std::chrono::nanoseconds /*duration*/) override {}
};

class IdleQueue final : public SerialQueue {
 public:
  void async(Task /*task*/) override {}
  void asyncAfter(std::chrono::nanoseconds /*delay*/, Task /*task*/) override {}
};

class OpenSemaphore final : public Semaphore {
 public:
  void signal() override {}
  void wait() override {}
};

class IdleConcurrency final : public Concurrency {
 public:
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view /*label*/, QualityOfService /*quality*/) override {
    return std::make_shared<IdleQueue>();
  }
  std::shared_ptr<Semaphore> makeSemaphore(long /*count*/) override { return std::make_shared<OpenSemaphore>(); }
};

class NoHid final : public HidService {
 public:
  std::shared_ptr<HidManager> createManager() override { return nullptr; }
};

class NoFramebuffer final : public FramebufferService {
 public:
  std::shared_ptr<Display> mainDisplay() override { return nullptr; }
};

class NoRunLoops final : public RunLoops {
 public:
  RunLoop* currentRunLoop() override { return nullptr; }
};

}  // namespace

Platform nullPlatform() {
  Platform platform;
  platform.capture = std::make_shared<NoCapture>();
  platform.clock = std::make_shared<StoppedClock>();
  platform.concurrency = std::make_shared<IdleConcurrency>();
  platform.reports = std::make_shared<NoReports>();
  platform.hid = std::make_shared<NoHid>();
  platform.framebuffer = std::make_shared<NoFramebuffer>();
  platform.runLoops = std::make_shared<NoRunLoops>();
  return platform;
}

}  // namespace quazor
