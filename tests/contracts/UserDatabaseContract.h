#pragma once

#include <string>

#include "platform/UserDatabase.h"
#include "tests/contracts/Port.h"

// One device with the user and group "mobile".
class UserDatabaseUnderTest {
 public:
  virtual ~UserDatabaseUnderTest() = default;
  virtual platform::UserDatabase& service() = 0;
  virtual uid_t mobileUser() = 0;
  virtual gid_t mobileGroup() = 0;
  // Takes "mobile" out of the database.
  virtual void removeMobile() = 0;
};
using UserDatabasePort = Port<UserDatabaseUnderTest>;
class UserDatabaseContract : public Contract<UserDatabaseUnderTest> {};

TEST_P(UserDatabaseContract, KnowsMobile) {
  EXPECT_EQ(device->service().userIdentifierForName("mobile"), device->mobileUser());
  EXPECT_EQ(device->service().groupIdentifierForName("mobile"), device->mobileGroup());
}

TEST_P(UserDatabaseContract, DoesNotMistakeAnotherNameForOneItKnows) {
  for (const char* name : {"", "0", "mobil", "mobile2", "Mobile", "mobile:", "*"}) {
    SCOPED_TRACE(name);
    EXPECT_FALSE(device->service().userIdentifierForName(name).has_value());
    EXPECT_FALSE(device->service().groupIdentifierForName(name).has_value());
  }
}

TEST_P(UserDatabaseContract, KnowsNobodyWhoWasRemoved) {
  device->removeMobile();
  EXPECT_FALSE(device->service().userIdentifierForName("mobile").has_value());
  EXPECT_FALSE(device->service().groupIdentifierForName("mobile").has_value());
}

TEST_P(UserDatabaseContract, NamesAHomeDirectoryByItsWholePath) {
  const std::string home = device->service().homeDirectory();
  EXPECT_TRUE(home.starts_with("/")) << home;
  EXPECT_FALSE(home.ends_with("/")) << home;
}
