// Full accounts that the account services of an image make.

#include "tests/accountservices/ServicesImage.h"

namespace accountservices {
namespace {

using FullAccounts = ServicesTest;

std::string descriptionOf(const accountsettings::FullAccountPtr& account) {
  const auto* describable = dynamic_cast<const platform::Describable*>(account.get());
  return describable == nullptr ? "(null)" : describable->description();
}

std::string fullAccountOf(const Dictionary& properties) {
  const AccountPtr record = accountsettings::ASSBasicAccount::initWithProperties(properties);
  return descriptionOf(record->fullAccountUsingLoader(nullptr));
}

TEST_F(FullAccounts, AreMadeByTheServiceOfTheirType) {
  const struct {
    const char* type;
    const char* fullAccount;
  } kCases[] = {
      // Made by the class that the creator names.
      {"CalDAV", "<CalendarServiceAccount: 1>"},
      {"CardDAV", "<ContactsServiceAccount: 1>"},
      {"Mail", "<MailServiceAccount: 1>"},
      {"BriskIMAP", "<MailServiceAccount: 1>"},
      {"IMAPNotes", "<MailServiceAccount: 1>"},
      {"SMTP", "<MailServiceAccount: 1>"},
      // Made by the creator itself.
      {"Subscribed Calendar", "<SubscribedCalendarServiceAccount: 1>"},
      {"LDAP", "<DirectoryServiceAccount: 1>"},
      {"Gmail", "<GroupServiceAccount: 1>"},
      {"Yahoo", "<GroupServiceAccount: 1>"},
      {"Exchange", "<GroupServiceAccount: 1>"},
      {"Quillnet", "<GroupServiceAccount: 1>"},
      {"VantorAccount", "<GroupServiceAccount: 1>"},
      // Made by the library that asks.
      {"OnMyDevice", "<ASSDeviceLocalAccount: DeviceLocalAccount>"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.type);
    EXPECT_EQ(fullAccountOf(account("1", c.type)), c.fullAccount);
  }
}

TEST_F(FullAccounts, OfATypeThatNobodyServesAreABrokenInstallation) {
  expectFailure("The framework/bundle where (null) is defined has not been loaded",
                [] { fullAccountOf(account("1", "BookmarkDAV")); });
}

TEST_F(FullAccounts, OfMailIncludeThoseOfAccountsThatAreToBeRetired) {
  const auto store =
      storeOf({account("q", "Quillnet", {}, {{"Class", "QuillnetAccount"}}), account("c", "CalDAV"),
               account("m", "Mail", {}, {{"Class", "IMAPAccount"}})});
  Lines found;
  for (const auto& full : store->allMailAccounts()) found.push_back(descriptionOf(full));
  EXPECT_EQ(found, (Lines{"<GroupServiceAccount: q>", "<MailServiceAccount: m>"}));
}

TEST_F(FullAccounts, AreMadeOnceAndKept) {
  const auto store = storeOf({account("1", "CalDAV")});
  const auto first = store->fullAccountWithIdentifierLoader("1", nullptr);
  EXPECT_NE(first, nullptr);
  EXPECT_EQ(store->fullAccountWithIdentifierLoader("1", nullptr), first);
}

TEST_F(FullAccounts, OfAStoreAreListedWithThoseOfTheirChildren) {
  const auto store =
      storeOf({account("1", "CalDAV"),
               account("2", "Mail", {},
                       {{"Class", "IMAPAccount"}, {"ChildAccounts", Array{account("3", "SMTP")}}}),
               account("4", "Gmail")});
  Lines found;
  for (const auto& full : store->accountsWithTypes({"Mail", "SMTP", "Gmail"}))
    found.push_back(descriptionOf(full));
  EXPECT_EQ(found, (Lines{"<MailServiceAccount: 2>", "<MailServiceAccount: 3, child of 2>",
                          "<GroupServiceAccount: 4>"}));
}

TEST_F(FullAccounts, NeedTheirBundleInTheImage) {
  image.removeBundle("CalendarService.so");
  const std::string path = image.bundlePath("CalendarService.so");
  expectFailure("Could not load the account creator framework " + path + ". Error " + path +
                    ": cannot open shared object file: No such file or directory",
                [] { fullAccountOf(account("1", "CalDAV")); });
  EXPECT_EQ(fullAccountOf(account("1", "CardDAV")), "<ContactsServiceAccount: 1>");
}

}  // namespace
}  // namespace accountservices
