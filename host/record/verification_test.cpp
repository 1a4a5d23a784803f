#include "host/record/verification.h"

#include "host/error/host_error.h"
#include "host/model/record_builder.h"
#include "host/testing/test_events.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <limits>

namespace quazor {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

using Events = std::vector<RunEvent>;

// The position of the event of that type in the diagnostic with that name.
template <class Event>
Events::iterator find(Events& events, const std::string& diagnostic) {
  const auto begin = std::find_if(events.begin(), events.end(), [&](const RunEvent& event) {
    const auto* const began = std::get_if<DiagnosticStarted>(&event);
    return began != nullptr && began->name == diagnostic;
  });
  return std::find_if(begin, events.end(), [](const RunEvent& event) { return std::holds_alternative<Event>(event); });
}

std::vector<std::string> problemsAfter(const std::function<void(Events&)>& change) {
  Events events = wholeRun();
  change(events);
  return problemsOf(events);
}

void replaceResult(Events& events, const std::string& diagnostic, const QZMeasuredResult& result) {
  std::get<ResultsReported>(*find<ResultsReported>(events, diagnostic)).results[0] = result;
}

QZMeasuredResult withUnit(const char* unit) {
  QZMeasuredResult result("Count", Measurement(90, QZUnit::unitWithSymbol(unit)));
  result.setLimit(*resultOf(90).limit());
  return result;
}

QZMeasuredResult withMinimum(double minimum) {
  QZMeasuredResult result = resultOf(90);
  QZLimit limit("Enough");
  limit.setLowerBound(std::make_shared<const QZBound>(Measurement(minimum, QZDimensionlessUnit::frames()), false));
  result.setLimit(limit);
  return result;
}

TEST(ProblemsOf, FindsNoneInAWholeRun) { EXPECT_THAT(problemsOf(wholeRun()), IsEmpty()); }

// Inserts rows of this kind everywhere; `name` is what the problem calls them.
void findsWhatIsOutOfPlace(TracedKind kind, const std::string& name) {
  const FramesTraced rows{"front", 1, {{0, 1, 2, 3}}, 0, kind};
  for (std::size_t place = 0; place <= wholeRun().size(); ++place) {
    Events events = wholeRun();
    events.insert(events.begin() + static_cast<std::ptrdiff_t>(place), rows);
    RecordBuilder builder;
    for (std::size_t i = 0; i < place; ++i) builder.onEvent(events[i]);
    if (place > wholeRun().size() - 1) {
      EXPECT_THAT(problemsOf(events),
                  ElementsAre("events follow the end of the run", "an event is recorded outside of any diagnostic"));
    } else if (!builder.isOpen()) {
      EXPECT_THAT(problemsOf(events), ElementsAre("an event is recorded outside of any diagnostic")) << place;
    } else if (builder.record().stages.empty()) {
      EXPECT_THAT(problemsOf(events),
                  ElementsAre(builder.record().name + ": " + name + " are recorded before its first stage"))
          << place;
    } else {
      EXPECT_THAT(problemsOf(events), IsEmpty()) << place;
    }
  }
}

TEST(ProblemsOf, FindsFramesThatAreOutOfPlace) { findsWhatIsOutOfPlace(TracedKind::kFrames, "frames"); }

TEST(ProblemsOf, FindsTasksThatAreOutOfPlace) { findsWhatIsOutOfPlace(TracedKind::kTasks, "tasks"); }

TEST(ProblemsOf, FindsNoneInAnyBeginningOfARun) {
  Events events = wholeRun();
  while (!events.empty()) {
    EXPECT_THAT(problemsOf(events), IsEmpty()) << events.size();
    events.pop_back();
  }
  EXPECT_THAT(problemsOf({}), IsEmpty());
}

TEST(ProblemsOf, FindsAVerdictThatDoesNotFollow) {
  for (const char* name : {"Good", "Bad", "Strange", "Broken"}) {
    for (const Verdict verdict : {Verdict::kPass, Verdict::kFail, Verdict::kError}) {
      Events events = wholeRun();
      Verdict& stored = std::get<DiagnosticEnded>(*find<DiagnosticEnded>(events, name)).verdict;
      if (stored == verdict) continue;
      const std::string right(nameOf(stored));
      stored = verdict;
      EXPECT_THAT(problemsOf(events),
                  ElementsAre(std::string(name) + ": the recorded verdict is " + std::string(nameOf(verdict)) +
                              ", but the results, limits and errors give " + right));
    }
  }
}

TEST(ProblemsOf, FindsChangesOfWhatTheVerdictFollowsFrom) {
  struct Row {
    const char* name;
    std::function<void(Events&)> change;
    const char* problem;
  };
  const double nan = std::numeric_limits<double>::quiet_NaN();
  const Row rows[] = {
      {"a value that fails", [](Events& e) { replaceResult(e, "Good", resultOf(89)); },
       "Good: the recorded verdict is pass"},
      {"a value that passes", [](Events& e) { replaceResult(e, "Bad", resultOf(90)); },
       "Bad: the recorded verdict is fail"},
      {"a value that is no number", [&](Events& e) { replaceResult(e, "Good", resultOf(nan)); },
       "Good: the recorded verdict is pass"},
      {"a value that was no number", [](Events& e) { replaceResult(e, "Strange", resultOf(90)); },
       "Strange: the recorded error of quazor is QuazorHostErrorDomain 5"},
      {"a limit", [](Events& e) { replaceResult(e, "Good", withMinimum(91)); }, "Good: the recorded verdict is pass"},
      {"a unit", [](Events& e) { replaceResult(e, "Good", withUnit("errors")); }, "Good: the recorded verdict is pass"},
      {"no result any more", [](Events& e) { e.erase(find<ResultsReported>(e, "Good")); },
       "Good: the recorded verdict is pass"},
      {"no failing result any more", [](Events& e) { e.erase(find<ResultsReported>(e, "Bad")); },
       "Bad: the recorded verdict is fail"},
      {"another result that fails",
       [](Events& e) { std::get<ResultsReported>(*find<ResultsReported>(e, "Good")).results.push_back(resultOf(1)); },
       "Good: the recorded verdict is pass"},
      {"an error that was not",
       [](Events& e) {
         e.insert(find<DiagnosticCompleted>(e, "Bad"), Failed{Stage::kRun, errorWithMessage("D", 1, "m", nullptr)});
       },
       "Bad: the recorded verdict is fail"},
      {"no error any more", [](Events& e) { e.erase(find<Failed>(e, "Broken")); },
       "Broken: the recorded error of quazor is none, but the results, limits and errors give QuazorHostErrorDomain 4 "
       "'nothing was measured'"},
      {"no failure of quazor's own any more", [](Events& e) { e.erase(find<Failed>(e, "Strange")); },
       "Strange: the recorded error of quazor is none, but the results, limits and errors give QuazorHostErrorDomain "
       "5"},
      {"another failure of quazor's own",
       [](Events& e) {
         *find<Failed>(e, "Strange") = Failed{std::nullopt, hostError(HostErrorCode::kNothingMeasured, "no")};
       },
       "Strange: the recorded error of quazor is QuazorHostErrorDomain 4 'no'"},
      {"a pass that was not completed", [](Events& e) { e.erase(find<DiagnosticCompleted>(e, "Good")); },
       "Good: the recorded verdict is pass"},
      {"a failure that was not completed", [](Events& e) { e.erase(find<DiagnosticCompleted>(e, "Bad")); },
       "Bad: the recorded verdict is fail"},
  };
  for (const Row& row : rows) {
    EXPECT_THAT(problemsAfter(row.change), testing::Contains(HasSubstr(row.problem))) << row.name;
  }
}

TEST(ProblemsOf, FindsThatAnErrorWithResultsWasTakenOut) {
  Events events = {runOf({"A"})};
  for (RunEvent& event : wholeDiagnostic("A", 90)) events.push_back(std::move(event));
  events.insert(events.end() - 1, Failed{Stage::kTeardown, errorWithMessage("D", 1, "m", nullptr)});
  events.emplace_back(DiagnosticEnded{Verdict::kError, momentAt(9)});
  EXPECT_THAT(problemsOf(events), IsEmpty());
  events.erase(find<Failed>(events, "A"));
  EXPECT_THAT(problemsOf(events),
              ElementsAre(HasSubstr("the recorded verdict is error, but the results, limits and errors give pass")));
}

TEST(ProblemsOf, TakesTheHostsWordThatItCouldNotWriteARecord) {
  const Failed notRecorded{std::nullopt, hostError(HostErrorCode::kNotRecorded, "the record cannot be written")};
  Events events = wholeRun();
  events.insert(find<DiagnosticEnded>(events, "Good"), notRecorded);
  EXPECT_THAT(
      problemsOf(events),
      ElementsAre(HasSubstr("Good: the recorded verdict is pass, but the results, limits and errors give error")));
  std::get<DiagnosticEnded>(*find<DiagnosticEnded>(events, "Good")).verdict = Verdict::kError;
  EXPECT_THAT(problemsOf(events), IsEmpty());
  const Failed another{std::nullopt, errorWithMessage("Domain", 10, "a plug-in's", nullptr)};
  *find<Failed>(events, "Good") = another;
  EXPECT_THAT(problemsOf(events),
              testing::Contains(
                  HasSubstr("Good: the recorded verdict is error, but the results, limits and errors give pass")));
}

TEST(ProblemsOf, FindsEventsThatAreOutOfPlace) {
  struct Row {
    const char* name;
    std::function<void(Events&)> change;
    const char* problem;
  };
  const Row rows[] = {
      {"a second beginning", [](Events& e) { e.insert(e.begin() + 1, runOf({})); }, "the run starts twice"},
      {"a line between two diagnostics", [](Events& e) { e.insert(e.begin() + 1, Logged{}); },
       "an event is recorded outside of any diagnostic"},
      {"a verdict without a diagnostic",
       [](Events& e) {
         e.insert(e.begin() + 1, DiagnosticEnded{Verdict::kPass, momentAt(1)});
       },
       "an event is recorded outside of any diagnostic"},
      {"a failure between two diagnostics",
       [](Events& e) {
         e.insert(e.begin() + 1, Failed{std::nullopt, errorWithMessage("D", 1, "m", nullptr)});
       },
       "a failure is recorded outside of any diagnostic"},
      {"a diagnostic that does not end", [](Events& e) { e.erase(find<DiagnosticEnded>(e, "Good")); },
       "Good has not ended when the next diagnostic starts"},
      {"a run that ends too early",
       [](Events& e) {
         e.insert(e.begin() + 2, RunEnded{"Good", momentAt(1)});
       },
       "the run ends before Good has ended"},
      {"something after the end", [](Events& e) { e.emplace_back(beginningOf("Late")); },
       "events follow the end of the run"},
  };
  for (const Row& row : rows) {
    EXPECT_THAT(problemsAfter(row.change), testing::Contains(row.problem)) << row.name;
  }
}

TEST(ProblemsOf, FindsADiagnosticThatWasTakenOut) {
  const auto without = [](Events& events) {
    events.erase(find<DiagnosticStarted>(events, "Bad"), find<DiagnosticStarted>(events, "Strange"));
  };
  EXPECT_THAT(problemsAfter(without), ElementsAre("Bad was selected to run but is missing from the record"));
  EXPECT_THAT(problemsAfter([&](Events& events) {
                without(events);
                events.back() = RunEnded{"Broken", momentAt(99)};  // as if the user had interrupted the run
              }),
              IsEmpty());
}

}  // namespace
}  // namespace quazor
