#include "localdata/DataclassFunctions.h"

#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

using platform::SyncDataType;

using SyncTypes = LocalDataTest;

TEST_F(SyncTypes, AreThoseOfTheTableAndNoneForAnyOtherString) {
  struct Row {
    const char* dataclass;
    std::optional<SyncDataType> type;
  };
  const Row kRows[] = {
      {"com.vantor.Dataclass.Mail", SyncDataType::mailAccounts},
      {"com.vantor.Dataclass.Contacts", SyncDataType::contacts},
      {"com.vantor.Dataclass.Calendars", SyncDataType::calendars},
      {"com.vantor.Dataclass.Bookmarks", SyncDataType::bookmarks},
      {"com.vantor.Dataclass.Reminders", SyncDataType::calendars},
      {"com.vantor.Dataclass.Notes", SyncDataType::notes},
      {"com.vantor.Dataclass.MediaStream", std::nullopt},
      {"com.vantor.Dataclass.DeviceLocator", std::nullopt},
      {"com.vantor.Dataclass.ContactsSearch", std::nullopt},
      {"com.vantor.Dataclass.Backup", std::nullopt},
      {"com.vantor.Dataclass.Ubiquity", std::nullopt},
      {"com.vantor.Dataclass.KeyValue", std::nullopt},
      {"com.vantor.Dataclass.Shoebox", std::nullopt},
      {"com.vantor.Dataclass.SharedStreams", std::nullopt},
      {"com.vantor.dataclass.Contacts", std::nullopt},
      {"com.vantor.Dataclass.Contacts ", std::nullopt},
      {"Contacts", std::nullopt},
      {"", std::nullopt},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.dataclass);
    EXPECT_EQ(AccountSettingsOrvetteSyncTypeForDataclass(row.dataclass), row.type);
  }
}

TEST_F(SyncTypes, HaveTheNameThatThePlatformGivesThem) {
  struct Row {
    const char* dataclass;
    const char* name;
  };
  const Row kRows[] = {
      {"com.vantor.Dataclass.Mail", "MailAccounts"},
      {"com.vantor.Dataclass.Contacts", "Contacts"},
      {"com.vantor.Dataclass.Calendars", "Calendars"},
      {"com.vantor.Dataclass.Bookmarks", "Bookmarks"},
      {"com.vantor.Dataclass.Reminders", "Calendars"},
      {"com.vantor.Dataclass.Notes", "Notes"},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.dataclass);
    EXPECT_EQ(AccountSettingsOrvetteSyncDataclassNameForDataclass(row.dataclass), row.name);
  }
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(MailAccounts)", "dataclassNameForSyncType(Contacts)",
                     "dataclassNameForSyncType(Calendars)", "dataclassNameForSyncType(Bookmarks)",
                     "dataclassNameForSyncType(Calendars)", "dataclassNameForSyncType(Notes)"}));
}

TEST_F(SyncTypes, NamelessDataclassIsNotAskedOfThePlatform) {
  EXPECT_EQ(AccountSettingsOrvetteSyncDataclassNameForDataclass("com.vantor.Dataclass.Backup"),
            std::nullopt);
  EXPECT_EQ(device.journal, Journal{});
}

TEST_F(SyncTypes, NameThatThePlatformLacksIsNone) {
  device.syncDataSource.failNext("dataclassNameForSyncType");
  EXPECT_EQ(AccountSettingsOrvetteSyncDataclassNameForDataclass("com.vantor.Dataclass.Contacts"),
            std::nullopt);
}

struct AddressRow {
  const char* address;
  std::optional<std::string> answer;
};

TEST(AddressDomain, IsTheTextBehindTheFirstAt) {
  const AddressRow kRows[] = {
      {"joe@example.com", "example.com"},
      {"a@b@c.com", "b@c.com"},
      {"@x.org", "x.org"},
      {"a@@", "@"},
      {"joe@host", "host"},
      {"joe@", std::nullopt},
      {"@", std::nullopt},
      {"joe", std::nullopt},
      {"", std::nullopt},
  };
  for (const AddressRow& row : kRows) {
    SCOPED_TRACE(row.address);
    EXPECT_EQ(_addressDomainForAddress(row.address), row.answer);
  }
}

TEST(EmailDescription, FollowsTheNumberOfLabels) {
  const AddressRow kRows[] = {
      {"joe@host", "joe@host"},
      {"a@b@c", "a@b@c"},
      {"joe@example.org", "Example"},
      {"joe@EXAMPLE.com", "Example"},
      {"joe@my-MAIL.com", "My-Mail"},
      {"joe@3com.com", "3Com"},
      {"joe@caf\xc3\xa9mail.fr", "Caf\xc3\xa9mail"},
      {"joe@\xc3\xa9mail.fr", "\xc3\xa9Mail"},
      {"a@b@c.com", "B@C"},
      {"joe@a.", "A"},
      {"joe@.com", ""},
      {"joe@.", ""},
      {"joe@mail.Example.com", "mail.Example.com"},
      {"joe@a..b", "a..b"},
      {"joe@", std::nullopt},
      {"joe", std::nullopt},
      {"", std::nullopt},
  };
  for (const AddressRow& row : kRows) {
    SCOPED_TRACE(row.address);
    EXPECT_EQ(AccountSettingsDescriptionFromEmailAddress(row.address), row.answer);
  }
}

class AccountDescriptions : public LocalDataTest {
 protected:
  AccountDescriptions() {
    const Dictionary child = with(accountInfo("CalDAV", "child", {}), {{"DisplayName", "Child"}});
    writeAccounts({
        with(accountInfo("SMTP", "smtp", {}), {{"DisplayName", "Outgoing"}}),
        with(accountInfo("Mail", "mail", {}), {{"DisplayName", "Post"}}),
        with(accountInfo("Quillnet", "q", {}),
             {{"DisplayName", "Quill"}, {"ChildAccounts", Array{Value(child)}}}),
        deviceLocalInfo({}),
        with(accountInfo("SMTP", "smtp-2", {}), {{"DisplayName", "Both"}}),
        with(accountInfo("Mail", "mail-2", {}), {{"DisplayName", "Both"}}),
    });
  }
};

TEST_F(AccountDescriptions, ExistWhenATopLevelAccountIsShownUnderExactlyThatName) {
  struct Row {
    const char* description;
    bool exists;
  };
  const Row kRows[] = {
      {"Post", true},          {"Quill", true},     {"post", false},
      {"Post ", false},        {"Outgoing", false}, {"Child", false},
      {"Both", true},          {"mail", false},     {"", false},
      {"On My Kallo", true},  // the localised name of the device-local account
      {"Name of mail", false},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.description);
    EXPECT_EQ(AccountSettingsAccountDescriptionAlreadyExists(row.description), row.exists);
  }
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(AccountDescriptions, AreLookedUpInAFreshStoreEachTime) {
  EXPECT_TRUE(AccountSettingsAccountDescriptionAlreadyExists("Post"));
  writeAccounts({accountInfo("Mail", "other", {})});
  EXPECT_FALSE(AccountSettingsAccountDescriptionAlreadyExists("Post"));
  EXPECT_TRUE(AccountSettingsAccountDescriptionAlreadyExists("Name of other"));
  EXPECT_EQ(settingsReads(), 3U);
}

}  // namespace
}  // namespace localdata
