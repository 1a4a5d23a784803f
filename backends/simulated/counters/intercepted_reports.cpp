#include "backends/simulated/counters/intercepted_reports.h"

#include "backends/simulated/scenario/report_operations.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

// The object that `body` makes, in its intercepting form; null when it makes none or a fault keeps it from doing so.
template <class Intercepted, class Body>
std::shared_ptr<const Intercepted> intercepted(const std::shared_ptr<CallInterceptor>& calls,
                                               std::string_view operation, DiagnosticErrorPtr* error, Body&& body) {
  return calls->perform(
      {operation, {}, {}}, error, [] { return std::string(); },
      [&]() -> std::shared_ptr<const Intercepted> {
        auto made = body();
        return made != nullptr ? std::make_shared<const Intercepted>(std::move(made), calls) : nullptr;
      });
}

class InterceptedSnapshot final : public ReportSnapshot {
 public:
  InterceptedSnapshot(std::shared_ptr<const ReportSnapshot> snapshot, std::shared_ptr<CallInterceptor> calls)
      : snapshot_(std::move(snapshot)), calls_(std::move(calls)) {}

  const std::vector<ReportSample>& samples() const override { return snapshot_->samples(); }

  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                             DiagnosticErrorPtr* error) const override {
    return intercepted<InterceptedSnapshot>(calls_, report_operation::kDelta, error, [&] {
      const auto* const own = dynamic_cast<const InterceptedSnapshot*>(&baseline);
      return snapshot_->snapshotWithBaseline(own != nullptr ? *own->snapshot_ : baseline, error);
    });
  }

 private:
  const std::shared_ptr<const ReportSnapshot> snapshot_;
  const std::shared_ptr<CallInterceptor> calls_;
};

class InterceptedSet final : public ReportChannelSet {
 public:
  InterceptedSet(std::shared_ptr<const ReportChannelSet> set, std::shared_ptr<CallInterceptor> calls)
      : set_(std::move(set)), calls_(std::move(calls)) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    std::size_t count = 0;
    auto kept = set_->reportByFilteringChannels([&](const ReportChannelDescription& channel) {
      const bool isKept = keep(channel);
      count += isKept ? 1 : 0;
      return isKept;
    });
    calls_->report(
        {report_operation::kFilter, {}, {}}, [count] { return std::to_string(count); }, true);
    return std::make_shared<InterceptedSet>(std::move(kept), calls_);
  }

  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const override {
    return intercepted<InterceptedSnapshot>(calls_, report_operation::kSnapshot, error,
                                            [&] { return set_->snapshot(error); });
  }

 private:
  const std::shared_ptr<const ReportChannelSet> set_;
  const std::shared_ptr<CallInterceptor> calls_;
};

class InterceptedReports final : public ReportFacility {
 public:
  InterceptedReports(std::shared_ptr<ReportFacility> reports, std::shared_ptr<CallInterceptor> calls)
      : reports_(std::move(reports)), calls_(std::move(calls)) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override {
    return intercepted<InterceptedSet>(calls_, report_operation::kSimpleChannels, error,
                                       [&] { return reports_->reportWithOnlySimpleChannels(error); });
  }

 private:
  const std::shared_ptr<ReportFacility> reports_;
  const std::shared_ptr<CallInterceptor> calls_;
};

}  // namespace

std::shared_ptr<ReportFacility> interceptReports(std::shared_ptr<ReportFacility> reports,
                                                 std::shared_ptr<CallInterceptor> calls) {
  return std::make_shared<InterceptedReports>(std::move(reports), std::move(calls));
}

}  // namespace quazor
