#include "host/AccountComparison.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using propertylist::Dictionary;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace host {
namespace {

const Selection kSelection = {"Status", {{{"Quillnet"}, 1}}};
const std::vector<std::string> kCorrected = {"Class", "Identifier"};

const Dictionary kMail = {{"Identifier", "M"}, {"Type", "Mail"}, {"Class", "Old"}, {"Port", 25}};
const Dictionary kQuillnet = {{"Identifier", "Q"}, {"Type", "Quillnet"}, {"Status", 1}};
const Dictionary kExchange = {{"Identifier", "E"}, {"Type", "Exchange"}, {"DisplayName", "Work"}};

AccountComparison compare(const std::vector<Dictionary>& before,
                          const std::vector<Dictionary>& after) {
  return compareAccounts(before, after, kSelection, kCorrected);
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

TEST(CompareAccounts, ReportsAnotherAccountThatIsGoneAsDropped) {
  const AccountComparison comparison = compare({kMail, kExchange}, {kMail});
  EXPECT_THAT(outcomes(comparison),
              ElementsAre(AccountOutcome::notSelected, AccountOutcome::dropped));
  EXPECT_THAT(comparison.leftBehind, ElementsAre(HasSubstr("Exchange account Work")));
  EXPECT_THAT(comparison.contradictions, IsEmpty());
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

TEST(CompareAccounts, PassesOverAccountsThatCameNew) {
  const AccountComparison comparison = compare({kMail}, {kExchange, kMail});
  EXPECT_THAT(outcomes(comparison), ElementsAre(AccountOutcome::notSelected));
  EXPECT_THAT(comparison.contradictions, IsEmpty());
}

}  // namespace
}  // namespace host
