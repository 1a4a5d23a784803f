// A scripted capture service, for behaviour that no healthy phone has.
#pragma once

#include "contract/message_format.h"
#include "platform/capture_service.h"

#include <algorithm>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

struct ScriptedCall {
  std::string_view object;     // "service", "plug-in", or the ID of a device, a group or a stream
  std::string_view operation;  // "setValue"
  std::string detail;          // the key of a property, KEY = VALUE for a setter, or a list of streams
  bool succeeds = true;        // the result of the call unless the script changes it
  DiagnosticErrorPtr* error = nullptr;
};

// Decides whether a call succeeds, before it has any effect, and stores the call's error. Without a script all possible
// calls succeed.
using CaptureScript = std::function<bool(const ScriptedCall& call)>;

// Base class of the objects that consult the script. Thread: one at a time.
class Scripted {
 public:
  Scripted(std::string id, CaptureScript script) : id_(std::move(id)), script_(std::move(script)) {}

  const std::string& id() const { return id_; }
  bool ask(std::string_view operation, std::string detail, bool succeeds, DiagnosticErrorPtr* error) const {
    return script_ ? script_({id_, operation, std::move(detail), succeeds, error}) : succeeds;
  }

 private:
  const std::string id_;
  const CaptureScript script_;
};

// Stores all properties that it is given, except refused ones. Thread: one at a time.
template <class Interface>
class ScriptedObject : public Interface {
 public:
  explicit ScriptedObject(std::string id, CaptureScript script = {}) : scripted_(std::move(id), std::move(script)) {}

  std::string description() const override { return scripted_.id(); }
  std::optional<Value> valueForProperty(std::string_view key, DiagnosticErrorPtr* error) override {
    const Value* const value = properties.find(key);
    const bool succeeds = ask("valueForProperty", std::string(key), value != nullptr, error);
    return succeeds && value != nullptr ? std::optional(*value) : std::nullopt;
  }
  bool setValue(const Value& value, std::string_view key, DiagnosticErrorPtr* error) override {
    const bool accepted = !refused.contains(std::string(key));
    if (!ask("setValue", std::string(key) + " = " + defaultText(value), accepted, error)) return false;
    properties.set(key, value);
    return true;
  }

  Dictionary properties;
  std::set<std::string> refused;  // property keys, "start" and "stop"

 protected:
  bool ask(std::string_view operation, std::string detail, bool succeeds, DiagnosticErrorPtr* error) const {
    return scripted_.ask(operation, std::move(detail), succeeds, error);
  }

 private:
  const Scripted scripted_;
};

// Thread: one at a time.
class ScriptedStream final : public ScriptedObject<CaptureStream> {
 public:
  using ScriptedObject::ScriptedObject;

  bool start(DiagnosticErrorPtr* error) override { return ask("start", "", !refused.contains("start"), error); }
  bool stop(DiagnosticErrorPtr* error) override { return ask("stop", "", !refused.contains("stop"), error); }
};

// Thread: one at a time.
class ScriptedGroup final : public ScriptedObject<SynchronizedStreamsGroup> {
 public:
  using ScriptedObject::ScriptedObject;

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    return ask("streams", "", members.has_value(), error) ? members : std::nullopt;
  }

  std::optional<CaptureStreams> members;
};

// Thread: one at a time.
class ScriptedDevice final : public ScriptedObject<CaptureDevice> {
 public:
  using ScriptedObject::ScriptedObject;

  std::optional<CaptureStreams> streams(DiagnosticErrorPtr* error) override {
    return ask("streams", "", members.has_value(), error) ? members : std::nullopt;
  }
  std::optional<SynchronizedStreamsGroups> synchronizedStreamsGroups(DiagnosticErrorPtr* error) override {
    return ask("synchronizedStreamsGroups", "", true, error) ? std::optional(groups) : std::nullopt;
  }
  bool requestControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    if (!ask("requestControlOfStreams", listOf(streams), true, error)) return false;
    controlled.insert(controlled.end(), streams.begin(), streams.end());
    return true;
  }
  bool relinquishControlOfStreams(const CaptureStreams& streams, DiagnosticErrorPtr* error) override {
    if (!ask("relinquishControlOfStreams", listOf(streams), true, error)) return false;
    std::erase_if(controlled, [&](const auto& one) { return std::ranges::find(streams, one) != streams.end(); });
    return true;
  }
  bool invalidate(DiagnosticErrorPtr* error) override { return ask("invalidate", "", true, error); }

  std::optional<CaptureStreams> members;
  SynchronizedStreamsGroups groups;
  CaptureStreams controlled;  // in the order of the requests

 private:
  static std::string listOf(const CaptureStreams& streams) {
    return defaultText(Array(streams.begin(), streams.end()));
  }
};

// Thread: one at a time.
class ScriptedPlugIn final : public CapturePlugIn {
 public:
  ScriptedPlugIn(std::shared_ptr<CaptureDevice> device, CaptureScript script)
      : device_(std::move(device)), scripted_("plug-in", std::move(script)) {}

  std::string description() const override { return scripted_.id(); }
  std::shared_ptr<CaptureDevice> device(DiagnosticErrorPtr* error) override {
    return scripted_.ask("device", "", device_ != nullptr, error) ? device_ : nullptr;
  }

 private:
  const std::shared_ptr<CaptureDevice> device_;
  const Scripted scripted_;
};

// Returns a new plug-in with the device in every call. Thread: one at a time.
class ScriptedCapture final : public CaptureService {
 public:
  explicit ScriptedCapture(std::shared_ptr<CaptureDevice> onlyDevice, CaptureScript script = {})
      : device(std::move(onlyDevice)), script_(std::move(script)) {}

  std::shared_ptr<CapturePlugIn> createPlugIn() override { return make("createPlugIn"); }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override { return make("defaultPlugIn"); }

  std::shared_ptr<CaptureDevice> device;  // for future plug-ins
  std::weak_ptr<CapturePlugIn> lastPlugIn;

 private:
  std::shared_ptr<CapturePlugIn> make(std::string_view operation) {
    if (!Scripted("service", script_).ask(operation, "", true, nullptr)) return nullptr;
    auto plugIn = std::make_shared<ScriptedPlugIn>(device, script_);
    lastPlugIn = plugIn;
    return plugIn;
  }

  const CaptureScript script_;
};

}  // namespace quazor
