#include "backends/faults/intercepted_capture.h"

#include "backends/faults/operations.h"
#include "backends/faults/wrapper_cache.h"
#include "contract/message_format.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using Calls = std::shared_ptr<CallInterceptor>;

// A copy of the value in which `replace` has replaced each object.
template <class Replace>
Value withObjects(const Value& value, const Replace& replace) {
  if (const Array* const array = value.array()) {
    Array elements;
    for (const Value& element : *array) elements.push_back(withObjects(element, replace));
    return elements;
  }
  if (const Dictionary* const dictionary = value.dictionary()) {
    Dictionary entries;
    for (const auto& [key, entry] : *dictionary) entries.set(key, withObjects(entry, replace));
    return entries;
  }
  return value.kind() == Value::Kind::kObject ? replace(value.object()) : value;
}

// Thread: as the stream that it wraps.
class InterceptedStream final : public CaptureStream {
 public:
  InterceptedStream(std::shared_ptr<CaptureStream> stream, Calls calls, std::string name)
      : stream_(std::move(stream)), calls_(std::move(calls)), name_(std::move(name)) {}

  const std::shared_ptr<CaptureStream>& wrapped() const { return stream_; }
  const std::string& name() const { return name_; }

  std::string description() const override { return stream_->description(); }

  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    return calls_->perform(
        {capture_operation::kReadStream, name_, key}, error, [&] { return std::string(key); },
        [&] { return stream_->valueForProperty(key, error); });
  }
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    return calls_->perform(
        {capture_operation::kSetStream, name_, key}, error, [&] { return formatMessage("%@ = %@", key, value); },
        [&] { return stream_->setValue(value, key, error); });
  }
  bool start(DiagnosticErrorPtr* error) override {
    return calls_->perform({capture_operation::kStart, name_, {}}, error, [&] { return stream_->start(error); });
  }
  bool stop(DiagnosticErrorPtr* error) override {
    return calls_->perform({capture_operation::kStop, name_, {}}, error, [&] { return stream_->stop(error); });
  }

 private:
  const std::shared_ptr<CaptureStream> stream_;
  const Calls calls_;
  const std::string name_;
};

std::shared_ptr<CaptureStream> unwrapped(const std::shared_ptr<CaptureStream>& stream) {
  const auto own = std::dynamic_pointer_cast<InterceptedStream>(stream);
  return own == nullptr ? stream : own->wrapped();
}

CaptureStreams unwrapped(const CaptureStreams& streams) {
  CaptureStreams inner;
  for (const std::shared_ptr<CaptureStream>& stream : streams) inner.push_back(unwrapped(stream));
  return inner;
}

// "(a, b)": the names of the streams, or the descriptions of foreign ones.
std::string namesOf(const CaptureStreams& streams) {
  std::vector<std::string> names;
  for (const std::shared_ptr<CaptureStream>& stream : streams) {
    const auto* const own = dynamic_cast<const InterceptedStream*>(stream.get());
    names.push_back(own == nullptr ? defaultText(stream) : own->name());
  }
  return defaultText(names);
}

// What a device and its groups share: their names, and one wrapper for each stream and group. The streams' wrappers
// live as long as it, because a device keeps its streams, whoever else holds them.
//
// Thread: any.
class DeviceObjects final : public std::enable_shared_from_this<DeviceObjects> {
 public:
  DeviceObjects(CaptureDevice& device, Calls calls, const ObjectNames& names)
      : calls_(std::move(calls)),
        groupsOfDevice_(device.synchronizedStreamsGroups(nullptr).value_or(SynchronizedStreamsGroups{})) {
    const CaptureStreams streams = device.streams(nullptr).value_or(CaptureStreams{});
    for (std::size_t i = 0; i < std::min(streams.size(), names.streams.size()); ++i) {
      names_[streams[i].get()] = names.streams[i];
    }
    for (std::size_t i = 0; i < std::min(groupsOfDevice_.size(), names.groups.size()); ++i) {
      names_[groupsOfDevice_[i].get()] = names.groups[i];
    }
    for (const std::shared_ptr<CaptureStream>& stream : streams) streamsOfDevice_.push_back(wrap(stream));
  }

  const Calls& calls() const { return calls_; }
  const SynchronizedStreamsGroups& groupsOfDevice() const { return groupsOfDevice_; }

  std::shared_ptr<CaptureStream> wrap(const std::shared_ptr<CaptureStream>& stream) {
    return streams_.wrapperOf(stream,
                              [&] { return std::make_shared<InterceptedStream>(stream, calls_, nameOf(*stream)); });
  }
  std::shared_ptr<SynchronizedStreamsGroup> wrap(const std::shared_ptr<SynchronizedStreamsGroup>& group);

  template <class Object>
  std::optional<std::vector<std::shared_ptr<Object>>> wrap(
      const std::optional<std::vector<std::shared_ptr<Object>>>& objects) {
    if (!objects) return std::nullopt;
    std::vector<std::shared_ptr<Object>> wrappers;
    for (const std::shared_ptr<Object>& object : *objects) wrappers.push_back(wrap(object));
    return wrappers;
  }

  // Replaces streams and groups in values of properties: plug-ins receive wrappers, the device its own objects.
  std::optional<Value> wrap(const std::optional<Value>& value);
  static Value unwrap(const Value& value);

 private:
  std::string nameOf(const CaptureObject& object) const {
    const auto found = names_.find(&object);
    return found == names_.end() ? object.description() : found->second;
  }

  const Calls calls_;
  const SynchronizedStreamsGroups groupsOfDevice_;  // held, so that nothing else gets their addresses
  CaptureStreams streamsOfDevice_;                  // wrapped
  std::map<const CaptureObject*, std::string> names_;
  WrapperCache<CaptureStream, InterceptedStream> streams_;
  WrapperCache<SynchronizedStreamsGroup, SynchronizedStreamsGroup> groups_;
};

// Thread: as the group that it wraps.
class InterceptedGroup final : public SynchronizedStreamsGroup {
 public:
  InterceptedGroup(std::shared_ptr<SynchronizedStreamsGroup> group, std::shared_ptr<DeviceObjects> objects,
                   std::string name)
      : group_(std::move(group)), objects_(std::move(objects)), name_(std::move(name)) {}

  const std::shared_ptr<SynchronizedStreamsGroup>& wrapped() const { return group_; }

  std::string description() const override { return group_->description(); }

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    return objects_->calls()->perform({capture_operation::kGroupStreams, name_, {}}, error,
                                      [&] { return objects_->wrap(group_->streams(error)); });
  }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    return objects_->calls()->perform(
        {capture_operation::kReadGroup, name_, key}, error, [&] { return std::string(key); },
        [&] { return objects_->wrap(group_->valueForProperty(key, error)); });
  }
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    return objects_->calls()->perform(
        {capture_operation::kSetGroup, name_, key}, error, [&] { return formatMessage("%@ = %@", key, value); },
        [&] { return group_->setValue(DeviceObjects::unwrap(value), key, error); });
  }

 private:
  const std::shared_ptr<SynchronizedStreamsGroup> group_;
  const std::shared_ptr<DeviceObjects> objects_;
  const std::string name_;
};

std::shared_ptr<SynchronizedStreamsGroup> DeviceObjects::wrap(const std::shared_ptr<SynchronizedStreamsGroup>& group) {
  return groups_.wrapperOf(
      group, [&] { return std::make_shared<InterceptedGroup>(group, shared_from_this(), nameOf(*group)); });
}

std::optional<Value> DeviceObjects::wrap(const std::optional<Value>& value) {
  if (!value) return std::nullopt;
  return withObjects(*value, [this](const std::shared_ptr<Object>& object) -> Value {
    if (const auto stream = std::dynamic_pointer_cast<CaptureStream>(object)) return wrap(stream);
    if (const auto group = std::dynamic_pointer_cast<SynchronizedStreamsGroup>(object)) return wrap(group);
    return object;
  });
}

Value DeviceObjects::unwrap(const Value& value) {
  return withObjects(value, [](const std::shared_ptr<Object>& object) -> Value {
    if (const auto stream = std::dynamic_pointer_cast<InterceptedStream>(object)) return stream->wrapped();
    if (const auto group = std::dynamic_pointer_cast<InterceptedGroup>(object)) return group->wrapped();
    return object;
  });
}

// Thread: as the device that it wraps.
class InterceptedDevice final : public CaptureDevice {
 public:
  InterceptedDevice(std::shared_ptr<CaptureDevice> device, Calls calls, const ObjectNames& names)
      : device_(std::move(device)),
        calls_(std::move(calls)),
        objects_(std::make_shared<DeviceObjects>(*device_, calls_, names)),
        groups_(objects_->wrap(std::optional(objects_->groupsOfDevice()))) {}

  std::string description() const override { return device_->description(); }

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    return calls_->perform({capture_operation::kDeviceStreams, {}, {}}, error,
                           [&] { return objects_->wrap(device_->streams(error)); });
  }
  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) override {
    return calls_->perform({capture_operation::kGroups, {}, {}}, error,
                           [&] { return objects_->wrap(device_->synchronizedStreamsGroups(error)); });
  }
  bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    return calls_->perform(
        {capture_operation::kRequestControl, {}, {}}, error, [&] { return namesOf(streams); },
        [&] { return device_->requestControlOfStreams(unwrapped(streams), error); });
  }
  bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    return calls_->perform(
        {capture_operation::kRelinquishControl, {}, {}}, error, [&] { return namesOf(streams); },
        [&] { return device_->relinquishControlOfStreams(unwrapped(streams), error); });
  }
  bool invalidate(DiagnosticErrorPtr* error) override {
    return calls_->perform({capture_operation::kInvalidate, {}, {}}, error, [&] { return device_->invalidate(error); });
  }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    return calls_->perform(
        {capture_operation::kReadDevice, {}, key}, error, [&] { return std::string(key); },
        [&] { return objects_->wrap(device_->valueForProperty(key, error)); });
  }
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    return calls_->perform(
        {capture_operation::kSetDevice, {}, key}, error, [&] { return formatMessage("%@ = %@", key, value); },
        [&] { return device_->setValue(DeviceObjects::unwrap(value), key, error); });
  }

 private:
  const std::shared_ptr<CaptureDevice> device_;
  const Calls calls_;
  const std::shared_ptr<DeviceObjects> objects_;
  const std::optional<SynchronizedStreamsGroups> groups_;  // wrapped; not in DeviceObjects, which groups hold
};

// Shared by the plug-ins of a service. Thread: any.
struct PlugInContext {
  Calls calls;
  std::shared_ptr<const ObjectNames> names;
  WrapperCache<CaptureDevice, InterceptedDevice> devices;
};

// Thread: any.
class InterceptedPlugIn final : public CapturePlugIn {
 public:
  InterceptedPlugIn(std::shared_ptr<CapturePlugIn> plugIn, std::shared_ptr<PlugInContext> context)
      : plugIn_(std::move(plugIn)), context_(std::move(context)) {}

  std::string description() const override { return plugIn_->description(); }

  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override {
    return context_->calls->perform(
        {capture_operation::kDevice, {}, {}}, error, [&]() -> std::shared_ptr<CaptureDevice> {
          const std::shared_ptr<CaptureDevice> device = plugIn_->device(error);
          return context_->devices.wrapperOf(
              device, [&] { return std::make_shared<InterceptedDevice>(device, context_->calls, *context_->names); });
        });
  }

 private:
  const std::shared_ptr<CapturePlugIn> plugIn_;
  const std::shared_ptr<PlugInContext> context_;
};

// Thread: any.
class InterceptedCapture final : public CaptureService {
 public:
  InterceptedCapture(std::shared_ptr<CaptureService> capture, Calls calls, std::shared_ptr<const ObjectNames> names)
      : capture_(std::move(capture)), context_(std::make_shared<PlugInContext>()) {
    context_->calls = std::move(calls);
    context_->names = std::move(names);
  }

  std::shared_ptr<CapturePlugIn> createPlugIn() override {
    return context_->calls->perform({capture_operation::kCreatePlugIn, {}, {}}, nullptr,
                                    [&] { return wrap(capture_->createPlugIn()); });
  }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override {
    return context_->calls->perform({capture_operation::kDefaultPlugIn, {}, {}}, nullptr,
                                    [&] { return wrap(capture_->defaultPlugIn()); });
  }

 private:
  std::shared_ptr<CapturePlugIn> wrap(const std::shared_ptr<CapturePlugIn>& plugIn) {
    return plugIns_.wrapperOf(plugIn, [&] { return std::make_shared<InterceptedPlugIn>(plugIn, context_); });
  }

  const std::shared_ptr<CaptureService> capture_;
  const std::shared_ptr<PlugInContext> context_;
  WrapperCache<CapturePlugIn, CapturePlugIn> plugIns_;
};

}  // namespace

std::shared_ptr<CaptureService> interceptedCapture(std::shared_ptr<CaptureService> capture,
                                                   std::shared_ptr<CallInterceptor> calls,
                                                   std::shared_ptr<const ObjectNames> names) {
  return std::make_shared<InterceptedCapture>(std::move(capture), std::move(calls), std::move(names));
}

}  // namespace quazor
