// Which stores belong to accounts, where a small file gives a long name to very many accounts.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include "host/DiscardedAccounts.h"
#include "host/StoreOwners.h"

using deviceimage::Dataclass;
using propertylist::Dictionary;

namespace host {
namespace {

const Selection kSelection = {"Status", {{{"CardDAV"}, 1}}};
const deviceimage::SyncAgent kAgent{std::nullopt};

Dictionary account(const propertylist::Value& identifier) {
  return {{"Type", "CardDAV"}, {"Status", 1}, {"Identifier", identifier}};
}

// With a store of contacts that has one record, for each name.
Observation observed(const std::vector<Dictionary>& accounts,
                     const std::vector<std::string>& names) {
  Observation observation;
  observation.settings.accounts = accounts;
  for (const std::string& name : names)
    observation.stores.push_back({Dataclass::contacts, name, false, {ObservedRecord()}});
  return observation;
}

TEST(RecordsWithoutAccount, AreThoseOfStoresThatNoAccountNames) {
  EXPECT_THAT(recordsWithoutAccount(observed({account("a")}, {"a", "b"}), kAgent, ""),
              testing::ElementsAre("1 record of contacts in the store b belongs to no account of "
                                   "the settings file and cannot be migrated."));
}

TEST(StoreNames, OfAnyLengthBelongToTheirAccounts) {
  const std::string name(5000, 'x');
  const Observation observation = observed({account(name)}, {name});
  EXPECT_THAT(recordsWithoutAccount(observation, kAgent, ""), testing::IsEmpty());
  StoreOwners owners(observation, kSelection, kAgent);
  EXPECT_NE(owners.lineOf(observation.stores[0]), nullptr);
}

// 400 gigabytes for each dataclass, were each looked at for itself.
TEST(StoreNames, ThatAreLongAndSharedAreNotLookedForAgainAndAgain) {
  constexpr rlimit kSeconds{4, 4};
  ASSERT_EQ(setrlimit(RLIMIT_CPU, &kSeconds), 0);
  const std::vector<Dictionary> accounts(40'000, account(std::string(10'000'000, 'x')));
  const Observation observation = observed(accounts, {"a"});
  EXPECT_EQ(recordsWithoutAccount(observation, kAgent, "").size(), 1U);
  StoreOwners owners(observation, kSelection, kAgent);
  EXPECT_EQ(owners.lineOf(observation.stores[0]), nullptr);
}

}  // namespace
}  // namespace host
