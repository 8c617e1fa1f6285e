#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>

#include "propertylist/Reading.h"
#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr int kReaders = 3;
constexpr int kSaves = 60;
constexpr int kAccounts = 40;

// The settings after the n-th save: every account holds n, and the file's length changes with it.
Array accountsOfSave(int n) {
  Array accounts;
  for (int i = 0; i < kAccounts; ++i)
    accounts.append(
        accountInfo("account " + std::to_string(i), "CalDAV",
                    {{"n", n}, {"filler", std::string(static_cast<std::size_t>(n), 'x')}}));
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
  int loads = 0;
  for (;;) {
    std::array<char, 1> byte{};
    const ssize_t got = ::read(pipe, byte.data(), byte.size());
    if (got == 0) ::_exit(loads > 0 ? 0 : 2);
    if (!isWhole(*ASSAccountsManager::init())) ::_exit(1);
    ++loads;
  }
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
  ::signal(SIGPIPE, SIG_IGN);  // a reader that found a torn file ends early
  const AccountsManagerPtr store = ASSAccountsManager::init();
  for (int n = 1; n <= kSaves; ++n) {
    for (const AccountPtr& account : *store->allBasicAccounts()) {
      account->setAccountPropertyForKey(n, "n");
      account->setAccountPropertyForKey(std::string(static_cast<std::size_t>(n), 'x'), "filler");
    }
    // One byte lets one reader load while this save goes on.
    ASSERT_EQ(::write(pipe[1], "..", 2), 2);
    store->saveAllAccounts();
  }
  ::close(pipe[1]);
  for (const pid_t reader : readers) {
    int status = 0;
    ASSERT_EQ(::waitpid(reader, &status, 0), reader);
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_NE(WEXITSTATUS(status), 1) << "a torn file was read";
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
