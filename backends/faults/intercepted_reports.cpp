#include "backends/faults/intercepted_reports.h"

#include "backends/faults/operations.h"

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using ReportCalls = std::shared_ptr<CallInterceptor>;

// Thread: any.
class InterceptedSnapshot final : public ReportSnapshot {
 public:
  InterceptedSnapshot(std::shared_ptr<const ReportSnapshot> snapshot, ReportCalls calls)
      : snapshot_(std::move(snapshot)), calls_(std::move(calls)) {}

  // Returns null for null.
  static std::shared_ptr<const ReportSnapshot> of(std::shared_ptr<const ReportSnapshot> snapshot,
                                                  const ReportCalls& calls) {
    return snapshot == nullptr ? nullptr : std::make_shared<const InterceptedSnapshot>(std::move(snapshot), calls);
  }

  const std::vector<ReportSample>& samples() const override { return snapshot_->samples(); }

  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& baseline,
                                                             DiagnosticErrorPtr* error) const override {
    return calls_->perform({report_operation::kDelta, {}, {}}, error, [&] {
      const auto* const own = dynamic_cast<const InterceptedSnapshot*>(&baseline);
      return of(snapshot_->snapshotWithBaseline(own == nullptr ? baseline : *own->snapshot_, error), calls_);
    });
  }

 private:
  const std::shared_ptr<const ReportSnapshot> snapshot_;
  const ReportCalls calls_;
};

// Thread: any.
class InterceptedChannelSet final : public ReportChannelSet {
 public:
  InterceptedChannelSet(std::shared_ptr<const ReportChannelSet> set, ReportCalls calls)
      : set_(std::move(set)), calls_(std::move(calls)) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    std::size_t kept = 0;
    auto filtered = std::make_shared<const InterceptedChannelSet>(
        set_->reportByFilteringChannels([&](const ReportChannelDescription& description) {
          const bool keeps = keep(description);
          kept += keeps ? 1U : 0U;
          return keeps;
        }),
        calls_);
    calls_->report(
        {report_operation::kFilter, {}, {}}, [&] { return std::to_string(kept); }, true);
    return filtered;
  }
  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const override {
    return calls_->perform({report_operation::kSnapshot, {}, {}}, error,
                           [&] { return InterceptedSnapshot::of(set_->snapshot(error), calls_); });
  }

 private:
  const std::shared_ptr<const ReportChannelSet> set_;
  const ReportCalls calls_;
};

// Thread: any.
class InterceptedReports final : public ReportFacility {
 public:
  InterceptedReports(std::shared_ptr<ReportFacility> reports, ReportCalls calls)
      : reports_(std::move(reports)), calls_(std::move(calls)) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override {
    return calls_->perform({report_operation::kSimpleChannels, {}, {}}, error,
                           [&]() -> std::shared_ptr<const ReportChannelSet> {
                             auto set = reports_->reportWithOnlySimpleChannels(error);
                             if (set == nullptr) return nullptr;
                             return std::make_shared<const InterceptedChannelSet>(std::move(set), calls_);
                           });
  }

 private:
  const std::shared_ptr<ReportFacility> reports_;
  const ReportCalls calls_;
};

}  // namespace

std::shared_ptr<ReportFacility> interceptedReports(std::shared_ptr<ReportFacility> reports,
                                                   std::shared_ptr<CallInterceptor> calls) {
  return std::make_shared<InterceptedReports>(std::move(reports), std::move(calls));
}

}  // namespace quazor
