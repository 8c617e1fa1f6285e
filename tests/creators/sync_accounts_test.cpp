#include <thread>

#include "tests/creators/CreatorsDevice.h"

namespace accountsettings {
namespace {

class SyncAccounts : public testing::Test {
 protected:
  void createBy(const std::string& className) {
    device.setCreators({{"CalDAV", Array{creator("SyncAccount", kSyncAccounts, className)}}});
  }
  CreatorsDevice device;
};

TEST_F(SyncAccounts, AreMadeOnceAndKept) {
  createBy("SyncCreator");
  const auto account = calendarAccount();
  const SyncAccountPtr made = account->_cachedSyncAccount();
  ASSERT_NE(made, nullptr);
  EXPECT_EQ(account->_cachedSyncAccount(), made);
  EXPECT_EQ(diaryLines(), Lines{"accountToRefreshForBasicAccount(1)"});
}

TEST_F(SyncAccounts, AreMissingInSilenceWhereATypeHasOtherCreatorsOnly) {
  device.setCreators({{"CalDAV", Array{creator("FullAccount", kFullAccounts, "MakingCreator")}}});
  const auto account = calendarAccount();
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_FALSE(account->refreshContainersForDataclass(kContacts));
  EXPECT_FALSE(account->refreshContainerListForDataclassIsUserRequested(kContacts, true));
  EXPECT_FALSE(
      account->refreshContainerWithIdentifierForDataclassIsUserRequested("box", kContacts, true));
  EXPECT_EQ(device.logLines(), Lines{});
  EXPECT_FALSE(fullAccountsAreLoaded());
}

TEST_F(SyncAccounts, NeedAListForTheirTypeLikeFullAccounts) {
  device.setCreators({{"Mail", Array{}}});
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the information for the type CalDAV",
      "ASSBasicAccount", [] { calendarAccount()->refreshContainersForDataclass(kContacts); });
}

TEST_F(SyncAccounts, AreMissingWithALogLineWithoutTheirCreatorsClass) {
  createBy("Missing");
  EXPECT_EQ(calendarAccount()->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logLines(),
            Lines{"ERROR: The framework/bundle where Missing is defined has not been loaded, so "
                  "there is no syncable account for basic account with properties {Class = C; "
                  "Identifier = 1; Type = CalDAV}"});
}

TEST_F(SyncAccounts, AreMissingWithALogLineWhereTheClassMakesNoSyncAccounts) {
  device.setCreators({{"CalDAV", Array{creator("SyncAccount", kFullAccounts, "NoCreator")}}});
  const auto account = calendarAccount();
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logLines(),
            Lines{"ERROR: Could not create the account with class NoCreator and id 1"});
  EXPECT_FALSE(account->refreshContainersForDataclass(kContacts));
}

TEST_F(SyncAccounts, AreTriedAgainAfterAFailureThatIsLogged) {
  createBy("SyncCreator");
  letCreationFail(true);
  const auto account = calendarAccount();
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logLines(),
            Lines{"ERROR: Could not create the account with class SyncCreator and id 1"});
  letCreationFail(false);
  EXPECT_NE(account->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logLines().size(), 1U);
}

TEST_F(SyncAccounts, GetTheArgumentsOfTheLongFormsAndTheirAnswersComeBack) {
  createBy("SyncCreator");
  const auto account = calendarAccount();
  for (const bool asked : {true, false}) {
    EXPECT_EQ(
        account->refreshContainerWithIdentifierForDataclassIsUserRequested("box", kContacts, asked),
        asked);
    EXPECT_EQ(account->refreshContainerListForDataclassIsUserRequested(kNotes, asked), asked);
    EXPECT_EQ(account->refreshContainersForDataclassIsUserRequested(kMail, asked), asked);
  }
  EXPECT_EQ(diaryLines(), (Lines{"accountToRefreshForBasicAccount(1)",
                                 "refreshContainer(box, com.vantor.Dataclass.Contacts, true)",
                                 "refreshContainerList(com.vantor.Dataclass.Notes, true)",
                                 "refreshContainers(com.vantor.Dataclass.Mail, true)",
                                 "refreshContainer(box, com.vantor.Dataclass.Contacts, false)",
                                 "refreshContainerList(com.vantor.Dataclass.Notes, false)",
                                 "refreshContainers(com.vantor.Dataclass.Mail, false)"}));
}

// A record with long forms of its own.
class OverridingAccount : public OpenAccount {
 public:
  using OpenAccount::OpenAccount;
  static std::shared_ptr<OverridingAccount> initWithProperties(const Dictionary& properties) {
    return _recordWithProperties<OverridingAccount>(properties);
  }
  bool refreshContainerWithIdentifierForDataclassIsUserRequested(
      std::string_view containerIdentifier, std::string_view dataclass,
      bool isUserRequested) override {
    return _called("container " + std::string(containerIdentifier), dataclass, isUserRequested);
  }
  bool refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                       bool isUserRequested) override {
    return _called("list", dataclass, isUserRequested);
  }
  bool refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                    bool isUserRequested) override {
    return _called("all", dataclass, isUserRequested);
  }
  Lines calls;

 private:
  bool _called(const std::string& what, std::string_view dataclass, bool isUserRequested) {
    calls.push_back(what + " " + std::string(dataclass) + (isUserRequested ? " true" : " false"));
    return true;
  }
};

TEST_F(SyncAccounts, ShortFormsCallTheLongFormsOfASubclassWithFalse) {
  const auto account = OverridingAccount::initWithProperties(accountInfo("1"));
  EXPECT_TRUE(account->refreshContainerWithIdentifierForDataclass("box", "Contacts"));
  EXPECT_TRUE(account->refreshContainerListForDataclass("Notes"));
  EXPECT_TRUE(account->refreshContainersForDataclass("Mail"));
  EXPECT_EQ(account->calls,
            (Lines{"container box Contacts false", "list Notes false", "all Mail false"}));
}

TEST_F(SyncAccounts, RenewingCredentialsTellsTheHandlerThreeBeforeItReturns) {
  const auto account = calendarAccount();
  std::vector<int> told;
  std::thread::id thread;
  account->renewAccountCredentialsWithHandler([&](int result) {
    told.push_back(result);
    thread = std::this_thread::get_id();
  });
  EXPECT_EQ(told, std::vector<int>{3});
  EXPECT_EQ(thread, std::this_thread::get_id());
  EXPECT_EQ(account->properties(), accountInfo("1"));
}

}  // namespace
}  // namespace accountsettings
