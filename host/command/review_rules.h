// What a reviewer of a plug-in asks of its names, summaries, results and costs.
#pragma once

#include "host/model/diagnostic_record.h"
#include "host/plugin/parameters.h"
#include "host/plugin/shared_object.h"

#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

enum class Rating { kOk, kAdvice, kProblem };

std::string_view nameOf(Rating rating);  // "ok", "advice", "problem"

// One finding. `text` says what was found and, unless it is kOk, what to do.
struct ReviewFinding {
  Rating rating = Rating::kOk;
  std::string subject;
  std::string text;
};

using ReviewFindings = std::vector<ReviewFinding>;

// The name of a diagnostic, an experiment or an analysis; `kind` is that word with a capital, as in "Diagnostic". Empty
// if nothing is wrong with it.
ReviewFindings reviewName(std::string_view kind, const std::string& name);

// The name of a parameter. Empty if nothing is wrong with it.
ReviewFindings reviewParameterName(const std::string& owner, const std::string& name);

// What is known about the values of a parameter; null if nothing is. Empty if nothing is missing.
ReviewFindings reviewParameterRange(const std::string& owner, const std::string& name,
                                    const QZNumberParameter& declaration, const QZParameterRange* range);

// The summary of `subject`, which is one sentence unless it `mayBeSeveral`. Empty if nothing is wrong with it.
ReviewFindings reviewSummary(const std::string& subject, const std::string& summary, bool mayBeSeveral);

// How the file was compiled and linked: at least one finding.
ReviewFindings reviewLinking(const LinkProperties& linked);

// What loading or describing took: one finding.
ReviewFinding reviewCost(const std::string& subject, const Cost& cost);

// The results of a run that ended with pass or fail, or of an experiment on its own: at least one finding.
// `isExplained` tells whether there is an explanation of a name.
ReviewFindings reviewResults(const DiagnosticRecord& record,
                             const std::function<bool(const std::string& name)>& isExplained);

}  // namespace quazor
