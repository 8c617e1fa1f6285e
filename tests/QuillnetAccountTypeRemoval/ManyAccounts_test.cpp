#include <gtest/gtest.h>
#include <sys/resource.h>

#include <algorithm>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr std::size_t kAccounts = 10000;

Dictionary manyAccountsInfo(std::size_t i) {
  const std::string number = std::to_string(i);
  return accountInfo(
      "p" + number, i % 2 == 0 ? "CalDAV" : "CardDAV",
      {{"ChildAccounts", Array{accountInfo("c" + number), accountInfo("d" + number)}}});
}

// Ends this process when it takes many times the processor time that such a test needs, also with a
// sanitizer.
void limitProcessorTime() {
  constexpr rlimit kSeconds{30, 30};
  ASSERT_EQ(setrlimit(RLIMIT_CPU, &kSeconds), 0);
}

// Ten thousand accounts with two children each: an operation that walked every account, or every
// child, for every account would be felt here.
class ManyAccounts : public ::testing::Test {
 protected:
  ManyAccounts() {
    std::vector<Value> infos;
    for (std::size_t i = 0; i < kAccounts; ++i) infos.emplace_back(manyAccountsInfo(i));
    accounts = Array(std::move(infos));
  }
  AccountsDevice device;
  Array accounts;
};

TEST_F(ManyAccounts, LoadChangeAndSave) {
  device.writeAccounts(accounts);
  const auto store = OpenStore::ofFile();
  EXPECT_EQ(store->count(), kAccounts);
  EXPECT_EQ(store->childAccountsByID().size(), 2 * kAccounts);
  EXPECT_EQ(store->accountWithIdentifier("d9999")->identifier(), "p9999");
  for (const AccountPtr& account : *store->allBasicAccounts())
    account->setAccountPropertyForKey(true, "changed");
  store->saveAllAccounts();
  const Array saved = device.savedAccounts();
  ASSERT_EQ(saved.size(), kAccounts);
  EXPECT_EQ(saved[0], Value(with(manyAccountsInfo(0), "changed", true)));
  EXPECT_EQ(saved[kAccounts - 1], Value(with(manyAccountsInfo(kAccounts - 1), "changed", true)));
  EXPECT_EQ(device.countOfFileCalls("readPropertyListFile(" + device.settingsPath()), 2U);
}

TEST_F(ManyAccounts, ReplaceEveryAccountOfAType) {
  const auto store = OpenStore::ofAccounts(accounts);
  AccountArray replacements;
  for (const AccountPtr& account : *store->allBasicAccounts())
    replacements.push_back(ASSBasicAccount::initWithProperties(account->properties()));
  store->replaceAccountsWithTypesWithAccounts({"CalDAV", "CardDAV"}, replacements);
  EXPECT_EQ(*store->allBasicAccounts(), replacements);
  store->replaceAccountsWithTypesWithAccounts({"CalDAV"}, {});
  EXPECT_EQ(store->count(), kAccounts / 2);
  EXPECT_EQ(store->childAccountsByID().size(), kAccounts);
}

// Each time its child goes and comes again, among those of the others.
TEST_F(ManyAccounts, ThatAreOneAndTheSame) {
  limitProcessorTime();
  std::vector<Value> infos(accounts.begin(), accounts.end());
  infos.insert(infos.end(), 12 * kAccounts, Value(manyAccountsInfo(kAccounts)));
  const auto store = OpenStore::ofAccounts(Array(std::move(infos)));
  EXPECT_EQ(store->count(), 13 * kAccounts);
  EXPECT_EQ(store->childAccountsByID().size(), 2 * (kAccounts + 1));
}

TEST_F(ManyAccounts, ParentOfTenThousandChildrenLosesThemAll) {
  std::vector<Value> children;
  for (std::size_t i = 0; i < kAccounts; ++i)
    children.emplace_back(accountInfo("same", "CalDAV", {{"n", i}}));
  children.emplace_back(accountInfo("other"));
  const auto store = OpenStore::ofAccounts(
      {accountInfo("p", "CalDAV", {{"ChildAccounts", Array(std::move(children))}})});
  store->removeChildWithIdentifierFromAccount("same", (*store->allBasicAccounts())[0]);
  EXPECT_EQ(store->children(), (Lines{"other of p"}));
}

// In bytes: the most that this process ever had.
std::size_t mostMemory() {
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  return static_cast<std::size_t>(usage.ru_maxrss) * 1024;
}

// A file stores a text once and may refer to it very often; here half a gigabyte would be copied.
class LongSharedText : public ::testing::Test {
 protected:
  static constexpr std::size_t kPlaces = 500;
  // The address sanitizer keeps up to 256 MiB of what was given back.
  ~LongSharedText() override { EXPECT_LT(mostMemory() - before, std::size_t{400} << 20U); }
  AccountsDevice device;
  const Value text = std::string(std::size_t{1} << 20U, 'x');
  const std::size_t before = mostMemory();
};

TEST_F(LongSharedText, OfOneChildIsNotCopiedForEachPlaceOfTheChild) {
  const Value child = with(accountInfo("c"), "Identifier", text);
  const auto store = OpenStore::ofAccounts(
      {accountInfo("p", "CalDAV", {{"ChildAccounts", Array(std::vector<Value>(kPlaces, child))}})});
  EXPECT_EQ(store->childAccountsByID().size(), 1U);
}

TEST_F(LongSharedText, OfOneChildIsNotKeptForEachTimeItsParentIsLoadedAgain) {
  const Value child = with(accountInfo("c"), "Identifier", text);
  const Value parent = accountInfo("p", "CalDAV", {{"ChildAccounts", Array{child}}});
  std::vector<Value> others;
  for (std::size_t i = 0; i < 2 * kPlaces; ++i)
    others.emplace_back(accountInfo("o" + std::to_string(i)));
  std::vector<Value> accounts(kPlaces, parent);
  accounts.emplace_back(accountInfo("q", "CalDAV", {{"ChildAccounts", Array(std::move(others))}}));
  std::rotate(accounts.begin(), accounts.end() - 1, accounts.end());
  const auto store = OpenStore::ofAccounts(Array(std::move(accounts)));
  EXPECT_EQ(store->childAccountsByID().size(), 2 * kPlaces + 1);
}

TEST_F(LongSharedText, OfAParentIsNotCopiedForEachChild) {
  std::vector<Value> children;
  for (std::size_t i = 0; i < kPlaces; ++i)
    children.emplace_back(accountInfo("c" + std::to_string(i)));
  const auto store = OpenStore::ofAccounts(
      {with(accountInfo("p", "CalDAV", {{"ChildAccounts", Array(children)}}), "Identifier", text)});
  EXPECT_EQ(store->childAccountsByID().size(), kPlaces);
}

TEST_F(LongSharedText, OfADataclassIsNotCopiedForEachPlaceInTheList) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo(
      "a", "CalDAV", {{"Enabled Dataclasses", Array(std::vector<Value>(kPlaces, text))}}));
  account->setEnabledForDataclass(true, kAccountDataclassCalendars);
  EXPECT_EQ(account->enabledDataclasses(), (StringList{std::string(kAccountDataclassCalendars)}));
}

// Each place costs what it costs to see that it is the same text.
TEST_F(LongSharedText, OfADataclassIsNotReadForEachPlaceInTheList) {
  limitProcessorTime();
  constexpr std::size_t kManyPlaces = 1'000'000;
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo(
      "a", "CalDAV", {{"Enabled Dataclasses", Array(std::vector<Value>(kManyPlaces, text))}}));
  account->setEnabledForDataclass(true, kAccountDataclassCalendars);
  EXPECT_EQ(account->enabledDataclasses(), (StringList{std::string(kAccountDataclassCalendars)}));
}

}  // namespace
}  // namespace accountsettings
