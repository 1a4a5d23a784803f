// Requirements on the capture service of every backend, as a typed test suite.
//
// A backend instantiates it with a type that has a default constructor and the members
//
//   std::shared_ptr<CaptureService> service();
//   std::shared_ptr<CaptureService> serviceWithoutDevice();
//   std::string refusal(CaptureRefusal);      // "DOMAIN CODE" of that refusal
//   void pass(std::chrono::milliseconds);     // lets time pass, so that frames arrive
//
//   INSTANTIATE_TYPED_TEST_SUITE_P(Linux, CaptureConformance, LinuxUnderTest);
//
// The device has four streams: BackFacingCamera, BackFacingTelephotoCamera and BackFacingSuperWideCamera, which form a
// group with the first as its master, and FrontFacingInfraredCamera, which has a projector. Each has the formats 0 and
// 1, supports 30 frames per second, and can switch automatic exposure on and off.
#pragma once

#include "backends/capture/capture_user_for_tests.h"

#include <limits>
#include <utility>

namespace quazor {

template <class UnderTest>
class CaptureConformance : public CaptureFixture<UnderTest> {};

TYPED_TEST_SUITE_P(CaptureConformance);

// ---- Devices, streams and groups

TYPED_TEST_P(CaptureConformance, TheDefaultPlugInIsSharedAndOthersAreNew) {
  EXPECT_EQ(this->service_->defaultPlugIn(), this->service_->defaultPlugIn());
  EXPECT_NE(this->service_->createPlugIn(), this->service_->createPlugIn());
  EXPECT_EQ(this->service_->defaultPlugIn()->description(), "capture plug-in");
  EXPECT_EQ(this->user_.device->description(), "capture device");
}

TYPED_TEST_P(CaptureConformance, WithoutADeviceThePlugInSaysSo) {
  const auto plugIn = this->under_test_.serviceWithoutDevice()->createPlugIn();
  ASSERT_NE(plugIn, nullptr);
  EXPECT_EQ(endOf([&](auto* error) { return plugIn->device(error); }), this->no(CaptureRefusal::kNoDevice));
  EXPECT_EQ(plugIn->device(nullptr), nullptr);
}

TYPED_TEST_P(CaptureConformance, EveryPathLeadsToTheSameObjects) {
  const CaptureUser& user = this->user_;
  ASSERT_EQ(user.streams.size(), 4U);
  ASSERT_EQ(user.groups.size(), 1U);
  EXPECT_EQ(user.device->streams(nullptr), user.streams);
  EXPECT_EQ(user.device->synchronizedStreamsGroups(nullptr), user.groups);
  EXPECT_EQ(user.back().streams(nullptr), user.backStreams());
  EXPECT_EQ(user.back().valueForProperty(capture_key::SynchronizationMaster, nullptr)->object(), user.streams[0]);
  const CaptureUser other = this->newUser();
  EXPECT_NE(other.streams[0], user.streams[0]);
}

// ---- Control

TYPED_TEST_P(CaptureConformance, ControlMayBeTakenAgainByItsHolder) {
  EXPECT_EQ(this->user_.request({this->user_.streams[0]}), "done");
  EXPECT_EQ(CaptureUser::set(this->user_.wide(), capture_key::FormatIndex, 1), "done");
  EXPECT_EQ(this->user_.request(this->user_.streams), "done");
  EXPECT_EQ(this->user_.wide().valueForProperty(capture_key::FormatIndex, nullptr), Value(1)) << "nothing was reset";
  EXPECT_EQ(this->user_.request({}), "done");
}

TYPED_TEST_P(CaptureConformance, WhatAnotherUserHoldsIsRefused) {
  const CaptureUser other = this->newUser();
  ASSERT_EQ(other.request({other.streams[0]}), "done");
  const std::string refused = this->no(CaptureRefusal::kControlledByAnother);
  EXPECT_EQ(this->user_.request({this->user_.streams[0]}), refused);
  EXPECT_EQ(this->user_.relinquish({this->user_.streams[0]}), refused);
  EXPECT_EQ(this->user_.start(0), refused);
  EXPECT_EQ(this->user_.stop(0), refused);
  EXPECT_EQ(CaptureUser::set(this->user_.wide(), capture_key::FormatIndex, 1), refused);
}

TYPED_TEST_P(CaptureConformance, ControlIsTakenOfAllStreamsOrNone) {
  const CaptureUser other = this->newUser();
  ASSERT_EQ(other.request({other.streams[2]}), "done");
  EXPECT_EQ(this->user_.request(this->user_.backStreams()), this->no(CaptureRefusal::kControlledByAnother));
  EXPECT_EQ(this->user_.start(0), this->no(CaptureRefusal::kNotControlled));
  EXPECT_EQ(other.request({other.streams[0], other.streams[1]}), "done");
}

TYPED_TEST_P(CaptureConformance, ControlIsGivenBackOfAllStreamsOrNone) {
  const CaptureUser other = this->newUser();
  ASSERT_EQ(this->user_.request({this->user_.streams[0]}), "done");
  EXPECT_EQ(this->user_.relinquish(this->user_.backStreams()), this->no(CaptureRefusal::kNotControlled));
  EXPECT_EQ(other.request({other.streams[0]}), this->no(CaptureRefusal::kControlledByAnother));
  EXPECT_EQ(this->user_.relinquish({this->user_.streams[0]}), "done");
  EXPECT_EQ(other.request({other.streams[0]}), "done");
}

TYPED_TEST_P(CaptureConformance, AStreamThatRunsIsNotGivenBack) {
  ASSERT_EQ(this->user_.request(this->user_.backStreams()), "done");
  ASSERT_EQ(this->user_.start(1), "done");
  EXPECT_EQ(this->user_.relinquish(this->user_.backStreams()), this->no(CaptureRefusal::kWrongState));
  EXPECT_EQ(this->user_.start(0), "done") << "none was given back";
}

TYPED_TEST_P(CaptureConformance, StreamsOfOthersAreForeign) {
  const CaptureUser other = this->newUser();
  const std::string foreign = this->no(CaptureRefusal::kForeignObject);
  EXPECT_EQ(this->user_.request({other.streams[0]}), foreign);
  EXPECT_EQ(this->user_.request({nullptr}), foreign);
  EXPECT_EQ(this->user_.relinquish({other.streams[0]}), foreign);
  EXPECT_EQ(this->user_.relinquish({nullptr}), foreign);
}

TYPED_TEST_P(CaptureConformance, SettingsAreNewForEveryHolder) {
  const auto value = [&](std::string_view key) { return this->user_.infrared().valueForProperty(key, nullptr); };
  ASSERT_EQ(this->user_.request({this->user_.streams[3]}), "done");
  const Value exposure = *value(capture_key::AEEnabled);
  for (const auto& [key, changed] :
       {std::pair(capture_key::FormatIndex, Value(1)),
        std::pair(capture_key::MultipleOutputSupportEnabled, Value(true)),
        std::pair(capture_key::InfraredLightSourceConfiguration, Value(capture_sample::light(2, 1, 0))),
        std::pair(capture_key::SynchronizedStreamsSlaveConfiguration, Value(capture_sample::slave())),
        std::pair(capture_key::VideoOutputsEnabled, Value(capture_sample::primary(true))),
        std::pair(capture_key::VideoOutputHandlers, Value(capture_sample::handlers(capture_sample::frameHandler())))}) {
    ASSERT_EQ(CaptureUser::set(this->user_.infrared(), key, changed), "done") << key;
  }
  ASSERT_EQ(this->user_.relinquish({this->user_.streams[3]}), "done");
  EXPECT_EQ(value(capture_key::VideoOutputHandlers), Value(Dictionary{})) << "handlers go with control";
  ASSERT_EQ(this->user_.request({this->user_.streams[3]}), "done");
  EXPECT_EQ(toUnsigned(pointerTo(value(capture_key::FormatIndex))), 0U);
  EXPECT_EQ(value(capture_key::MultipleOutputSupportEnabled), Value(false));
  EXPECT_EQ(value(capture_key::AEEnabled), exposure);
  EXPECT_EQ(value(capture_key::InfraredLightSourceConfiguration), Value(capture_sample::light(0, 0, 0)));
  EXPECT_EQ(value(capture_key::SynchronizedStreamsSlaveConfiguration), Value(Dictionary{}));
  EXPECT_EQ(value(capture_key::VideoOutputsEnabled), Value(Dictionary{}));
}

TYPED_TEST_P(CaptureConformance, InvalidatingFreesWhatTheUserHadAndRefusesEveryCall) {
  const CaptureUser& user = this->user_;
  ASSERT_EQ(user.request(user.streams), "done");
  ASSERT_EQ(user.start(0), "done");
  EXPECT_TRUE(user.device->invalidate(nullptr));
  const CaptureUser other = this->newUser();
  EXPECT_EQ(other.request(other.streams), "done");
  EXPECT_EQ(other.start(0), "done");
  const std::function<bool(DiagnosticErrorPtr*)> calls[] = {
      [&](auto* error) { return user.device->streams(error).has_value(); },
      [&](auto* error) { return user.device->synchronizedStreamsGroups(error).has_value(); },
      [&](auto* error) { return user.device->requestControlOfStreams({}, error); },
      [&](auto* error) { return user.device->relinquishControlOfStreams({}, error); },
      [&](auto* error) { return user.device->invalidate(error); },
      [&](auto* error) { return user.device->valueForProperty(capture_key::MultiCamConfiguration, error).has_value(); },
      [&](auto* error) {
        return user.device->setValue(capture_sample::session({}), capture_key::MultiCamConfiguration, error);
      },
      [&](auto* error) { return user.back().streams(error).has_value(); },
      [&](auto* error) { return user.back().valueForProperty(capture_key::ActiveStreams, error).has_value(); },
      [&](auto* error) { return user.back().setValue(Array{}, capture_key::ActiveStreams, error); },
      [&](auto* error) { return user.wide().valueForProperty(capture_key::PortType, error).has_value(); },
      [&](auto* error) { return user.wide().valueForProperty("Colour", error).has_value(); },
      [&](auto* error) { return user.wide().setValue(0, capture_key::FormatIndex, error); },
      [&](auto* error) { return user.wide().start(error); },
      [&](auto* error) { return user.wide().stop(error); },
  };
  for (const auto& call : calls) EXPECT_EQ(endOf(call), this->no(CaptureRefusal::kInvalidated)) << &call - calls;
}

TYPED_TEST_P(CaptureConformance, WhatAUserHadIsFreeWhenItsLastObjectIsGone) {
  auto leaving = std::make_unique<CaptureUser>(*this->service_);
  ASSERT_EQ(leaving->request(leaving->streams), "done");
  ASSERT_EQ(leaving->start(0), "done");
  std::shared_ptr<CaptureStream> last = leaving->streams[2];
  leaving.reset();
  EXPECT_EQ(this->user_.request(this->user_.streams), this->no(CaptureRefusal::kControlledByAnother));
  last.reset();
  EXPECT_EQ(this->user_.request(this->user_.streams), "done");
  EXPECT_EQ(this->user_.start(0), "done");
}

TYPED_TEST_P(CaptureConformance, ErrorPlacesMayBeMissing) {
  EXPECT_FALSE(this->user_.wide().start(nullptr));
  EXPECT_FALSE(this->user_.wide().setValue(1, "Colour", nullptr));
  EXPECT_FALSE(this->user_.device->requestControlOfStreams({nullptr}, nullptr));
  EXPECT_EQ(this->user_.device->valueForProperty("Colour", nullptr), std::nullopt);
}

// ---- Properties

TYPED_TEST_P(CaptureConformance, UnknownPropertiesAreNeitherReadNorSet) {
  const CaptureUser& user = this->user_;
  CaptureObject* const objects[] = {user.device.get(), &user.back(), &user.wide()};
  for (CaptureObject* object : objects) {
    EXPECT_EQ(user.read(*object, "Colour"), this->no(CaptureRefusal::kUnknownProperty));
    EXPECT_EQ(user.set(*object, "Colour", 1), this->no(CaptureRefusal::kUnknownProperty)) << "even without control";
  }
  EXPECT_EQ(user.read(*user.device, capture_key::PortType), this->no(CaptureRefusal::kUnknownProperty));
  EXPECT_EQ(user.read(user.wide(), capture_key::ActiveStreams), this->no(CaptureRefusal::kUnknownProperty));
  EXPECT_EQ(user.set(user.back(), capture_key::FormatIndex, 0), this->no(CaptureRefusal::kUnknownProperty));
}

TYPED_TEST_P(CaptureConformance, SomePropertiesCanOnlyBeRead) {
  const CaptureUser& user = this->user_;
  const std::string refused = this->no(CaptureRefusal::kReadOnlyProperty);
  EXPECT_EQ(user.set(user.wide(), capture_key::PortType, "Other"), refused) << "even without control";
  ASSERT_EQ(user.request(user.streams), "done");
  EXPECT_EQ(user.set(user.wide(), capture_key::PortType, "Other"), refused);
  EXPECT_EQ(user.set(user.wide(), capture_key::ErrorCounters, Dictionary{}), refused);
  const std::optional<Value> name = user.wide().valueForProperty(capture_key::CameraName, nullptr);
  EXPECT_TRUE(name && name->string() != nullptr && !name->string()->empty()) << "with control, it is known";
  EXPECT_EQ(user.set(user.wide(), capture_key::CameraName, "Other"), refused);
  EXPECT_EQ(user.set(user.back(), capture_key::SynchronizationMaster, user.streams[1]), refused);
  EXPECT_EQ(user.set(user.back(), capture_key::MasterConfigurationSupportedKeys, Array{}), refused);
  EXPECT_EQ(user.set(*user.device, capture_key::MulticamSessionStatus, 1), refused);
}

TYPED_TEST_P(CaptureConformance, PropertiesAreReadWithoutControl) {
  const auto value = [&](std::size_t index, std::string_view key) {
    return this->user_.streams[index]->valueForProperty(key, nullptr);
  };
  const std::string_view ports[] = {port_type::BackFacingCamera, port_type::BackFacingTelephotoCamera,
                                    port_type::BackFacingSuperWideCamera, port_type::FrontFacingInfraredCamera};
  for (std::size_t i = 0; i < 4; ++i) EXPECT_EQ(value(i, capture_key::PortType), Value(ports[i]));
  EXPECT_EQ(value(0, capture_key::FormatIndex), Value(0U));
  EXPECT_EQ(value(0, capture_key::MultipleOutputSupportEnabled), Value(false));
  EXPECT_EQ(value(0, capture_key::SynchronizedStreamsSlaveConfiguration), Value(Dictionary{}));
  EXPECT_EQ(value(0, capture_key::AEEnabled), Value(true));
  EXPECT_EQ(value(3, capture_key::InfraredLightSourceConfiguration), Value(capture_sample::light(0, 0, 0)));
  EXPECT_EQ(value(0, capture_key::VideoOutputConfigurations), Value(Dictionary{}));
  EXPECT_EQ(value(0, capture_key::VideoOutputsEnabled), Value(Dictionary{}));
  EXPECT_EQ(value(0, capture_key::VideoOutputHandlers), Value(Dictionary{}));
  const std::optional<Value> counters = value(0, capture_key::ErrorCounters);
  for (const std::string_view name : {"I2CErrorCount", "MIPIErrorCount", "LPDPErrorCount", "UARTErrorCount",
                                      "SIFErrorCount", "ProjectorErrorCount"}) {
    const Value* const counter = entryOf(pointerTo(counters), name);
    ASSERT_NE(counter, nullptr) << name;
    EXPECT_EQ(toUnsigned(counter), 0U) << name;
  }
}

TYPED_TEST_P(CaptureConformance, ARateThatWasNotSetIsTheFormatsOrUnreadable) {
  for (const std::string_view key : {capture_key::MinimumFrameRate, capture_key::MaximumFrameRate}) {
    const std::optional<Value> rate = this->user_.wide().valueForProperty(key, nullptr);
    if (rate) {
      EXPECT_GT(toDouble(&*rate), 0) << key;
    } else {
      EXPECT_EQ(this->user_.read(this->user_.wide(), key), this->no(CaptureRefusal::kUnreadableProperty)) << key;
    }
  }
}

struct StreamSetting {
  std::string_view key;
  Value value;
};

inline std::vector<StreamSetting> goodStreamSettings() {
  return {
      {capture_key::FormatIndex, 1U},
      {capture_key::FormatIndex, 1},
      {capture_key::FormatIndex, 0},
      {capture_key::MinimumFrameRate, 29.97},
      {capture_key::MinimumFrameRate, 29.75F},
      {capture_key::MaximumFrameRate, 30U},
      {capture_key::MaximumFrameRate, 30},
      {capture_key::MultipleOutputSupportEnabled, true},
      {capture_key::MultipleOutputSupportEnabled, false},
      {capture_key::SynchronizedStreamsSlaveConfiguration, capture_sample::slave()},
      {capture_key::SynchronizedStreamsSlaveConfiguration,
       capture_sample::with(capture_sample::slave(), capture_key::MasterToSlaveFrameRateRatio, std::uint64_t{1})},
      {capture_key::AEEnabled, false},
      {capture_key::AEEnabled, true},
      {capture_key::InfraredLightSourceConfiguration, capture_sample::light(2, 1, 0)},
      {capture_key::InfraredLightSourceConfiguration, capture_sample::light(0U, 0U, 0U)},
      {capture_key::VideoOutputConfigurations, Dictionary{}},
      {capture_key::VideoOutputConfigurations, capture_sample::primary(Dictionary{})},
      {capture_key::VideoOutputConfigurations,
       capture_sample::primary(Dictionary{{capture_sample::text(capture_key::AttachRaw), true}})},
      {capture_key::VideoOutputsEnabled, Dictionary{}},
      {capture_key::VideoOutputsEnabled, capture_sample::primary(true)},
      {capture_key::VideoOutputHandlers, capture_sample::primary(Dictionary{})},
      {capture_key::VideoOutputHandlers,
       capture_sample::primary(
           Dictionary{{capture_sample::text(capture_key::PixelBufferHandler), capture_sample::frameHandler()},
                      {capture_sample::text(capture_key::EventHandler), capture_sample::eventHandler()}})},
  };
}

TYPED_TEST_P(CaptureConformance, SettingsReadBackAsTheyWereSet) {
  CaptureStream& stream = this->user_.infrared();
  ASSERT_EQ(this->user_.request({this->user_.streams[3]}), "done");
  for (const StreamSetting& row : goodStreamSettings()) {
    EXPECT_EQ(CaptureUser::set(stream, row.key, row.value), "done") << row.key << " " << defaultText(row.value);
    const std::optional<Value> read = stream.valueForProperty(row.key, nullptr);
    EXPECT_EQ(read, row.value) << row.key;
    EXPECT_EQ(read->kind(), row.value.kind()) << row.key;
  }
}

TYPED_TEST_P(CaptureConformance, SettingsNeedControlOfAStoppedStream) {
  CaptureStream& stream = this->user_.infrared();
  for (const StreamSetting& row : goodStreamSettings()) {
    EXPECT_EQ(CaptureUser::set(stream, row.key, row.value), this->no(CaptureRefusal::kNotControlled)) << row.key;
  }
  ASSERT_EQ(this->user_.request({this->user_.streams[3]}), "done");
  ASSERT_EQ(this->user_.start(3), "done");
  for (const StreamSetting& row : goodStreamSettings()) {
    EXPECT_EQ(CaptureUser::set(stream, row.key, row.value), this->no(CaptureRefusal::kWrongState)) << row.key;
  }
  EXPECT_EQ(CaptureUser::set(stream, capture_key::FormatIndex, "1"), this->no(CaptureRefusal::kWrongState))
      << "whatever the value";
  ASSERT_EQ(this->user_.stop(3), "done");
  EXPECT_EQ(CaptureUser::set(stream, capture_key::FormatIndex, 1), "done");
}

struct BadSetting {
  std::string name;
  std::string_view key;
  Value value;
  CaptureRefusal reason;
};

// Invalid settings for any camera's stream.
inline std::vector<BadSetting> badStreamSettings() {
  using enum CaptureRefusal;
  const auto in = [](std::string_view key, Value value) {
    return Dictionary{{capture_sample::text(key), std::move(value)}};
  };
  std::vector<BadSetting> rows = {
      {"a text", capture_key::FormatIndex, "1", kWrongType},
      {"a boolean", capture_key::FormatIndex, true, kWrongType},
      {"a whole double", capture_key::FormatIndex, 1.0, kWrongType},
      {"a fraction", capture_key::FormatIndex, 0.5F, kWrongType},
      {"below 0", capture_key::FormatIndex, -1, kOutOfRange},
      {"beyond 32 bits", capture_key::FormatIndex, std::uint64_t{1} << 32U, kOutOfRange},
      {"beyond everything", capture_key::FormatIndex, std::numeric_limits<std::uint64_t>::max(), kOutOfRange},
      {"a number", capture_key::MultipleOutputSupportEnabled, 1, kWrongType},
      {"bytes", capture_key::MultipleOutputSupportEnabled, Bytes{}, kWrongType},
      {"an error", capture_key::MultipleOutputSupportEnabled, DiagnosticErrorPtr{}, kWrongType},
      {"no object", capture_key::MultipleOutputSupportEnabled, std::shared_ptr<Object>{}, kWrongType},
      {"a number", capture_key::AEEnabled, 0, kWrongType},
      {"a number", capture_key::InfraredLightSourceConfiguration, 2, kWrongType},
      {"no current", capture_key::InfraredLightSourceConfiguration,
       capture_sample::without(capture_sample::light(1, 1, 1), capture_key::StructuredLightCurrent), kOutOfRange},
      {"a colour", capture_key::InfraredLightSourceConfiguration,
       capture_sample::with(capture_sample::light(1, 1, 1), "Colour", 1), kOutOfRange},
      {"a mode below 0", capture_key::InfraredLightSourceConfiguration, capture_sample::light(-1, 1, 1), kOutOfRange},
      {"a mode that is a boolean", capture_key::InfraredLightSourceConfiguration, capture_sample::light(true, 1, 1),
       kWrongType},
      {"a mode that is a double", capture_key::InfraredLightSourceConfiguration, capture_sample::light(2.0, 1, 1),
       kWrongType},
      {"a pattern beyond 8 bits", capture_key::InfraredLightSourceConfiguration, capture_sample::light(1, 256, 1),
       kOutOfRange},
      {"a current beyond 8 bits", capture_key::InfraredLightSourceConfiguration, capture_sample::light(1, 1, 256),
       kOutOfRange},
      {"an array", capture_key::VideoOutputConfigurations, Array{}, kWrongType},
      {"another output", capture_key::VideoOutputConfigurations, in("SecondaryScaler", Dictionary{}), kOutOfRange},
      {"no configuration", capture_key::VideoOutputConfigurations, capture_sample::primary(1), kWrongType},
      {"another entry", capture_key::VideoOutputConfigurations, capture_sample::primary(in("Crop", 1)), kOutOfRange},
      {"no boolean", capture_key::VideoOutputConfigurations, capture_sample::primary(in(capture_key::AttachRaw, 1)),
       kWrongType},
      {"a boolean", capture_key::VideoOutputsEnabled, true, kWrongType},
      {"no boolean", capture_key::VideoOutputsEnabled, capture_sample::primary(1), kWrongType},
      {"another output", capture_key::VideoOutputsEnabled, in("SecondaryScaler", true), kOutOfRange},
      {"no dictionary", capture_key::VideoOutputHandlers, capture_sample::primary(capture_sample::frameHandler()),
       kWrongType},
      {"a handler of frames for events", capture_key::VideoOutputHandlers,
       capture_sample::primary(in(capture_key::EventHandler, capture_sample::frameHandler())), kWrongType},
      {"a handler of events for frames", capture_key::VideoOutputHandlers,
       capture_sample::primary(in(capture_key::PixelBufferHandler, capture_sample::eventHandler())), kWrongType},
      {"no handler", capture_key::VideoOutputHandlers, capture_sample::primary(in(capture_key::PixelBufferHandler, 1)),
       kWrongType},
      {"another handler", capture_key::VideoOutputHandlers,
       capture_sample::primary(in("SampleHandler", capture_sample::frameHandler())), kOutOfRange},
  };
  for (const std::string_view key : {capture_key::MinimumFrameRate, capture_key::MaximumFrameRate}) {
    rows.push_back({"a boolean", key, true, kWrongType});
    rows.push_back({"a text", key, "30", kWrongType});
    rows.push_back({"an array", key, Array{}, kWrongType});
    rows.push_back({"zero", key, 0, kOutOfRange});
    rows.push_back({"below zero", key, -30, kOutOfRange});
    rows.push_back({"not a number", key, std::numeric_limits<double>::quiet_NaN(), kOutOfRange});
    rows.push_back({"infinite", key, std::numeric_limits<double>::infinity(), kOutOfRange});
    rows.push_back({"too many", key, 10'001, kOutOfRange});
  }
  return rows;
}

// Invalid slave configurations.
inline std::vector<BadSetting> badSlaves() {
  using enum CaptureRefusal;
  constexpr std::string_view kKey = capture_key::SynchronizedStreamsSlaveConfiguration;
  constexpr std::string_view kRatio = capture_key::MasterToSlaveFrameRateRatio;
  return {
      {"no dictionary", kKey, 1, kWrongType},
      {"nothing", kKey, Dictionary{}, kOutOfRange},
      {"without a switch", kKey, capture_sample::without(capture_sample::slave(), capture_key::TimeMachineEnabled),
       kOutOfRange},
      {"a switch that is a number", kKey,
       capture_sample::with(capture_sample::slave(), capture_key::FrameSkippingEnabled, 0), kWrongType},
      {"without the ratio", kKey, capture_sample::without(capture_sample::slave(), kRatio), kOutOfRange},
      {"a ratio of 0", kKey, capture_sample::with(capture_sample::slave(), kRatio, 0), kOutOfRange},
      {"a ratio below 0", kKey, capture_sample::with(capture_sample::slave(), kRatio, -1), kOutOfRange},
      {"a ratio that is a double", kKey, capture_sample::with(capture_sample::slave(), kRatio, 1.0), kWrongType},
      {"a ratio that is a text", kKey, capture_sample::with(capture_sample::slave(), kRatio, "1"), kWrongType},
      {"another entry", kKey, capture_sample::with(capture_sample::slave(), "Speed", 1), kOutOfRange},
  };
}

TYPED_TEST_P(CaptureConformance, ValuesThatDoNotFitAreRefusedAndChangeNothing) {
  CaptureStream& stream = this->user_.infrared();
  ASSERT_EQ(this->user_.request({this->user_.streams[3]}), "done");
  std::vector<BadSetting> rows = badStreamSettings();
  for (const BadSetting& row : badSlaves()) rows.push_back(row);
  for (const BadSetting& row : rows) {
    const std::optional<Value> before = stream.valueForProperty(row.key, nullptr);
    EXPECT_EQ(CaptureUser::set(stream, row.key, row.value), this->no(row.reason)) << row.key << ": " << row.name;
    EXPECT_EQ(stream.valueForProperty(row.key, nullptr), before) << row.key << ": " << row.name;
  }
}

TYPED_TEST_P(CaptureConformance, AFormatThatTheCameraDoesNotHaveIsRefused) {
  ASSERT_EQ(this->user_.request({this->user_.streams[0]}), "done");
  EXPECT_NE(CaptureUser::set(this->user_.wide(), capture_key::FormatIndex, 2), "done");
  EXPECT_EQ(this->user_.wide().valueForProperty(capture_key::FormatIndex, nullptr), Value(0U));
}

TYPED_TEST_P(CaptureConformance, ACameraWithoutAProjectorHasNoLight) {
  constexpr std::string_view kKey = capture_key::InfraredLightSourceConfiguration;
  ASSERT_EQ(this->user_.request({this->user_.streams[0]}), "done");
  const std::string refused = this->no(CaptureRefusal::kUnsupported);
  EXPECT_EQ(this->user_.read(this->user_.wide(), kKey), refused);
  EXPECT_EQ(CaptureUser::set(this->user_.wide(), kKey, capture_sample::light(2, 0, 0)), refused);
  EXPECT_EQ(CaptureUser::set(this->user_.wide(), kKey, 1), refused) << "whatever the value";
}

REGISTER_TYPED_TEST_SUITE_P(
    CaptureConformance, TheDefaultPlugInIsSharedAndOthersAreNew, WithoutADeviceThePlugInSaysSo,
    EveryPathLeadsToTheSameObjects, ControlMayBeTakenAgainByItsHolder, WhatAnotherUserHoldsIsRefused,
    ControlIsTakenOfAllStreamsOrNone, ControlIsGivenBackOfAllStreamsOrNone, AStreamThatRunsIsNotGivenBack,
    StreamsOfOthersAreForeign, SettingsAreNewForEveryHolder, InvalidatingFreesWhatTheUserHadAndRefusesEveryCall,
    WhatAUserHadIsFreeWhenItsLastObjectIsGone, ErrorPlacesMayBeMissing, UnknownPropertiesAreNeitherReadNorSet,
    SomePropertiesCanOnlyBeRead, PropertiesAreReadWithoutControl, ARateThatWasNotSetIsTheFormatsOrUnreadable,
    SettingsReadBackAsTheyWereSet, SettingsNeedControlOfAStoppedStream, ValuesThatDoNotFitAreRefusedAndChangeNothing,
    AFormatThatTheCameraDoesNotHaveIsRefused, ACameraWithoutAProjectorHasNoLight);

}  // namespace quazor
