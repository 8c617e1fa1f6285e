#include <sys/resource.h>

#include "tests/creators/CreatorsDevice.h"

namespace accountsettings {
namespace {

using Change = AccountChangeType;
using Properties = std::optional<Dictionary>;

// "Contacts and notes" and "Mail" have a notifier each; a third serves notes and mail.
class ChangeRecords : public testing::Test {
 protected:
  ChangeRecords() {
    device.setCreators(
        {{"CalDAV", Array{notifier("ForContacts", {kContacts, kNotes}),
                          notifier("ForMail", {kMail}), notifier("ForBoth", {kNotes, kMail})}},
         {"", Array{notifier("ForNoType", {kContacts})}}});
  }
  // What the notifiers are to be told of one change, by their names.
  static TellingStore::NotificationTable recordsOf(Change kind, const Properties& original,
                                                   const Properties& current) {
    TellingStore::NotificationTable table;
    TellingStore()._addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties(
        table, kind, original, current);
    return table;
  }
  static Lines toldOf(Change kind, const Properties& original, const Properties& current) {
    Lines names;
    for (const auto& [name, records] : recordsOf(kind, original, current)) {
      EXPECT_EQ(records.size(), 1U) << name;
      names.push_back(name);
    }
    return names;
  }
  CreatorsDevice device;
};

Dictionary enabled(const Array& dataclasses, const Dictionary& more = {}) {
  return with(accountInfo("1", "CalDAV", more), "Enabled Dataclasses", dataclasses);
}

TEST_F(ChangeRecords, KeysAndKindsAreFixed) {
  EXPECT_EQ(kASChangeAccountChangeTypeKey, "ChangeType");
  EXPECT_EQ(kASChangeAccountIdentifierKey, "AccountID");
  EXPECT_EQ(kASChangeAccountTypeKey, "AccountType");
  EXPECT_EQ(kASChangeAccountOriginallyEnabledDataclassesKey, "OriginalDataclasses");
  EXPECT_EQ(static_cast<int>(Change::added), 0);
  EXPECT_EQ(static_cast<int>(Change::modified), 1);
  EXPECT_EQ(static_cast<int>(Change::deleted), 2);
}

TEST_F(ChangeRecords, ADeletedAccountConcernsWhatWasEnabled) {
  EXPECT_EQ(recordsOf(Change::deleted, enabled({kMail}), std::nullopt),
            (TellingStore::NotificationTable{{"ForBoth", {change(2, "1", "CalDAV", {kMail})}},
                                             {"ForMail", {change(2, "1", "CalDAV", {kMail})}}}));
}

TEST_F(ChangeRecords, AnAddedAccountConcernsWhatIsEnabledAndHadNothingBefore) {
  EXPECT_EQ(
      recordsOf(Change::added, std::nullopt, enabled({kContacts})),
      (TellingStore::NotificationTable{{"ForContacts", {change(0, "1", "CalDAV", Array{})}}}));
}

TEST_F(ChangeRecords, AModifiedAccountConcernsEachDataclassByItsChange) {
  const Dictionary renamed{{"DisplayName", "other"}};
  const struct {
    const char* name;
    Dictionary original;
    Dictionary current;
    Lines told;
  } kCases[] = {
      {"nothing changed", enabled({kMail}), enabled({kMail}), {}},
      {"only the order", enabled({kMail, kContacts}), enabled({kContacts, kMail}), {}},
      {"one turned off", enabled({kMail, kContacts}), enabled({kMail}), {"ForContacts"}},
      {"one turned on", enabled({kMail}), enabled({kContacts, kMail}), {"ForContacts"}},
      {"one each way",
       enabled({kMail}),
       enabled({kContacts}),
       {"ForBoth", "ForContacts", "ForMail"}},
      {"renamed", enabled({kMail}), enabled({kMail}, renamed), {"ForBoth", "ForMail"}},
      {"a key gone", enabled({kMail}, renamed), enabled({kMail}), {"ForBoth", "ForMail"}},
      {"one turned on and renamed",
       enabled({kMail}),
       enabled({kMail, kContacts}, renamed),
       {"ForBoth", "ForContacts", "ForMail"}},
      {"all off and renamed", enabled({kContacts}), enabled({}, renamed), {"ForContacts"}},
      {"no list any more and renamed",
       enabled({kContacts}),
       accountInfo("1", "CalDAV", renamed),
       {"ForContacts"}},
      {"none on, renamed", enabled({}), enabled({}, renamed), {}},
      {"activity", enabled({kMail}), enabled({kMail}, {{"IsActive", true}}), {}},
      {"children",
       enabled({kMail}),
       enabled({kMail}, {{"ChildAccounts", Array{accountInfo("c")}}}),
       {}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(toldOf(Change::modified, c.original, c.current), c.told);
  }
}

TEST_F(ChangeRecords, AnAccountWithNothingEnabledAnyMoreConcernsOnlyWhatItLost) {
  const Dictionary original = enabled({kContacts}, {{"DisplayName", "before"}, {"Port", 1}});
  const Dictionary current = enabled({}, {{"DisplayName", "after"}, {"Host", "h"}});
  EXPECT_EQ(
      recordsOf(Change::modified, original, current),
      (TellingStore::NotificationTable{{"ForContacts", {change(1, "1", "CalDAV", {kContacts})}}}));
  // With one left on, the other properties concern that one.
  EXPECT_EQ(toldOf(Change::modified, with(original, "Enabled Dataclasses", Array{kContacts, kMail}),
                   with(current, "Enabled Dataclasses", Array{kMail})),
            (Lines{"ForBoth", "ForContacts", "ForMail"}));
}

TEST_F(ChangeRecords, CompareWhatIsStoredNotWhatIsProvisionedOrForbidden) {
  // CalDAV supports none of these dataclasses, and the service granted none.
  const Dictionary grantsNothing{{"Provisioned Dataclasses", Array{}}};
  EXPECT_EQ(toldOf(Change::modified, enabled({kContacts}, grantsNothing),
                   enabled({kContacts, kMail}, grantsNothing)),
            (Lines{"ForBoth", "ForMail"}));
}

TEST_F(ChangeRecords, HoldTheOriginalListAndOneRecordForANotifierOfSeveralDataclasses) {
  EXPECT_EQ(recordsOf(Change::modified, enabled({kContacts, kNotes}), enabled({})),
            (TellingStore::NotificationTable{
                {"ForBoth", {change(1, "1", "CalDAV", {kContacts, kNotes})}},
                {"ForContacts", {change(1, "1", "CalDAV", {kContacts, kNotes})}}}));
  EXPECT_EQ(
      recordsOf(Change::modified, accountInfo("1"), enabled({kContacts})),
      (TellingStore::NotificationTable{{"ForContacts", {change(1, "1", "CalDAV", Array{})}}}));
}

TEST_F(ChangeRecords, HoldTheOriginalListAsItIs) {
  const Array odd{kContacts, 5, kContacts};
  for (const Properties& current : {Properties(enabled({})), Properties()}) {
    const Change kind = current ? Change::modified : Change::deleted;
    EXPECT_EQ(recordsOf(kind, enabled(odd), current).at("ForContacts"),
              Array{change(static_cast<int>(kind), "1", "CalDAV", odd)});
  }
}

TEST_F(ChangeRecords, TakeIdentifierAndTypeFromTheCurrentPropertiesElseFromTheOriginal) {
  const Dictionary original = enabled({kContacts});
  const Array told{change(1, "1", "CalDAV", {kContacts})};
  EXPECT_EQ(recordsOf(Change::modified, original, Dictionary{{"Type", "CalDAV"}}).at("ForContacts"),
            told);
  EXPECT_EQ(
      recordsOf(Change::modified, original, Dictionary{{"Identifier", "1"}}).at("ForContacts"),
      told);
  EXPECT_EQ(recordsOf(Change::modified, with(original, "Identifier", "old"),
                      Dictionary{{"Identifier", "1"}})
                .at("ForContacts"),
            told);
}

TEST_F(ChangeRecords, EndAtTheFirstValueThatIsMissing) {
  const Dictionary original = enabled({kContacts});
  EXPECT_EQ(
      recordsOf(Change::deleted, without(original, "Identifier"), std::nullopt).at("ForContacts"),
      Array{(Dictionary{{"ChangeType", 2}})});
  EXPECT_EQ(recordsOf(Change::deleted, without(original, "Type"), std::nullopt).at("ForNoType"),
            Array{(Dictionary{{"ChangeType", 2}, {"AccountID", "1"}})});
}

TEST_F(ChangeRecords, AreAppendedAndLeaveTheComparedPropertiesAlone) {
  const Properties original = enabled({kContacts}, {{"IsActive", true}});
  const Properties current = enabled({kContacts}, {{"ChildAccounts", Array{}}, {"k", 1}});
  TellingStore::NotificationTable table{{"ForContacts", {"earlier"}}};
  TellingStore()._addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties(
      table, Change::modified, original, current);
  EXPECT_EQ(table.at("ForContacts"), (Array{"earlier", change(1, "1", "CalDAV", {kContacts})}));
  EXPECT_EQ(original, enabled({kContacts}, {{"IsActive", true}}));
  EXPECT_EQ(current, enabled({kContacts}, {{"ChildAccounts", Array{}}, {"k", 1}}));
}

// In bytes: the most that this process ever had.
std::size_t mostMemory() {
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  return static_cast<std::size_t>(usage.ru_maxrss) * 1024;
}

// A small file may name one long dataclass very often; copied, these would take a gigabyte.
TEST_F(ChangeRecords, CopyNoDataclassForEachPlaceInTheList) {
  const Value text = std::string(std::size_t{1} << 20U, 'x');
  std::vector<Value> places(500, text);
  places.emplace_back(kContacts);
  const Properties original =
      Dictionary{{"Type", "CalDAV"}, {"Enabled Dataclasses", Array(places)}};
  const Properties current = with(*original, "k", 1);
  const std::size_t before = mostMemory();
  EXPECT_EQ(toldOf(Change::modified, original, current), Lines{"ForContacts"});
  // The address sanitizer keeps up to 256 MiB of what was given back.
  EXPECT_LT(mostMemory() - before, std::size_t{400} << 20U);
}

}  // namespace
}  // namespace accountsettings
