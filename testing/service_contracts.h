// What callers may rely on in the service families, whoever provides them. Each subject is
// default-constructible, has `service()`, which answers the family's interface, and lets the tests arrange
// what the service then answers:
//
//   PreferencesContract       PreferencesStore& another(): the same store, as another process has it
//   DeviceAnswersContract     answer(key, PlistValue), setBuild(text), setMultiUser(bool),
//   addContainer(identifier, path) KernelContract            setSysctl(name, PlistData), setClock(PlistDate,
//   ticks, Timebase) LogSubmissionContract     enable(PlistValue), setTaskingValue(key, PlistValue); logs():
//   the bytes of the written
//                             logs in order, options(): those of the last one
//   AppRegistryContract       addBundle(type)
//   LocaleSettingsContract    set(preferred, system, country)
//   NotificationsContract     posts(name): how many so far
//   ServiceListenerContract   connectPeer(), send(PlistDictionary): as the peer that connected; no more is
//   asked of
//                             one that comes after createListener
//   FileSystemContract        put(path, text)
//   DynamicLoaderContract     library(), symbolName(): a library that is there and a symbol that it has
//   MessageDigestContract     nothing more
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/app_registry.h"
#include "platform/device_answers.h"
#include "platform/dynamic_loader.h"
#include "platform/file_system.h"
#include "platform/kernel.h"
#include "platform/locale_settings.h"
#include "platform/log_submission.h"
#include "platform/message_digest.h"
#include "platform/notifications.h"
#include "platform/preferences_store.h"
#include "platform/service_listener.h"

namespace tbdaily::testing {

inline PlistData bytesOf(std::string_view text) {
  const auto bytes = std::as_bytes(std::span(text));
  return {bytes.begin(), bytes.end()};
}

template <typename Subject>
struct ServiceContract : ::testing::Test {
  Subject subject;
  decltype(subject.service())& service = subject.service();
};

template <typename Subject>
struct PreferencesContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(PreferencesContract);

TYPED_TEST_P(PreferencesContract, KeepsValuesByDomainVisibleAtOnceUntilTheyAreRemoved) {
  PreferencesStore& here = this->service;
  PreferencesStore& there = this->subject.another();
  const PlistValue nested = PlistValue::dictionary(
      {{"n", PlistValue::int8(-3)}, {"a", PlistValue::array({PlistValue::float32(0.1F)})}});
  EXPECT_TRUE(here.getValue("k", "a.b").isNone());
  here.setValue("k", PlistValue::int32(1), "a.b");
  EXPECT_EQ(there.getValue("k", "a.b"), PlistValue::int32(1));
  there.setValue("k", PlistValue::int32(2), "a.b");  // of the same length as what it replaces
  EXPECT_EQ(here.getValue("k", "a.b"), PlistValue::int32(2));
  there.setValue("other", nested, "a.b");
  here.setValue("k", PlistValue::string(""), "a");
  here.synchronize("a.b");
  here.synchronize("never.written");
  EXPECT_EQ(here.copyApplicationValue("other", "a.b"), nested);
  EXPECT_EQ(here.getValue("k", "a.b"), PlistValue::int32(2));
  there.setValue("k", PlistValue(), "a.b");
  there.setValue("k", PlistValue(), "never.written");
  EXPECT_TRUE(here.getValue("k", "a.b").isNone());
  EXPECT_EQ(here.getValue("k", "a"), PlistValue::string(""));
  here.setOwnValue("seen", PlistValue::boolean(true));
  here.synchronizeOwn();
  EXPECT_EQ(there.getValue("seen", "com.velmora.sysmetrics.tbdaily"), PlistValue::boolean(true));
}

TYPED_TEST_P(PreferencesContract, ReadsNumbersAndBooleansAsTheirKindsAlone) {
  struct Case {
    PlistValue value;
    std::int64_t integer;
    bool isNumber, boolean, isBoolean;
  };
  const std::vector<Case> cases{
      {PlistValue::int64(-5), -5, true, false, false},
      {PlistValue::float64(-2.9), -2, true, false, false},
      {PlistValue::float64(1e300), std::numeric_limits<std::int64_t>::max(), true, false, false},
      {PlistValue::float64(std::nan("")), 0, true, false, false},
      {PlistValue::boolean(true), 0, false, true, true},
      {PlistValue::boolean(false), 0, false, false, true},
      {PlistValue::string("1"), 0, false, false, false},
      {PlistValue(), 0, false, false, false},
  };
  for (const Case& c : cases) {
    this->service.setValue("k", c.value, "d");
    bool valid = !c.isNumber;
    EXPECT_EQ(this->service.getInteger("k", "d", &valid), c.integer);
    EXPECT_EQ(valid, c.isNumber) << c.integer;
    const PreferenceBoolean boolean = this->service.getApplicationBoolean("k", "d");
    EXPECT_TRUE(boolean.value == c.boolean && boolean.valid == c.isBoolean) << c.integer;
  }
}

TYPED_TEST_P(PreferencesContract, ASeriesOfChangesComesToTheSameAsOneAfterTheOther) {
  this->service.setValue("old", PlistValue::int64(1), "a");
  const PlistValue one = PlistValue::int32(1), two = PlistValue::int32(2);
  this->service.applyChanges(std::vector<PreferenceChange>{{"old", PlistValue(), "a"},
                                                           {"k", one, "a"},
                                                           {"k", one, "b"},
                                                           {"k", two, "a"},
                                                           {"back", PlistValue(), "b"},
                                                           {"back", one, "b"},
                                                           {"gone", one, "a"},
                                                           {"gone", PlistValue(), "a"}});
  PreferencesStore& there = this->subject.another();
  EXPECT_EQ(there.getValue("k", "a"), two);
  EXPECT_EQ(there.getValue("k", "b"), one);
  EXPECT_EQ(there.getValue("back", "b"), one);
  EXPECT_TRUE(there.getValue("old", "a").isNone() && there.getValue("gone", "a").isNone());
}
REGISTER_TYPED_TEST_SUITE_P(PreferencesContract, KeepsValuesByDomainVisibleAtOnceUntilTheyAreRemoved,
                            ReadsNumbersAndBooleansAsTheirKindsAlone,
                            ASeriesOfChangesComesToTheSameAsOneAfterTheOther);

template <typename Subject>
struct DeviceAnswersContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(DeviceAnswersContract);

TYPED_TEST_P(DeviceAnswersContract, AnswersByKindAndCurrently) {
  for (const auto& [value, expected] : {std::pair(PlistValue::boolean(true), true),
                                        {PlistValue::int64(1), false},
                                        {PlistValue::boolean(false), false}}) {
    this->subject.answer("q", value);
    EXPECT_EQ(this->service.booleanAnswer("q"), expected);
    EXPECT_EQ(this->service.copyAnswer("q"), value);
  }
  for (const bool multiUser : {true, false}) {
    this->subject.setMultiUser(multiUser);
    EXPECT_EQ(this->service.multiUserMode(), multiUser);
  }
  this->subject.setBuild("4N117");
  EXPECT_EQ(this->service.currentOSBuildVersion(), "4N117");
  this->subject.addContainer("g", "/private/g");
  EXPECT_EQ(this->service.systemGroupContainerPath("g").path, "/private/g");
  const SystemGroupContainer unknown = this->service.systemGroupContainerPath("G");
  EXPECT_TRUE(!unknown.path && unknown.error != 0);
}
REGISTER_TYPED_TEST_SUITE_P(DeviceAnswersContract, AnswersByKindAndCurrently);

template <typename Subject>
struct KernelContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(KernelContract);

TYPED_TEST_P(KernelContract, FillsNoMoreThanTheRoomAndSaysHowMuch) {
  constexpr std::byte kUntouched{0xEE};
  constexpr int kNoSuchName = 2, kTooSmall = 12;
  this->subject.setSysctl("kern.three", bytesOf("abc"));
  struct Case {
    std::string_view name;
    std::size_t room;
    int error;
  };
  for (const Case& c : {Case{"kern.three", 8, 0}, Case{"kern.three", 3, 0}, Case{"kern.three", 2, kTooSmall},
                        Case{"kern.three", 0, kTooSmall}, Case{"kern.other", 8, kNoSuchName}}) {
    PlistData buffer(8, kUntouched);
    std::size_t length = c.room;
    EXPECT_EQ(this->service.sysctlByName(c.name, buffer, length), c.error) << c.room;
    if (c.error == 0) {
      EXPECT_EQ(length, 3U);
      EXPECT_EQ(PlistData(buffer.begin(), buffer.begin() + 3), bytesOf("abc"));
    }
    EXPECT_EQ(buffer[c.error == 0 ? 3 : 0], kUntouched) << c.room;
  }
}

TYPED_TEST_P(KernelContract, TellsTimeTicksAndTheProcess) {
  const PlistDate now = PlistDate::fromUnixSeconds(1795511224.25);
  this->subject.setClock(now, 123456789012, {125, 3});
  EXPECT_EQ(this->service.currentTime(), now);
  EXPECT_EQ(this->service.tickCount(), 123456789012U);
  const auto timebase = this->service.timebase();
  EXPECT_TRUE(timebase && timebase->numerator == 125 && timebase->denominator == 3);
  EXPECT_NE(this->service.processName(), "");
  EXPECT_GT(this->service.processIdentifier(), 0);
}
REGISTER_TYPED_TEST_SUITE_P(KernelContract, FillsNoMoreThanTheRoomAndSaysHowMuch,
                            TellsTimeTicksAndTheProcess);

template <typename Subject>
struct LogSubmissionContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(LogSubmissionContract);

TYPED_TEST_P(LogSubmissionContract, WritesTheLogBeforeItReturnsAndNothingWhenTheWriterFails) {
  const auto write = [&](const PlistValue& options, std::string_view text, bool whole) {
    bool called = false;
    const bool written =
        this->service.writeLogForSubmission("193", "log", options, PlistValue(), [&](LogOutput& output) {
          called = true;
          EXPECT_TRUE(output.write(bytesOf(text)) && output.write(bytesOf("!")));
          return whole;
        });
    EXPECT_TRUE(called);
    return written;
  };
  const PlistValue options = PlistValue::dictionary({{"o", PlistValue::string("1")}});
  EXPECT_TRUE(write(options, "one", true));
  EXPECT_EQ(this->subject.options(), options);
  EXPECT_FALSE(write(options, "two", false));
  EXPECT_TRUE(write(PlistValue(), "three", true));
  EXPECT_TRUE(this->subject.options().isNone());
  EXPECT_EQ(this->subject.logs(), (std::vector<std::string>{"one!", "three!"}));
}

TYPED_TEST_P(LogSubmissionContract, IsEnabledByTheBooleanAlone) {
  EXPECT_FALSE(this->service.isDiagnosticLogSubmissionEnabled());
  for (const PlistValue& no :
       {PlistValue::int64(1), PlistValue::string("true"), PlistValue::boolean(false)}) {
    this->subject.enable(no);
    EXPECT_FALSE(this->service.isDiagnosticLogSubmissionEnabled());
  }
  this->subject.enable(PlistValue::boolean(true));
  EXPECT_TRUE(this->service.isDiagnosticLogSubmissionEnabled());
  this->subject.setTaskingValue("AggressiveSubmissionDays", PlistValue::int64(3));
  EXPECT_EQ(this->service.taskingValue("AggressiveSubmissionDays"), PlistValue::int64(3));
  EXPECT_NE(this->service.incidentIdentifier(), this->service.incidentIdentifier());
}
REGISTER_TYPED_TEST_SUITE_P(LogSubmissionContract, WritesTheLogBeforeItReturnsAndNothingWhenTheWriterFails,
                            IsEnabledByTheBooleanAlone);

template <typename Subject>
struct AppRegistryContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(AppRegistryContract);

TYPED_TEST_P(AppRegistryContract, CallsBackOnceForEachBundle) {
  const std::string user(this->service.userApplicationType());
  for (const std::string& type : {user, std::string("System"), user}) this->subject.addBundle(type);
  std::vector<std::string> types;
  this->service.enumerateBundles(BundleKind::Application,
                                 [&](std::string_view type) { types.emplace_back(type); });
  EXPECT_EQ(types, (std::vector<std::string>{user, "System", user}));
}
REGISTER_TYPED_TEST_SUITE_P(AppRegistryContract, CallsBackOnceForEachBundle);

template <typename Subject>
struct LocaleSettingsContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(LocaleSettingsContract);

TYPED_TEST_P(LocaleSettingsContract, KeepsTheOrderOfTheLists) {
  const std::vector<std::string> preferred{"fr", "de-AT"}, system{"sv", "de", "fr"};
  this->subject.set(preferred, system, "AT");
  EXPECT_EQ(this->service.preferredLanguages(), preferred);
  EXPECT_EQ(this->service.systemLanguages(), system);
  EXPECT_EQ(this->service.countryCode(), "AT");
}
REGISTER_TYPED_TEST_SUITE_P(LocaleSettingsContract, KeepsTheOrderOfTheLists);

template <typename Subject>
struct NotificationsContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(NotificationsContract);

TYPED_TEST_P(NotificationsContract, EveryPostCountsByItsName) {
  for (const char* name : {"a.b", "a", "a.b"}) this->service.post(name);
  EXPECT_EQ(this->subject.posts("a.b"), 2U);
  EXPECT_EQ(this->subject.posts("a"), 1U);
  EXPECT_EQ(this->subject.posts("b"), 0U);
}
REGISTER_TYPED_TEST_SUITE_P(NotificationsContract, EveryPostCountsByItsName);

template <typename Subject>
struct ServiceListenerContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(ServiceListenerContract);

TYPED_TEST_P(ServiceListenerContract, DeliversOneEventASliceToWhatWasResumed) {
  constexpr double kShort = 0.02, kLong = 30;
  const PlistDictionary message{{"operation", PlistValue::int64(2)}};
  ServiceListener& listener = this->service;
  const ServiceConnection endpoint = listener.createListener("com.example.endpoint", DeliveryQueue::Main);
  ASSERT_NE(endpoint, 0U);
  std::vector<PlistDictionary> received;
  ServiceConnection peer = 0;
  listener.setEventHandler(endpoint, [&](const ServiceEvent& event) {
    EXPECT_EQ(event.kind, ServiceEventKind::NewPeer);
    peer = event.peer;
  });
  this->subject.connectPeer();
  this->subject.send(message);
  this->subject.send({});
  EXPECT_EQ(listener.runSlice(kShort), SliceResult::TimedOut);
  listener.resume(endpoint);
  EXPECT_EQ(listener.runSlice(kLong), SliceResult::HandledEvent);
  ASSERT_NE(peer, 0U);
  listener.setDeliveryQueue(peer, DeliveryQueue::Main);
  listener.setEventHandler(peer, [&](const ServiceEvent& event) { received.push_back(event.message); });
  EXPECT_EQ(listener.runSlice(kShort), SliceResult::TimedOut);
  EXPECT_TRUE(received.empty());
  listener.resume(peer);
  EXPECT_EQ(listener.runSlice(kLong), SliceResult::HandledEvent);
  EXPECT_EQ(received, std::vector{message});
  EXPECT_EQ(listener.runSlice(kLong), SliceResult::HandledEvent);
  EXPECT_EQ(received, (std::vector{message, PlistDictionary()}));
  constexpr ServiceConnection kUnknown = 4711;
  listener.setDeliveryQueue(kUnknown, DeliveryQueue::Main);
  listener.setEventHandler(kUnknown, {});
  listener.resume(kUnknown);
  EXPECT_EQ(listener.runSlice(0), SliceResult::TimedOut);
}
REGISTER_TYPED_TEST_SUITE_P(ServiceListenerContract, DeliversOneEventASliceToWhatWasResumed);

template <typename Subject>
struct FileSystemContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(FileSystemContract);

TYPED_TEST_P(FileSystemContract, ReadsWholeFilesByAbsolutePath) {
  for (const std::string& contents : {std::string(), std::string("a\0b\n", 4), std::string(100'000, 'x')}) {
    this->subject.put("/Library/Some where/file", contents);
    const auto status = this->service.status("/Library/Some where/file");
    EXPECT_TRUE(status && status->size == static_cast<std::int64_t>(contents.size()));
    EXPECT_EQ(this->service.readFile("/Library/Some where/file"), bytesOf(contents));
  }
  EXPECT_FALSE(this->service.status("/Library/none"));
  EXPECT_FALSE(this->service.readFile("/Library/none"));
}
REGISTER_TYPED_TEST_SUITE_P(FileSystemContract, ReadsWholeFilesByAbsolutePath);

template <typename Subject>
struct DynamicLoaderContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(DynamicLoaderContract);

TYPED_TEST_P(DynamicLoaderContract, FindsWhatIsThereAndNothingElse) {
  const LibraryHandle library = this->service.open(this->subject.library());
  ASSERT_NE(library, nullptr);
  EXPECT_NE(this->service.symbol(library, this->subject.symbolName()), nullptr);
  EXPECT_EQ(this->service.symbol(library, "NoSuchSymbol"), nullptr);
  EXPECT_EQ(this->service.open("/Library/none"), nullptr);
  EXPECT_EQ(this->service.symbol(nullptr, this->subject.symbolName()), nullptr);
}
REGISTER_TYPED_TEST_SUITE_P(DynamicLoaderContract, FindsWhatIsThereAndNothingElse);

template <typename Subject>
struct MessageDigestContract : ServiceContract<Subject> {};
TYPED_TEST_SUITE_P(MessageDigestContract);

TYPED_TEST_P(MessageDigestContract, DependsOnTheBytesAlone) {
  EXPECT_EQ(this->service.md5(bytesOf("abc")), this->service.md5(bytesOf(std::string("abc"))));
  for (const std::string_view other :
       {std::string_view("abd"), std::string_view(), std::string_view("abc\0", 4)}) {
    EXPECT_NE(this->service.md5(bytesOf("abc")), this->service.md5(bytesOf(other)));
  }
}
REGISTER_TYPED_TEST_SUITE_P(MessageDigestContract, DependsOnTheBytesAlone);

}  // namespace tbdaily::testing
