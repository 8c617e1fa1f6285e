#pragma once

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/SyncDataSource.h"
#include "tests/contracts/Port.h"

// One device with data stores. All of them are empty, and none exists, to begin with.
class SyncDataSourceUnderTest {
 public:
  enum class Records { contacts, events, reminders, notes };
  using Account = std::optional<std::string>;  // empty: the device-local store

  virtual ~SyncDataSourceUnderTest() = default;
  virtual platform::SyncDataSource& service() = 0;
  // Lets the service go and makes a new one over the same stores, as another process would. Sources
  // of the old one are not used any more.
  virtual void restart() = 0;

  // Puts a record into a store, which is made when missing.
  virtual void addRecord(Records kind, const Account& account, const std::string& uid,
                         const std::string& content) = 0;
  // The exact contents of the store's records of the kind, sorted; none when there is no such
  // store.
  virtual std::vector<std::string> contents(Records kind, const Account& account) = 0;
  // The same of what was taken out of the account's store and is kept.
  virtual std::vector<std::string> retiredContents(Records kind, const std::string& account) = 0;
  virtual bool storeExists(Records kind, const Account& account) = 0;

  // Gives the store, which exists, the anchors of a sync that has begun.
  virtual void setSyncAnchors(Records kind, const Account& account) = 0;
  virtual bool hasSyncAnchors(Records kind, const Account& account) = 0;
};
using SyncDataSourcePort = Port<SyncDataSourceUnderTest>;

class SyncDataSourceContract : public Contract<SyncDataSourceUnderTest> {
 protected:
  using Records = SyncDataSourceUnderTest::Records;
  using Account = SyncDataSourceUnderTest::Account;
  using Contents = std::vector<std::string>;

  static constexpr Records kContacts = Records::contacts;
  static constexpr Records kEvents = Records::events;
  static constexpr Records kReminders = Records::reminders;
  inline static const Account kLocal = std::nullopt;
  inline static const std::string kService = "service-1";

  // Two versions of one contact, another contact, an event, a to-do. Only bytes to the service.
  inline static const std::string kAda =
      "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:ada\r\nFN:Ada "
      "Byron\r\nX-Odd;x=\"1\":kept\r\nEND:VCARD\r\n";
  inline static const std::string kAdaMarried =
      "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:ada\r\nFN:Ada Lovelace\r\nEND:VCARD\r\n";
  inline static const std::string kBob =
      "BEGIN:VCARD\nVERSION:3.0\nUID:bob\nFN:Bob M\xC3\xBCller\nEND:VCARD\n";
  inline static const std::string kParty =
      "BEGIN:VCALENDAR\r\nVERSION:2.0\r\nBEGIN:VEVENT\r\nUID:party\r\nDTSTART:20260101T180000Z\r\n"
      "SUMMARY:Party\r\nEND:VEVENT\r\nEND:VCALENDAR\r\n";
  inline static const std::string kMilk =
      "BEGIN:VCALENDAR\r\nVERSION:2.0\r\nBEGIN:VTODO\r\nUID:milk\r\nSUMMARY:Milk\r\nEND:VTODO\r\n"
      "END:VCALENDAR\r\n";

  static Contents sorted(Contents contents) {
    std::sort(contents.begin(), contents.end());
    return contents;
  }
  static platform::DataSourceOptions option(std::string_view key) {
    return propertylist::Dictionary{{key, true}};
  }
  static platform::SyncDataType typeOf(Records kind) {
    if (kind == kContacts) return platform::ContactsSyncType;
    return kind == Records::notes ? platform::NotesSyncType : platform::CalendarsSyncType;
  }

  platform::SyncDataSource& service() { return device->service(); }
  platform::DataSourcePtr open(Records kind, const Account& account,
                               const platform::DataSourceOptions& options = std::nullopt) {
    const auto name = service().dataclassNameForSyncType(typeOf(kind));
    const auto created = service().createDataSource(name, account, options);
    EXPECT_TRUE(created.status.isSuccess());
    EXPECT_NE(created.source, nullptr);
    return created.source;
  }
  std::int32_t count(const platform::DataSourcePtr& source) {
    const auto counted = service().countRecords(source);
    EXPECT_TRUE(counted.status.isSuccess());
    return counted.count;
  }
  void close(const platform::DataSourcePtr& source) {
    EXPECT_TRUE(service().deleteDataSource(source).isSuccess());
  }
  // Merges the service's contacts into the device-local store, to the end.
  void mergeContacts() {
    const auto local = open(kContacts, kLocal);
    const auto remote = open(kContacts, kService);
    EXPECT_TRUE(service().migrateRecords(remote, local).isSuccess());
    EXPECT_TRUE(service().commit(local).isSuccess());
    close(local);
    EXPECT_TRUE(service().commit(remote).isSuccess());
    close(remote);
  }
};
