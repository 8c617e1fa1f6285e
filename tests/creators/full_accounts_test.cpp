#include "tests/creators/CreatorsDevice.h"
#include "tests/creators/Diary.h"

namespace accountsettings {
namespace {

constexpr const char* kSourceFile = "ASSBasicAccount";

std::string originOf(const FullAccountPtr& account) {
  return dynamic_cast<const Origin&>(*account).origin();
}

class FullAccounts : public testing::Test {
 protected:
  void createBy(const std::string& className) {
    device.setCreators({{"CalDAV", Array{creator("FullAccount", kFullAccounts, className)}}});
  }
  CreatorsDevice device;
};

TEST_F(FullAccounts, AreInstancesOfTheClassThatTheCreatorNames) {
  createBy("NamingCreator");
  const auto account = calendarAccount();
  const FullAccountPtr full = account->fullAccountUsingLoader(nullptr);
  EXPECT_EQ(originOf(full), "by the class");
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), full);
  EXPECT_EQ(diaryLines(), (Lines{"classForAccountType(CalDAV)", "initWithProperties(1)",
                                 "setParentAccount(none)"}));
}

TEST_F(FullAccounts, AreMadeByACreatorThatNamesNoClass) {
  createBy("MakingCreator");
  const auto account = calendarAccount();
  EXPECT_EQ(originOf(account->fullAccountUsingLoader(nullptr)), "by the creator");
  EXPECT_EQ(diaryLines(), (Lines{"accountWithBasicAccount(1)", "setParentAccount(none)"}));
}

TEST_F(FullAccounts, AreNamedByACreatorThatOffersBothWays) {
  createBy("BothWaysCreator");
  EXPECT_EQ(originOf(calendarAccount()->fullAccountUsingLoader(nullptr)), "by the class");
  EXPECT_EQ(diaryLines(), (Lines{"initWithProperties(1)", "setParentAccount(none)"}));
}

TEST_F(FullAccounts, AreNotMadeTheSecondWayAfterTheFirstGaveNothing) {
  const Array bothWays{creator("FullAccount", kFullAccounts, "BothWaysCreator")};
  device.setCreators({{"CalDAV", bothWays}, {"Mail", bothWays}});
  // No class is named.
  const auto mail = ASSBasicAccount::initWithProperties(accountInfo("2", "Mail"));
  expectAssertionFailure("Could not create the account with class BothWaysCreator and id 2",
                         kSourceFile, [&] { mail->fullAccountUsingLoader(nullptr); });
  EXPECT_EQ(diaryLines(), Lines{});
  // The class that is named makes none.
  letCreationFail(true);
  expectAssertionFailure("Could not create the account with class BothWaysCreator and id 1",
                         kSourceFile, [&] { calendarAccount()->fullAccountUsingLoader(nullptr); });
  EXPECT_EQ(diaryLines(), Lines{"initWithProperties(1)"});
}

TEST_F(FullAccounts, AreMissingWhereTheNamedClassMakesNone) {
  createBy("NamingCreator");
  letCreationFail(true);
  expectAssertionFailure("Could not create the account with class NamingCreator and id 1",
                         kSourceFile, [&] { calendarAccount()->fullAccountUsingLoader(nullptr); });
  EXPECT_EQ(diaryLines(), (Lines{"classForAccountType(CalDAV)", "initWithProperties(1)"}));
}

TEST_F(FullAccounts, MustComeFromAClassThatCanMakeThem) {
  createBy("NoCreator");
  expectAssertionFailure("Could not create the account with class NoCreator and id 1", kSourceFile,
                         [&] { calendarAccount()->fullAccountUsingLoader(nullptr); });
}

TEST_F(FullAccounts, AreTriedAgainAfterAFailure) {
  createBy("MakingCreator");
  const auto account = calendarAccount();
  letCreationFail(true);
  expectAssertionFailure("Could not create the account with class MakingCreator and id 1",
                         kSourceFile, [&] { account->fullAccountUsingLoader(nullptr); });
  letCreationFail(false);
  EXPECT_EQ(originOf(account->fullAccountUsingLoader(nullptr)), "by the creator");
}

TEST_F(FullAccounts, NeedTheirCreatorsClassToBeThere) {
  device.setCreators(
      {{"CalDAV", Array{creator("FullAccount", kFullAccounts, "Missing")}}, {"Mail", Array{}}});
  expectAssertionFailure("The framework/bundle where Missing is defined has not been loaded",
                         kSourceFile, [&] { calendarAccount()->fullAccountUsingLoader(nullptr); });
  const auto mail = ASSBasicAccount::initWithProperties(accountInfo("2", "Mail"));
  expectAssertionFailure("The framework/bundle where (null) is defined has not been loaded",
                         kSourceFile, [&] { mail->fullAccountUsingLoader(nullptr); });
}

TEST_F(FullAccounts, TakeTheRecordsParentWhenTheyAreMadeAndNeverAgain) {
  createBy("MakingCreator");
  const auto account = calendarAccount();
  account->setParentAccount(calendarAccount("p"));
  account->fullAccountUsingLoader(nullptr);
  EXPECT_EQ(diaryLines(), (Lines{"accountWithBasicAccount(1)", "setParentAccount(p)"}));
  account->setParentAccount(calendarAccount("q"));
  account->fullAccountUsingLoader(nullptr);
  EXPECT_EQ(diaryLines().size(), 2U);
}

TEST_F(FullAccounts, ThatWereSetAreAnsweredWithoutALookup) {
  class SetAccount : public AccountFullAccountProtocol {
   public:
    void setParentAccount(const AccountPtr&) override {}
  };
  const auto account = calendarAccount();  // there is no catalogue of creators
  auto first = std::make_shared<SetAccount>();
  account->setFullAccount(first);
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), first);
  account->setFullAccount(first);
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), first);
  const auto second = std::make_shared<SetAccount>();
  account->setFullAccount(second);
  EXPECT_EQ(first.use_count(), 1);
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), second);
  EXPECT_FALSE(fullAccountsAreLoaded());
}

TEST_F(FullAccounts, OfTheDeviceAreDeviceLocalAccounts) {
  device.setCreators(
      {{"OnMyDevice", Array{creator("FullAccount", kFullAccounts, "ASSDeviceLocalAccount")}}});
  const AccountPtr record = ASSBasicAccount::initWithProperties(
      accountInfo("own", "OnMyDevice", {{"Type String", "On My Kallo"}}));
  const auto full =
      std::dynamic_pointer_cast<ASSDeviceLocalAccount>(record->fullAccountUsingLoader(nullptr));
  ASSERT_NE(full, nullptr);
  EXPECT_NE(std::static_pointer_cast<ASSBasicAccount>(full), record);
  EXPECT_EQ(full->identifier(), "DeviceLocalAccount");
  EXPECT_EQ(full->properties(), record->properties());
}

TEST_F(FullAccounts, OfTheDeviceThatMakeNoRecordAreABrokenInstallation) {
  device.setCreators(
      {{"OnMyDevice", Array{creator("FullAccount", kFullAccounts, "ASSDeviceLocalAccount")}}});
  const AccountPtr record = ASSBasicAccount::initWithProperties(accountInfo("1", "OnMyDevice"));
  record->removeAccountPropertyForKey("Class");
  expectAssertionFailure("Could not create the account with class ASSDeviceLocalAccount and id 1",
                         kSourceFile, [&] { record->fullAccountUsingLoader(nullptr); });
}

}  // namespace
}  // namespace accountsettings
