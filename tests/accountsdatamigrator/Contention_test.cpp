// Processes that migrate one image at the same time, and one that is killed meanwhile.
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>

#include "tests/accountsdatamigrator/LegacyImage.h"

namespace accountsdatamigrator {
namespace {

class Contention : public LegacyTest {
 protected:
  // A process of its own over the image; `beforeLine` sees each log line before it is written.
  pid_t start(const std::function<void(std::string_view)>& beforeLine) const {
    const pid_t process = ::fork();
    if (process != 0) return process;
    deviceimage::ServiceOptions options;
    options.logSink = beforeLine;
    const deviceimage::DeviceImageServices services(
        deviceimage::DeviceImage::open(image.root()).image, options);
    platform::install(services.services());
    migrate();
    ::_exit(0);
  }
  static int endOf(pid_t process) {
    int status = -1;
    ::waitpid(process, &status, 0);
    return status;
  }
  // How many lines of the image's log have the text in them.
  std::size_t count(const std::string& text) const {
    const std::string log = *bytesOf("var/log/system.log");
    std::size_t found = 0;
    for (std::size_t at = log.find(text); at != std::string::npos; at = log.find(text, at + 1))
      ++found;
    return found;
  }
};

// Both have decided that there is something to do before either goes on.
TEST_F(Contention, EndsWithNothingDoneTwice) {
  write(kSettingsFile, {{"Version", 11}, {"Accounts", Array{Dictionary{{"Type", "LDAP"}}}}});
  int decided[2];
  int go[2];
  ASSERT_EQ(::pipe(decided), 0);
  ASSERT_EQ(::pipe(go), 0);
  const auto meetAfterFirstDecision = [&](std::string_view line) {
    static bool met = false;
    if (met || !line.starts_with("Accounts settings needs migration!")) return;
    met = true;
    char letter = 0;
    if (::write(decided[1], "d", 1) != 1 || ::read(go[0], &letter, 1) != 1) ::_exit(1);
  };
  const pid_t first = start(meetAfterFirstDecision);
  const pid_t second = start(meetAfterFirstDecision);
  char letters[2];
  ASSERT_EQ(::read(decided[0], letters, 1), 1);
  ASSERT_EQ(::read(decided[0], letters, 1), 1);
  ASSERT_EQ(::write(go[1], "gg", 2), 2);
  EXPECT_EQ(endOf(first), 0);
  EXPECT_EQ(endOf(second), 0);
  EXPECT_EQ(count("AccountMigrator: brought "), 1U);
  EXPECT_EQ(count("Accounts settings needs migration!"), 3U);  // the later one's second saw nothing
  EXPECT_EQ(count("Accounts migration failed"), 0U);
  EXPECT_EQ(accounts().size(), 1U);
}

// Legacy files stay, so the second migrates again; what it makes is the same.
TEST_F(Contention, OverLegacyFilesEndsWithEachAccountOnce) {
  write(kMailFile, {{"MailAccounts", Array{Dictionary{{"Class", "IMAPAccount"}}}}});
  const auto ignore = [](std::string_view) {};
  const pid_t first = start(ignore);
  const pid_t second = start(ignore);
  EXPECT_EQ(endOf(first), 0);
  EXPECT_EQ(endOf(second), 0);
  const auto both = bytesOf(kSettingsFile);
  migrate();
  EXPECT_EQ(bytesOf(kSettingsFile), both);
  EXPECT_EQ(accounts().size(), 1U);
}

TEST_F(Contention, AKilledMigratorLeavesTheLegacyFilesAndARunAfterItCompletes) {
  write(kMailFile, {{"MailAccounts",
                     Array{Dictionary{{"Class", "Other"}}, Dictionary{{"Class", "IMAPAccount"}}}}});
  write(kSettingsFile, {{"Version", 12}, {"Accounts", Array()}});
  const auto legacy = bytesOf(kMailFile);
  // The line of the entry that is left out comes while the accounts are built.
  const pid_t killed = start([](std::string_view line) {
    if (line.find("is left out") != std::string_view::npos) ::raise(SIGKILL);
  });
  EXPECT_TRUE(WIFSIGNALED(endOf(killed)));
  EXPECT_EQ(bytesOf(kMailFile), legacy);
  EXPECT_EQ(bytesOf(kSettingsFile), std::nullopt);
  migrate();
  EXPECT_EQ(accounts().size(), 1U);
  EXPECT_EQ(bytesOf(kMailFile), legacy);
  EXPECT_EQ(temporaryFiles(), Lines());
}

}  // namespace
}  // namespace accountsdatamigrator
