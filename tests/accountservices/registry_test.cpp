// One registry of classes for everybody in the process, whose bundles stay loaded.

#include <dlfcn.h>
#include <unistd.h>

#include <cstdlib>

#include "tests/accountservices/ServicesImage.h"
#include "tests/accountservices/bundles/StorePlugin.h"

namespace accountservices {
namespace {

using Registry = ServicesTest;

bool isLoaded(const std::string& path) {
  void* const handle = ::dlopen(path.c_str(), RTLD_NOW | RTLD_NOLOAD);
  if (handle != nullptr) ::dlclose(handle);
  return handle != nullptr;
}

constexpr const char* kMailNotifier = "MailServiceNotifier";

// Runs when the objects of the bundles that were loaded after it was registered have been
// destroyed.
void useTheMailNotifierAtExit() {
  platform::RuntimeClass* const found = platform::registeredClass(kMailNotifier);
  const bool works = found != nullptr && found->className() == kMailNotifier &&
                     dynamic_cast<accountsettings::AccountChangesNotifier*>(found) != nullptr;
  ::_exit(works ? 17 : 1);
}

void tellOfNothing(std::string_view className) {
  auto* const notifier =
      dynamic_cast<accountsettings::AccountChangesNotifier*>(platform::registeredClass(className));
  ASSERT_NE(notifier, nullptr);
  notifier->noteAccountChanges(Array{Dictionary{{"ChangeType", 0}}});
}

StorePlugin& loadedPlugin(const ServicesImage& image) {
  const auto failed = image.services().classRegistry.loadLibrary(STORE_PLUGIN);
  if (failed) throw std::runtime_error(*failed);
  return dynamic_cast<StorePlugin&>(*platform::registeredClass("StorePlugin"));
}

TEST_F(Registry, IsOneForAPluginAndTheProcessThatLoadedIt) {
  StorePlugin& plugin = loadedPlugin(image);
  image.writeAccounts({account("1", "CalDAV", kCalendars)});
  EXPECT_EQ(platform::registeredClass("CalendarServiceNotifier"), nullptr);
  plugin.renameAndNotify("1", "by the plug-in");
  EXPECT_TRUE(plugin.refresh("1", kCalendars));
  platform::RuntimeClass* const found = platform::registeredClass("CalendarServiceNotifier");
  ASSERT_NE(found, nullptr);
  EXPECT_EQ(plugin.classNamed("CalendarServiceNotifier"), found);
  // The library in this program finds the bundles that the plug-in loaded, and its classes.
  const auto store = ASSAccountsManager::init();
  EXPECT_TRUE(store->accountWithIdentifier("1")->refreshContainersForDataclass(kCalendars));
  ASSAccountsManager::accountDidChangeForDataclass(store->accountWithIdentifier("1"), kCalendars);
  EXPECT_EQ(platform::registeredClass("CalendarServiceNotifier"), found);
  EXPECT_EQ(image.changes().size(), 2U);
  EXPECT_EQ(image.refreshes().size(), 2U);
}

TEST_F(Registry, IsAllThatCopiesOfTheLibraryShare) {
  StorePlugin& plugin = loadedPlugin(image);
  const auto store = storeOf({account("1", "CalDAV", kCalendars)});
  // This copy has read its catalogue; the plug-in's finds another one.
  EXPECT_TRUE(store->accountWithIdentifier("1")->refreshContainersForDataclass(kCalendars));
  image.addNotifier("Absent.so", "Absent");
  const std::string path = image.bundlePath("Absent.so");
  expectFailure("Could not load the account creator framework " + path + ". Error " + path +
                    ": cannot open shared object file: No such file or directory",
                [&] { plugin.renameAndNotify("1", "by the plug-in"); });
  // The plug-in cleared a flag of its own.
  rename(*store, "1");
  store->saveAllAccounts();
  EXPECT_EQ(image.changes(), Lines{});
  speak();
  store->saveAllAccounts();
  EXPECT_EQ(image.changes().size(), 1U);
}

TEST_F(Registry, AnswersAClassThatWorksUntilTheProcessIsGone) {
  EXPECT_EXIT(
      {
        std::atexit(useTheMailNotifierAtExit);
        image.services().classRegistry.loadLibrary(image.bundlePath("MailService.so"));
        std::exit(0);
      },
      testing::ExitedWithCode(17), "");
}

TEST_F(Registry, KeepsTheServicesLoadedWhoeverClosesThem) {
  const std::string path = image.bundlePath("MailService.so");
  void* const handle = ::dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  ASSERT_NE(handle, nullptr) << ::dlerror();
  ::dlclose(handle);
  EXPECT_TRUE(isLoaded(path));
  tellOfNothing(kMailNotifier);
  EXPECT_EQ(
      image.changes(),
      Lines{R"({"notifier": "MailServiceNotifier", "record": 1, "of": 1, "change": "added"})"});
}

TEST_F(Registry, KeepsEveryBundleLoadedThatItLoaded) {
  // This one does not ask the loader to stay.
  image.addBundle("Faulty.so", FAULTY_NOTIFIERS);
  const std::string path = image.bundlePath("Faulty.so");
  ASSERT_EQ(image.services().classRegistry.loadLibrary(path), std::nullopt);
  void* const handle = ::dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  ASSERT_NE(handle, nullptr) << ::dlerror();
  ::dlclose(handle);
  EXPECT_TRUE(isLoaded(path));
  EXPECT_EQ(platform::registeredClass("RaisingNotifier")->className(), "RaisingNotifier");
}

}  // namespace
}  // namespace accountservices
