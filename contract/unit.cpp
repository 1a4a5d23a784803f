#include "contract/unit.h"

#include <map>
#include <memory>
#include <mutex>

namespace QUAZOR_CONTRACT {

const QZUnit& QZUnit::unitWithSymbol(std::string_view symbol) {
  struct Units {
    std::mutex mutex;
    std::map<std::string, std::unique_ptr<const QZUnit>, std::less<>> bySymbol;
  };
  static auto* const units = new Units;  // never destroyed: measurements may outlive the main function
  const std::lock_guard lock(units->mutex);
  auto found = units->bySymbol.find(symbol);
  if (found == units->bySymbol.end()) {
    std::unique_ptr<const QZUnit> unit(new QZUnit(symbol));
    found = units->bySymbol.emplace(std::string(symbol), std::move(unit)).first;
  }
  return *found->second;
}

const QZUnit& QZDimensionlessUnit::frames() {
  static const QZUnit& unit = QZUnit::unitWithSymbol("frames");
  return unit;
}

const QZUnit& QZDimensionlessUnit::errors() {
  static const QZUnit& unit = QZUnit::unitWithSymbol("errors");
  return unit;
}

const QZUnit& QZDimensionlessUnit::events() {
  static const QZUnit& unit = QZUnit::unitWithSymbol("events");
  return unit;
}

}  // namespace QUAZOR_CONTRACT
