#include "tools/account-settings/Change.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <nlohmann/json.hpp>
#include <optional>

#include "deviceimage/ImageLock.h"
#include "platform/InternalConsistencyFailure.h"
#include "tools/account-settings/BundleTrust.h"
#include "tools/account-settings/Differences.h"
#include "tools/account-settings/ImageAccess.h"
#include "tools/account-settings/Oddities.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/Images.h"
#include "tools/common/Installation.h"
#include "tools/common/Program.h"
#include "tools/common/Text.h"

namespace tools {
namespace {

using accountsettings::ASSAccountsManager;
using deviceimage::DeviceImage;
using deviceimage::ImageLock;

void refuseLossySave(const AccountStore& store) {
  std::vector<std::string> problems;
  for (const Oddity& oddity : findOddities(store.root()))
    if (oddity.effect == Oddity::Effect::lost) problems.push_back(describe(oddity));
  if (problems.empty()) return;
  throw CommandFailure(
      ExitCode::imageDamaged,
      fmt::format("{}: {}{}; nothing was changed, since a save would lose it; account-settings "
                  "validate --image {} lists all; mend the file with account-settings convert",
                  store.image().settingsFile(), problems.front(),
                  problems.size() > 1 ? fmt::format(" (and {} more)", problems.size() - 1) : "",
                  store.image().rootPath()));
}

// Tells one file at the settings file's place from another that was moved there later.
struct FileIdentity {
  ino_t number = 0;
  timespec written = {};
  bool operator==(const FileIdentity& other) const {
    return number == other.number && written.tv_sec == other.written.tv_sec &&
           written.tv_nsec == other.written.tv_nsec;
  }
};

FileIdentity settingsFileIdentity(const DeviceImage& image) {
  const deviceimage::OpenedFile file = image.openFile(DeviceImage::kSettingsFile, O_RDONLY);
  struct stat status {};
  if (file.descriptor < 0) return {};
  ::fstat(file.descriptor, &status);
  ::close(file.descriptor);
  return {status.st_ino, status.st_mtim};
}

// The line with which the library says that a save failed; empty when it did not.
std::optional<std::string> failureLine(const AccountStore& store) {
  const auto& lines = store.logLines();
  const auto line = std::find_if(lines.rbegin(), lines.rend(), [](const std::string& text) {
    return text.starts_with("Failed to save accounts to filesystem.");
  });
  return line != lines.rend() ? std::optional(*line) : std::nullopt;
}

[[noreturn]] void failUnsaved(const AccountStore& store, const std::string& reason) {
  throw CommandFailure(
      ExitCode::unexpectedFailure,
      fmt::format("{}: the accounts were not saved, the file is as it was: {} See that {} and the "
                  "file's folder can be written, that there is room, and that {} has the user "
                  "\"mobile\", then repeat the command",
                  store.image().settingsFile(), reason, store.image().temporaryDirectory(),
                  store.image().absolutePath(DeviceImage::kUsersFile)));
}

// What a notifier, or the library on its way to one, raised.
std::optional<std::string> raisedBySaving(AccountStore& store) {
  try {
    store.manager().saveAllAccounts();
  } catch (const platform::InternalConsistencyFailure& failure) {
    return fmt::format("{} ({}, line {})", failure.what(), failure.sourceFile(), failure.line());
  } catch (const std::exception& failure) {  // of a notifier's own
    return failure.what();
  }
  return std::nullopt;
}

// Returns what there is to say of a save that succeeded when a notifier was not told; ends the
// command when nothing was saved.
std::optional<CommandFailure> save(AccountStore& store, bool notify) {
  const FileIdentity before = settingsFileIdentity(store.image());
  store.startLogging();
  ASSAccountsManager::_setShouldSkipNotifications(!notify);
  const std::optional<std::string> raised = raisedBySaving(store);
  const bool isSaved = settingsFileIdentity(store.image()) != before;
  if (raised) {
    const std::string text = fmt::format(
        "{}: the accounts were {}: {}; the account services are listed in "
        "{}/AccountCreators.plist; install what it names into the image, or leave "
        "--notify out",
        store.image().settingsFile(),
        isSaved ? "saved, but not every notifier was told" : "not saved", *raised,
        installedAccountResources());
    if (!isSaved) throw CommandFailure(ExitCode::unexpectedFailure, text);
    return CommandFailure(ExitCode::unexpectedFailure, text);
  }
  if (const auto line = failureLine(store)) failUnsaved(store, *line);
  if (!isSaved) failUnsaved(store, "The library said nothing.");
  return std::nullopt;
}

// What became of a change.
struct Result {
  std::vector<Difference> differences;
  bool saved = false;
  std::optional<CommandFailure> untold;  // why a notifier was not told of what was saved
};

std::string reportText(const AccountStore& store, const Result& result,
                       const ChangeOptions& options) {
  std::string text;
  if (options.json) {
    nlohmann::json json;
    json["image"] = store.image().rootPath();
    json["dry_run"] = options.dryRun;
    json["saved"] = result.saved;
    json["notified"] = result.saved && options.notify && !result.untold;
    json["changes"] = nlohmann::json::array();
    for (const Difference& difference : result.differences)
      json["changes"].push_back(jsonOf(difference));
    text = jsonText(json);
  } else if (options.dryRun) {
    for (const Difference& difference : result.differences)
      text += forTerminal(describe(difference)) + '\n';
    if (result.differences.empty()) text = "nothing would change\n";
  } else {
    for (const Difference& difference : result.differences)
      if (difference.kind == Difference::Kind::added)
        text += forTerminal(difference.account) + '\n';
  }
  return text;
}

void report(const AccountStore& store, const Result& result, const ChangeOptions& options) {
  const std::string text = reportText(store, result, options);
  if (text.empty()) return;  // fwrite takes no null pointer
  if (std::fwrite(text.data(), 1, text.size(), stdout) == text.size() && std::fflush(stdout) == 0)
    return;
  if (result.untold) printMessage(result.untold->what());
  throw CommandFailure(
      ExitCode::unexpectedFailure,
      fmt::format("cannot write standard output, and what was printed is incomplete; {}",
                  result.saved ? fmt::format("the accounts were saved; account-settings list "
                                             "--image {} shows them",
                                             store.image().rootPath())
                               : "nothing was changed"));
}

// The edit in memory, and the save.
Result change(AccountStore& store, const ChangeOptions& options, const Edit& edit) {
  Result result;
  const auto before = store.snapshot();
  edit(store);
  result.differences = differencesBetween(before, store.snapshot());
  if (result.differences.empty() || options.dryRun) return result;
  result.untold = save(store, options.notify);
  result.saved = true;
  return result;
}

}  // namespace

ExitCode changeAccounts(const ChangeOptions& options, const Edit& edit, const TakeBack& takeBack) {
  ImagePtr image = openImage(options.image);
  if (options.notify) requireTrustedServices(*image);
  const std::unique_ptr<ImageLock> lock =
      options.lock && !options.dryRun ? takeLock(*image, options.wait) : nullptr;
  useTemporaryDirectory(*image);
  AccountStore store(std::move(image));
  refuseLossySave(store);
  Result result;
  try {
    result = change(store, options, edit);
  } catch (const CommandFailure& failure) {
    throw CommandFailure(failure.code(), failure.what() + (takeBack ? takeBack() : std::string()));
  }
  report(store, result, options);
  if (result.untold) throw CommandFailure(*result.untold);
  return ExitCode::done;
}

}  // namespace tools
