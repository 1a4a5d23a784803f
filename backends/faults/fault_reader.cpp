#include "backends/faults/fault_reader.h"

#include "backends/capture/property_table.h"
#include "backends/faults/hid_report_name.h"
#include "backends/faults/operations.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <string_view>

namespace quazor {
namespace {

using Names = std::vector<std::string_view>;

constexpr std::uint64_t kMaxOccurrence = 1'000'000'000;
constexpr double kMaxDelay = 1e9;
constexpr std::string_view kEveryOperation = "*";

// The values that a selector accepts for one operation, or for all operations.
struct Selectable {
  Names names;
  bool any = false;        // all names
  bool anyReport = false;  // all IDs of feature reports

  void add(const std::vector<std::string>& more) {
    for (const std::string& name : more) addName(name);
  }
  void addKeys(CaptureObjectKind kind) {
    for (const CaptureProperty& property : propertiesOf(kind)) addName(property.key);
  }
  // Without a list, sets `open` to true.
  void add(const std::optional<std::vector<std::string>>& more, bool& open) {
    if (more) add(*more);
    open = open || !more;
  }
  bool isEmpty() const { return names.empty() && !any && !anyReport; }

 private:
  void addName(std::string_view name) {
    if (std::ranges::find(names, name) == names.end()) names.push_back(name);
  }
};

Selectable selectableObjects(const Names& operations, const FaultTargets& targets) {
  Selectable objects;
  for (const std::string_view name : operations) {
    switch (findOperation(name)->object) {
      case OperationObject::kStream: objects.add(targets.streams); break;
      case OperationObject::kGroup: objects.add(targets.groups); break;
      case OperationObject::kHidDevice: objects.add(targets.hidDevices, objects.any); break;
      case OperationObject::kOnlyOne: break;
    }
  }
  return objects;
}

Selectable selectableProperties(const Names& operations, const FaultTargets& targets) {
  Selectable properties;
  for (const std::string_view name : operations) {
    switch (findOperation(name)->property) {
      case OperationProperty::kOfDevice: properties.addKeys(CaptureObjectKind::kDevice); break;
      case OperationProperty::kOfGroup: properties.addKeys(CaptureObjectKind::kGroup); break;
      case OperationProperty::kOfStream: properties.addKeys(CaptureObjectKind::kStream); break;
      case OperationProperty::kFeatureReport: properties.add(targets.featureReports, properties.anyReport); break;
      case OperationProperty::kOfRegistry: properties.add(targets.registryProperties, properties.any); break;
      case OperationProperty::kNone: break;
    }
  }
  return properties;
}

std::string readObject(const JsonCursor& cursor, const std::string& operation, const Selectable& objects) {
  if (objects.isEmpty()) {
    cursor.fail(operation + " has no object; remove this key.");
  }
  return objects.any ? cursor.text() : cursor.oneOf(objects.names, "an object of " + operation);
}

std::string readProperty(const JsonCursor& cursor, const std::string& operation, const Selectable& properties) {
  if (properties.isEmpty()) cursor.fail(operation + " has no property; remove this key.");
  if (!properties.any && !properties.anyReport) return cursor.oneOf(properties.names, "a property of " + operation);
  std::string name = cursor.text();
  if (properties.any || hidReportNamed(name)) return name;
  cursor.fail(inQuotes(name) + " is not a feature report's ID; write it with two digits, like \"0x0A\".");
}

void readSelectors(const JsonCursor& cursor, const FaultTargets& targets, Fault& fault) {
  Names all;
  for (const Operation& operation : kOperations) all.push_back(operation.name);
  Names known{kEveryOperation};
  known.insert(known.end(), all.begin(), all.end());
  fault.operation = cursor.at("operation").oneOf(known, "an operation that can fail");
  const Names selected = fault.operation == kEveryOperation ? all : Names{fault.operation};

  if (const auto object = cursor.find("object")) {
    fault.object = readObject(*object, fault.operation, selectableObjects(selected, targets));
  }
  if (const auto property = cursor.find("property")) {
    fault.property = readProperty(*property, fault.operation, selectableProperties(selected, targets));
  }
  if (const auto occurrence = cursor.find("occurrence")) fault.occurrence = occurrence->integer(1, kMaxOccurrence);
}

Fault readFault(const JsonCursor& cursor, const FaultTargets& targets) {
  constexpr std::array kActions{FaultAction::kFail, FaultAction::kNothing, FaultAction::kHang, FaultAction::kDelay};
  cursor.allowKeys({"operation", "object", "property", "occurrence", "action", "error", "seconds"});
  Fault fault;
  readSelectors(cursor, targets, fault);

  Names names;
  for (const FaultAction action : kActions) names.push_back(faultActionName(action));
  const std::string name = cursor.at("action").oneOf(names, "an action");
  fault.action = *std::ranges::find(kActions, name, &faultActionName);

  if (const auto error = cursor.find("error")) {
    if (fault.action != FaultAction::kFail) error->fail("only the action \"fail\" can have an error.");
    fault.error = readFaultError(*error);
  }
  if (fault.action == FaultAction::kDelay) {
    fault.seconds = cursor.at("seconds").positiveNumber(kMaxDelay);
  } else if (const auto seconds = cursor.find("seconds")) {
    seconds->fail("only the action \"delay\" can have seconds.");
  }
  return fault;
}

}  // namespace

std::vector<Fault> readFaults(const JsonCursor& cursor, const FaultTargets& targets) {
  std::vector<Fault> faults;
  for (const JsonCursor& fault : cursor.elements()) faults.push_back(readFault(fault, targets));
  return faults;
}

FaultError readFaultError(const JsonCursor& cursor) {
  cursor.allowKeys({"domain", "code", "message"});
  return {cursor.at("domain").text(), cursor.at("code").integer(), cursor.at("message").text()};
}

}  // namespace quazor
