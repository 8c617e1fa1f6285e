#pragma once

#include <algorithm>
#include <optional>
#include <string>
#include <vector>

#include "tests/contracts/SyncDataSourceUnderTest.h"

TEST_P(SyncDataSourceContract, HasAnotherNameForEachType) {
  std::vector<std::string> names;
  for (const platform::SyncDataType type :
       {platform::MailAccountsSyncType, platform::ContactsSyncType, platform::CalendarsSyncType,
        platform::BookmarksSyncType, platform::NotesSyncType}) {
    const auto name = service().dataclassNameForSyncType(type);
    ASSERT_TRUE(name.has_value());
    EXPECT_EQ(service().dataclassNameForSyncType(type), name);
    names.push_back(*name);
  }
  std::sort(names.begin(), names.end());
  EXPECT_EQ(std::unique(names.begin(), names.end()), names.end());
}

TEST_P(SyncDataSourceContract, OpensNoSourceWithoutAName) {
  for (const Account& account : {kLocal, Account(kService)}) {
    const auto created = service().createDataSource(std::nullopt, account, std::nullopt);
    EXPECT_FALSE(created.status.isSuccess());
    EXPECT_TRUE(created.status.error.has_value());
    EXPECT_EQ(created.source, nullptr);
  }
}

TEST_P(SyncDataSourceContract, FailsWithAnErrorOnAnEmptyHandle) {
  const auto contacts = open(kContacts, kLocal);
  const platform::Status failures[] = {
      service().countRecords(nullptr).status,
      service().clearAllRecords(nullptr),
      service().clearSyncAnchors(nullptr),
      service().migrateRecords(nullptr, contacts),
      service().migrateRecords(contacts, nullptr),
      service().migrateRecords(nullptr, nullptr),
      service().commit(nullptr),
      service().deleteDataSource(nullptr),
      service().removeStore(nullptr, false),
  };
  for (const platform::Status& failure : failures) {
    SCOPED_TRACE(&failure - failures);
    EXPECT_FALSE(failure.isSuccess());
    ASSERT_TRUE(failure.error.has_value());
    EXPECT_NE(failure.error->description, "");
  }
  close(contacts);
}

TEST_P(SyncDataSourceContract, ShowsAMissingStoreAsAnEmptySourceAndCreatesNothing) {
  for (const Account& account : {kLocal, Account(kService)}) {
    const auto source = open(kContacts, account);
    EXPECT_EQ(count(source), 0);
    close(source);
    EXPECT_FALSE(device->storeExists(kContacts, account));
  }
}

TEST_P(SyncDataSourceContract, MakesAServiceStoreOnlyForRecords) {
  const auto source = open(kContacts, kService);
  EXPECT_TRUE(service().clearAllRecords(source).isSuccess());
  EXPECT_TRUE(service().clearSyncAnchors(source).isSuccess());
  EXPECT_TRUE(service().commit(source).isSuccess());
  close(source);
  EXPECT_FALSE(device->storeExists(kContacts, kService));
}

TEST_P(SyncDataSourceContract, MakesTheDeviceLocalStoreAtTheCommitOfItsSource) {
  const auto source = open(kContacts, kLocal);
  EXPECT_TRUE(service().commit(source).isSuccess());
  close(source);
  EXPECT_TRUE(device->storeExists(kContacts, kLocal));
}

TEST_P(SyncDataSourceContract, CountsTheRecordsOfItsOwnStoreOnly) {
  device->addRecord(kContacts, kLocal, "ada", kAda);
  device->addRecord(kContacts, kService, "ada", kAda);
  device->addRecord(kContacts, kService, "bob", kBob);
  const auto local = open(kContacts, kLocal);
  const auto remote = open(kContacts, kService);
  const auto other = open(kContacts, "service-2");
  EXPECT_EQ(count(local), 1);
  EXPECT_EQ(count(remote), 2);
  EXPECT_EQ(count(other), 0);
  close(local);
  close(remote);
  close(other);
}

TEST_P(SyncDataSourceContract, CopiesEveryByteAtTheCommitAndLeavesTheSourceAsItIs) {
  device->addRecord(kContacts, kService, "ada", kAda);
  device->addRecord(kContacts, kService, "bob", kBob);
  const auto local = open(kContacts, kLocal);
  const auto remote = open(kContacts, kService);
  EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
  EXPECT_EQ(device->contents(kContacts, kLocal), Contents{});
  EXPECT_TRUE(service().commit(local).isSuccess());
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
  close(local);
  close(remote);
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
  EXPECT_EQ(device->contents(kContacts, kService), sorted({kAda, kBob}));
}

TEST_P(SyncDataSourceContract, KeepsWhatTheTargetHasOfItsOwn) {
  device->addRecord(kContacts, kLocal, "bob", kBob);
  device->addRecord(kContacts, kService, "ada", kAda);
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
}

TEST_P(SyncDataSourceContract, DropsAMergeThatIsClosedWithoutACommit) {
  device->addRecord(kContacts, kService, "ada", kAda);
  const auto local = open(kContacts, kLocal);
  const auto remote = open(kContacts, kService);
  EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
  close(local);
  EXPECT_TRUE(service().commit(remote).isSuccess());
  close(remote);
  EXPECT_EQ(device->contents(kContacts, kLocal), Contents{});
  EXPECT_EQ(device->contents(kContacts, kService), Contents{kAda});
}

TEST_P(SyncDataSourceContract, MergesFromAnEmptySourceWithoutAFailure) {
  device->addRecord(kContacts, kLocal, "bob", kBob);
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), Contents{kBob});
}

TEST_P(SyncDataSourceContract, DoublesNothingWhenAMergeIsRepeated) {
  device->addRecord(kContacts, kService, "ada", kAda);
  device->addRecord(kContacts, kService, "bob", kBob);
  const auto local = open(kContacts, kLocal);
  const auto remote = open(kContacts, kService);
  EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
  EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
  EXPECT_TRUE(service().commit(local).isSuccess());
  EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
  EXPECT_TRUE(service().commit(local).isSuccess());
  close(local);
  close(remote);
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
  device->restart();
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
}

TEST_P(SyncDataSourceContract, DoesNotDoubleARecordThatTheTargetHasAlready) {
  device->addRecord(kContacts, kLocal, "ada", kAda);
  device->addRecord(kContacts, kService, "ada", kAda);
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), Contents{kAda});
}

TEST_P(SyncDataSourceContract, KeepsBothVersionsOfARecordAndMakesNoThird) {
  device->addRecord(kContacts, kLocal, "ada", kAda);
  device->addRecord(kContacts, kService, "ada", kAdaMarried);
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kAdaMarried}));
  EXPECT_EQ(device->contents(kContacts, kService), Contents{kAdaMarried});
  mergeContacts();
  device->restart();
  mergeContacts();
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kAdaMarried}));
}

TEST_P(SyncDataSourceContract, ClearsTheStoreAtTheCommitAndKeepsAServicesRecordsAside) {
  device->addRecord(kContacts, kService, "ada", kAda);
  device->addRecord(kContacts, kService, "bob", kBob);
  const auto source = open(kContacts, kService);
  EXPECT_TRUE(service().clearAllRecords(source).isSuccess());
  EXPECT_EQ(device->contents(kContacts, kService), sorted({kAda, kBob}));
  EXPECT_TRUE(service().commit(source).isSuccess());
  EXPECT_EQ(device->contents(kContacts, kService), Contents{});
  close(source);
  EXPECT_EQ(device->retiredContents(kContacts, kService), sorted({kAda, kBob}));
}

TEST_P(SyncDataSourceContract, DropsAClearThatIsClosedWithoutACommit) {
  device->addRecord(kContacts, kService, "ada", kAda);
  const auto source = open(kContacts, kService);
  EXPECT_TRUE(service().clearAllRecords(source).isSuccess());
  close(source);
  EXPECT_EQ(device->contents(kContacts, kService), Contents{kAda});
  EXPECT_EQ(device->retiredContents(kContacts, kService), Contents{});
}

TEST_P(SyncDataSourceContract, RemovesTheStoreAtOnceAndKeepsAServicesRecordsAside) {
  device->addRecord(kContacts, kService, "ada", kAda);
  const auto source = open(kContacts, kService);
  EXPECT_TRUE(service().removeStore(source, false).isSuccess());
  EXPECT_FALSE(device->storeExists(kContacts, kService));
  EXPECT_EQ(device->retiredContents(kContacts, kService), Contents{kAda});
  EXPECT_TRUE(service().commit(source).isSuccess());
  close(source);
  EXPECT_FALSE(device->storeExists(kContacts, kService));
  EXPECT_EQ(device->retiredContents(kContacts, kService), Contents{kAda});
}

TEST_P(SyncDataSourceContract, RemovesTheDeviceLocalStoreAtOnce) {
  device->addRecord(kContacts, kLocal, "ada", kAda);
  const auto source = open(kContacts, kLocal);
  EXPECT_TRUE(service().removeStore(source, false).isSuccess());
  close(source);
  EXPECT_EQ(device->contents(kContacts, kLocal), Contents{});
}

TEST_P(SyncDataSourceContract, RemovesAMissingStoreWithoutAFailure) {
  const auto source = open(kContacts, kService);
  EXPECT_TRUE(service().removeStore(source, false).isSuccess());
  close(source);
  EXPECT_FALSE(device->storeExists(kContacts, kService));
}

TEST_P(SyncDataSourceContract, RetiresEachRecordOnceWhenAStoreIsClearedAndRemoved) {
  device->addRecord(kEvents, kService, "party", kParty);
  device->addRecord(kReminders, kService, "milk", kMilk);
  const auto source = open(kEvents, kService);
  EXPECT_TRUE(service().clearAllRecords(source).isSuccess());
  EXPECT_TRUE(service().removeStore(source, false).isSuccess());
  EXPECT_TRUE(service().commit(source).isSuccess());
  close(source);
  EXPECT_EQ(device->contents(kEvents, kService), Contents{});
  EXPECT_EQ(device->contents(kReminders, kService), Contents{});
  EXPECT_EQ(device->retiredContents(kEvents, kService), Contents{kParty});
  EXPECT_EQ(device->retiredContents(kReminders, kService), Contents{kMilk});
}

TEST_P(SyncDataSourceContract, LosesNothingWhenAStoreIsFilledAndRemovedTwice) {
  for (const std::string& content : {kAda, kAdaMarried}) {
    device->addRecord(kContacts, kService, "ada", content);
    const auto source = open(kContacts, kService);
    EXPECT_TRUE(service().removeStore(source, false).isSuccess());
    close(source);
  }
  EXPECT_EQ(device->retiredContents(kContacts, kService), sorted({kAda, kAdaMarried}));
}

TEST_P(SyncDataSourceContract, ForgetsTheAnchorsAtOnceAndKeepsTheRecords) {
  device->addRecord(kContacts, kLocal, "ada", kAda);
  device->setSyncAnchors(kContacts, kLocal);
  ASSERT_TRUE(device->hasSyncAnchors(kContacts, kLocal));
  const auto source = open(kContacts, kLocal);
  EXPECT_TRUE(service().clearSyncAnchors(source).isSuccess());
  EXPECT_FALSE(device->hasSyncAnchors(kContacts, kLocal));
  close(source);
  EXPECT_FALSE(device->hasSyncAnchors(kContacts, kLocal));
  EXPECT_EQ(device->contents(kContacts, kLocal), Contents{kAda});
}

TEST_P(SyncDataSourceContract, ShowsOnlyTheSelectedKindOfACalendarStore) {
  device->addRecord(kEvents, kService, "party", kParty);
  device->addRecord(kReminders, kService, "milk", kMilk);
  const auto events = open(kEvents, kService, option(platform::EventsOnlySourceOption));
  const auto reminders = open(kReminders, kService, option(platform::RemindersOnlySourceOption));
  const auto both = open(kReminders, kService);
  EXPECT_EQ(count(events), 1);
  EXPECT_EQ(count(reminders), 1);
  EXPECT_EQ(count(both), 2);
  close(events);
  close(reminders);
  close(both);
}

TEST_P(SyncDataSourceContract, TakesOnlyItsOwnKindIntoACalendarSource) {
  device->addRecord(kEvents, kService, "party", kParty);
  device->addRecord(kReminders, kService, "milk", kMilk);
  const auto local = open(kReminders, kLocal, option(platform::RemindersOnlySourceOption));
  const auto remote = open(kReminders, kService);
  EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
  EXPECT_TRUE(service().commit(local).isSuccess());
  close(local);
  close(remote);
  EXPECT_EQ(device->contents(kReminders, kLocal), Contents{kMilk});
  EXPECT_EQ(device->contents(kEvents, kLocal), Contents{});
}

TEST_P(SyncDataSourceContract, ClearsOnlyTheKindThatTheSourceHolds) {
  device->addRecord(kEvents, kService, "party", kParty);
  device->addRecord(kReminders, kService, "milk", kMilk);
  const auto events = open(kEvents, kService, option(platform::EventsOnlySourceOption));
  EXPECT_TRUE(service().clearAllRecords(events).isSuccess());
  EXPECT_TRUE(service().commit(events).isSuccess());
  close(events);
  EXPECT_EQ(device->contents(kEvents, kService), Contents{});
  EXPECT_EQ(device->contents(kReminders, kService), Contents{kMilk});
}

TEST_P(SyncDataSourceContract, LetsSeveralSourcesOfOneStoreCommitWhileAllAreOpen) {
  device->addRecord(kContacts, kService, "ada", kAda);
  device->addRecord(kContacts, "service-2", "bob", kBob);
  const auto first = open(kContacts, kLocal);
  const auto second = open(kContacts, kLocal);
  const auto ada = open(kContacts, kService);
  const auto bob = open(kContacts, "service-2");
  EXPECT_TRUE(service().migrateRecords(ada, first).isSuccess());
  EXPECT_TRUE(service().migrateRecords(bob, second).isSuccess());
  EXPECT_TRUE(service().clearAllRecords(bob).isSuccess());
  EXPECT_TRUE(service().commit(second).isSuccess());
  EXPECT_TRUE(service().commit(bob).isSuccess());
  EXPECT_TRUE(service().commit(first).isSuccess());
  EXPECT_TRUE(service().removeStore(ada, false).isSuccess());
  for (const auto& source : {first, second, ada, bob}) close(source);
  EXPECT_EQ(device->contents(kContacts, kLocal), sorted({kAda, kBob}));
}

TEST_P(SyncDataSourceContract, NamesTheTetheredSourceAsDeniedWhileItsSyncingIsOff) {
  using Names = std::optional<std::vector<std::string>>;
  const platform::SyncDataType type = platform::ContactsSyncType;
  EXPECT_EQ(service().externalSourcesEnabledForSyncType(type).names, Names(Contents{}));
  EXPECT_TRUE(service().setTetheredSyncingDisabled(type, true).isSuccess());
  EXPECT_TRUE(service().setTetheredSyncingDisabled(type, true).isSuccess());
  device->restart();
  EXPECT_EQ(service().externalSourcesEnabledForSyncType(type).names, Names({{"DenyTethered"}}));
  EXPECT_EQ(service().externalSourcesEnabledForSyncType(platform::NotesSyncType).names,
            Names(Contents{}));
  EXPECT_TRUE(service().setTetheredSyncingDisabled(type, false).isSuccess());
  EXPECT_TRUE(service().setTetheredSyncingDisabled(type, false).isSuccess());
  EXPECT_EQ(service().externalSourcesEnabledForSyncType(type).names, Names(Contents{}));
}
