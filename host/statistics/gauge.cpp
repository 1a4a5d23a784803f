#include "host/statistics/gauge.h"

#include "contract/message_format.h"
#include "host/statistics/moments.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <set>
#include <utility>

namespace quazor {

namespace {

using Cell = std::pair<std::string, std::string>;

std::string nameOf(const Cell& cell) { return "phone " + cell.first + " at station " + cell.second; }

// Why the table is not full; empty if it is.
std::string gapIn(const std::map<Cell, Moments>& cells, const std::map<std::string, Moments>& parts,
                  const std::map<std::string, Moments>& places) {
  if (parts.size() < 2) return "it takes at least two phones with a serial number";
  if (places.size() < 2) return "it takes at least two stations";
  const auto most = std::max_element(cells.begin(), cells.end(),
                                     [](const auto& a, const auto& b) { return a.second.count() < b.second.count(); });
  if (most->second.count() < 2) return "no phone was measured twice at one station";
  for (const auto& [part, ignored] : parts) {
    for (const auto& [place, alsoIgnored] : places) {
      const auto cell = cells.find({part, place});
      const std::uint64_t count = cell == cells.end() ? 0 : cell->second.count();
      if (count == most->second.count()) continue;
      return formatMessage("the table is not full: %@ has %@ of the %@ values that %@ has", nameOf({part, place}),
                           count, most->second.count(), nameOf(most->first));
    }
  }
  return {};
}

// The sum of the squared distances of the means from that of all, each weighted by its number of values.
template <class Groups>
double squaresBetween(const Groups& groups, double mean) {
  double squares = 0;
  for (const auto& [ignored, one] : groups) {
    squares += static_cast<double>(one.count()) * (one.mean() - mean) * (one.mean() - mean);
  }
  return squares;
}

}  // namespace

GaugeResult gaugeStudy(const std::vector<GaugeReading>& readings) {
  std::map<Cell, Moments> cells;
  std::map<std::string, Moments> parts;
  std::map<std::string, Moments> places;
  Moments all;
  for (const GaugeReading& one : readings) {
    cells[{one.part, one.place}].add(one.value);
    parts[one.part].add(one.value);
    places[one.place].add(one.value);
    all.add(one.value);
  }
  if (std::string gap = gapIn(cells, parts, places); !gap.empty()) return {std::nullopt, std::move(gap)};
  GaugeStudy study;
  study.parts = parts.size();
  study.places = places.size();
  study.repetitions = static_cast<std::size_t>(cells.begin()->second.count());
  const double p = static_cast<double>(study.parts);
  const double o = static_cast<double>(study.places);
  const double r = static_cast<double>(study.repetitions);
  const double ofParts = squaresBetween(parts, all.mean());
  const double ofPlaces = squaresBetween(places, all.mean());
  double interaction = 0;
  double within = 0;
  for (const auto& [name, cell] : cells) {
    const double rest = cell.mean() - parts[name.first].mean() - places[name.second].mean() + all.mean();
    interaction += r * rest * rest;
    within += cell.squares();
  }
  const double meanParts = ofParts / (p - 1);
  const double meanPlaces = ofPlaces / (o - 1);
  const double meanInteraction = interaction / ((p - 1) * (o - 1));
  study.repeatability = within / (p * o * (r - 1));
  if (!(study.repeatability > 0)) {
    return {std::nullopt, "all repetitions gave the same value, so that there is no spread to compare with"};
  }
  study.interactionF = meanInteraction / study.repeatability;
  const double ofInteraction = std::max(0.0, (meanInteraction - study.repeatability) / r);
  study.reproducibility = std::max(0.0, (meanPlaces - meanInteraction) / (p * r)) + ofInteraction;
  study.partToPart = std::max(0.0, (meanParts - meanInteraction) / (o * r));
  study.gauge = study.repeatability + study.reproducibility;
  study.total = study.gauge + study.partToPart;
  study.share = std::sqrt(study.gauge / study.total);
  return {study, {}};
}

}  // namespace quazor
