// What callers may rely on in the services of a platform, whoever provides it. The subject is
// that of ContractTest and lets the tests arrange what the services then answer:
//
//   PreferencesStore& anotherStore()    the same store, as another process has it
//   answer(key, PlistValue), addContainer(identifier, path)
//   setSysctl(name, PlistData), setTime(PlistDate, ticks, Timebase)
//   enableLogs(PlistValue), setTaskingValue(key, PlistValue)
//   logs(), logOptions()                the bytes of the written logs in order, the options of the last one
//   addBundle(type)
//   posts(name)                         how many so far
//   connectPeer(), send(PlistDictionary)  as the peer that connected, once there is a listener
//   setDrivers(std::vector<ScriptedDriver>)
//   put(path, text), library(), symbolName()  a file; a library that is there and a symbol that it has
#pragma once

#include "platform/plist_text.h"
#include "testing/contract_test.h"
#include "testing/scripted_driver.h"

namespace tbdaily::testing {

template <typename Subject>
struct ServiceContract : ContractTest<Subject> {};
TYPED_TEST_SUITE_P(ServiceContract);

TYPED_TEST_P(ServiceContract, PreferencesAreVisibleAtOnceUntilTheyAreRemoved) {
  PreferencesStore& here = this->services.preferences;
  PreferencesStore& there = this->subject.anotherStore();
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
  there.setValue("k", PlistValue(), "a.b");
  there.setValue("k", PlistValue(), "never.written");
  EXPECT_TRUE(here.getValue("k", "a.b").isNone());
  EXPECT_EQ(here.getValue("k", "a"), PlistValue::string(""));
  here.setOwnValue("seen", PlistValue::boolean(true));
  bool valid = true;
  EXPECT_TRUE(here.getInteger("seen", "com.velmora.sysmetrics.tbdaily", &valid) == 0 && !valid);
  EXPECT_FALSE(here.getApplicationBoolean("k", "a").valid);
  EXPECT_EQ(there.getValue("seen", "com.velmora.sysmetrics.tbdaily"), PlistValue::boolean(true));
}

TYPED_TEST_P(ServiceContract, ASeriesOfChangesComesToTheSameAsOneAfterTheOther) {
  const PlistValue one = PlistValue::int32(1), two = PlistValue::int32(2);
  this->services.preferences.setValue("old", one, "a");
  this->services.preferences.applyChanges(std::vector<PreferenceChange>{{"old", PlistValue(), "a"},
                                                                        {"k", one, "a"},
                                                                        {"k", one, "b"},
                                                                        {"k", two, "a"},
                                                                        {"back", PlistValue(), "b"},
                                                                        {"back", one, "b"},
                                                                        {"gone", one, "a"},
                                                                        {"gone", PlistValue(), "a"}});
  PreferencesStore& there = this->subject.anotherStore();
  EXPECT_EQ(there.getValue("k", "a"), two);
  EXPECT_EQ(there.getValue("k", "b"), one);
  EXPECT_EQ(there.getValue("back", "b"), one);
  EXPECT_TRUE(there.getValue("old", "a").isNone() && there.getValue("gone", "a").isNone());
}

TYPED_TEST_P(ServiceContract, AnswersAreByKindAndCurrent) {
  DeviceAnswers& answers = this->services.deviceAnswers;
  for (const auto& [value, expected] :
       {std::pair(PlistValue::boolean(true), true), {PlistValue::int64(1), false}}) {
    this->subject.answer("q", value);
    EXPECT_EQ(answers.booleanAnswer("q"), expected);
    EXPECT_EQ(answers.copyAnswer("q"), value);
  }
  this->subject.addContainer("g", "/private/g");
  EXPECT_EQ(answers.systemGroupContainerPath("g").path, "/private/g");
  const SystemGroupContainer unknown = answers.systemGroupContainerPath("G");
  EXPECT_TRUE(!unknown.path && unknown.error != 0);
}

TYPED_TEST_P(ServiceContract, SysctlsFillNoMoreThanTheRoomAndSayHowMuch) {
  constexpr std::byte kUntouched{0xEE};
  constexpr int kNoSuchName = 2, kTooSmall = 12;
  this->subject.setSysctl("kern.three", bytesOf("abc"));
  for (const auto& [name, room, error] : {std::tuple("kern.three", std::size_t{8}, 0),
                                          {"kern.three", 3, 0},
                                          {"kern.three", 2, kTooSmall},
                                          {"kern.three", 0, kTooSmall},
                                          {"kern.other", 8, kNoSuchName}}) {
    PlistData buffer(8, kUntouched);
    std::size_t length = room;
    EXPECT_EQ(this->services.kernel.sysctlByName(name, buffer, length), error) << name << room;
    if (error == 0) {
      EXPECT_EQ(length, 3U);
      EXPECT_EQ(PlistData(buffer.begin(), buffer.begin() + 3), bytesOf("abc"));
    }
    EXPECT_EQ(buffer[error == 0 ? 3 : 0], kUntouched) << name << room;
  }
  const PlistDate now = PlistDate::fromUnixSeconds(1795511224.25);
  this->subject.setTime(now, 123456789012, {125, 3});
  EXPECT_EQ(this->services.kernel.currentTime(), now);
  EXPECT_EQ(this->services.kernel.tickCount(), 123456789012U);
  const auto timebase = this->services.kernel.timebase();
  EXPECT_TRUE(timebase && timebase->numerator == 125 && timebase->denominator == 3);
}

TYPED_TEST_P(ServiceContract, LogsAreWrittenBeforeTheCallReturnsAndNotAtAllWhenTheWriterFails) {
  const auto write = [&](const PlistValue& options, std::string_view text, bool whole) {
    return this->services.logSubmission.writeLogForSubmission(
        "193", "log", options, PlistValue(), [&](LogOutput& output) {
          EXPECT_TRUE(output.write(bytesOf(text)) && output.write(bytesOf("!")));
          return whole;
        });
  };
  const PlistValue options = PlistValue::dictionary({{"o", PlistValue::string("1")}});
  this->subject.enableLogs(PlistValue::boolean(true));
  EXPECT_TRUE(write(options, "one", true));
  EXPECT_EQ(this->subject.logOptions(), options);
  EXPECT_FALSE(write(options, "two", false));
  EXPECT_TRUE(write(PlistValue(), "three", true));
  EXPECT_TRUE(this->subject.logOptions().isNone());
  EXPECT_EQ(this->subject.logs(), (std::vector<std::string>{"one!", "three!"}));
}

TYPED_TEST_P(ServiceContract, LogSubmissionIsEnabledByTheBooleanAlone) {
  LogSubmission& logs = this->services.logSubmission;
  for (const auto& [value, enabled] : {std::pair(PlistValue::int64(1), false),
                                       {PlistValue::string("true"), false},
                                       {PlistValue::boolean(false), false},
                                       {PlistValue::boolean(true), true}}) {
    this->subject.enableLogs(value);
    EXPECT_EQ(logs.isDiagnosticLogSubmissionEnabled(), enabled);
  }
  this->subject.setTaskingValue("AggressiveSubmissionDays", PlistValue::int64(3));
  EXPECT_EQ(logs.taskingValue("AggressiveSubmissionDays"), PlistValue::int64(3));
  EXPECT_NE(logs.incidentIdentifier(), logs.incidentIdentifier());
}

TYPED_TEST_P(ServiceContract, BundlesAndPostsAreCountedOneByOne) {
  using Texts = std::vector<std::string>;
  const Texts bundles{std::string(this->services.appRegistry.userApplicationType()), "System", "System"};
  for (const std::string& type : bundles) this->subject.addBundle(type);
  Texts types;
  this->services.appRegistry.enumerateBundles(BundleKind::Application,
                                              [&](std::string_view type) { types.emplace_back(type); });
  EXPECT_EQ(types, bundles);

  for (const char* name : {"a.b", "a", "a.b"}) this->services.notifications.post(name);
  EXPECT_EQ(this->subject.posts("a.b"), 2U);
  EXPECT_EQ(this->subject.posts("a"), 1U);
}

TYPED_TEST_P(ServiceContract, OneEventASliceGoesToWhatWasResumed) {
  constexpr double kShort = 0.02, kLong = 30;
  const PlistDictionary message{{"operation", PlistValue::int64(2)}};
  ServiceListener& listener = this->services.serviceListener;
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
  listener.setEventHandler(
      peer, [&](const ServiceEvent& event) { received.push_back(*event.message.asDictionary()); });
  EXPECT_EQ(listener.runSlice(kShort), SliceResult::TimedOut);
  EXPECT_TRUE(received.empty());
  listener.resume(peer);
  EXPECT_EQ(listener.runSlice(kLong), SliceResult::HandledEvent);
  EXPECT_EQ(received, std::vector{message});
  EXPECT_EQ(listener.runSlice(kLong), SliceResult::HandledEvent);
  EXPECT_EQ(received, (std::vector{message, PlistDictionary()}));
  listener.resume(4711);  // that nobody knows
  EXPECT_EQ(listener.runSlice(0), SliceResult::TimedOut);
}

TYPED_TEST_P(ServiceContract, DriversAreFoundInOrderAndCountUntilTheyAreReleased) {
  const auto dictionary = [](PlistDictionary entries) { return PlistValue::dictionary(std::move(entries)); };
  DriverRegistry& registry = this->services.driverRegistry;
  this->subject.setDrivers(
      {{1, "child", "C", {{"own", PlistValue::string("near")}}, 2},
       {2, "parent", "P", {{"p", PlistValue::string("far")}, {"q", PlistValue::int64(1)}}, 1},
       {{}, {}, "C", {}, 4711, 0}});
  KdHandle iterator = 0;
  ASSERT_EQ(registry.KdServiceGetMatchingServices(registry.KdServiceMatching("C"), iterator), kKdSuccess);
  const KdHandle child = registry.KdIteratorNext(iterator), nameless = registry.KdIteratorNext(iterator);
  EXPECT_EQ(registry.KdIteratorNext(iterator), 0U);
  EXPECT_TRUE(registry.KdIteratorIsValid(iterator));
  std::uint64_t identifier = 0;
  std::string name;
  EXPECT_EQ(registry.KdRegistryEntryGetRegistryEntryID(child, identifier), kKdSuccess);
  EXPECT_EQ(identifier, 1U);
  EXPECT_EQ(registry.KdRegistryEntryGetRegistryEntryID(nameless, identifier), kKdNotFound);
  EXPECT_EQ(registry.KdRegistryEntryGetName(nameless, name), kKdNotFound);
  EXPECT_EQ(registry.KdObjectGetUserRetainCount(child), 1U);
  EXPECT_EQ(registry.KdObjectGetUserRetainCount(nameless), 0U);
  const auto search = [&](const char* key) {
    return registry.KdRegistryEntrySearchCFProperty(child, KdRegistryPlane::KdService, key,
                                                    KdSearchOptions::RecursivelyTowardsParents);
  };
  EXPECT_EQ(search("p").asString(), "far");
  EXPECT_EQ(search("own").asString(), "near");
  EXPECT_TRUE(search("none").isNone());  // though the parents go in a circle
  EXPECT_TRUE(registry.KdRegistryEntryCreateCFProperty(child, "p").isNone());
  const auto matching = [&](std::int64_t q) {
    return dictionary({{"KdPropertyMatch", dictionary({{"q", PlistValue::int64(q)}})}});
  };
  const KdHandle parent = registry.KdServiceGetMatchingService(matching(1));
  EXPECT_EQ(registry.KdRegistryEntryGetName(parent, name), kKdSuccess);
  EXPECT_EQ(name, "parent");
  EXPECT_EQ(registry.KdServiceGetMatchingService(matching(2)), 0U);
  for (const KdHandle handle : {iterator, child, nameless, parent})
    EXPECT_EQ(registry.KdObjectRelease(handle), kKdSuccess);
  EXPECT_EQ(registry.KdObjectRelease(child), kKdBadArgument);
}

TYPED_TEST_P(ServiceContract, FilesAreReadWholeAndLibrariesByTheirPath) {
  FileSystem& files = this->services.fileSystem;
  for (const std::string& contents : {std::string(), std::string("a\0b\n", 4), std::string(100'000, 'x')}) {
    this->subject.put("/Library/Some where/file", contents);
    const auto status = files.status("/Library/Some where/file");
    EXPECT_TRUE(status && status->size == static_cast<std::int64_t>(contents.size()));
    EXPECT_EQ(files.readFile("/Library/Some where/file"), bytesOf(contents));
  }
  EXPECT_FALSE(files.status("/Library/none") || files.readFile("/Library/none"));

  DynamicLoader& loader = this->services.dynamicLoader;
  const LibraryHandle library = loader.open(this->subject.library());
  ASSERT_NE(library, nullptr);
  EXPECT_NE(loader.symbol(library, this->subject.symbolName()), nullptr);
  EXPECT_EQ(loader.symbol(library, "NoSuchSymbol"), nullptr);
  EXPECT_EQ(loader.open("/Library/none"), nullptr);
  EXPECT_EQ(loader.symbol(nullptr, this->subject.symbolName()), nullptr);
}

REGISTER_TYPED_TEST_SUITE_P(ServiceContract, PreferencesAreVisibleAtOnceUntilTheyAreRemoved,
                            ASeriesOfChangesComesToTheSameAsOneAfterTheOther, AnswersAreByKindAndCurrent,
                            SysctlsFillNoMoreThanTheRoomAndSayHowMuch,
                            LogsAreWrittenBeforeTheCallReturnsAndNotAtAllWhenTheWriterFails,
                            LogSubmissionIsEnabledByTheBooleanAlone, BundlesAndPostsAreCountedOneByOne,
                            OneEventASliceGoesToWhatWasResumed,
                            DriversAreFoundInOrderAndCountUntilTheyAreReleased,
                            FilesAreReadWholeAndLibrariesByTheirPath);

// What a platform computes, and the fakes do not.
template <typename Subject>
struct ComputationContract : ContractTest<Subject> {};
TYPED_TEST_SUITE_P(ComputationContract);
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(ComputationContract);

TYPED_TEST_P(ComputationContract, ChoosesTheBestLocalizations) {
  using Texts = std::vector<std::string>;
  const std::tuple<Texts, Texts, Texts> cases[] = {
      {{"de", "en"}, {"en-GB"}, {"en"}},
      {{"en", "en-GB"}, {"en-GB", "en-US"}, {"en-GB", "en"}},
      {{"zh", "ZH_hant", "zh-Hant-HK"}, {"zh-Hant-TW"}, {"ZH_hant"}},
      {{"pt-BR"}, {"pt", "PT_br"}, {"pt-BR"}},
      {{"de", "en"}, {"en-GB", "de", "en-US"}, {"en", "de"}},
      {{"", "de"}, {"fr", ""}, {}}};
  for (const auto& [available, preferred, best] : cases) {
    EXPECT_EQ(this->services.localeSettings.bestLocalizations(available, preferred), best);
  }
}

TYPED_TEST_P(ComputationContract, DigestsAreMd5) {
  for (const auto& [message, digest] : {std::pair("", "<d41d8cd98f00b204e9800998ecf8427e>"),
                                        {"message digest", "<f96b697d7cb7938d525a2f31aaf161d0>"}}) {
    const Md5Digest md5 = this->services.messageDigest.md5(bytesOf(message));
    EXPECT_EQ(plistText(PlistValue::data({md5.begin(), md5.end()})), digest);
  }
}

REGISTER_TYPED_TEST_SUITE_P(ComputationContract, ChoosesTheBestLocalizations, DigestsAreMd5);

}  // namespace tbdaily::testing
