// The capture service: the image signal processor's capture plug-in, its device, the device's streams (one per camera
// port) and its groups of synchronised streams.
//
// Thread: every call is synchronous on the caller's thread and may block as long as the hardware takes. One thread at
//   a time calls into one device and its streams, but for one thing: frames come as soon as a stream is started, and
//   whoever handles them may read the stream's properties and stop it while its start has not yet returned. Different
//   devices are independent.
// Ownership: objects are shared; what a call returns stays valid, if perhaps of no more use, for as long as the caller
//   holds it. The same stream is the same object on every path that leads to it, so streams compare by identity.
// Errors: a call that fails returns false or nothing and then stores the service's own error where the caller gave a
//   place for one; it may have none to give, and stores nothing. After a success the place is as it was. Nothing is
//   thrown.
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

// What has properties (platform/capture_keys.h): a device, a group, a stream.
// Thread: one at a time for a device and what belongs to it; a frame handler may read properties meanwhile.
class QUAZOR_EXPORT CaptureObject : public Object {
 public:
  ~CaptureObject() override;

  // The property's value; nothing when it cannot be read or the object has no such property.
  virtual std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) = 0;
  // Sets a property. Refused when the object has no such property, the property is read only, or the value is of the
  // wrong kind or out of range; the property then keeps its value.
  virtual bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) = 0;
};

// Thread: one at a time for a device's streams; a frame handler may read properties and call stop() meanwhile.
class QUAZOR_EXPORT CaptureStream : public CaptureObject {
 public:
  ~CaptureStream() override;

  // Starts delivering frames. Refused without control of the stream, and while it runs.
  virtual bool start(DiagnosticErrorPtr* error) = 0;
  // Stops delivering frames; when it returns, no handler is running or will run. Refused while it does not run.
  virtual bool stop(DiagnosticErrorPtr* error) = 0;
};
using CaptureStreams = std::vector<std::shared_ptr<CaptureStream>>;

// Streams that can run in lockstep, one of them as the master.
// Thread: one at a time for a device and its groups.
class QUAZOR_EXPORT SynchronizedStreamsGroup : public CaptureObject {
 public:
  ~SynchronizedStreamsGroup() override;

  // The group's streams, in a fixed order.
  virtual std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) = 0;
};
using SynchronizedStreamsGroups = std::vector<std::shared_ptr<SynchronizedStreamsGroup>>;

// Thread: one at a time; different devices are independent.
class QUAZOR_EXPORT CaptureDevice : public CaptureObject {
 public:
  ~CaptureDevice() override;

  // The device's streams, in a fixed order.
  virtual std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) = 0;
  // The groups of streams that can be synchronised, in a fixed order.
  virtual std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) = 0;
  // Takes the streams for this user: all of them or, on failure, none.
  virtual bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) = 0;
  // Gives the streams back.
  virtual bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) = 0;
  // Ends the use of the device: its streams stop, their control is given back, and every later call is refused.
  virtual bool invalidate(DiagnosticErrorPtr* error) = 0;
};

// Thread: any.
class QUAZOR_EXPORT CapturePlugIn : public Object {
 public:
  ~CapturePlugIn() override;

  // The capture device, or null.
  virtual std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) = 0;
};

// Where a capture plug-in comes from.
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
