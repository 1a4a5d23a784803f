// Reads a JSON object a line and prints the figures of this folder for it, for statistics_oracle_test.py.
#include "host/statistics/capability.h"
#include "host/statistics/control_rules.h"
#include "host/statistics/gauge.h"
#include "host/statistics/proportion.h"
#include "host/statistics/trend.h"

#include <nlohmann/json.hpp>

#include <iostream>
#include <string>

namespace quazor {
namespace {

using Json = nlohmann::json;

Moments momentsOf(const Json& values) {
  Moments moments;
  for (const Json& one : values) moments.add(one.get<double>());
  return moments;
}

Json figuresOf(const Json& asked) {
  Json figures;
  const Interval interval = wilsonInterval(asked["hits"], asked["trials"]);
  figures["wilson"] = {interval.low, interval.high};
  std::vector<CapabilityGroup> groups;
  std::vector<Moments> days;
  for (const Json& values : asked["days"]) {
    const Moments& day = days.emplace_back(momentsOf(values));
    groups.push_back({"S", std::to_string(groups.size()), day, day.count(), day.count()});
  }
  const Capability capability = capabilityOf(groups, asked["lower"].get<double>(), asked["upper"].get<double>());
  figures["mean"] = capability.values.mean();
  figures["deviation"] = capability.values.deviation();
  figures["within"] = capability.within;
  figures["refusal"] = capability.refusal;
  if (capability.cpk) figures["cpk"] = *capability.cpk;
  if (capability.ppk) figures["ppk"] = *capability.ppk;
  figures["broken"] = Json::array();
  if (const std::optional<ControlChart> chart = controlChart(days)) {
    for (const BrokenRule& one : brokenRules(chart->distances)) figures["broken"].push_back({one.rule, one.point});
  }
  std::vector<double> means;
  for (const Moments& day : days) means.push_back(day.mean());
  if (const std::optional<Trend> trend = trendOf(means)) figures["trend"] = {trend->tau, trend->chance};
  if (const std::optional<Trend> trend = trendOf(asked["tied"])) figures["tied"] = {trend->tau, trend->chance};
  figures["binomial"] = chanceOfAtLeast(asked["hits"], asked["trials"], asked["rate"]);
  std::vector<GaugeReading> readings;
  for (const Json& one : asked["readings"]) readings.push_back({one[0], one[1], one[2]});
  const GaugeResult gauge = gaugeStudy(readings);
  if (gauge.study) {
    const GaugeStudy& study = *gauge.study;
    figures["gauge"] = {study.repeatability, study.reproducibility, study.partToPart, study.interactionF, study.share};
  }
  return figures;
}

}  // namespace
}  // namespace quazor

int main() {
  for (std::string line; std::getline(std::cin, line);) {
    std::cout << quazor::figuresOf(nlohmann::json::parse(line)) << '\n';
  }
  return 0;
}
