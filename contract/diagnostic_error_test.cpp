#include "contract/diagnostic_error.h"

#include "contract/counting_object_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using testing::ElementsAre;

std::vector<std::string> keysOf(const Dictionary& dictionary) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : dictionary) keys.push_back(key);
  return keys;
}

TEST(DiagnosticErrorTest, KeepsWhatItIsMadeOf) {
  const Dictionary userInfo{{"localized-description", "Too dark."}, {"lamp", 3}};
  const DiagnosticError error("LampDomain", std::numeric_limits<std::int64_t>::min(), userInfo);
  EXPECT_EQ(error.domain(), "LampDomain");
  EXPECT_EQ(error.code(), std::numeric_limits<std::int64_t>::min());
  EXPECT_EQ(error.userInfo(), userInfo);
  EXPECT_EQ(error.localizedDescription(), "Too dark.");
  EXPECT_EQ(error.underlyingError(), nullptr);
}

TEST(DiagnosticErrorTest, WithoutAMessageDescribesItselfByDomainAndCode) {
  EXPECT_EQ(DiagnosticError("LampDomain", -5, {}).localizedDescription(),
            "The operation failed (LampDomain error -5).");
  EXPECT_EQ(DiagnosticError("LampDomain", 5, {{"localized-description", 12}}).localizedDescription(),
            "The operation failed (LampDomain error 5).");
}

TEST(DiagnosticErrorTest, AnEmptyMessageIsAMessage) {
  EXPECT_EQ(DiagnosticError("LampDomain", 5, {{"localized-description", ""}}).localizedDescription(), "");
}

TEST(DiagnosticErrorTest, AnUnderlyingEntryThatIsNoErrorIsNone) {
  const DiagnosticError error("LampDomain", 5, {{"underlying-error", "text"}});
  EXPECT_EQ(error.underlyingError(), nullptr);
  EXPECT_FALSE(error.dictionaryRepresentation().contains("underlying-error"));
}

TEST(DiagnosticErrorTest, TheDomainsOfTheHostReadAsTheirNames) {
  EXPECT_EQ(QZErrorDomain, "QZErrorDomain");
  EXPECT_EQ(QZCapturePlugInErrorDomain, "QZCapturePlugInErrorDomain");
  EXPECT_EQ(QZTelemonErrorDomain, "QZTelemonErrorDomain");
  EXPECT_EQ(QZNimbeImageExperimentErrorDomain, "QZNimbeImageExperimentErrorDomain");
}

TEST(DictionaryRepresentationTest, HasExactlyThreeKeysInOrderWithoutAnUnderlyingError) {
  const Dictionary representation = makeError("LampDomain", -5, "Too dark.")->dictionaryRepresentation();
  EXPECT_THAT(keysOf(representation), ElementsAre("message", "code", "domain"));
  EXPECT_EQ(*representation.find("message"), Value("Too dark."));
  EXPECT_EQ(*representation.find("code"), Value(-5));
  EXPECT_EQ(*representation.find("domain"), Value("LampDomain"));
}

TEST(DictionaryRepresentationTest, NestsUnderlyingErrorsToAnyDepth) {
  const auto inner = errorWithMessage("Bus", 1, "stalled", nullptr);
  const auto middle = errorWithMessage("Driver", 2, "no answer", inner);
  const auto outer = errorWithMessage("Lamp", 3, "dark", middle);
  const Dictionary representation = outer->dictionaryRepresentation();
  EXPECT_THAT(keysOf(representation), ElementsAre("message", "code", "domain", "underlying-error"));
  const Dictionary* second = representation.find("underlying-error")->dictionary();
  ASSERT_NE(second, nullptr);
  EXPECT_THAT(keysOf(*second), ElementsAre("message", "code", "domain", "underlying-error"));
  EXPECT_EQ(*second->find("message"), Value("no answer"));
  const Dictionary* third = second->find("underlying-error")->dictionary();
  ASSERT_NE(third, nullptr);
  EXPECT_THAT(keysOf(*third), ElementsAre("message", "code", "domain"));
  EXPECT_EQ(*third, (Dictionary{{"message", "stalled"}, {"code", 1}, {"domain", "Bus"}}));
}

TEST(DictionaryRepresentationTest, IsACopyOfItsOwn) {
  const auto error = makeError("LampDomain", 5, "Too dark.");
  Dictionary representation = error->dictionaryRepresentation();
  representation.set("message", "changed");
  EXPECT_EQ(error->localizedDescription(), "Too dark.");
  EXPECT_EQ(*error->dictionaryRepresentation().find("message"), Value("Too dark."));
}

TEST(MakeErrorTest, BuildsItsMessageFromTheFormatAsTheOnlyEntry) {
  const auto error = makeError(QZErrorDomain, 5, "Lamp %@ is at %d of %lu.", "front", -3, 9U);
  EXPECT_EQ(error->domain(), "QZErrorDomain");
  EXPECT_EQ(error->code(), 5);
  EXPECT_EQ(error->userInfo(), (Dictionary{{"localized-description", "Lamp front is at -3 of 9."}}));
}

TEST(MakeErrorTest, NeverHasAnUnderlyingErrorNotEvenOneThatItsMessageNames) {
  const auto cause = makeError("Bus", 1, "stalled");
  const auto error = makeError("Lamp", 2, "Dark: %@", cause);
  EXPECT_EQ(error->localizedDescription(), "Dark: Bus code 1: stalled");
  EXPECT_EQ(error->underlyingError(), nullptr);
  EXPECT_THAT(keysOf(error->userInfo()), ElementsAre("localized-description"));
}

TEST(ErrorWithMessageTest, TakesTheMessageAsItIs) {
  EXPECT_EQ(errorWithMessage("Lamp", 1, "100%@", nullptr)->localizedDescription(), "100%@");
}

TEST(ErrorWithMessageTest, HasAnUnderlyingEntryOnlyForAnError) {
  const auto cause = makeError("Bus", 1, "stalled");
  const auto with = errorWithMessage("Lamp", 2, "Dark.", cause);
  EXPECT_EQ(with->underlyingError(), cause);
  EXPECT_THAT(keysOf(with->userInfo()), ElementsAre("localized-description", "underlying-error"));
  const auto without = errorWithMessage("Lamp", 2, "Dark.", nullptr);
  EXPECT_THAT(keysOf(without->userInfo()), ElementsAre("localized-description"));
}

DiagnosticErrorPtr chainOf(int errors) {
  DiagnosticErrorPtr chain;
  for (int i = 0; i < errors; ++i) chain = errorWithMessage("Bus", i, "stalled", std::move(chain));
  return chain;
}

TEST(DiagnosticErrorTest, AChainOfAnyLengthIsPrintedAndDestroyed) {
  constexpr int kErrors = 120'000;
  DiagnosticErrorPtr chain = chainOf(kErrors);
  EXPECT_EQ(formatMessage("%@", chain), "Bus code 119999: stalled");
  Dictionary representation = chain->dictionaryRepresentation();
  EXPECT_EQ(*representation.find("code"), Value(kErrors - 1));
  int length = 0;
  for (DiagnosticErrorPtr one = chain; one != nullptr; one = one->underlyingError()) ++length;
  EXPECT_EQ(length, kErrors);
  const std::weak_ptr<const DiagnosticError> inner = chain->underlyingError()->underlyingError();
  chain = nullptr;
  EXPECT_TRUE(inner.expired());
  representation = {};
}

TEST(DiagnosticErrorTest, TheEndOfAChainLeavesWhatOthersHold) {
  DiagnosticErrorPtr chain = chainOf(10);
  const DiagnosticErrorPtr held = chain->underlyingError();
  chain = nullptr;
  EXPECT_EQ(held->code(), 8);
  ASSERT_NE(held->underlyingError(), nullptr);
  EXPECT_EQ(held->underlyingError()->code(), 7);
}

TEST(StoreErrorTest, StoresWhereThereIsAPlaceAndNowhereElse) {
  const auto error = makeError("Lamp", 1, "Dark.");
  DiagnosticErrorPtr place = makeError("Lamp", 0, "old");
  storeError(&place, error);
  EXPECT_EQ(place, error);
  storeError(&place, nullptr);
  EXPECT_EQ(place, nullptr);
  storeError(nullptr, error);
  EXPECT_EQ(error.use_count(), 1);
}

TEST(FailTest, BuildsAndStoresAnErrorWithItsCause) {
  const auto cause = makeError("Bus", 1, "stalled");
  DiagnosticErrorPtr place;
  fail(&place, QZCapturePlugInErrorDomain, 207, cause, "Lamp %@ is dark! %@", "front", cause);
  ASSERT_NE(place, nullptr);
  EXPECT_EQ(place->domain(), "QZCapturePlugInErrorDomain");
  EXPECT_EQ(place->code(), 207);
  EXPECT_EQ(place->localizedDescription(), "Lamp front is dark! Bus code 1: stalled");
  EXPECT_EQ(place->underlyingError(), cause);
}

TEST(FailTest, WithoutACauseTheErrorHasOnlyItsMessage) {
  DiagnosticErrorPtr place = makeError("Lamp", 0, "old");
  fail(&place, "Lamp", 2, nullptr, "Dark.");
  EXPECT_THAT(keysOf(place->userInfo()), ElementsAre("localized-description"));
  EXPECT_EQ(place->code(), 2);
}

TEST(FailTest, WithoutAPlaceNothingIsFormatted) {
  const auto object = std::make_shared<CountingObject>();
  fail(nullptr, "Lamp", 2, nullptr, "Dark: %@", object);
  EXPECT_EQ(object->asked, 0);
  DiagnosticErrorPtr place;
  fail(&place, "Lamp", 2, nullptr, "Dark: %@", object);
  EXPECT_EQ(object->asked, 1);
}

TEST(FailTest, TheCauseMayStandWhereTheErrorGoes) {
  DiagnosticErrorPtr place = makeError("Bus", 1, "stalled");
  const DiagnosticErrorPtr cause = place;
  fail(&place, "Lamp", 2, place, "Dark: %@", place);
  EXPECT_EQ(place->localizedDescription(), "Dark: Bus code 1: stalled");
  EXPECT_EQ(place->underlyingError(), cause);
}

}  // namespace
}  // namespace quazor
