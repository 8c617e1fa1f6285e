#include <gtest/gtest.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

using platform::Status;

constexpr int kReaders = 2;
constexpr int kSaves = 100;
constexpr int kAccounts = 4;

// The settings after the n-th save: every account holds n, and the file is large enough to take a
// while to write and changes its length every time.
Dictionary accountOfSave(int i, int n) {
  return accountInfo("account " + std::to_string(i), "CalDAV",
                     {{"n", n}, {"filler", std::string(static_cast<std::size_t>(50000 + n), 'x')}});
}

Array accountsOfSave(int n) {
  Array accounts;
  for (int i = 0; i < kAccounts; ++i) accounts.append(accountOfSave(i, n));
  return accounts;
}

bool isWhole(const ASSAccountsManager& store) {
  if (store.count() != kAccounts || store.dataVersion() != 12) return false;
  const Value n = *(*store.allBasicAccounts())[0]->accountPropertyForKey("n");
  for (const AccountPtr& account : *store.allBasicAccounts()) {
    if (*account->accountPropertyForKey("n") != n) return false;
  }
  return true;
}

// Loads over and over until the pipe's other end is closed; 0 when every load was whole.
[[noreturn]] void readUntilClosed(int pipe) {
  pollfd end = {pipe, POLLIN, 0};
  do {
    if (!isWhole(*ASSAccountsManager::init())) ::_exit(1);
  } while (::poll(&end, 1, 0) == 0);
  ::_exit(0);
}

// Loads the settings after every call of a save.
class LoadingBetweenCalls : public platform::JournaledFileServices {
 public:
  Opened createPrivateFile(const std::string& path) override {
    return _checked(JournaledFileServices::createPrivateFile(path));
  }
  Status writeAll(int descriptor, std::span<const std::uint8_t> bytes) override {
    return _checked(JournaledFileServices::writeAll(descriptor, bytes));
  }
  Status setOwner(int descriptor, uid_t user, gid_t group) override {
    return _checked(JournaledFileServices::setOwner(descriptor, user, group));
  }
  Status makePrivate(int descriptor) override {
    return _checked(JournaledFileServices::makePrivate(descriptor));
  }
  Status synchronizeFile(int descriptor) override {
    return _checked(JournaledFileServices::synchronizeFile(descriptor));
  }
  Status checkName(int descriptor, const std::string& path) override {
    return _checked(JournaledFileServices::checkName(descriptor, path));
  }
  Status closeFile(int descriptor) override {
    return _checked(JournaledFileServices::closeFile(descriptor));
  }
  Status renameFileToFile(const std::string& from, const std::string& to) override {
    return _checked(JournaledFileServices::renameFileToFile(from, to));
  }
  Status synchronizeDirectoryOfFile(const std::string& path) override {
    return _checked(JournaledFileServices::synchronizeDirectoryOfFile(path));
  }
  std::vector<Value> seen;  // the "n" of the first account, after each call

 private:
  template <typename Outcome>
  Outcome _checked(Outcome outcome) {
    const AccountsManagerPtr store = ASSAccountsManager::init();
    EXPECT_TRUE(isWhole(*store));
    seen.push_back(*(*store->allBasicAccounts())[0]->accountPropertyForKey("n"));
    return outcome;
  }
};

TEST(SavingConcurrency, BetweenAnyTwoStepsOfASaveTheFileIsWhole) {
  AccountsDevice device;
  device.writeAccounts(accountsOfSave(1));
  LoadingBetweenCalls files;
  device.use<platform::FileServices>(files);
  const AccountsManagerPtr store = ASSAccountsManager::init();
  for (const AccountPtr& account : *store->allBasicAccounts())
    account->setAccountPropertyForKey(2, "n");
  store->saveAllAccounts();
  EXPECT_EQ(files.seen, (std::vector<Value>{1, 1, 1, 1, 1, 1, 1, 2, 2}));
  device.use<platform::FileServices>(device.fileServices);
}

TEST(SavingConcurrency, ReadersInOtherProcessesMeetTheOldOrTheNewFileWhole) {
  AccountsDevice device;
  device.writeAccounts(accountsOfSave(0));
  std::array<int, 2> pipe{};
  ASSERT_EQ(::pipe(pipe.data()), 0);
  std::array<pid_t, kReaders> readers{};
  for (pid_t& reader : readers) {
    reader = ::fork();
    ASSERT_GE(reader, 0);
    if (reader == 0) {
      ::close(pipe[1]);
      readUntilClosed(pipe[0]);
    }
  }
  ::close(pipe[0]);
  const AccountsManagerPtr store = ASSAccountsManager::init();
  for (int n = 1; n <= kSaves; ++n) {
    for (int i = 0; i < kAccounts; ++i) {
      const AccountPtr account = (*store->allBasicAccounts())[static_cast<std::size_t>(i)];
      account->properties() = accountOfSave(i, n);
    }
    store->saveAllAccounts();
  }
  ::close(pipe[1]);
  for (const pid_t reader : readers) {
    int status = -1;
    ASSERT_EQ(::waitpid(reader, &status, 0), reader);
    EXPECT_EQ(status, 0) << "a torn file was read";
  }
  EXPECT_EQ(device.savedAccounts(), accountsOfSave(kSaves));
  EXPECT_EQ(device.temporaryFiles(), Lines());
  EXPECT_EQ(device.logLines(), Lines());
}

TEST(SavingConcurrency, SaversOfDifferentAccountsInTurnLeaveEveryChange) {
  AccountsDevice device;
  device.writeAccounts({accountInfo("1"), accountInfo("2"), accountInfo("3")});
  Array expected;
  for (const char* identifier : {"1", "2", "3"}) {
    const pid_t saver = ::fork();
    ASSERT_GE(saver, 0);
    if (saver == 0) {
      const AccountsManagerPtr store = ASSAccountsManager::init();
      store->accountWithIdentifier(identifier)->setAccountPropertyForKey(identifier, "saved by");
      store->saveAllAccounts();
      ::_exit(0);
    }
    int status = 1;
    ASSERT_EQ(::waitpid(saver, &status, 0), saver);
    EXPECT_EQ(status, 0);
    expected.append(accountInfo(identifier, "CalDAV", {{"saved by", identifier}}));
  }
  EXPECT_EQ(device.savedAccounts(), expected);
}

}  // namespace
}  // namespace accountsettings
