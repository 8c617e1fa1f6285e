#include <fcntl.h>
#include <fmt/format.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <optional>
#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/ProcessLookup.h"
#include "deviceimage/Descriptor.h"
#include "deviceimage/DeviceImageServices.h"
#include "platform/posix/LinuxProcessTable.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/Options.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/Images.h"
#include "tools/common/Program.h"

namespace tools {
namespace {

using accountsettings::findProcessIDByName;
using deviceimage::DeviceImage;

constexpr const char* kDaemonName = "tallowd";

// The image's process table, which remembers what the library, to which a table
// that cannot be read is one without the daemon, keeps to itself.
class WatchedProcessTable : public platform::ProcessTable {
 public:
  explicit WatchedProcessTable(platform::ProcessTable& table) : _table(table) {}
  Sized sizeOfTable() override {
    Sized sized = _table.sizeOfTable();
    lookup = sized.status;
    return sized;
  }
  Filled fillTable(std::size_t capacity) override {
    Filled filled = _table.fillTable(capacity);
    lookup = filled.status;
    return filled;
  }
  pid_t ownProcessIdentifier() override { return _table.ownProcessIdentifier(); }
  platform::Status sendSignal(pid_t process, int signal) override {
    sent = _table.sendSignal(process, signal);
    return *sent;
  }

  std::optional<platform::Status> sent;
  platform::Status lookup = platform::Status::success();  // how the last look at the table ended

 private:
  platform::ProcessTable& _table;
};

// The image's services, installed with that process table.
class WatchedServices {
 public:
  explicit WatchedServices(const ImagePtr& image)
      : _services(image, _options()), _processTable(_services.services().processTable) {
    const platform::Services& own = _services.services();
    platform::install({own.accountFramework, own.bundleResources, own.calendarStore,
                       own.classRegistry, own.clock, own.contactsStore, own.deviceInfo,
                       own.exclusiveFileLock, own.fileServices, own.preferences, _processTable,
                       own.restrictions, own.runLoop, own.syncDataSource, own.systemLog,
                       own.notifyCenter, own.uuidGenerator, own.userDatabase});
  }
  WatchedProcessTable& processTable() { return _processTable; }

 private:
  static deviceimage::ServiceOptions _options() {
    deviceimage::ServiceOptions options;
    options.processName = "account-settings";
    return options;
  }

  deviceimage::DeviceImageServices _services;
  WatchedProcessTable _processTable;
};

// What became of the daemon.
struct Result {
  pid_t asked = -1;  // the process that was there at the beginning
  pid_t now = -1;    // the one that is there at the end
  std::optional<platform::Status> signal;
  pid_t unseen = -1;  // one by that name of which nobody shows whether it runs from the image
};

const char* outcomeOf(const Result& result) {
  if (result.asked < 0) return result.unseen < 0 ? "not running" : "unknown";
  if (result.now == result.asked) return "still running";
  if (result.now >= 0) return "restarted";
  return result.signal && result.signal->isSuccess() ? "killed" : "left";
}

// A process that is named as the daemon and whose executable this user may not look at; -1 when
// there is none.
pid_t findUnseenDaemon() {
  platform::LinuxProcessTable everything;
  for (const platform::ProcessTable::Process& process :
       everything.fillTable(everything.sizeOfTable().count).processes) {
    const std::string link = "/proc/" + std::to_string(process.identifier) + "/exe";
    char byte = 0;
    if (process.commandName == kDaemonName && ::readlink(link.c_str(), &byte, 1) < 0 &&
        errno == EACCES)
      return process.identifier;
  }
  return -1;
}

// To the library a table that cannot be read is one without the daemon.
void requireProcessTable(platform::ProcessTable& table) {
  const platform::ProcessTable::Sized sized = table.sizeOfTable();
  const platform::Status status =
      sized.status.isSuccess() ? table.fillTable(sized.count).status : sized.status;
  if (!status.isSuccess())
    throw CommandFailure(ExitCode::refused,
                         fmt::format("the processes of this machine cannot be listed: {}; nothing "
                                     "was done; see that /proc is there and can be read",
                                     status.error->description));
}

// Nobody hears of a notification that the image cannot take up, and the daemon would be killed.
void requireNotifications(const DeviceImage& image) {
  const deviceimage::OpenedFile file =
      image.openFile(DeviceImage::kNotificationsFile, O_WRONLY | O_APPEND | O_CREAT);
  const deviceimage::Descriptor closing(file.descriptor);
  if (!file.status.isSuccess())
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: {}; so the daemon cannot be asked to leave; nothing was done; see that "
                    "you may write the file",
                    image.absolutePath(DeviceImage::kNotificationsFile),
                    file.status.error->description));
}

Result stopDaemon(const ImagePtr& image) {
  WatchedServices services(image);
  requireProcessTable(services.processTable());
  Result result;
  result.asked = findProcessIDByName(kDaemonName);
  if (result.asked < 0) {
    result.unseen = findUnseenDaemon();
    return result;
  }
  requireNotifications(*image);
  accountsettings::ASSAccountsManager::killDataAccessIfNecessary();
  result.now = findProcessIDByName(kDaemonName);
  result.signal = services.processTable().sent;
  const platform::Status& lookup = services.processTable().lookup;
  if (!lookup.isSuccess())
    throw CommandFailure(ExitCode::unexpectedFailure,
                         fmt::format("the data-access daemon, process {}, was asked to leave, but "
                                     "whether it has cannot be seen: {}; repeat the command",
                                     result.asked, lookup.error->description));
  return result;
}

nlohmann::json orNull(pid_t process) {
  return process < 0 ? nlohmann::json() : nlohmann::json(process);
}

void print(const DeviceImage& image, const Result& result, bool json) {
  const std::string_view outcome = outcomeOf(result);
  if (json)
    printJson({{"image", image.rootPath()},
               {"outcome", outcome},
               {"process", orNull(result.asked)},
               {"signalled", result.signal && result.signal->isSuccess()},
               {"running", orNull(result.now)}});
  else if (outcome == "not running")
    fmt::print("the data-access daemon does not run\n");
  else if (outcome == "left")
    fmt::print("the data-access daemon, process {}, has left\n", result.asked);
  else if (outcome == "killed")
    fmt::print("the data-access daemon, process {}, did not leave and was killed\n", result.asked);
}

std::string aboutSignal(const Result& result) {
  if (!result.signal) return {};  // a look at the processes failed when it was to be sent
  if (result.signal->isSuccess()) return " and sent signal 9";
  return "; " + result.signal->error->description;
}

ExitCode run(const LookOptions& options) {
  const ImagePtr image = openImage(options.image);
  const Result result = stopDaemon(image);
  print(*image, result, options.json);
  if (result.unseen >= 0)
    throw CommandFailure(ExitCode::refused,
                         fmt::format("process {} is named as the data-access daemon, but this user "
                                     "may not see whether it runs from the image; nothing was "
                                     "done; repeat the command as that process's user or as root",
                                     result.unseen));
  if (result.now < 0) return ExitCode::done;
  if (result.now != result.asked)
    throw CommandFailure(ExitCode::daemonRuns,
                         fmt::format("the data-access daemon, process {}, is gone, but another one "
                                     "runs as process {}; stop what starts it, and repeat the "
                                     "command",
                                     result.asked, result.now));
  throw CommandFailure(ExitCode::daemonRuns,
                       fmt::format("the data-access daemon, process {}, still runs although it was "
                                   "asked to leave{}; end it as its own user or as root",
                                   result.asked, aboutSignal(result)));
}

}  // namespace

void addStopDaemonCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<LookOptions>();
  CLI::App* const command =
      app.add_subcommand("stop-daemon", "Have the image's data-access daemon leave");
  addLookOptions(*command, *options);
  command->footer(
      "Asks the daemon to leave, kills it when it has not left after five seconds, and gives up\n"
      "after five more. Exit code 0 when no daemon runs any more, 10 when one does, 7\n"
      "when this user may not see whether one does.\n\n"
      "Example:\n  account-settings stop-daemon --image my-device");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
