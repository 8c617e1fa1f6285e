#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

using platform::RestrictedFeature;

constexpr const char* kMail = "com.vantor.Dataclass.Mail";
constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
constexpr const char* kReminders = "com.vantor.Dataclass.Reminders";
constexpr const char* kNotes = "com.vantor.Dataclass.Notes";
constexpr const char* kBackup = "com.vantor.Dataclass.Backup";

class Enablement : public ::testing::Test {
 protected:
  static std::shared_ptr<OpenAccount> account(const Dictionary& more = {},
                                              std::string_view type = "Quillnet") {
    return OpenAccount::initWithProperties(accountInfo("1", type, more));
  }
  static std::shared_ptr<OpenAccount> childOf(const AccountPtr& parent, const Dictionary& more = {},
                                              std::string_view type = "CalDAV") {
    auto child = OpenAccount::initWithProperties(accountInfo("child", type, more));
    child->setParentAccount(parent);
    return child;
  }
  static Value storedList(const AccountPtr& account) {
    const Value* stored = account->properties().find("Enabled Dataclasses");
    return stored != nullptr ? *stored : Value("absent");
  }
  AccountsDevice device;
};

TEST_F(Enablement, OrdersKnownDataclassesOnceEachAndUnknownOnesAsTheyCame) {
  const struct {
    const char* name;
    Lines list, ordered;
  } kCases[] = {
      {"known ones are sorted", {kNotes, kMail, kContacts}, {kMail, kContacts, kNotes}},
      {"known repeats go", {kNotes, kMail, kNotes, kMail}, {kMail, kNotes}},
      {"unknown ones follow, repeats included",
       {"z", kNotes, "a", "z", kMail, "z"},
       {kMail, kNotes, "z", "a", "z", "z"}},
      {"nothing", {}, {}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(OpenAccount::_orderedDataclasses(c.list), c.ordered);
  }
}

TEST_F(Enablement, SupportedIsTheListOfTheTypeInTheListedOrder) {
  EXPECT_EQ(account({}, "CalDAV")->supportedDataclasses(), (Lines{kCalendars, kReminders}));
  EXPECT_EQ(account({}, "SMTP")->supportedDataclasses(), Lines());
}

TEST_F(Enablement, ChildWithoutATypeSupportsWhatItsParentsTypeDoes) {
  const auto child = childOf(account({}, "Mail"));
  child->removeAccountPropertyForKey("Type");
  EXPECT_EQ(child->supportedDataclasses(), (Lines{kMail, kNotes}));
}

TEST_F(Enablement, ProvisionedIsWhatTheServiceGrantedWithinWhatIsSupported) {
  EXPECT_EQ(account({{"Provisioned Dataclasses", Array{kNotes, "other", kContacts, kMail}}}, "Mail")
                ->provisionedDataclasses(),
            (Lines{kMail, kNotes}));
}

TEST_F(Enablement, ProvisionedIsEverythingSupportedOnlyWhenTheServiceSaidNothing) {
  EXPECT_EQ(account({}, "Mail")->provisionedDataclasses(), (Lines{kMail, kNotes}));
  EXPECT_EQ(account({{"Provisioned Dataclasses", Array()}}, "Mail")->provisionedDataclasses(),
            Lines());
}

TEST_F(Enablement, ChildWithoutAProvisionedListUsesItsParents) {
  const auto parent = account({{"Provisioned Dataclasses", Array{kCalendars, kMail}}});
  EXPECT_EQ(childOf(parent)->provisionedDataclasses(), (Lines{kCalendars}));
  EXPECT_EQ(
      childOf(parent, {{"Provisioned Dataclasses", Array{kReminders}}})->provisionedDataclasses(),
      (Lines{kReminders}));
}

TEST_F(Enablement, EachForbiddenFeatureWithholdsItsDataclasses) {
  const struct {
    RestrictedFeature feature;
    Lines withheld;
  } kCases[] = {
      {RestrictedFeature::cloudDocumentSync,
       {"com.vantor.Dataclass.Ubiquity", "com.vantor.Dataclass.KeyValue"}},
      {RestrictedFeature::photoStream, {"com.vantor.Dataclass.MediaStream"}},
      {RestrictedFeature::sharedPhotoStreams, {"com.vantor.Dataclass.SharedStreams"}},
      {RestrictedFeature::cloudBackup, {"com.vantor.Dataclass.Backup"}},
      {RestrictedFeature::cardsWhileLocked, {"com.vantor.Dataclass.Shoebox"}},
  };
  EXPECT_EQ(OpenAccount::_profileRestrictedDataclasses(), Lines());
  for (const auto& c : kCases) {
    device.restrictions.states = {{c.feature, 2}};
    EXPECT_EQ(OpenAccount::_profileRestrictedDataclasses(), c.withheld);
    const Lines provisioned = account()->provisionedDataclasses();
    EXPECT_EQ(provisioned.size(), 14U - c.withheld.size());
    for (const std::string& dataclass : c.withheld) EXPECT_FALSE(contains(provisioned, dataclass));
  }
}

TEST_F(Enablement, OnlyTheStateForbiddenWithholds) {
  for (const int state : {0, 1, 3, -1, -2, 20}) {
    device.restrictions.states = {{RestrictedFeature::cloudBackup, state},
                                  {RestrictedFeature::photoStream, state}};
    EXPECT_EQ(OpenAccount::_profileRestrictedDataclasses(), Lines()) << state;
  }
}

TEST_F(Enablement, AsksForTheFiveFeaturesInOrderAtEveryCall) {
  OpenAccount::_profileRestrictedDataclasses();
  OpenAccount::_profileRestrictedDataclasses();
  EXPECT_EQ(
      device.restrictions.calls(),
      (CallJournal{"featureRestriction(cloudDocumentSync)", "featureRestriction(photoStream)",
                   "featureRestriction(sharedPhotoStreams)", "featureRestriction(cloudBackup)",
                   "featureRestriction(cardsWhileLocked)", "featureRestriction(cloudDocumentSync)",
                   "featureRestriction(photoStream)", "featureRestriction(sharedPhotoStreams)",
                   "featureRestriction(cloudBackup)", "featureRestriction(cardsWhileLocked)"}));
}

TEST_F(Enablement, EnabledIsNothingWithoutAListAndEmptyWithAnEmptyOne) {
  EXPECT_EQ(account()->enabledDataclasses(), std::nullopt);
  EXPECT_FALSE(account()->isEnabledForDataclass(kMail));
  EXPECT_EQ(account({{"Enabled Dataclasses", Array()}})->enabledDataclasses(), Lines());
  EXPECT_EQ(account({{"Enabled Dataclasses", Array{"unsupported"}}})->enabledDataclasses(),
            Lines());
}

TEST_F(Enablement, EnabledIsTheStoredListWithinWhatIsProvisionedOnceEachInOrder) {
  const auto mail = account({{"Enabled Dataclasses", Array{kNotes, kContacts, kMail, kNotes, "x"}},
                             {"Provisioned Dataclasses", Array{kMail, kContacts, kNotes}}},
                            "Mail");
  EXPECT_EQ(mail->enabledDataclasses(), (Lines{kMail, kNotes}));
  EXPECT_TRUE(mail->isEnabledForDataclass(kNotes));
  EXPECT_FALSE(mail->isEnabledForDataclass(kContacts));
}

TEST_F(Enablement, ForbiddenDataclassDropsOutOfTheAnswersAndStaysStored) {
  const auto service = account({{"Enabled Dataclasses", Array{kBackup, kMail}}});
  device.restrictions.forbid(RestrictedFeature::cloudBackup);
  EXPECT_FALSE(contains(service->provisionedDataclasses(), kBackup));
  EXPECT_EQ(service->enabledDataclasses(), (Lines{kMail}));
  EXPECT_EQ(storedList(service), Value(Array{kBackup, kMail}));
}

TEST_F(Enablement, ChildSharesItsParentsListWhateverItStoresAndSupports) {
  const auto parent = account({{"Enabled Dataclasses", Array{kContacts, kMail}}});
  EXPECT_EQ(childOf(parent)->enabledDataclasses(), (Lines{kMail, kContacts}));
  EXPECT_EQ(childOf(parent, {{"Enabled Dataclasses", Array{kReminders}}})->enabledDataclasses(),
            (Lines{kMail, kContacts}));
}

TEST_F(Enablement, ChildUsesItsOwnListWhenItsParentHasNothingEnabled) {
  const Dictionary own{{"Enabled Dataclasses", Array{kReminders, kMail}}};
  EXPECT_EQ(childOf(account(), own)->enabledDataclasses(), (Lines{kReminders}));
  const auto emptyParent = account({{"Enabled Dataclasses", Array()}});
  EXPECT_EQ(childOf(emptyParent, own)->enabledDataclasses(), (Lines{kReminders}));
  EXPECT_EQ(childOf(emptyParent)->enabledDataclasses(), Lines());
  EXPECT_EQ(childOf(account())->enabledDataclasses(), std::nullopt);
}

TEST_F(Enablement, ChildInheritsAListThatItsParentsOwnTypeFiltersAway) {
  const auto parent = account({{"Enabled Dataclasses", Array{kReminders}}}, "Mail");
  EXPECT_EQ(parent->enabledDataclasses(), Lines());
  EXPECT_EQ(childOf(parent)->enabledDataclasses(), (Lines{kReminders}));
}

TEST_F(Enablement, TurningOnInEitherOrderGivesTheListedOrder) {
  for (const Lines& order : {Lines{kMail, kContacts}, Lines{kContacts, kMail}}) {
    const auto service = account();
    for (const std::string& dataclass : order) service->setEnabledForDataclass(true, dataclass);
    EXPECT_EQ(service->enabledDataclasses(), (Lines{kMail, kContacts}));
  }
}

TEST_F(Enablement, SwitchingWhatTheTypeDoesNotSupportChangesNothing) {
  const auto mail = account({}, "Mail");
  mail->setEnabledForDataclass(true, kContacts);
  mail->setEnabledForDataclass(false, kContacts);
  EXPECT_EQ(mail->properties(), accountInfo("1", "Mail"));
}

TEST_F(Enablement, SwitchingLooksAtNeitherProvisioningNorRestrictions) {
  device.restrictions.forbid(RestrictedFeature::cloudBackup);
  const auto service = account({{"Provisioned Dataclasses", Array{kMail}}});
  service->setEnabledForDataclass(true, kBackup);
  service->setEnabledForDataclass(true, kContacts);
  EXPECT_EQ(storedList(service), Value(Array{kContacts, kBackup}));
  EXPECT_EQ(service->enabledDataclasses(), Lines());
  EXPECT_TRUE(device.restrictions.calls().size() == 5U);  // asked by enabledDataclasses alone
}

TEST_F(Enablement, SwitchingStartsFromTheOwnListAlone) {
  const auto parent = account({{"Enabled Dataclasses", Array{kCalendars}}});
  const auto child = childOf(parent);
  child->setEnabledForDataclass(true, kReminders);
  EXPECT_EQ(storedList(child), Value(Array{kReminders}));
  EXPECT_EQ(storedList(parent), Value(Array{kCalendars}));
}

TEST_F(Enablement, TurningTheLastOffStoresAnEmptyListAlsoWhereThereWasNone) {
  const auto service = account({{"Enabled Dataclasses", Array{kMail}}});
  service->setEnabledForDataclass(false, kMail);
  EXPECT_EQ(storedList(service), Value(Array()));
  const auto fresh = account();
  fresh->setEnabledForDataclass(false, kMail);
  EXPECT_EQ(storedList(fresh), Value(Array()));
  EXPECT_EQ(fresh->enabledDataclasses(), Lines());
}

TEST_F(Enablement, AnyChangeStoresEachDataclassOnce) {
  const auto service = account({{"Enabled Dataclasses", Array{kNotes, kMail, kNotes, "x", "x"}}});
  service->setEnabledForDataclass(true, kMail);
  EXPECT_EQ(storedList(service), Value(Array{kMail, kNotes, "x"}));
  service->setEnabledForDataclass(true, kMail);
  EXPECT_EQ(storedList(service), Value(Array{kMail, kNotes, "x"}));
  service->setEnabledForDataclass(false, kNotes);
  EXPECT_EQ(storedList(service), Value(Array{kMail, "x"}));
}

TEST_F(Enablement, ForcedSwitchStoresWhatTheTypeDoesNotSupport) {
  const auto mail = account({}, "Mail");
  mail->_forcedSetEnabledForDataclass(true, kContacts);
  EXPECT_EQ(storedList(mail), Value(Array{kContacts}));
  EXPECT_EQ(mail->enabledDataclasses(), Lines());
  mail->_forcedSetEnabledForDataclass(false, kContacts);
  EXPECT_EQ(storedList(mail), Value(Array()));
}

TEST_F(Enablement, SettingAllReplacesTheOwnListByWhatIsSupported) {
  const auto mail = account({{"Enabled Dataclasses", Array{kNotes}}}, "Mail");
  mail->setEnabledForDataclasses({kContacts, kMail});
  EXPECT_EQ(storedList(mail), Value(Array{kMail}));
}

TEST_F(Enablement, SettingNothingLeavesNoListAtAll) {
  for (const Lines& none : {Lines{}, Lines{kContacts, "unknown"}}) {
    const auto mail = account({{"Enabled Dataclasses", Array{kNotes}}}, "Mail");
    mail->setEnabledForDataclasses(none);
    EXPECT_EQ(mail->properties(), accountInfo("1", "Mail"));
    EXPECT_EQ(mail->enabledDataclasses(), std::nullopt);
  }
}

class SwitchNotingAccount : public OpenAccount {
 public:
  using OpenAccount::OpenAccount;
  static std::shared_ptr<SwitchNotingAccount> initWithProperties(const Dictionary& properties) {
    return _recordWithProperties<SwitchNotingAccount>(properties);
  }
  void setEnabledForDataclass(bool enabled, std::string_view dataclass) override {
    switched.push_back((enabled ? "on " : "off ") + std::string(dataclass));
  }
  Lines switched;
};

TEST_F(Enablement, SettingAllGoesThroughTheSwitchOfASubclass) {
  const auto noting = SwitchNotingAccount::initWithProperties(accountInfo("1", "Mail"));
  noting->setEnabledForDataclasses({kContacts, "x", kMail});
  EXPECT_EQ(noting->switched,
            (Lines{std::string("on ") + kContacts, "on x", std::string("on ") + kMail}));
}

TEST_F(Enablement, LogsNothing) {
  const auto mail = account({{"Enabled Dataclasses", Array{kNotes}}}, "Mail");
  mail->setEnabledForDataclasses({kContacts, kMail});
  mail->enabledDataclasses();
  EXPECT_EQ(device.logLines(), Lines());
}

}  // namespace
}  // namespace accountsettings
