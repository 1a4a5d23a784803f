// What the tests of report channels and of projector faults expect alike.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/message_format.h"
#include "contract/results.h"

#include <array>
#include <memory>
#include <string>
#include <string_view>

namespace quazor {

// The channels of a sound depth camera module, spelled out once more: a slip in the list under test must show.
inline constexpr std::array<std::string_view, 60> kModuleChannels{"Number Vok INT_ADC_READY_LATCH",
                                                                  "Number Vok INT_BBSAT_LATCH",
                                                                  "Number Vok INT_FAULT_BBA_OVC_LATCH",
                                                                  "Number Vok INT_FAULT_BBA_OVP_LATCH",
                                                                  "Number Vok INT_FAULT_BBA_OVV_LATCH",
                                                                  "Number Vok INT_FAULT_BBA_UDC_LATCH",
                                                                  "Number Vok INT_FAULT_BBA_WDG_SFST_LATCH",
                                                                  "Number Vok INT_FAULT_BBB_OVC_LATCH",
                                                                  "Number Vok INT_FAULT_BBB_OVP_LATCH",
                                                                  "Number Vok INT_FAULT_BBB_OVV_LATCH",
                                                                  "Number Vok INT_FAULT_BBB_UDC_LATCH",
                                                                  "Number Vok INT_FAULT_BBB_WDG_SFST_LATCH",
                                                                  "Number Vok INT_FAULT_CC",
                                                                  "Number Vok INT_FAULT_LS_OVC_LATCH",
                                                                  "Number Vok INT_FAULT_LVT_LATCH",
                                                                  "Number Vok INT_FAULT_MAXDC_CLKLP_BBA_LATCH",
                                                                  "Number Vok INT_FAULT_MAXDC_CLKLP_BBB_LATCH",
                                                                  "Number Vok INT_FAULT_MAXDC_CLKSAF_BBA_LATCH",
                                                                  "Number Vok INT_FAULT_MAXDC_CLKSAF_BBB_LATCH",
                                                                  "Number Vok INT_FAULT_MAXPC_LATCH",
                                                                  "Number Vok INT_FAULT_MAXPW_CLKLP_BBA_LATCH",
                                                                  "Number Vok INT_FAULT_MAXPW_CLKLP_BBB_LATCH",
                                                                  "Number Vok INT_FAULT_MAXPW_CLKSAF_BBA_LATCH",
                                                                  "Number Vok INT_FAULT_MAXPW_CLKSAF_BBB_LATCH",
                                                                  "Number Vok INT_FAULT_OTP_LATCH",
                                                                  "Number Vok INT_FAULT_SHORTANODE_ACT_LATCH",
                                                                  "Number Vok INT_FAULT_SHORTANODE_LATCH",
                                                                  "Number Vok INT_FAULT_STBYDLY_LATCH",
                                                                  "Number Vok INT_FAULT_STROBE_SHORT_LATCH",
                                                                  "Number Vok INT_FAULT_TAMP_LATCH",
                                                                  "Number Vok INT_FAULT_THROT_LATCH",
                                                                  "Number Vok INT_FAULT_THSD_LATCH",
                                                                  "Number Vok INT_FAULT_TSD_WARN_LATCH",
                                                                  "Number Vok INT_FAULT_VINUVLO_LATCH",
                                                                  "Number Vok INT_FAULT_VIN_OVV_LATCH",
                                                                  "Number Vok INT_FAULT_XEF0",
                                                                  "Number Vok INT_FAULT_XEF1",
                                                                  "Number Vok INT_I2CWDG_LATCH",
                                                                  "Number Vok INT_MODE1_LATCH",
                                                                  "Number Vok INT_SUPPLY_LATCH",
                                                                  "Number KT ARM_KT_NOREAD",
                                                                  "Number KT ARM_KT_STATE",
                                                                  "Number KT EN_FORCE_LOW",
                                                                  "Number KT EN_PIN_STATE",
                                                                  "Number KT MODID_ECC_ERR",
                                                                  "Number KT MRI_ECC_ERR",
                                                                  "Number KT MRI_ECC_ERR_FATAL",
                                                                  "Number KT NON_ZERO_PASS_KEY",
                                                                  "Number KT PASS_KEY_ECC_ERR",
                                                                  "Number KT PASS_KEY_ECC_ERR_FATAL",
                                                                  "Number ZE FAULT_A",
                                                                  "Number ZE FAULT_B",
                                                                  "Number ZE FAULT_C",
                                                                  "Number ZE FAULT_D",
                                                                  "Number ZE FAULT_E",
                                                                  "Number ZE FAULT_NVM",
                                                                  "Number ZE FAULT_UV",
                                                                  "Number ZE FAULT_OV",
                                                                  "Number Dwna NTC",
                                                                  "Number Fenk NTC"};

// A result in which every channel of the module counted nothing.
inline QZExperimentResult resultOfQuietModule() {
  QZExperimentResult result;
  for (const std::string_view name : kModuleChannels) {
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
