#include "platform/testing/InMemoryDevice.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <stdexcept>

#include "platform/testing/TemporaryDirectory.h"

namespace platform {
namespace {

using Lines = std::vector<std::string>;

TEST(InMemoryDevice, NotesWhatIsDoneToItInOneOrder) {
  InMemoryDevice device;
  const Services& device_ = services();
  const auto local = device_.syncDataSource.createDataSource(
      "Calendars", std::nullopt, propertylist::Dictionary{{EventsOnlySourceOption, true}});
  const auto remote = device_.syncDataSource.createDataSource("Calendars", "Quillnet:ada", {});
  device_.notifyCenter.postSystemNotification("com.vantor.One");
  EXPECT_TRUE(device_.syncDataSource.migrateRecords(remote.source, local.source).isSuccess());
  EXPECT_FALSE(device_.syncDataSource.commit(nullptr).isSuccess());
  const auto book = device_.contactsStore.openAddressBook();
  device_.contactsStore.setSourceEnabled(device_.contactsStore.localSource(book), false);
  EXPECT_EQ(device.journal,
            (CallJournal{"createDataSource(Calendars, none, {EventsOnly})",
                         "createDataSource(Calendars, Quillnet:ada, none)",
                         "postSystemNotification(com.vantor.One)",
                         "migrateRecords(Quillnet:ada Calendars, local Calendars {EventsOnly})",
                         "commit(none)", "openAddressBook()", "localSource()",
                         "setSourceEnabled(local, false)"}));
  EXPECT_EQ(device.notifyCenter.calls(), (CallJournal{"postSystemNotification(com.vantor.One)"}));
  EXPECT_EQ(device.syncDataSource.openSources(), 2);
}

TEST(InMemoryDevice, FailsTheCallsThatTheTestNames) {
  InMemoryDevice device;
  device.syncDataSource.failNext("createDataSource(Notes", Status::failure(7, "no notes"));
  device.syncDataSource.failEvery("countRecords", Status{3, std::nullopt});
  SyncDataSource& service = services().syncDataSource;

  const auto contacts = service.createDataSource("Contacts", std::nullopt, {});
  EXPECT_TRUE(contacts.status.isSuccess());
  const auto notes = service.createDataSource("Notes", std::nullopt, {});
  EXPECT_EQ(notes.status.code, 7);
  EXPECT_EQ(notes.status.error.value().description, "no notes");
  EXPECT_EQ(notes.source, nullptr);
  EXPECT_TRUE(service.createDataSource("Notes", std::nullopt, {}).status.isSuccess());
  for (int times = 0; times < 2; ++times) {
    EXPECT_EQ(service.countRecords(contacts.source).status.code, 3);
    EXPECT_FALSE(service.countRecords(contacts.source).status.error.has_value());
  }
  device.syncDataSource.answerNormally();
  EXPECT_TRUE(service.countRecords(contacts.source).status.isSuccess());
}

TEST(InMemoryDevice, GivesASourceWithAFailureAndNoneWithASuccess) {
  InMemoryDevice device;
  device.syncDataSource.answerNext("createDataSource",
                                   {Status::failure(1, "but here it is"), true});
  device.syncDataSource.answerNext("createDataSource", {Status::success(), false});
  SyncDataSource& service = services().syncDataSource;
  const auto failed = service.createDataSource("Contacts", std::nullopt, {});
  EXPECT_FALSE(failed.status.isSuccess());
  EXPECT_NE(failed.source, nullptr);
  const auto empty = service.createDataSource("Contacts", std::nullopt, {});
  EXPECT_TRUE(empty.status.isSuccess());
  EXPECT_EQ(empty.source, nullptr);
}

TEST(InMemoryDevice, AnswersWithNothingWhereAFailedCallHasNoStatus) {
  InMemoryDevice device;
  device.contactsStore.failNext("openAddressBook");
  device.uuidGenerator.failNext("generateUUID");
  device.userDatabase.failNext("userIdentifierForName(mobile");
  EXPECT_EQ(services().contactsStore.openAddressBook(), nullptr);
  EXPECT_EQ(services().uuidGenerator.generateUUID(), std::nullopt);
  EXPECT_EQ(services().userDatabase.userIdentifierForName("mobile"), std::nullopt);
}

TEST(InMemoryDevice, LetsADecisionEndTheRunBeforeACall) {
  InMemoryDevice device;
  device.syncDataSource.decideBy([](const std::string& call) -> std::optional<PlannedAnswer> {
    if (call.starts_with("commit")) throw std::runtime_error("killed");
    return std::nullopt;
  });
  const auto local = services().syncDataSource.createDataSource("Contacts", std::nullopt, {});
  EXPECT_THROW(static_cast<void>(services().syncDataSource.commit(local.source)),
               std::runtime_error);
  EXPECT_FALSE(device.syncDataSource.storeExists(std::nullopt, "Contacts"));
}

TEST(InMemoryDevice, HoldsASettingsFileInADirectoryOfItsOwn) {
  InMemoryDevice device;
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
  device.writeSettings({{"Version", 12}, {"Accounts", propertylist::Array{}}});
  EXPECT_EQ(device.readSettings(),
            (propertylist::Dictionary{{"Version", 12}, {"Accounts", propertylist::Array{}}}));
  EXPECT_EQ(device.settingsPath(),
            joinedPath(services().deviceInfo.systemRootDirectory(),
                       "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist"));
  device.writeSettingsBytes("broken");
  EXPECT_EQ(device.readSettingsBytes(), "broken");
  EXPECT_THROW(device.readSettings(), std::runtime_error);
}

TEST(InMemoryDevice, LendsTheProcessItsDirectoryForTemporaryFiles) {
  InMemoryDevice device;
  const auto name = services().fileServices.temporaryFileName();
  ASSERT_TRUE(name.has_value());
  EXPECT_TRUE(name->starts_with(device.root() + "/tmp/")) << *name;
  EXPECT_EQ(device.temporaryFiles(), Lines{});
  const auto created = services().fileServices.createPrivateFile(*name);
  EXPECT_TRUE(services().fileServices.closeFile(created.descriptor).isSuccess());
  EXPECT_EQ(device.temporaryFiles(), Lines{name->substr(name->rfind('/') + 1)});
}

TEST(InMemoryDevice, FindsTextsAndFilesWhereTheTestPutThem) {
  InMemoryDevice device;
  BundleResources& resources = services().bundleResources;
  EXPECT_EQ(resources.localizedString(nullptr, "Key", "Table"), "Key");
  EXPECT_EQ(resources.pathForResource(nullptr, "Types", "plist"), std::nullopt);
  device.bundleResources.texts["Table"]["Key"] = "Text";
  EXPECT_EQ(resources.localizedString(nullptr, "Key", "Table"), "Text");
  device.writeSettings({});
  device.setResourcesDirectory(device.root() + "/var/mobile/Library/Preferences");
  EXPECT_EQ(resources.pathForResource(nullptr, "com.vantor.accountsettings", "plist"),
            device.settingsPath());
}

TEST(InMemoryRunLoop, LetsTimePassAtOnce) {
  InMemoryDevice device;
  int slices = 0;
  device.runLoop.afterSlice = [&] { ++slices; };
  for (int i = 0; i < 20; ++i) services().runLoop.runForAtMost(std::chrono::milliseconds(250));
  EXPECT_EQ(services().clock.absoluteTime(), 5.0);
  EXPECT_EQ(slices, 20);
  EXPECT_EQ(device.runLoop.calls().front(), "runForAtMost(250 ms)");
}

TEST(JournaledFileServices, CarryOutACreationWhoseAnswerIsPlanned) {
  const TemporaryDirectory directory;
  JournaledFileServices files;
  files.answerNext("createPrivateFile", {Status::failure(EIO, "injected"), true});
  const auto failed = files.createPrivateFile(directory.path() + "/failed");
  EXPECT_EQ(failed.status.code, EIO);
  EXPECT_EQ(failed.descriptor, -1);
  EXPECT_TRUE(files.fileExists(directory.path() + "/failed"));

  files.answerNext("createPrivateFile", {Status::success(), true});
  const auto made = files.createPrivateFile(directory.path() + "/made");
  EXPECT_TRUE(made.status.isSuccess());
  EXPECT_TRUE(files.closeFile(made.descriptor).isSuccess());

  files.failNext("createPrivateFile");
  EXPECT_EQ(files.createPrivateFile(directory.path() + "/not made").descriptor, -1);
  EXPECT_FALSE(files.fileExists(directory.path() + "/not made"));
}

}  // namespace
}  // namespace platform
