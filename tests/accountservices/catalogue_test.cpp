// The shipped catalogue of account creators and the built services belong together.

#include <set>

#include "propertylist/Writing.h"
#include "tests/accountservices/ServicesImage.h"

namespace accountservices {
namespace {

using Catalogue = ServicesTest;

// Whether the class can do what an entry of this type asks of it.
bool offers(platform::RuntimeClass* found, const std::string& entryType) {
  using namespace accountsettings;
  if (entryType == "FullAccount")
    return dynamic_cast<FullAccountClassCreator*>(found) != nullptr ||
           dynamic_cast<FullAccountCreator*>(found) != nullptr;
  if (entryType == "SyncAccount") return dynamic_cast<SyncAccountCreator*>(found) != nullptr;
  return dynamic_cast<AccountChangesNotifier*>(found) != nullptr &&
         dynamic_cast<AccountWillChangeNotifier*>(found) != nullptr &&
         dynamic_cast<AccountDidChangeNotifier*>(found) != nullptr;
}

TEST_F(Catalogue, NamesClassesThatTheServicesRegister) {
  const propertylist::FileReadResult read =
      propertylist::readPropertyListFile(std::string(SHIPPED_RESOURCES) + "/AccountCreators.plist");
  std::set<std::string> bundles;
  int entries = 0;
  for (const Dictionary::Entry& type : *read.value->asDictionary()) {
    for (const propertylist::Value& value : *type.value().asArray()) {
      const Dictionary& entry = *value.asDictionary();
      const Dictionary& description = *propertylist::findDictionary(entry, "Description");
      const std::string framework = *propertylist::findString(description, "Framework");
      SCOPED_TRACE(std::string(type.key()) + ", " + propertylist::describe(entry));
      bundles.insert(framework);
      const auto failed =
          image.services().classRegistry.loadLibrary(image.root() + "/" + framework);
      EXPECT_EQ(failed, std::nullopt);
      platform::RuntimeClass* const found =
          platform::registeredClass(*propertylist::findString(description, "Class"));
      EXPECT_TRUE(offers(found, *propertylist::findString(entry, "Type")));
      ++entries;
    }
  }
  EXPECT_EQ(bundles, (std::set<std::string>{"System/Library/AccountServices/CalendarService.so",
                                            "System/Library/AccountServices/ContactsService.so",
                                            "System/Library/AccountServices/DeviceService.so",
                                            "System/Library/AccountServices/MailService.so"}));
  EXPECT_EQ(entries, 40);
}

}  // namespace
}  // namespace accountservices
