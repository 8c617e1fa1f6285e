#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

class OpenFixer : public ASSRuntimeFixMailAccount {
 public:
  using ASSRuntimeFixMailAccount::_cleanupAccountClass;
  using ASSRuntimeFixMailAccount::shouldNotifyMobileMail;
  using ASSRuntimeFixMailAccount::supportedMailClasses;
};

class MailFix : public ::testing::Test {
 protected:
  static AccountPtr account(std::string_view type, std::string_view className,
                            const std::optional<Value>& path = std::nullopt) {
    Dictionary info = accountInfo("1", type, {{"Class", className}});
    if (path) info.set("AccountPath", *path);
    return ASSBasicAccount::initWithProperties(info);
  }
  FixVerdict fix(const AccountPtr& account) {
    return fixer.fixBasicAccountIfNeededLoggingMessage(account, "loading accounts");
  }
  const CallJournal& broadcasts() const { return device.preferences.calls(); }
  AccountsDevice device;
  OpenFixer fixer;
};

const CallJournal kOneBroadcast = {"postPreferencesChanged(com.vantor.mobilemail, MailAccounts)"};

TEST_F(MailFix, KnowsEightMailClassesAndTwoTypes) {
  EXPECT_EQ(fixer.supportedMailClasses(),
            (std::set<std::string, std::less<>>{"PellixAccount", "QuillnetAccount", "POPAccount",
                                                "IMAPAccount", "AOLAccount", "LocalAccount",
                                                "GmailAccount", "YahooAccount"}));
  EXPECT_EQ(fixer.supportedAccountTypes(),
            (std::set<std::string, std::less<>>{"Quillnet", "Mail"}));
  EXPECT_EQ(&fixer.supportedAccountTypes(), &OpenFixer().supportedAccountTypes());
  EXPECT_FALSE(fixer.shouldNotifyMobileMail());
}

TEST_F(MailFix, VerdictsHaveFixedNumbers) {
  EXPECT_EQ(static_cast<int>(FixVerdict::nothingToDo), 0);
  EXPECT_EQ(static_cast<int>(FixVerdict::fixed), 1);
  EXPECT_EQ(static_cast<int>(FixVerdict::couldNotFix), 2);
}

TEST_F(MailFix, LeavesOtherTypesAloneWhateverTheirClass) {
  for (const char* type : {"Gmail", "Yahoo", "SMTP", "IMAPNotes", "BriskIMAP", "VantorAccount",
                           "Exchange", "CalDAV", "OnMyDevice"}) {
    SCOPED_TRACE(type);
    const AccountPtr other = account(type, "Unknown", "Mail/POP-x");
    EXPECT_EQ(fix(other), FixVerdict::nothingToDo);
    EXPECT_EQ(other->accountClass(), "Unknown");
  }
  EXPECT_FALSE(fixer.shouldNotifyMobileMail());
}

TEST_F(MailFix, LeavesEveryKnownClassAlone) {
  for (const char* type : {"Mail", "Quillnet"}) {
    for (const std::string& className : fixer.supportedMailClasses())
      EXPECT_EQ(fix(account(type, className, "Mail/POP-x")), FixVerdict::nothingToDo) << className;
  }
  EXPECT_FALSE(fixer.shouldNotifyMobileMail());
}

TEST_F(MailFix, ComparesClassesExactly) {
  for (const char* className : {"imapaccount", "IMAPAccount ", "IMAP"})
    EXPECT_EQ(fix(account("Mail", className, "Mail/IMAP-x")), FixVerdict::fixed) << className;
}

TEST_F(MailFix, TakesTheClassOfTheFirstRuleWhoseFragmentThePathHolds) {
  const struct {
    const char* name;
    const char* path;
    const char* className;
  } kCases[] = {
      {"rule 1", "/var/mobile/Library/Mail/Dorn-ada", "PellixAccount"},
      {"rule 2", "/var/mobile/Library/Mail/Quillnet-ada", "QuillnetAccount"},
      {"rule 3", "/var/mobile/Library/Mail/AOL-ada", "AOLAccount"},
      {"rule 4", "/var/mobile/Library/Mail/Mailboxes", "LocalAccount"},
      {"rule 5", "Mail/IMAP-ada@gmail.com@imap.gmail.com", "GmailAccount"},
      {"rule 6", "Mail/IMAP-ada@imap.mail.yahoo.com", "YahooAccount"},
      {"rule 7", "/var/mobile/Library/Mail/POP-x", "POPAccount"},
      {"rule 8", "/var/mobile/Library/Mail/IMAP-x", "IMAPAccount"},
      {"the whole path", "Mail/POP-", "POPAccount"},
      {"1 before 2", "Mail/Quillnet-x/Mail/Dorn-y", "PellixAccount"},
      {"2 before 3", "Mail/AOL-x/Mail/Quillnet-y", "QuillnetAccount"},
      {"3 before 8, which stands first", "Mail/IMAP-x/Mail/AOL-y", "AOLAccount"},
      {"4 before 5", "gmail.com@imap.gmail.com/Mail/Mailboxes", "LocalAccount"},
      {"5 before 6", "imap.mail.yahoo.com/gmail.com@imap.gmail.com", "GmailAccount"},
      {"6 before 7", "Mail/POP-ada@imap.mail.yahoo.com", "YahooAccount"},
      {"7 before 8", "Mail/IMAP-x/Mail/POP-y", "POPAccount"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const AccountPtr mail = account("Mail", "Unknown", c.path);
    EXPECT_EQ(fix(mail), FixVerdict::fixed);
    EXPECT_EQ(mail->accountClass(), c.className);
    EXPECT_EQ(fix(mail), FixVerdict::nothingToDo);
  }
  EXPECT_TRUE(fixer.shouldNotifyMobileMail());
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(MailFix, GivesUpOnAPathThatImpliesNoClassAndSaysSo) {
  const struct {
    const char* name;
    std::optional<Value> path;
    std::string properties;
  } kCases[] = {
      {"no path", std::nullopt, "{Class = U; Identifier = 1; Type = Mail}"},
      {"empty path", "", "{AccountPath = ; Class = U; Identifier = 1; Type = Mail}"},
      {"no rule", "Mail/Fax-x",
       "{AccountPath = Mail/Fax-x; Class = U; Identifier = 1; Type = Mail}"},
      {"other case", "mail/pop-x",
       "{AccountPath = mail/pop-x; Class = U; Identifier = 1; Type = Mail}"},
      {"no string", 5, "{AccountPath = 5; Class = U; Identifier = 1; Type = Mail}"},
      {"percent signs", "%@%n", "{AccountPath = %@%n; Class = U; Identifier = 1; Type = Mail}"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    device.systemLog.clear();
    const AccountPtr mail = account("Mail", "U", c.path);
    const Dictionary before = mail->properties();
    EXPECT_EQ(fix(mail), FixVerdict::couldNotFix);
    EXPECT_EQ(mail->properties(), before);
    EXPECT_EQ(device.logLines(),
              (Lines{"Could not fix the class of the mail account: " + c.properties}));
    EXPECT_TRUE(fixer.shouldNotifyMobileMail());
    fixer.accountsHaveBeenSaved(false);
  }
}

TEST_F(MailFix, CleaningUpSaysWhetherTheClassIsRight) {
  EXPECT_TRUE(fixer._cleanupAccountClass(account("Mail", "U", "Mail/POP-x")));
  EXPECT_FALSE(fixer._cleanupAccountClass(account("Mail", "U")));
}

TEST_F(MailFix, ReadsThePathOfAParent) {
  const AccountPtr child = account("Mail", "Unknown");
  child->setParentAccount(account("Mail", "IMAPAccount", "Mail/POP-x"));
  EXPECT_EQ(fix(child), FixVerdict::fixed);
  EXPECT_EQ(child->accountClass(), "POPAccount");
}

TEST_F(MailFix, MessageProducesNoOutput) {
  fixer.fixBasicAccountIfNeededLoggingMessage(account("Mail", "U", "Mail/POP-x"),
                                              "saving accounts");
  fixer.fixBasicAccountIfNeededLoggingMessage(account("Mail", "POPAccount"), "saving accounts");
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(MailFix, TellsTheMailApplicationOnceAfterASave) {
  fix(account("Mail", "U", "Mail/POP-x"));
  fix(account("Quillnet", "U", "Mail/IMAP-x"));
  fixer.accountsHaveBeenSaved(true);
  EXPECT_EQ(broadcasts(), kOneBroadcast);
  fixer.accountsHaveBeenSaved(true);
  EXPECT_EQ(broadcasts(), kOneBroadcast);
}

TEST_F(MailFix, TellsItAlsoAboutAnAccountThatCouldNotBeFixed) {
  fix(account("Mail", "U"));
  fixer.accountsHaveBeenSaved(true);
  EXPECT_EQ(broadcasts(), kOneBroadcast);
}

TEST_F(MailFix, ForgetsWithoutTellingAfterALoad) {
  fix(account("Mail", "U", "Mail/POP-x"));
  fixer.accountsHaveBeenSaved(false);
  EXPECT_FALSE(fixer.shouldNotifyMobileMail());
  fixer.accountsHaveBeenSaved(true);
  EXPECT_EQ(broadcasts(), CallJournal());
}

TEST_F(MailFix, TellsNobodyWhenNothingNeededFixing) {
  fixer.accountsHaveBeenSaved(true);
  fix(account("Mail", "IMAPAccount"));
  fixer.accountsHaveBeenSaved(true);
  EXPECT_EQ(broadcasts(), CallJournal());
}

TEST_F(MailFix, TracingPointAnswersItsArgument) {
  const int value = 0;
  EXPECT_EQ(reportMailAccountClassFound(&value), &value);
  EXPECT_EQ(reportMailAccountClassFound(nullptr), nullptr);
}

}  // namespace
}  // namespace accountsettings
