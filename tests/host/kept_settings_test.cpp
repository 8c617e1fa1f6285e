// The copy of the settings file that a migration of legacy settings leaves.
#include "host/KeptSettings.h"

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "tests/deviceimage/TemporaryImage.h"

namespace host {
namespace {

namespace files = std::filesystem;
using Names = std::vector<std::string>;

class KeptSettingsOfAnImage : public testing::Test {
 protected:
  KeptSettingsOfAnImage() { write(settings(), "before"); }

  std::string settings() const { return image.image->settingsFile(); }
  std::string copy(const std::string& number) const {
    return settings() + ".before-migration-" + number;
  }
  static void write(const std::string& path, const std::string& content) {
    std::ofstream(path, std::fstream::binary) << content;
  }
  static std::string contentOf(const std::string& path) {
    std::ifstream stream(path, std::fstream::binary);
    return {std::istreambuf_iterator<char>(stream), {}};
  }
  // As a save does it.
  void replace() const {
    write(settings() + ".new", "after");
    files::rename(settings() + ".new", settings());
  }
  Names copies() const { return keptSettingsOf(*image.image); }

  deviceimage::TemporaryImage image;
};

TEST_F(KeptSettingsOfAnImage, AreAPrivateCopyBesideTheFile) {
  files::permissions(settings(), files::perms(0644));
  KeptSettings kept(*image.image);
  EXPECT_EQ(kept.error(), "");
  EXPECT_EQ(contentOf(copy("1")), "before");
  EXPECT_EQ(files::status(copy("1")).permissions(), files::perms(0600));
  replace();
  EXPECT_EQ(kept.settle(), SettingsFate::replaced);
  EXPECT_EQ(copies(), Names{copy("1")});
  EXPECT_EQ(contentOf(settings()), "after");
}

TEST_F(KeptSettingsOfAnImage, AreNotMadeWhereThereIsNoFile) {
  files::remove(settings());
  KeptSettings kept(*image.image);
  EXPECT_EQ(kept.error(), "");
  EXPECT_EQ(kept.settle(), SettingsFate::untouched);
  EXPECT_FALSE(files::exists(settings()));
  EXPECT_EQ(copies(), Names());
}

TEST_F(KeptSettingsOfAnImage, CountAFileThatComesNewAsReplaced) {
  files::remove(settings());
  KeptSettings kept(*image.image);
  replace();
  EXPECT_EQ(kept.settle(), SettingsFate::replaced);
}

TEST_F(KeptSettingsOfAnImage, GoWhenTheFileIsUntouched) {
  KeptSettings kept(*image.image);
  EXPECT_EQ(kept.settle(), SettingsFate::untouched);
  EXPECT_EQ(copies(), Names());
}

TEST_F(KeptSettingsOfAnImage, OfAnEarlierMigrationStay) {
  write(copy("1"), "earlier");
  write(copy("3"), "before");
  files::permissions(copy("3"), files::perms(0600));
  KeptSettings kept(*image.image);
  EXPECT_EQ(copies(), (Names{copy("1"), copy("3")}));  // the third does
  EXPECT_EQ(kept.settle(), SettingsFate::untouched);
  EXPECT_EQ(copies(), (Names{copy("1"), copy("3")}));
}

TEST_F(KeptSettingsOfAnImage, AreMadeAnewWhereOthersMayReadTheEqualOne) {
  write(copy("1"), "before");
  files::permissions(copy("1"), files::perms(0666));
  const KeptSettings kept(*image.image);
  EXPECT_EQ(copies(), (Names{copy("1"), copy("2")}));
  EXPECT_EQ(files::status(copy("2")).permissions(), files::perms(0600));
}

TEST_F(KeptSettingsOfAnImage, AreRegularFilesOnly) {
  files::create_directory(copy("1"));
  files::create_symlink(settings(), copy("2"));
  const KeptSettings kept(*image.image);
  EXPECT_EQ(copies(), Names{copy("3")});
}

TEST_F(KeptSettingsOfAnImage, ArePutBackFromTheNewestWhenAKilledRunHasLeftNoFile) {
  write(copy("1"), "newest");
  write(copy("2"), "earlier");
  files::last_write_time(copy("2"), files::last_write_time(copy("1")) - std::chrono::hours(1));
  files::remove(settings());
  KeptSettings kept(*image.image);
  EXPECT_EQ(kept.settle(), SettingsFate::putBack);
  EXPECT_EQ(contentOf(settings()), "newest");
  EXPECT_EQ(copies(), (Names{copy("1"), copy("2")}));
}

TEST_F(KeptSettingsOfAnImage, ArePutBackAsTheyWereWhenTheyWereCopied) {
  KeptSettings kept(*image.image, false);
  EXPECT_EQ(copies(), Names());
  replace();
  EXPECT_EQ(keepSettings(*image.image), "");
  files::remove(settings());
  EXPECT_EQ(kept.settle(), SettingsFate::putBack);
  EXPECT_EQ(contentOf(settings()), "after");
  EXPECT_EQ(copies(), Names());
}

TEST_F(KeptSettingsOfAnImage, TakeTheFirstFreeNumber) {
  write(copy("1"), "earlier");
  write(copy("3"), "much earlier");
  const KeptSettings kept(*image.image);
  EXPECT_EQ(contentOf(copy("2")), "before");
}

TEST_F(KeptSettingsOfAnImage, DoNotIncludeWhatOnlyHasASimilarName) {
  for (const char* const other : {"01", "0", "", "x", "1x", "-1", "99999999999"})
    write(copy(other), "before");
  const KeptSettings kept(*image.image);
  EXPECT_EQ(copies(), Names{copy("1")});
}

TEST_F(KeptSettingsOfAnImage, ArePutBackWhenTheFileIsGone) {
  KeptSettings kept(*image.image);
  files::remove(settings());
  EXPECT_EQ(kept.settle(), SettingsFate::putBack);
  EXPECT_EQ(contentOf(settings()), "before");
  EXPECT_EQ(files::status(settings()).permissions(), files::perms(0600));
  EXPECT_EQ(copies(), Names());
}

// No file may grow, as on a full disk.
void forbidWriting() {
  std::signal(SIGXFSZ, SIG_IGN);
  const rlimit none = {0, RLIM_INFINITY};
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &none), 0);
}
void allowWriting() {
  const rlimit all = {RLIM_INFINITY, RLIM_INFINITY};
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &all), 0);
}

TEST_F(KeptSettingsOfAnImage, StayWhenTheFileIsGoneAndCannotBePutBack) {
  KeptSettings kept(*image.image);
  files::remove(settings());
  forbidWriting();
  const SettingsFate fate = kept.settle();
  allowWriting();
  EXPECT_EQ(fate, SettingsFate::lost);
  EXPECT_EQ(contentOf(copy("1")), "before");
}

TEST_F(KeptSettingsOfAnImage, ThatCannotBeMadeAreAnError) {
  forbidWriting();
  const KeptSettings kept(*image.image);
  allowWriting();
  EXPECT_NE(kept.error().find("File too large"), std::string::npos) << kept.error();
  EXPECT_EQ(copies(), Names());
  EXPECT_EQ(contentOf(settings()), "before");
}

TEST_F(KeptSettingsOfAnImage, OfAFileThatIsALinkAreAnError) {
  files::rename(settings(), settings() + ".away");
  files::create_symlink(settings() + ".away", settings());
  EXPECT_NE(KeptSettings(*image.image).error(), "");
  EXPECT_EQ(copies(), Names());
}

}  // namespace
}  // namespace host
