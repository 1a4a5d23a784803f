// What the tests of report channels and of projector faults expect alike.
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

// The channels of a sound depth camera module, in their order: those of the healthy phone.
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

// A result in which every channel of the module counted nothing.
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

// NAME = VALUE UNIT [LIMIT: LOWER to UPPER]
inline std::string told(const QZMeasuredResult& measured) {
  std::string text = measured.name() + " = " + told(measured.measurement());
  if (const auto& limit = measured.limit()) {
    text += " [" + limit->name() + ": " + told(limit->lowerBound()) + " to " + told(limit->upperBound()) + ']';
  }
  return text;
}

// Every measured result on a line of its own.
inline std::string told(const QZAnalysisResult& result) {
  std::string text;
  for (const QZMeasuredResult& measured : result.measuredResults()) text += told(measured) + '\n';
  return text;
}

// Every measurement on a line of its own, and then the auxiliary data.
inline std::string told(const QZExperimentResult& result) {
  std::string text;
  for (const auto& [name, measurement] : result.measurements()) text += name + " = " + told(measurement) + '\n';
  for (const auto& [key, value] : result.auxiliaryData()) text += key + ": " + defaultText(value) + '\n';
  return text;
}

// DOMAIN CODE MESSAGE, and every entry of the user info that is not the message.
inline std::string told(const DiagnosticErrorPtr& error) {
  if (error == nullptr) return "none";
  std::string text = error->domain() + ' ' + std::to_string(error->code()) + ' ' + error->localizedDescription();
  for (const auto& [key, value] : error->userInfo()) {
    if (key != localizedDescriptionKey) text += " {" + key + ": " + defaultText(value) + '}';
  }
  return text;
}

// Whether a measurement lies within the bounds that its limit has; a closed bound belongs to its range.
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

// What a caller had in its place for errors before a call; only a failure may touch it.
inline DiagnosticErrorPtr earlierError() { return makeError("CallerErrorDomain", 1, "Here before."); }

}  // namespace quazor
