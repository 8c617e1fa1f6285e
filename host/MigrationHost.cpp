#include "host/MigrationHost.h"

#include <algorithm>
#include <cerrno>
#include <memory>
#include <system_error>
#include <utility>

#include "deviceimage/DeviceImageServices.h"
#include "deviceimage/ImageLock.h"
#include "deviceimage/RecordStores.h"
#include "deviceimage/SyncAgent.h"
#include "host/AccountComparison.h"
#include "host/DiscardedAccounts.h"
#include "host/MigratorChild.h"
#include "host/ProcessTree.h"
#include "host/RecordAccounting.h"
#include "host/SettingsFileCheck.h"
#include "host/StaleFiles.h"
#include "host/StartChecks.h"

namespace host {
namespace {

using deviceimage::DeviceImage;
using deviceimage::ImageLock;
using deviceimage::RecordStores;

// A report stays readable whatever a migrator writes; the image's system log has every line.
constexpr std::size_t kMaximumLogSize = std::size_t{64} << 20U;  // bytes

Selection selectionOf(const std::shared_ptr<const DeviceImage>& image,
                      const std::vector<MigratorBundle>& bundles) {
  const deviceimage::DeviceImageServices services(image);
  Selection selection;
  selection.statusKey = services.services().accountFramework.QuillnetStatusKey();
  for (const MigratorBundle& bundle : bundles)
    if (!bundle.retiredAccountTypes.empty())
      selection.rules.push_back({bundle.retiredAccountTypes, bundle.retiredServiceStatus});
  return selection;
}

// Of a run that ends with a legacy step that was not done.
RunOutcome outcomeAfter(Ending ending) {
  switch (ending) {
    case Ending::notLoaded:
    case Ending::notBegun:
      return RunOutcome::refused;
    case Ending::busy:
      return RunOutcome::busy;
    case Ending::raised:
    case Ending::crashed:
    case Ending::left:
    case Ending::timedOut:
      return RunOutcome::migratorFailed;
    case Ending::interrupted:
      return RunOutcome::interrupted;
    case Ending::succeeded:  // but there is no fit settings file
    case Ending::notNeeded:  // nor here
    case Ending::failed:
    case Ending::notStarted:
      return RunOutcome::failed;
  }
  return RunOutcome::failed;
}

void append(std::vector<std::string>& target, const std::vector<std::string>& added) {
  target.insert(target.end(), added.begin(), added.end());
}

AccountRights rightsOf(const std::vector<MigratorBundle>& bundles) {
  AccountRights rights;
  for (const MigratorBundle& bundle : bundles) {
    append(rights.correctedKeys, bundle.correctedAccountKeys);
    append(rights.mayBeAdded, bundle.addedAccountTypes);
    rights.mayBeDropped.push_back(bundle.unkeepableAccounts);
  }
  return rights;
}

}  // namespace

MigrationHost::MigrationHost(RunListener& listener, Interruption& interruption)
    : _listener(listener), _interruption(interruption) {}

MigrationReport MigrationHost::run(const RunOptions& options) {
  _report.image = options.image;
  const deviceimage::OpenedImage opened = DeviceImage::open(options.image);
  if (!opened.image) {
    _refuse(opened.error);
    return std::move(_report);
  }
  _image = opened.image;
  _report.image = _image->rootPath();
  const ImageLock::Attempt attempt = ImageLock::tryAcquire(*_image);
  switch (attempt.outcome) {
    case ImageLock::Outcome::held:
      _runUnderLock(options, attempt.lock->descriptor());
      break;
    case ImageLock::Outcome::heldByAnother:
      _report.outcome = RunOutcome::busy;
      _report.reasons.push_back(attempt.error);
      break;
    case ImageLock::Outcome::failed:
      _refuse(_report.image + " cannot be locked: " + attempt.error +
              "; give the right to write, or mount the image so that it can be written.");
      break;
  }
  return std::move(_report);
}

void MigrationHost::_refuse(std::string reason) {
  _report.outcome = RunOutcome::refused;
  _report.reasons.push_back(std::move(reason));
}

void MigrationHost::_runUnderLock(const RunOptions& options, int lockDescriptor) {
  _listener.stageBegan("Checking the image");
  if (!adoptOrphans())
    _refuse("The system does not let the host find what a migrator leaves running: " +
            std::generic_category().message(errno) +
            "; run the host outside of the sandbox that forbids it.");
  _readBundles(options);
  if (options.legacy && _report.reasons.empty() && !_migrateLegacy(options, lockDescriptor)) return;
  for (std::string& reason : reasonsNotToStart(*_image, readSettings(*_image), _bundles))
    _refuse(std::move(reason));
  if (!_report.reasons.empty()) return;
  // Opened once for all looks at the image before, and once for those after: a migrator may put
  // another file in a database's place.
  auto stores = std::make_unique<RecordStores>(_image, RecordStores::Access::readOnly);
  _leftAlone = findUnusableDatabases(_image, *stores);
  for (const UnusableDatabase& database : _leftAlone)
    if (database.mayPass) _refuse(_image->absolutePath(database.path) + ": " + database.why + ".");
  if (!_report.reasons.empty()) return;

  _listener.stageBegan("Looking at the image before");
  const Observation before = observe(*_image, *stores, _leftAlone);
  stores.reset();
  if (!before.error.empty()) return _refuse(before.error);
  const Selection selection = selectionOf(_image, _bundles);
  const deviceimage::SyncAgent agent(*_image);
  const bool isMadeAnew = _report.legacy && _report.legacy->hasMadeSettings();
  if (isMadeAnew)
    _leftWithoutAccount = leftByNewSettings(_report.legacy->settingsBefore, before.settings,
                                            _report.legacy->keptCopy);
  // What other services left behind on their own is no matter of this run.
  append(_leftWithoutAccount,
         recordsWithoutAccount(
             before, agent,
             isMadeAnew ? std::string_view() : deviceimage::SyncAgent::kQuillnetStorePrefix));
  removeStaleTemporaryFiles(*_image);
  _image->removeLeftovers();
  if (!_interruption.requested()) _runMigrators(options, lockDescriptor);
  rollBackLeftovers(_image, _leftAlone);

  _listener.stageBegan("Looking at the image after");
  stores = std::make_unique<RecordStores>(_image, RecordStores::Access::readOnly);
  const Observation after = observe(*_image, *stores, _leftAlone);
  _compare(before, after, newDamage(*_image, *stores, _leftAlone), selection, agent);
  _judge();
}

// False when the run ends here. What speaks against the settings file that is there does not count
// yet: it may be replaced.
bool MigrationHost::_migrateLegacy(const RunOptions& options, int lockDescriptor) {
  if (legacyNeedOf(*_image).any()) {
    for (std::string& reason : reasonsNotToStart(*_image, Settings{}, _bundles))
      _refuse(std::move(reason));
    if (!_report.reasons.empty()) return false;
    _listener.stageBegan("Migrating legacy settings");
    // The step itself refuses a migrator that is not to be trusted; nothing is written before.
    if (reasonsAgainstAccountMigrator(*_image).empty()) {
      removeStaleTemporaryFiles(*_image);
      _image->removeLeftovers();
    }
  }
  _report.legacy =
      runLegacyStep(*_image, {kMigrateLegacyArgument, lockDescriptor, options.limit, true},
                    _interruption, [this](std::string_view line) { _keepLogLine(line); });
  if (_report.legacy->isDone()) return true;
  append(_report.reasons, _report.legacy->reasons);
  _report.outcome = _interruption.requested()  ? RunOutcome::interrupted
                    : _report.legacy->migrator ? outcomeAfter(_report.legacy->migrator->ending)
                                               : RunOutcome::refused;
  return false;
}

void MigrationHost::_readBundles(const RunOptions& options) {
  std::vector<ReadBundle> read;
  if (options.bundle) {
    read.push_back(readMigratorBundle(*options.bundle));
  } else {
    read = readMigratorBundlesOfImage(*_image);
    read.insert(read.begin(), readInstalledMigratorBundle(options.installedMigrators));
  }
  for (ReadBundle& each : read) {
    for (std::string& problem : each.problems) _refuse(std::move(problem));
    if (each.bundle) _bundles.push_back(std::move(*each.bundle));
  }
}

void MigrationHost::_runMigrators(const RunOptions& options, int lockDescriptor) {
  for (const MigratorBundle& bundle : _bundles) {
    _listener.stageBegan("Running " + bundle.name);
    const MigratorTask task = {bundle.name,
                               {kRunMigratorArgument, _image->rootPath(), bundle.path,
                                bundle.executable, bundle.principalClass, joinedPaths(_leftAlone)},
                               _image->temporaryDirectory(),
                               lockDescriptor,
                               options.limit};
    MigratorOutcome outcome =
        runMigrator(task, _interruption, [this](std::string_view line) { _keepLogLine(line); });
    std::string sentence = sentenceFor(outcome);
    if (!sentence.empty()) _report.reasons.push_back(std::move(sentence));
    _report.migrators.push_back(std::move(outcome));
    if (_interruption.requested()) return;
  }
}

void MigrationHost::_keepLogLine(std::string_view line) {
  _listener.logLineCame(line);
  _report.logWasCut = _report.logWasCut || _logSize + line.size() > kMaximumLogSize;
  if (_report.logWasCut) return;
  _logSize += line.size() + sizeof(std::string);
  _report.log.emplace_back(line);
}

void MigrationHost::_compare(const Observation& before, const Observation& after,
                             const std::vector<std::string>& damage, const Selection& selection,
                             const deviceimage::SyncAgent& agent) {
  std::vector<std::string> contradictions;
  if (!after.error.empty()) contradictions.push_back(after.error);
  append(contradictions, checkSettingsFile(*_image, before.settings, after.settings));
  AccountComparison accounts = compareAccounts(before.settings.accounts, after.settings.accounts,
                                               selection, rightsOf(_bundles));
  _report.accounts = std::move(accounts.accounts);
  append(contradictions, accounts.contradictions);
  std::vector<std::string> leftBehind = std::move(_leftWithoutAccount);
  append(leftBehind, accounts.leftBehind);
  if (after.error.empty()) {
    RecordAccounting records = accountForRecords(before, after, selection, agent);
    _report.dataclasses = std::move(records.dataclasses);
    append(contradictions, records.contradictions);
    append(leftBehind, records.leftBehind);
  }
  append(contradictions, damage);
  for (const UnusableDatabase& database : _leftAlone)
    leftBehind.push_back(_image->absolutePath(database.path) + " was left alone: " + database.why +
                         ".");
  append(_report.reasons, contradictions);
  append(_report.reasons, leftBehind);
  _report.balanced = contradictions.empty();
  _isAnythingLeftBehind = !leftBehind.empty();
}

// The gravest of what has happened decides.
void MigrationHost::_judge() {
  const auto hasEnded = [this](std::initializer_list<Ending> endings) {
    return std::any_of(
        _report.migrators.begin(), _report.migrators.end(), [&](const MigratorOutcome& migrator) {
          return std::find(endings.begin(), endings.end(), migrator.ending) != endings.end();
        });
  };
  const bool noneWasLoaded =
      std::all_of(_report.migrators.begin(), _report.migrators.end(),
                  [](const MigratorOutcome& each) { return each.ending == Ending::notLoaded; });
  if (_interruption.requested())
    _report.outcome = RunOutcome::interrupted;
  else if (!_report.balanced)
    _report.outcome = RunOutcome::verificationFailed;
  else if (!_report.migrators.empty() && noneWasLoaded)
    _report.outcome = RunOutcome::refused;
  else if (hasEnded({Ending::notLoaded, Ending::raised, Ending::crashed, Ending::left,
                     Ending::timedOut}))
    _report.outcome = RunOutcome::migratorFailed;
  else if (hasEnded({Ending::failed, Ending::notStarted}))
    _report.outcome = RunOutcome::failed;
  else
    _report.outcome = _isAnythingLeftBehind ? RunOutcome::leftBehind : RunOutcome::done;
}

}  // namespace host
