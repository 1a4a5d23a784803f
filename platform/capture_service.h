// The capture service: the image signal processor's capture plug-in, its device, the device's streams (one per camera
// port) and its groups of synchronised streams.
//
// Thread: every call is synchronous on the caller's thread and may block as long as the hardware takes. One thread at
//   a time calls into one device and its streams, with one exception: frames may arrive before the call that starts a
//   stream has returned, and a frame handler may then read the stream's properties and stop it. Different devices are
//   independent.
// Ownership: objects are shared; a returned object stays valid, though perhaps no longer usable, for as long as the
//   caller holds it. Every path to a stream returns the same object, so streams compare by identity.
// Errors: a call that fails returns false or nothing and stores the service's error if the caller passed a pointer and
//   the service has an error to give. A successful call leaves the pointer's target unchanged. Calls do not throw.
#pragma once

#include "contract/contract.h"
#include "contract/diagnostic_error.h"
#include "contract/value.h"
#include "platform/capture_keys.h"

#include <memory>
#include <optional>
#include <string_view>
#include <vector>

namespace QUAZOR_CONTRACT {

// An object with properties (platform/capture_keys.h): a device, a group or a stream.
// Thread: one at a time for a device and what belongs to it; a frame handler may read properties meanwhile.
class QUAZOR_EXPORT CaptureObject : public Object {
 public:
  ~CaptureObject() override;

  // Returns the property's value, or nothing if it cannot be read or does not exist.
  [[nodiscard]] virtual std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) = 0;
  // Sets a property. Fails if the property does not exist or is read only, or if the value has the wrong type or is out
  // of range; the property then keeps its value.
  [[nodiscard]] virtual bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) = 0;
};

// Thread: one at a time for a device's streams; a frame handler may read properties and call stop() meanwhile.
class QUAZOR_EXPORT CaptureStream : public CaptureObject {
 public:
  ~CaptureStream() override;

  // Starts delivering frames. Fails without control of the stream and while the stream runs.
  [[nodiscard]] virtual bool start(DiagnosticErrorPtr* error) = 0;
  // Stops delivering frames. After it returns, no handler is running or will run. Fails if the stream is not running.
  [[nodiscard]] virtual bool stop(DiagnosticErrorPtr* error) = 0;
};
using CaptureStreams = std::vector<std::shared_ptr<CaptureStream>>;

// Streams that can run in lockstep, one of them as the master.
// Thread: one at a time for a device and its groups.
class QUAZOR_EXPORT SynchronizedStreamsGroup : public CaptureObject {
 public:
  ~SynchronizedStreamsGroup() override;

  // The group's streams, in a fixed order.
  [[nodiscard]] virtual std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) = 0;
};
using SynchronizedStreamsGroups = std::vector<std::shared_ptr<SynchronizedStreamsGroup>>;

// Thread: one at a time; different devices are independent.
class QUAZOR_EXPORT CaptureDevice : public CaptureObject {
 public:
  ~CaptureDevice() override;

  // The device's streams, in a fixed order.
  [[nodiscard]] virtual std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) = 0;
  // The groups of streams that can be synchronised, in a fixed order.
  [[nodiscard]] virtual std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(
      DiagnosticErrorPtr* error) = 0;
  // Acquires control of the streams for this client: all of them or, on failure, none.
  [[nodiscard]] virtual bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) = 0;
  // Releases control of the streams.
  [[nodiscard]] virtual bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) = 0;
  // Ends the use of the device: stops its streams and releases their control. Every later call fails.
  [[nodiscard]] virtual bool invalidate(DiagnosticErrorPtr* error) = 0;
};

// Thread: any.
class QUAZOR_EXPORT CapturePlugIn : public Object {
 public:
  ~CapturePlugIn() override;

  // The capture device, or null.
  [[nodiscard]] virtual std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) = 0;
};

// Provides the capture plug-in.
// Thread: any.
class QUAZOR_EXPORT CaptureService {
 public:
  CaptureService() = default;
  CaptureService(const CaptureService&) = delete;
  CaptureService& operator=(const CaptureService&) = delete;
  virtual ~CaptureService();

  // A new instance of the capture plug-in, or null when it cannot be loaded.
  virtual std::shared_ptr<CapturePlugIn> createPlugIn() = 0;
  // The shared instance of the capture plug-in, or null when it cannot be loaded.
  virtual std::shared_ptr<CapturePlugIn> defaultPlugIn() = 0;
};

}  // namespace QUAZOR_CONTRACT
