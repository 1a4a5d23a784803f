#include "tests/sweeps/camera_sync_oracle.h"

namespace quazor::oracle {

namespace {

constexpr const char* kNone = "(null)";

std::string list(const std::vector<std::string>& texts) {
  std::string joined;
  for (const std::string& text : texts) joined += (joined.empty() ? "" : ", ") + text;
  return '(' + joined + ')';
}

std::string cameraName(const std::string& port) {
  static const std::map<std::string, std::string> names{{"BackFacingCamera", "BackWide"},
                                                        {"FrontFacingCamera", "Front"},
                                                        {"BackFacingTelephotoCamera", "BackTele"},
                                                        {"FrontFacingInfraredCamera", "FrontInfrared"},
                                                        {"BackFacingSuperWideCamera", "BackSuperWide"}};
  return names.at(port);
}

// The text of an error of the experiment and the error that caused it.
std::string ownError(int code, const std::string& message, const std::string& cause = kNone) {
  return "QZCapturePlugInErrorDomain code " + std::to_string(code) + ": " + message +
         (cause == kNone ? "" : ", caused by " + cause);
}

// A run, step by step. Each step returns whether the run continues.
class Run {
 public:
  Run(const Phone& phone, const Request& request, const Failures& failures)
      : phone_(phone), request_(request), failures_(failures), runs_(phone.cameras.size(), false) {}

  Prediction predict(bool hasPlaceForError) {
    const bool succeeded = load() && synchronize() && configure() && start() && measure();
    Prediction prediction;
    prediction.told = lines_ + (succeeded ? "returned a result\n" : "returned nothing\n");
    if (!hasPlaceForError) {
      prediction.told += "no place for an error\n";
    } else if (succeeded) {
      prediction.told += "error untouched\n";
    } else {
      prediction.told += error_.empty() ? "error emptied\n" : "error " + error_ + '\n';
    }
    if (succeeded) prediction.told += measurements_ + "ErrorCounters = {" + counters_ + "}\n";
    prediction.calls = calls_;
    return prediction;
  }

 private:
  // The next call; returns whether it succeeds. `refusal` is the reason why the phone itself would reject the call;
  // empty if it would not. Stores the text of the call's error in cause_.
  bool call(const std::string& line, const std::string& refusal = "") {
    const auto failure = failures_.find(++calls_);
    const bool fails = failure != failures_.end();
    cause_ = fails ? failure->second.value_or(kNone) : (refusal.empty() ? kNone : refusal);
    const bool succeeds = !fails && refusal.empty();
    lines_ += line + (succeeds ? "\n" : " -> failed\n");
    return succeeds;
  }
  void logError(const std::string& text) { lines_ += "log error: " + text + '\n'; }
  void logDefault(const std::string& text) { lines_ += "log default: " + text + '\n'; }
  bool fail(const std::string& error) {
    error_ = error;
    return false;
  }
  bool failToSynchronize(const std::string& logLine) {
    logError(logLine);
    return fail(ownError(214, "Failed to synchronize cameras!"));
  }

  const PhoneCamera& camera(std::size_t position) const { return phone_.cameras[selected_[position]]; }
  std::string selectedIds() const {
    std::vector<std::string> ids;
    for (const std::size_t index : selected_) ids.push_back(phone_.cameras[index].id);
    return list(ids);
  }

  bool load() {
    if (!call("service create plug-in")) {
      logError("Failed to load capture plugin!");
      return fail(ownError(200, "Failed to create capture device!"));
    }
    if (!call("plug-in get device")) {
      logError("Failed to create capture device! " + cause_);
      return fail(ownError(200, "Failed to create capture device!", cause_));
    }
    return true;
  }

  bool synchronize() {
    if (!call("device get groups")) return failToSynchronize("Failed to copy groups from device! " + cause_);
    if (!chooseGroup()) {
      return failToSynchronize("Failed to find appropriate group for ports " + list(request_.ports) + '!');
    }
    if (!call("device request control " + selectedIds())) {
      return failToSynchronize("Failed to request control streams " + list(request_.ports) + "! " + cause_);
    }
    std::vector<std::string> streams;
    for (std::size_t i = 0; i < selected_.size(); ++i) {
      streams.push_back("stream " + camera(i).id + " (" + camera(i).port + ')');
    }
    if (!call(group_->id + " set ActiveStreams = " + list(streams))) {
      return failToSynchronize("Failed to set the active streams " + cause_ + '!');
    }
    if (!call(group_->id + " get SynchronizationMaster") || group_->master != selected_.front()) {
      return failToSynchronize("The sync master port must be provided first!");
    }
    if (!call("device set MultiCamConfiguration = {ActiveSynchronizedStreamsGroups = (group " + group_->id + ")}")) {
      return failToSynchronize("Failed to set the multicam config! " + cause_);
    }
    enableMultipleOutputs();
    return configureSlaves();
  }

  bool chooseGroup() {
    for (const PhoneGroup& group : phone_.groups) {
      if (!call(group.id + " get streams") || group.cameras.size() < request_.ports.size()) continue;
      selected_.clear();
      for (const std::string& port : request_.ports) selectStream(group, port);
      if (selected_.size() != request_.ports.size()) continue;
      group_ = &group;
      return true;
    }
    return false;
  }

  void selectStream(const PhoneGroup& group, const std::string& port) {
    for (const std::size_t index : group.cameras) {
      if (call(phone_.cameras[index].id + " get PortType") && phone_.cameras[index].port == port) {
        selected_.push_back(index);
        return;
      }
    }
  }

  void enableMultipleOutputs() {
    for (std::size_t i = 0; i < selected_.size(); ++i) {
      const bool enabled = call(camera(i).id + " set MultipleOutputSupportEnabled = 1");
      if (!enabled) {
        logError("Failed to configure " + request_.ports[i] + " for multiple output support! " + cause_);
      } else if (i > 0) {
        slaves_.push_back(i);
      }
    }
  }

  bool configureSlaves() {
    const std::string configuration =
        "{StreamingOutputsEnabled = 1; FrameSkippingEnabled = 0; TimeMachineEnabled = 0; "
        "MasterToSlaveFrameRateRatio = 1}";
    const bool known = call(group_->id + " get MasterConfigurationSupportedKeys");
    if (known && group_->masterConfiguration) {
      logDefault("Device supports SlaveConfigurationByPortType");
      std::string entries;
      for (const std::size_t slave : slaves_) {
        entries += (entries.empty() ? "" : "; ") + request_.ports[slave] + " = " + configuration;
      }
      if (call(group_->id + " set MasterConfiguration = {SlaveConfigurationByPortType = {" + entries + "}}"))
        return true;
      return failToSynchronize("Failed to set the slave config! " + cause_);
    }
    logDefault(
        "Device does not support SlaveConfigurationByPortType, using SynchronizedStreamsSlaveConfiguration instead.");
    for (const std::size_t slave : slaves_) {
      for (std::size_t i = 0; i < selected_.size(); ++i) {
        if (!call(camera(i).id + " get PortType") || camera(i).port != request_.ports[slave]) continue;
        if (!call(camera(i).id + " set SynchronizedStreamsSlaveConfiguration = " + configuration)) {
          return failToSynchronize("Failed to set the slave config! " + cause_);
        }
      }
    }
    return true;
  }

  bool configure() {
    const std::string rate = std::to_string(request_.frameRate);
    for (std::size_t i = 0; i < selected_.size(); ++i) {
      const std::string& port = request_.ports[i];
      const std::string format = std::to_string(request_.formatIndexes[i]);
      if (!call(camera(i).id + " set FormatIndex = " + format)) {
        logError("Failed to set the format index to " + format + " on " + port + "! " + cause_);
        error_ = ownError(209, "Failed to set format index to " + format, cause_);
      } else if (!call(camera(i).id + " set MinimumFrameRate = " + rate)) {
        logError("Failed to set the min frame rate to " + rate + " on " + port + "! " + cause_);
      } else if (!call(camera(i).id + " set MaximumFrameRate = " + rate)) {
        logError("Failed to set the max frame rate to " + rate + " on " + port + "! " + cause_);
      } else {
        continue;
      }
      call("device relinquish control " + selectedIds());
      return false;
    }
    return true;
  }

  bool start() {
    for (std::size_t i = 0; i < selected_.size(); ++i) {
      if (call(camera(i).id + " start")) {
        runs_[selected_[i]] = true;
        continue;
      }
      const std::string message = "Failed to start steam at " + request_.ports[i] + " port! " + cause_;
      logError(message);
      error_ = ownError(204, message, cause_);
      abandon();
      return false;
    }
    return true;
  }

  // The phone rejects stopping a stream that does not run, and releasing control of one that runs.
  bool stop(std::size_t position) {
    const std::size_t index = selected_[position];
    const bool stopped = call(camera(position).id + " stop", runs_[index] ? "" : "not running");
    if (stopped) runs_[index] = false;
    return stopped;
  }
  bool relinquish() {
    std::string refusal;
    for (std::size_t i = selected_.size(); i > 0; --i) {
      if (runs_[selected_[i - 1]]) {
        refusal =
            "SimulatedCaptureErrorDomain code 10: " + camera(i - 1).id + " is running; stop it before giving it back.";
      }
    }
    return call("device relinquish control " + selectedIds(), refusal);
  }
  void abandon() {
    for (std::size_t i = selected_.size(); i > 0; --i) stop(i - 1);
    relinquish();
  }

  bool measure() {
    lines_ += "clock sleep " + std::to_string(request_.seconds) + '\n';
    if (!call("device get MulticamSessionStatus")) {
      const std::string cause = cause_;
      abandon();
      logError("Failed to copy session status! " + cause);
      return fail(ownError(215, "Failed to copy sesison status!", cause));
    }
    for (std::size_t i = 0; i < selected_.size(); ++i) {
      if (!measureStream(i)) {
        abandon();
        return false;
      }
    }
    for (std::size_t i = selected_.size(); i > 0; --i) {
      if (!stop(i - 1)) logError("Failed to stop steam! " + cause_);
    }
    if (!relinquish()) logError("Failed to relinquish steam! " + cause_);
    return true;
  }

  // The master delivers every frame at its full rate; a slave lacks the frames before its first one.
  bool measureStream(std::size_t position) {
    const std::string& port = request_.ports[position];
    if (!call(camera(position).id + " get ErrorCounters")) {
      logError("Failed to get error counters of steam at " + port + " port! " + cause_);
      return fail(ownError(210, "No error counters for port " + port + '!', cause_));
    }
    const auto total = static_cast<std::uint64_t>(request_.frameRate) * static_cast<std::uint64_t>(request_.seconds);
    const std::string offset = std::to_string(camera(position).firstFrameOffset);
    const std::string frames = std::to_string(total - camera(position).firstFrameOffset);
    const std::string& counters = camera(position).errorCounters;
    logDefault(port + (position == 0 ? " <-- sync master" : "") + "\n  Offset: " + offset + "\n  Frames: " + frames +
               "\n  Total: " + std::to_string(total) + "\n  ErrorCounters: " + counters + '\n');
    const std::string name = cameraName(port);
    measurements_ += name + ".FrameOffset = " + offset + " frames\n" + name + ".Frames = " + frames + " frames\n";
    counters_ += (counters_.empty() ? "" : "; ") + name + " = " + counters;
    return true;
  }

  const Phone& phone_;
  const Request& request_;
  const Failures& failures_;

  std::size_t calls_ = 0;
  std::string lines_;
  std::string cause_;  // of the last call
  std::string error_;  // of the run; empty if there is none

  const PhoneGroup* group_ = nullptr;
  std::vector<std::size_t> selected_;  // indexes of cameras, in the order of the ports
  std::vector<std::size_t> slaves_;    // indexes of ports
  std::vector<bool> runs_;             // by index of the camera
  std::string measurements_;
  std::string counters_;
};

}  // namespace

Prediction predictRun(const Phone& phone, const Request& request, const Failures& failures, bool hasPlaceForError) {
  return Run(phone, request, failures).predict(hasPlaceForError);
}

}  // namespace quazor::oracle
