// No sequence of attempts, repetitions, skips and limits turns a failing run into exit code 0.
//
// A run is written as text: a word for each diagnostic in each repetition, a letter for each attempt. The oracle only
// looks at these words; the product judges the results, limits and errors that the letters stand for.
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/testing/test_records.h"
#include "host/testing/test_values.h"
#include "tests/support/effort.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <iostream>
#include <iterator>
#include <limits>
#include <map>
#include <regex>
#include <string>
#include <vector>

namespace quazor {
namespace {

constexpr char kLetters[] = "pwfuenbcharxy";

// The five outcomes of the letters, as the oracle has them: x is an error with a failed result.
char outcomeOf(char letter) {
  if (letter == 'x' || letter == 'y') return 'x';
  if (letter == 'p' || letter == 'w') return 'p';
  if (letter == 'f' || letter == 'u') return 'f';
  return letter == 'h' || letter == 'a' || letter == 'r' ? 's' : 'e';
}

UserLimit limitOf(const std::string& text, LimitSeverity severity) {
  UserLimit limit = parseUserLimit(text);
  limit.severity = severity;
  return limit;
}

DiagnosticRecord recordOfLetter(char letter) {
  DiagnosticRecord record;
  bool isCompleted = true;
  const double value = letter == 'f' || letter == 'x' ? 80
                       : letter == 'n'                ? std::numeric_limits<double>::quiet_NaN()
                                                      : 95;
  record.measuredResults = judgeResults({resultWithMinimum(value, 90)});
  switch (letter) {
    case 'w': record.limits = {limitOf("Count >= 99", LimitSeverity::kWarn)}; break;
    case 'u': record.limits = {limitOf("Count >= 99", LimitSeverity::kFail)}; break;
    case 'b': record.limits = {limitOf("Count >= 1 V", LimitSeverity::kFail)}; break;  // another unit
    case 'y': record.limits = {limitOf("Count >= 99", LimitSeverity::kFail)}; [[fallthrough]];
    case 'x':
    case 'e': record.error = errorWithMessage("D", 1, "m", nullptr); break;
    case 'c': isCompleted = false; break;
    case 'h': record.skip = Skip{SkipKind::kNoSuchHardware, "r"}; break;
    case 'a': record.skip = Skip{SkipKind::kNotAllowed, "r"}; break;
    case 'r': record.skip = Skip{SkipKind::kNotReached, "r"}; break;
    default: EXPECT_NE(std::string(kLetters).find(letter), std::string::npos) << letter; break;
  }
  if (record.skip) {
    record.measuredResults.clear();
    isCompleted = false;
  }
  const RecordJudgement judgement = judgeRecord(record, isCompleted);
  record.verdict = judgement.verdict;
  record.error = judgement.error;
  return record;
}

// The attempts of a diagnostic in one repetition.
struct Word {
  std::string letters;
  std::uint64_t diagnostic = 0;
  std::uint64_t repetition = 1;
};

std::vector<DiagnosticRecord> recordsOf(const std::vector<Word>& words) {
  std::vector<DiagnosticRecord> records;
  for (const Word& word : words) {
    for (std::size_t i = 0; i < word.letters.size(); ++i) {
      records.push_back(recordOfLetter(word.letters[i]));
      records.back().name = std::to_string(word.diagnostic);
      records.back().trial = {i + 1, 9, word.repetition, 9};
    }
  }
  return records;
}

std::string outcomesOf(const Word& word) {
  std::string outcomes;
  std::transform(word.letters.begin(), word.letters.end(), std::back_inserter(outcomes), outcomeOf);
  return outcomes;
}

bool allMatch(const std::vector<Word>& words, const std::string& pattern) {
  static std::map<std::string, std::regex> known;
  const std::regex& regex = known.try_emplace(pattern, pattern).first->second;
  return std::all_of(words.begin(), words.end(),
                     [&regex](const Word& word) { return std::regex_match(outcomesOf(word), regex); });
}

bool has(const std::vector<Word>& words, char outcome) {
  return std::any_of(words.begin(), words.end(),
                     [outcome](const Word& word) { return outcomesOf(word).find(outcome) != std::string::npos; });
}

// The exit code of a run as quazor makes it: errors, and then another outcome or nothing.
ExitCode dueOf(const std::vector<Word>& words, const ExitRules& rules) {
  const std::string before = rules.acceptFlaky ? "e*" : "";
  if (!allMatch(words, before + "[pf]|s")) return ExitCode::kError;
  if (has(words, 'f')) return ExitCode::kFailed;
  const bool isGood = allMatch(words, before + (rules.allowSkips ? "p|s" : "p")) && has(words, 'p');
  return isGood ? ExitCode::kAllPassed : ExitCode::kError;
}

bool isPossible(const std::vector<Word>& words) { return allMatch(words, "e*[pfx]|e+|s"); }

// True if anything in the run forbids exit code 0, whatever the order of the letters is.
bool isBad(const std::vector<Word>& words, const ExitRules& rules) {
  if (has(words, 'f') || has(words, 'x') || !has(words, 'p')) return true;
  if (has(words, 's') && !rules.allowSkips) return true;
  if (has(words, 'e') && !rules.acceptFlaky) return true;
  return !allMatch(words, "[^e]*|.*p[^e]*");  // nothing passed after the last error
}

// Thread: one at a time.
struct Count {
  std::size_t runs = 0;
  std::size_t possible = 0;
  std::size_t codes[3] = {};
};

void check(const std::vector<Word>& words, Count& count) {
  const std::vector<DiagnosticRecord> records = recordsOf(words);
  const bool possible = isPossible(words);
  std::string text;
  for (const Word& word : words) {
    text += std::to_string(word.diagnostic) + "/" + std::to_string(word.repetition) + ":" + word.letters + " ";
  }
  for (const ExitRules rules :
       {ExitRules{false, false}, ExitRules{true, false}, ExitRules{false, true}, ExitRules{true, true}}) {
    const ExitCode code = exitCodeOf(records, rules);
    ASSERT_FALSE(code == ExitCode::kAllPassed && isBad(words, rules)) << text << rules.allowSkips << rules.acceptFlaky;
    if (!possible) continue;
    ASSERT_EQ(code, dueOf(words, rules)) << text << rules.allowSkips << rules.acceptFlaky;
    ++count.codes[static_cast<int>(code)];
  }
  ++count.runs;
  count.possible += possible ? 1 : 0;
}

// All words of these letters with 1 to `longest` of them.
std::vector<std::string> wordsOf(const std::string& letters, std::size_t longest) {
  std::vector<std::string> words = {""};
  for (std::size_t at = 0; at < words.size(); ++at) {
    if (words[at].size() == longest) continue;
    for (const char letter : letters) words.push_back(words[at] + letter);
  }
  words.erase(words.begin());
  return words;
}

TEST(ExitCodeProperty, LettersHaveTheirOutcomes) {
  for (const char letter : std::string(kLetters)) {
    const std::string verdict(nameOf(recordOfLetter(letter).verdict));
    EXPECT_EQ(verdict.front(), outcomeOf(letter) == 'x' ? 'e' : outcomeOf(letter)) << letter;
  }
}

TEST(ExitCodeProperty, HoldsForEveryShortWord) {
  Count count;
  for (const std::string& word : wordsOf("pfeh", 6)) ASSERT_NO_FATAL_FAILURE(check({{word, 0, 1}}, count));
  for (const std::string& word : wordsOf(kLetters, 3)) ASSERT_NO_FATAL_FAILURE(check({{word, 0, 1}}, count));
  EXPECT_EQ(count.runs, 5460U + 2379U);  // 4 + ... + 4^6, and 13 + 13^2 + 13^3
  for (const std::size_t one : count.codes) EXPECT_GT(one, 10U);
}

TEST(ExitCodeProperty, HoldsForEveryPairOfShortWords) {
  Count count;
  const std::vector<std::string> words = wordsOf("pfeh", 2);
  for (const std::string& first : words) {
    for (const std::string& second : words) {
      ASSERT_NO_FATAL_FAILURE(check({{first, 0, 1}, {second, 0, 2}}, count));  // repetitions
      ASSERT_NO_FATAL_FAILURE(check({{first, 0, 1}, {second, 1, 1}}, count));  // diagnostics
    }
  }
  EXPECT_EQ(count.runs, 800U);
}

std::string possibleWord(RandomValues& random) {
  std::string word;
  while (word.size() < 5 && random.chance(30)) word += "enbc"[random.below(4)];
  if (word.empty() && random.chance(10)) return {"har"[random.below(3)]};
  if (!word.empty() && random.chance(20)) return word;
  if (random.chance(5)) return word + "xy"[random.below(2)];
  return word + (random.chance(15) ? "fu"[random.below(2)] : "pw"[random.below(2)]);
}

TEST(ExitCodeProperty, HoldsForRandomRuns) {
  const int runs = roundsOf(20'000);
  RandomValues random(20261122);
  Count count;
  for (int i = 0; i < runs; ++i) {
    std::vector<Word> words;
    const std::uint64_t diagnostics = 1 + random.below(3);
    const std::uint64_t repetitions = 1 + random.below(3);
    for (std::uint64_t repetition = 1; repetition <= repetitions; ++repetition) {
      for (std::uint64_t diagnostic = 0; diagnostic < diagnostics; ++diagnostic) {
        words.push_back({possibleWord(random), diagnostic, repetition});
      }
    }
    ASSERT_NO_FATAL_FAILURE(check(words, count));
    // Letters in any order, as no run has them.
    std::string& changed = words[random.below(words.size())].letters;
    for (std::uint64_t more = random.below(4); more > 0; --more) {
      changed.insert(random.below(changed.size() + 1), 1, kLetters[random.below(sizeof kLetters - 1)]);
    }
    ASSERT_NO_FATAL_FAILURE(check(words, count));
  }
  for (const std::size_t one : count.codes) EXPECT_GT(one, static_cast<std::size_t>(runs) / 20);
  std::cout << count.runs << " random runs, " << count.possible << " as quazor makes them; exit codes "
            << count.codes[0] << ", " << count.codes[1] << ", " << count.codes[2] << '\n';
}

TEST(ExitCodeProperty, MoreLimitsNeverImproveARun) {
  constexpr int kRuns = 5'000;
  RandomValues random(7);
  int changed = 0;
  for (int i = 0; i < kRuns; ++i) {
    std::vector<DiagnosticRecord> records = recordsOf({{possibleWord(random), 0, 1}, {possibleWord(random), 1, 1}});
    const ExitRules rules{random.chance(50), random.chance(50)};
    const ExitCode before = exitCodeOf(records, rules);
    for (DiagnosticRecord& record : records) {
      if (record.skip) continue;
      const std::string number = std::to_string(random.below(200));
      const bool fails = random.chance(80);
      record.limits.push_back(limitOf("Count <= " + number, fails ? LimitSeverity::kFail : LimitSeverity::kWarn));
      const RecordJudgement judgement = judgeRecord(record, true);
      record.verdict = judgement.verdict;
      record.error = judgement.error;
    }
    const ExitCode after = exitCodeOf(records, rules);
    ASSERT_FALSE(before != ExitCode::kAllPassed && after == ExitCode::kAllPassed) << i;
    changed += before != after ? 1 : 0;
  }
  EXPECT_GT(changed, kRuns / 10);
}

// The entries of a run, with those of the limits that fit no result, as the host adds them.
std::vector<DiagnosticRecord> withLimitsWithoutResult(std::vector<DiagnosticRecord> records,
                                                      const std::vector<UserLimit>& limits) {
  const std::vector<DiagnosticRecord> measured = records;
  for (const UserLimit& limit : limitsWithoutResult(limits, measured)) {
    DiagnosticRecord record;
    record.name = canonicalText(limit);
    record.error = errorOfLimitWithoutResult(limit, measured);
    record.verdict = judgeRecord(record, false).verdict;
    records.push_back(std::move(record));
  }
  return records;
}

// A limit on "Count", the only result, or on one that does not exist, of diagnostics of which some do not exist.
UserLimit anyLimit(RandomValues& random) {
  const std::string diagnostic[] = {"", "0:", "1:", "*:", "2:"};
  const std::string result[] = {"Count", "C*", "Cuont", "Total*"};
  const std::string condition = random.chance(90) ? " <= 1000" : " <= 0";
  UserLimit limit =
      limitOf(diagnostic[random.below(std::size(diagnostic))] + result[random.below(std::size(result))] + condition,
              random.chance(70) ? LimitSeverity::kFail : LimitSeverity::kWarn);
  limit.onlyIfSelected = random.chance(30);
  return limit;
}

// True if the limit is meant for a diagnostic that passed or was judged, and none has the result. Not in a run with
// diagnostics that were not reached: that run has a failure or an error already.
bool isForNothing(const UserLimit& limit, const std::vector<Word>& words) {
  if (limit.result == "Count" || limit.result == "C*") return false;
  if (std::any_of(words.begin(), words.end(), [](const Word& word) { return word.letters == "r"; })) return false;
  const auto isMeant = [&limit](const Word& word) {
    return limit.diagnostic.empty() || limit.diagnostic == "*" || limit.diagnostic == std::to_string(word.diagnostic);
  };
  return std::any_of(words.begin(), words.end(),
                     [&](const Word& word) { return isMeant(word) && outcomesOf(word).back() == 'p'; });
}

// A limit that protects nothing makes a run an error, whatever its severity, and no limit makes it better.
TEST(ExitCodeProperty, LimitsThatFitNoResultNeverImproveARun) {
  constexpr int kRuns = 5'000;
  RandomValues random(11);
  int spoilt = 0;
  int passed = 0;
  for (int i = 0; i < kRuns; ++i) {
    const std::vector<Word> words = {{possibleWord(random), 0, 1}, {possibleWord(random), 1, 1}};
    const ExitRules rules{random.chance(50), random.chance(50)};
    std::vector<DiagnosticRecord> records = recordsOf(words);
    const ExitCode before = exitCodeOf(records, rules);
    std::vector<UserLimit> limits;
    for (std::uint64_t more = 1 + random.below(3); more > 0; --more) limits.push_back(anyLimit(random));
    for (DiagnosticRecord& record : records) {
      if (record.verdict == Verdict::kError || record.skip) continue;
      for (const UserLimit& limit : limitsFor(record.name, limits)) record.limits.push_back(limit);
      const RecordJudgement judgement = judgeRecord(record, true);
      record.verdict = judgement.verdict;
      record.error = judgement.error;
    }
    const ExitCode after = exitCodeOf(withLimitsWithoutResult(std::move(records), limits), rules);
    ASSERT_FALSE(before != ExitCode::kAllPassed && after == ExitCode::kAllPassed) << i;
    const bool hasOneForNothing = std::any_of(limits.begin(), limits.end(),
                                              [&words](const UserLimit& limit) { return isForNothing(limit, words); });
    if (hasOneForNothing) {
      ASSERT_EQ(after, ExitCode::kError) << i << ' ' << words[0].letters << ' ' << words[1].letters;
    }
    spoilt += before == ExitCode::kAllPassed && hasOneForNothing ? 1 : 0;
    passed += after == ExitCode::kAllPassed ? 1 : 0;
  }
  EXPECT_GT(spoilt, kRuns / 20);
  EXPECT_GT(passed, kRuns / 20);
}

}  // namespace
}  // namespace quazor
