// What it costs to load a store of accounts, to ask and change it, and to save it.
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <algorithm>
#include <memory>
#include <random>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "bench/Device.h"
#include "bench/Rows.h"
#include "bench/StoreChanges.h"
#include "platform/posix/PosixFileServices.h"

namespace bench {
namespace {

using accountsettings::AccountArray;
using accountsettings::AccountPtr;
using accountsettings::AccountsManagerPtr;
using accountsettings::ASSAccountsManager;
using accountsettings::ASSBasicAccount;

constexpr std::uint64_t kSeed = 20261122;

// A store of the settings with so many accounts.
AccountsManagerPtr loadedStore(const Document& document) {
  device().settingsFile.settings = document.binary;
  return ASSAccountsManager::init();
}

void load(benchmark::State& state, const Document& document) {
  device().settingsFile.settings = document.binary;
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(ASSAccountsManager::init());
}

// Reads the file anew, merges each account three ways and writes; nothing is flushed.
void save(benchmark::State& state, const Document& document) {
  const propertylist::Bytes elsewhere = changedElsewhere(document.accounts);
  for ([[maybe_unused]] auto iteration : state) {
    state.PauseTiming();
    AccountsManagerPtr store = loadedStore(document);
    changeSome(*store);
    device().settingsFile.settings = elsewhere;
    device().settingsFile.savesCount = 0;
    state.ResumeTiming();
    store->saveAllAccounts();
    state.PauseTiming();
    if (device().settingsFile.savesCount != 1) return state.SkipWithError("not saved");
    store.reset();
    state.ResumeTiming();
  }
}

void queryIdentifiers(benchmark::State& state, const Document& document) {
  const AccountsManagerPtr store = loadedStore(document);
  std::vector<std::string> identifiers;
  for (const AccountPtr& account : *store->allBasicAccounts())
    identifiers.push_back(account->identifier().value_or(""));
  for ([[maybe_unused]] auto iteration : state) {
    for (const std::string& identifier : identifiers)
      benchmark::DoNotOptimize(store->accountWithIdentifier(identifier));
  }
}

void queryTypes(benchmark::State& state, const Document& document) {
  const AccountsManagerPtr store = loadedStore(document);
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(store->basicAccountsWithTypes({"Exchange", "Gmail"}));
}

void queryChildren(benchmark::State& state, const Document& document) {
  const AccountsManagerPtr store = loadedStore(document);
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(store->allBasicSyncableAccounts());
}

// Every account on its own, in the order that `arrange` gives them.
template <typename Arrange>
void deleteAll(benchmark::State& state, const Document& document, const Arrange& arrange) {
  for ([[maybe_unused]] auto iteration : state) {
    state.PauseTiming();
    AccountsManagerPtr store = loadedStore(document);
    AccountArray accounts = *store->allBasicAccounts();
    arrange(accounts);
    state.ResumeTiming();
    for (const AccountPtr& account : accounts) store->deleteAccount(account);
    state.PauseTiming();
    if (store->count() != 0) return state.SkipWithError("some are left");
    store.reset();
    accounts.clear();  // ours, and not what a deletion costs
    state.ResumeTiming();
  }
}

void deleteFromTheEnd(benchmark::State& state, const Document& document) {
  deleteAll(state, document,
            [](AccountArray& accounts) { std::reverse(accounts.begin(), accounts.end()); });
}

// A deletion walks over what stands behind the account. Every run has the same order.
void deleteInAnyOrder(benchmark::State& state, const Document& document) {
  deleteAll(state, document, [](AccountArray& accounts) {
    std::shuffle(accounts.begin(), accounts.end(), std::mt19937_64(kSeed));
  });
}

// All accounts of three types, some thousands of ten thousand, by others in one call.
void replaceTypes(benchmark::State& state, const Document& document) {
  const accountsettings::StringList types = {"Exchange", "Gmail", "CalDAV"};
  for ([[maybe_unused]] auto iteration : state) {
    state.PauseTiming();
    AccountsManagerPtr store = loadedStore(document);
    AccountArray replacements;
    for (const AccountPtr& account : store->basicAccountsWithTypes(types))
      replacements.push_back(ASSBasicAccount::initWithProperties(account->properties()));
    state.ResumeTiming();
    store->replaceAccountsWithTypesWithAccounts(types, replacements);
    state.PauseTiming();
    store.reset();
    replacements.clear();
    state.ResumeTiming();
  }
}

// The save with real files: read, written, flushed to the disk and moved into place. Each has file
// services of its own, as a process has: they remember a small file that they read before.
void saveDurably(benchmark::State& state, const Document& document) {
  const propertylist::Bytes elsewhere = changedElsewhere(document.accounts);
  for ([[maybe_unused]] auto iteration : state) {
    state.PauseTiming();
    AccountsManagerPtr store = loadedStore(document);
    changeSome(*store);
    writeFile(device().settingsPath(), elsewhere);
    ::sync();
    auto files = std::make_unique<platform::PosixFileServices>();
    device().use(*files);
    state.ResumeTiming();
    store->saveAllAccounts();
    state.PauseTiming();
    device().use(device().settingsFile);
    if (!holdsChanges(device().settingsPath())) return state.SkipWithError("not saved");
    store.reset();
    files.reset();
    state.ResumeTiming();
  }
}

// The file system's part of it.
void writeDurably(benchmark::State& state, const Document& document) {
  platform::PosixFileServices files;
  const std::string target = device().root() + "/settings";
  for ([[maybe_unused]] auto iteration : state) {
    state.PauseTiming();
    ::sync();
    state.ResumeTiming();
    const auto opened = files.createPrivateFile(target + ".new");
    const bool isWritten = files.writeAll(opened.descriptor, document.binary).isSuccess() &&
                           files.synchronizeFile(opened.descriptor).isSuccess() &&
                           files.closeFile(opened.descriptor).isSuccess() &&
                           files.renameFileToFile(target + ".new", target).isSuccess() &&
                           files.synchronizeDirectoryOfFile(target).isSuccess();
    if (!isWritten) return state.SkipWithError("not written");
  }
}

}  // namespace
}  // namespace bench

int main(int argc, char** argv) {
  using namespace bench;
  return runRows(argc, argv, [] {
    addRows("load/read alone", readBinary);
    addRows("load/own", load);
    addRows("save/own", save);
    addRows("query identifiers/own", queryIdentifiers);
    addRows("query types/own", queryTypes);
    addRows("list children/own", queryChildren);
    addRows("delete from the end/own", deleteFromTheEnd);
    addRows("delete in any order/own", deleteInAnyOrder);
    addRows("replace types/own", replaceTypes);
    addRows("durable save/own", saveDurably);
    addRows("durable save/file alone", writeDurably);
  });
}
