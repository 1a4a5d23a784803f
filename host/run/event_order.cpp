#include "host/run/event_order.h"

#include <type_traits>
#include <variant>

namespace quazor {

namespace {

template <class Event, class... Others>
constexpr bool isOneOf = (std::is_same_v<Event, Others> || ...);

}  // namespace

bool EventOrder::accepts(const RunEvent& event) {
  if (completed_) return false;
  return std::visit(
      [this](const auto& one) {
        using Event = std::remove_cvref_t<decltype(one)>;
        if constexpr (isOneOf<Event, RunStarted, DiagnosticStarted, DiagnosticSkipped, Heartbeat, FramesTraced,
                              DiagnosticEnded, RunEnded>) {
          return false;  // quazor's own
        } else if constexpr (isOneOf<Event, Logged>) {
          return true;  // at any time and on any thread
        } else if constexpr (isOneOf<Event, MeasurementsAdded, AuxiliaryDataAdded>) {
          return acceptsMeasured();
        } else {
          return accept(one);
        }
      },
      event);
}

bool EventOrder::accept(const StageStarted& event) {
  if (open_ || (began_ ? event.stage <= stage_ : event.stage != Stage::kLoad)) return false;
  stage_ = event.stage;
  began_ = true;
  open_ = true;
  return true;
}

bool EventOrder::accept(const StageEnded& event) {
  if (!open_ || event.stage != stage_) return false;
  open_ = false;
  return true;
}

bool EventOrder::accept(const Failed& event) const { return open_ && event.stage == stage_; }

bool EventOrder::accept(const ResultsReported& /*event*/) const {
  return isBetweenStages() && stage_ == Stage::kAnalyze;
}

bool EventOrder::accept(const FaultsCounted& /*event*/) {
  if (counted_ || !isBetweenStages()) return false;
  counted_ = true;
  return true;
}

bool EventOrder::accept(const DiagnosticCompleted& /*event*/) {
  completed_ = isBetweenStages();
  return completed_;
}

// A recorded result that is analyzed again follows the stage of loading.
bool EventOrder::acceptsMeasured() const {
  return isBetweenStages() && (stage_ == Stage::kRun || stage_ == Stage::kLoad);
}

}  // namespace quazor
