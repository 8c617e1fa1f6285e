#include "host/AccountComparison.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

using propertylist::Array;
using propertylist::Dictionary;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace host {
namespace {

const Selection kSelection = {"Status", {{{"Quillnet"}, 1}}};
const AccountRights kRights = {
    {"Class", "Identifier"}, {{{"Mail"}, {"IMAPAccount"}, {"Mail/POP-"}}}, {"OnMyDevice"}};

const Dictionary kMail = {{"Identifier", "M"}, {"Type", "Mail"}, {"Class", "Old"}, {"Port", 25}};
const Dictionary kQuillnet = {{"Identifier", "Q"}, {"Type", "Quillnet"}, {"Status", 1}};
const Dictionary kExchange = {{"Identifier", "E"}, {"Type", "Exchange"}, {"DisplayName", "Work"}};

AccountComparison compare(const std::vector<Dictionary>& before,
                          const std::vector<Dictionary>& after) {
  return compareAccounts(before, after, kSelection, kRights);
}

Dictionary with(Dictionary account, std::string_view key, const propertylist::Value& value) {
  account.set(key, value);
  return account;
}

std::vector<AccountOutcome> outcomes(const AccountComparison& comparison) {
  std::vector<AccountOutcome> result;
  for (const AccountReport& account : comparison.accounts) result.push_back(account.outcome);
  return result;
}

TEST(CompareAccounts, ReportsASelectedAccountThatIsGoneAsRetired) {
  const AccountComparison comparison = compare({kMail, kQuillnet, kExchange}, {kMail, kExchange});
  EXPECT_THAT(outcomes(comparison),
              ElementsAre(AccountOutcome::notSelected, AccountOutcome::retired,
                          AccountOutcome::notSelected));
  EXPECT_EQ(comparison.accounts[2].identifier, "E");
  EXPECT_EQ(comparison.accounts[2].type, "Exchange");
  EXPECT_EQ(comparison.accounts[2].displayName, "Work");
  EXPECT_THAT(comparison.leftBehind, IsEmpty());
  EXPECT_THAT(comparison.contradictions, IsEmpty());
}

TEST(CompareAccounts, ReportsASelectedAccountThatIsThereAsKept) {
  const AccountComparison comparison = compare({kQuillnet}, {kQuillnet});
  EXPECT_THAT(outcomes(comparison), ElementsAre(AccountOutcome::kept));
  EXPECT_THAT(comparison.leftBehind, ElementsAre("The Quillnet account Q is still there."));
}

TEST(CompareAccounts, NoticesAnotherAccountThatIsGone) {
  const AccountComparison comparison = compare({kMail, kExchange}, {kMail});
  EXPECT_THAT(outcomes(comparison),
              ElementsAre(AccountOutcome::notSelected, AccountOutcome::dropped));
  EXPECT_THAT(comparison.contradictions,
              ElementsAre("The Exchange account Work was not to be retired and is gone from the "
                          "settings file."));
  EXPECT_THAT(comparison.leftBehind, IsEmpty());
}

TEST(CompareAccounts, LeavesBehindOnlyWhatAMigratorCannotKeep) {
  struct Case {
    const char* name;
    Dictionary account;
    bool mayGo;
  };
  const Case kCases[] = {
      {"unknown class", {{"Type", "Mail"}, {"Class", "Old"}}, true},
      {"no class", {{"Type", "Mail"}}, true},
      {"unknown class and path", {{"Type", "Mail"}, {"AccountPath", "Mail/Fax-1"}}, true},
      {"known class", {{"Type", "Mail"}, {"Class", "IMAPAccount"}}, false},
      {"a path that tells the class", {{"Type", "Mail"}, {"AccountPath", "/x/Mail/POP-1"}}, false},
      {"another type", {{"Type", "Exchange"}, {"Class", "Old"}}, false},
  };
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    const AccountComparison comparison = compare({c.account}, {});
    EXPECT_THAT(outcomes(comparison), ElementsAre(AccountOutcome::dropped));
    EXPECT_EQ(comparison.leftBehind.size(), c.mayGo ? 1U : 0U);
    EXPECT_EQ(comparison.contradictions.size(), c.mayGo ? 0U : 1U);
  }
}

TEST(CompareAccounts, NoticesEveryChangeOfAnAccountThatStays) {
  EXPECT_EQ(compare({kMail}, {with(kMail, "Port", 26)}).contradictions.size(), 1U);
  EXPECT_EQ(compare({kMail}, {with(kMail, "New", 1)}).contradictions.size(), 1U);
  Dictionary less = kMail;
  less.remove("Port");
  EXPECT_EQ(compare({kMail}, {less}).contradictions.size(), 1U);
}

TEST(CompareAccounts, LetsCorrectedKeysChangeAndCome) {
  EXPECT_THAT(compare({kMail}, {with(kMail, "Class", "New")}).contradictions, IsEmpty());
}

TEST(CompareAccounts, NoticesALostPlace) {
  EXPECT_THAT(compare({kMail, kExchange}, {kExchange, kMail}).contradictions,
              ElementsAre("The Exchange account Work has lost its place."));
}

TEST(CompareAccounts, FindsAnAccountThatGotItsFirstIdentifier) {
  const Dictionary nameless = {{"Type", "Mail"}, {"Port", 1}};
  const AccountComparison comparison =
      compare({kMail, nameless}, {kMail, with(nameless, "Identifier", "fresh")});
  EXPECT_THAT(outcomes(comparison),
              ElementsAre(AccountOutcome::notSelected, AccountOutcome::notSelected));
  EXPECT_THAT(comparison.contradictions, IsEmpty());
}

TEST(CompareAccounts, CountsTwoAccountsOfOneIdentifierAsTwo) {
  EXPECT_THAT(outcomes(compare({kMail, kMail}, {kMail})),
              ElementsAre(AccountOutcome::notSelected, AccountOutcome::dropped));
}

TEST(CompareAccounts, NoticesAccountsThatCameNew) {
  const AccountComparison comparison = compare({kMail}, {kExchange, kMail});
  EXPECT_THAT(outcomes(comparison), ElementsAre(AccountOutcome::notSelected));
  EXPECT_THAT(comparison.contradictions,
              ElementsAre("The Exchange account Work was not there before."));
}

TEST(CompareAccounts, LetsTheFirstAccountOfATypeThatMayBeAddedCome) {
  const Dictionary local = {{"Identifier", "L"}, {"Type", "OnMyDevice"}};
  const Dictionary another = {{"Identifier", "L2"}, {"Type", "OnMyDevice"}};
  EXPECT_THAT(compare({kMail}, {kMail, local}).contradictions, IsEmpty());
  EXPECT_THAT(compare({kMail, local}, {kMail, local, another}).contradictions,
              ElementsAre("The OnMyDevice account L2 was not there before."));
  EXPECT_EQ(compare({kMail}, {kMail, local, another}).contradictions.size(), 2U);
}

// A small file may give very many accounts one long text.
TEST(CompareAccounts, ShortensLongTextsInTheReport) {
  const std::string text(3000, 'x');
  const std::string shortText = std::string(1024, 'x') + "...";
  const Dictionary account =
      with(with(kQuillnet, "Identifier", text), "DisplayName", text + " of somebody");
  const AccountComparison comparison = compare({account}, {});
  EXPECT_EQ(comparison.accounts[0].outcome, AccountOutcome::retired);
  EXPECT_EQ(comparison.accounts[0].identifier, shortText);
  EXPECT_EQ(comparison.accounts[0].displayName, shortText);
}

TEST(CompareAccounts, TellsLongIdentifiersApartByTheirEnds) {
  const Dictionary one = with(kExchange, "Identifier", std::string(3000, 'x') + "1");
  const Dictionary two = with(kExchange, "Identifier", std::string(3000, 'x') + "2");
  EXPECT_THAT(compare({one, two}, {one, two}).contradictions, IsEmpty());
  EXPECT_THAT(outcomes(compare({one, two}, {two})),
              ElementsAre(AccountOutcome::dropped, AccountOutcome::notSelected));
}

TEST(CompareAccounts, TellsAccountsWithoutIdentifiersApartByTheEndsOfTheirTexts) {
  const std::string text(3000, 'x');
  const Dictionary one = {{"Type", "Exchange"}, {"Note", Array{propertylist::Value(text + "1")}}};
  const Dictionary two = {{"Type", "Exchange"}, {"Note", Array{propertylist::Value(text + "2")}}};
  EXPECT_THAT(compare({one, two}, {one, two}).contradictions, IsEmpty());
  EXPECT_THAT(outcomes(compare({one, two}, {two})),
              ElementsAre(AccountOutcome::dropped, AccountOutcome::notSelected));
  const Dictionary data = {{"Type", "Exchange"}, {"Note", propertylist::Bytes(3000, 1)}};
  const Dictionary other = {{"Type", "Exchange"}, {"Note", propertylist::Bytes(3000, 2)}};
  EXPECT_THAT(outcomes(compare({data, other}, {other})),
              ElementsAre(AccountOutcome::dropped, AccountOutcome::notSelected));
}

// Ends this process when it takes several times what such a test needs, also with a sanitizer.
void limitProcessorTime() {
  constexpr rlimit kSeconds{4, 4};
  ASSERT_EQ(setrlimit(RLIMIT_CPU, &kSeconds), 0);
}

// 40,000 accounts of two lists that share one text of ten million blanks within each list: 400
// gigabytes on each side, were each looked at for itself.
struct Lists {
  std::vector<Dictionary> before;
  std::vector<Dictionary> after;
};
Lists accountsWith(const char* key, const Dictionary& more = {}) {
  const propertylist::Value text = std::string(10'000'000, ' ');
  const propertylist::Value again = std::string(*text.asString());
  Lists lists;
  for (int number = 0; number < 40'000; ++number) {
    Dictionary account = {{"Type", "Exchange"}, {"Number", number}};
    for (const Dictionary::Entry& entry : more) account.set(entry.key(), entry.value());
    account.set(key, text);
    lists.before.push_back(account);
    account.set(key, again);
    lists.after.push_back(account);
  }
  return lists;
}

TEST(CompareAccounts, LooksOnceAtWhatManyAccountsShare) {
  limitProcessorTime();
  const auto [before, after] = accountsWith("Note");
  const AccountComparison comparison = compare(before, after);
  EXPECT_THAT(comparison.contradictions, IsEmpty());
  EXPECT_EQ(comparison.accounts.size(), 40'000U);
}

TEST(CompareAccounts, LooksRarelyAtWhatManyAccountsShareWhenOneHasChanged) {
  limitProcessorTime();
  auto [before, after] = accountsWith("Note", {{"Identifier", "A"}});
  after[30'000].set("Further", true);
  EXPECT_THAT(compare(before, after).contradictions,
              ElementsAre("The Exchange account A was not to be retired and has changed."));
}

TEST(CompareAccounts, LooksRarelyAtWhatManyAccountsShareWhenEverySecondHasChanged) {
  limitProcessorTime();
  auto [before, after] = accountsWith("Note");
  for (std::size_t i = 0; i < after.size(); i += 2) after[i].set("Number", -1);
  // Without identifiers those that have changed are not found again.
  EXPECT_EQ(compare(before, after).contradictions.size(), 40'000U);
  for (Dictionary& account : before) account.set("Identifier", "A");
  for (Dictionary& account : after) account.set("Identifier", "A");
  EXPECT_EQ(compare(before, after).contradictions.size(), 20'000U);
}

TEST(CompareAccounts, LooksOnceAtAnIdentifierThatManyAccountsShare) {
  limitProcessorTime();
  const auto [before, after] = accountsWith("Identifier");
  EXPECT_THAT(compare(before, after).contradictions, IsEmpty());
}

TEST(CompareAccounts, ReadsOnceAStatusThatManyAccountsShare) {
  limitProcessorTime();
  for (const char* type : {"Quillnet", "Exchange"}) {
    const auto [before, after] = accountsWith("Status", {{"Type", type}});
    EXPECT_THAT(compare(before, after).contradictions, IsEmpty());
  }
}

// Their keys come in no order once they are shortened.
TEST(CompareAccounts, TellsAccountsOfManyLongKeysApartWithoutIdentifiers) {
  limitProcessorTime();
  Dictionary account = {{"Type", "Exchange"}};
  for (int number = 100'000; number < 200'000; ++number)
    account.set(std::string(100, 'k') + std::to_string(number), number);
  EXPECT_THAT(compare({account}, {Dictionary(account)}).contradictions, IsEmpty());
}

}  // namespace
}  // namespace host
