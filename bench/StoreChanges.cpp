#include "bench/StoreChanges.h"

#include <fstream>
#include <iterator>
#include <stdexcept>

#include "bench/Accounts.h"
#include "propertylist/Writing.h"

namespace bench {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::size_t kOneIn = 100;
constexpr std::size_t kElsewhere = 3;  // so that no account is changed in both places
constexpr const char* kChanged = "changed in memory";

}  // namespace

void changeSome(accountsettings::ASSAccountsManager& store) {
  const auto accounts = store.allBasicAccounts();
  for (std::size_t i = 0; i < accounts->size(); i += kOneIn)
    (*accounts)[i]->setAccountPropertyForKey(kChanged, "DisplayName");
}

propertylist::Bytes changedElsewhere(std::size_t accounts) {
  const Dictionary root = settings(accounts);
  Array list = *propertylist::findArray(root, "Accounts");
  for (std::size_t i = kElsewhere; i < list.size(); i += kOneIn) {
    Dictionary account = *list[i].asDictionary();
    account.set("Username", "changed@example.com");
    list.replace(i, std::move(account));
  }
  const auto bytes = propertylist::writeBinaryPropertyList(
      Dictionary{{"Version", 12}, {"Accounts", std::move(list)}});
  if (!bytes) throw std::runtime_error("the changed settings have no binary form");
  return *bytes;
}

void writeFile(const std::string& path, const propertylist::Bytes& bytes) {
  std::ofstream file(path, std::fstream::binary | std::fstream::trunc);
  file.write(reinterpret_cast<const char*>(bytes.data()),
             static_cast<std::streamsize>(bytes.size()));
  if (!file.flush()) throw std::runtime_error("cannot write " + path);
}

// A text of plain ASCII lies in a binary list as it is.
bool holdsChanges(const std::string& path) {
  std::ifstream file(path, std::fstream::binary);
  const std::string bytes{std::istreambuf_iterator<char>(file), {}};
  return bytes.find(kChanged) != std::string::npos;
}

}  // namespace bench
