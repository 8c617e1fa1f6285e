// One call of the platform at a time fails, or is the last that the process lives to make.

#include <stdexcept>

#include "tests/migrator/MigratorTest.h"

namespace migrator {
namespace {

using platform::PlannedAnswer;

struct ProcessEnds : std::runtime_error {
  ProcessEnds() : std::runtime_error("the process ends here") {}
};

class FailingPlatform : public MigratorTest {
 protected:
  using Sources = platform::InMemorySyncDataSource;
  using RecordKind = Sources::RecordKind;

  FailingPlatform() {
    const Dictionary child{
        {"Type", "CalDAV"}, {"Class", "MobileCalDAVAccount"}, {"Identifier", "cal"}};
    _settings = {
        {"Version", 12},
        {"Accounts",
         Array{with(selectedInfo("q", {"Contacts", "Calendars", "Reminders", "Bookmarks", "Notes"}),
                    {{"ChildAccounts", Array{Value(child)}}}),
               accountInfo("Mail", "m", {"Mail"}), selectedInfo("q2", {"Notes"})}}};
  }

  // The device as it was before the first run.
  void startOver() {
    device.writeSettings(_settings);
    Sources& sources = device.syncDataSource;
    sources.stores.clear();
    sources.retired.clear();
    sources.tetheredSyncingDisabled.clear();
    sources.stores[{"Quillnet:ada", "Contacts"}].records = {{"1", "one"}, {"2", "two"}};
    sources.stores[{std::nullopt, "Contacts"}].records = {{"2", "two"}, {"3", "three"}};
    sources.stores[{"cal", "Calendars"}].records = {{"e", "event", RecordKind::event}};
    sources.stores[{"Quillnet:ada", "Calendars"}].records = {
        {"r", "reminder", RecordKind::reminder}};
    sources.stores[{"Quillnet:ada", "Bookmarks"}].records = {{"b", "link"}};
    sources.stores[{"Quillnet:ada", "Notes"}].records = {{"n", "note"}};
    answerNormally();
  }
  // The catalogues are read once; a failure to read them is a broken installation, no ordinary one.
  void readCatalogues() {
    startOver();
    migrator.performMigration();
  }
  void answerNormally() {
    decideAll({});
    _callAtTurn.clear();
  }
  // Every call that begins with `operation` fails.
  void failAll(const std::string& operation) {
    decideAll([operation](const std::string& call) {
      return call.starts_with(operation)
                 ? std::optional(PlannedAnswer{Status::failure(5, "injected"), false})
                 : std::nullopt;
    });
  }
  // Lets the call number `n`, from 1, be answered by `decide`.
  void atCall(int n, const std::function<std::optional<PlannedAnswer>()>& decide) {
    _countdown = n;
    decideAll([this, decide](const std::string& call) {
      if (--_countdown != 0) return std::optional<PlannedAnswer>();
      _callAtTurn = call;
      return decide();
    });
  }
  // Empty as long as that call did not come.
  const std::string& callAtTurn() const { return _callAtTurn; }

  // How often the content lies in the device-local store.
  std::ptrdiff_t localCopies(const std::string& content) const {
    std::ptrdiff_t copies = 0;
    for (const auto& [key, store] : device.syncDataSource.stores)
      if (!key.first) copies += copiesIn(store.records, content);
    return copies;
  }
  bool isSomewhere(const std::string& content) const {
    for (const auto& [key, store] : device.syncDataSource.stores)
      if (copiesIn(store.records, content) > 0) return true;
    return std::any_of(
        device.syncDataSource.retired.begin(), device.syncDataSource.retired.end(),
        [&](const Sources::RetiredRecord& retired) { return retired.record.content == content; });
  }
  void expectEveryRecordSomewhereAndNoneTwice() const {
    for (const char* content : {"one", "two", "three", "event", "reminder", "link", "note"}) {
      EXPECT_TRUE(isSomewhere(content)) << content;
      EXPECT_LE(localCopies(content), 1) << content;
    }
  }
  void expectEverythingMigrated() const {
    EXPECT_EQ(savedIdentifiers(), Lines{"m"});
    for (const char* content : {"one", "two", "three", "event", "reminder", "note"})
      EXPECT_EQ(localCopies(content), 1) << content;
    EXPECT_TRUE(isSomewhere("link"));
  }
  void expectTheMailAccount() const {
    const Value& mail = (*propertylist::findArray(_settings, "Accounts"))[1];
    EXPECT_TRUE(propertylist::findArray(device.readSettings(), "Accounts")->contains(mail));
  }

 private:
  void decideAll(const platform::FakeService::Decision& decision) {
    device.syncDataSource.decideBy(decision);
    device.contactsStore.decideBy(decision);
    device.calendarStore.decideBy(decision);
    device.fileServices.decideBy(decision);
    device.userDatabase.decideBy(decision);
    device.preferences.decideBy(decision);
  }
  static std::ptrdiff_t copiesIn(const std::vector<Sources::Record>& records,
                                 const std::string& content) {
    return std::count_if(records.begin(), records.end(),
                         [&](const Sources::Record& record) { return record.content == content; });
  }
  Dictionary _settings;
  int _countdown = 0;
  std::string _callAtTurn;
};

TEST_F(FailingPlatform, WithoutAFailureEverythingIsMigrated) {
  startOver();
  EXPECT_TRUE(migrator.performMigration());
  expectEverythingMigrated();
}

TEST_F(FailingPlatform, AnySingleFailureLosesNothingAndAnotherRunFinishes) {
  readCatalogues();
  int n = 0;
  bool turnCame = true;
  while (turnCame) {
    ++n;
    startOver();
    atCall(n, [] { return PlannedAnswer{Status::failure(5, "injected"), false}; });
    EXPECT_TRUE(migrator.performMigration());
    turnCame = !callAtTurn().empty();
    SCOPED_TRACE("call " + std::to_string(n) + ": " + callAtTurn());
    expectEveryRecordSomewhereAndNoneTwice();
    expectTheMailAccount();
    EXPECT_EQ(device.temporaryFiles().size(), callAtTurn().starts_with("removeFile") ? 1U : 0U);
    answerNormally();
    EXPECT_TRUE(migrator.performMigration());
    expectEveryRecordSomewhereAndNoneTwice();
    EXPECT_EQ(savedIdentifiers(), Lines{"m"});
    if (::testing::Test::HasFailure()) return;
  }
  EXPECT_GT(n, 150);  // the calls of a run without a failure
}

TEST_F(FailingPlatform, KilledBeforeAnyCallAnotherRunMigratesEverythingOnce) {
  readCatalogues();
  int n = 0;
  bool turnCame = true;
  while (turnCame) {
    ++n;
    startOver();
    atCall(n, []() -> std::optional<PlannedAnswer> { throw ProcessEnds(); });
    try {
      OpenedUpMigrator killed;
      killed.performMigration();
    } catch (const ProcessEnds&) {
    }
    turnCame = !callAtTurn().empty();
    SCOPED_TRACE("call " + std::to_string(n) + ": " + callAtTurn());
    expectEveryRecordSomewhereAndNoneTwice();
    expectTheMailAccount();
    answerNormally();
    EXPECT_TRUE(migrator.performMigration());
    expectEverythingMigrated();
    if (::testing::Test::HasFailure()) return;
  }
  EXPECT_GT(n, 150);  // the calls of a run without a failure
}

TEST_F(FailingPlatform, OperationThatAlwaysFailsLosesNothingAndKeepsNoAccount) {
  readCatalogues();
  for (const char* operation : {"dataclassNameForSyncType",
                                "createDataSource",
                                "createDataSource(Notes, none",
                                "createDataSource(Notes, Quillnet:ada",
                                "countRecords",
                                "clearAllRecords",
                                "clearSyncAnchors",
                                "migrateRecords",
                                "commit",
                                "commit(local",
                                "commit(Quillnet:ada",
                                "deleteDataSource",
                                "removeStore",
                                "setTetheredSyncingDisabled",
                                "openAddressBook",
                                "allSources",
                                "localSource",
                                "saveAddressBook",
                                "openCalendarDatabase",
                                "allStores",
                                "localStore",
                                "saveCalendarDatabase",
                                "readApplicationPreference"}) {
    SCOPED_TRACE(operation);
    startOver();
    failAll(operation);
    EXPECT_TRUE(migrator.performMigration());
    EXPECT_EQ(savedIdentifiers(), Lines{"m"});
    expectTheMailAccount();
    expectEveryRecordSomewhereAndNoneTwice();
  }
}

}  // namespace
}  // namespace migrator
