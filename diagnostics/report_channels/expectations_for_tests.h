// Expectations shared by the tests of report channels and of projector faults.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/message_format.h"
#include "contract/results.h"
#include "tests/support/shipped_scenario.h"

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The channels of a healthy depth camera module, in order, as on the healthy phone.
inline const std::vector<std::string>& moduleChannels() {
  static const std::vector<std::string> kNames = [] {
    std::vector<std::string> names;
    for (const ReportChannelConfig& channel : shippedScenario("healthy").reports) {
      if (channel.group == "K42ISP" && channel.subGroup == "K42ISP Events") names.push_back(channel.name);
    }
    return names;
  }();
  return kNames;
}

// A result in which all channels of the module are 0.
inline QZExperimentResult resultOfQuietModule() {
  QZExperimentResult result;
  for (const std::string_view name : moduleChannels()) {
    result.measurements().set(name, Measurement(0, QZDimensionlessUnit::events()));
  }
  return result;
}

inline std::string told(const Measurement& measurement) {
  return defaultText(measurement.value()) + ' ' + measurement.unit().symbol();
}

inline std::string told(const std::shared_ptr<const QZBound>& bound) {
  if (bound == nullptr) return "none";
  return told(bound->value()) + (bound->open() ? " open" : " closed");
}

// Formats as NAME = VALUE UNIT [LIMIT: LOWER to UPPER].
inline std::string told(const QZMeasuredResult& measured) {
  std::string text = measured.name() + " = " + told(measured.measurement());
  if (const auto& limit = measured.limit()) {
    text += " [" + limit->name() + ": " + told(limit->lowerBound()) + " to " + told(limit->upperBound()) + ']';
  }
  return text;
}

// One line per measured result.
inline std::string told(const QZAnalysisResult& result) {
  std::string text;
  for (const QZMeasuredResult& measured : result.measuredResults()) text += told(measured) + '\n';
  return text;
}

// One line per measurement, then the auxiliary data.
inline std::string told(const QZExperimentResult& result) {
  std::string text;
  for (const auto& [name, measurement] : result.measurements()) text += name + " = " + told(measurement) + '\n';
  for (const auto& [key, value] : result.auxiliaryData()) text += key + ": " + defaultText(value) + '\n';
  return text;
}

// DOMAIN CODE MESSAGE, and all other entries of the user info.
inline std::string told(const DiagnosticErrorPtr& error) {
  if (error == nullptr) return "none";
  std::string text = error->domain() + ' ' + std::to_string(error->code()) + ' ' + error->localizedDescription();
  for (const auto& [key, value] : error->userInfo()) {
    if (key != localizedDescriptionKey) text += " {" + key + ": " + defaultText(value) + '}';
  }
  return text;
}

// True if the measurement lies within the bounds of its limit; closed bounds are included.
inline bool isInside(const QZMeasuredResult& measured) {
  const double value = measured.measurement().value();
  const auto& lower = measured.limit().value().lowerBound();
  const auto& upper = measured.limit().value().upperBound();
  const bool highEnough =
      lower == nullptr || value > lower->value().value() || (!lower->open() && value == lower->value().value());
  const bool lowEnough =
      upper == nullptr || value < upper->value().value() || (!upper->open() && value == upper->value().value());
  return highEnough && lowEnough;
}

// The previous content of a caller's error variable, which only a failure may change.
inline DiagnosticErrorPtr earlierError() { return makeError("CallerErrorDomain", 1, "Here before."); }

}  // namespace quazor
