#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/SyncAgent.h"
#include "host/Interruption.h"
#include "host/MigratorBundle.h"
#include "host/Observation.h"
#include "host/Report.h"
#include "host/UnusableDatabases.h"

namespace host {

struct RunOptions {
  std::string image;                  // path of the device image
  std::optional<std::string> bundle;  // the only bundle to run; without it the installed one, and
                                      // then the image's own in name order
  std::string installedMigrators;     // folder in which the installed bundle lies
  std::chrono::seconds limit{0};      // for each migrator
  // Whether to have a settings file made, before everything else, of what older systems left in the
  // image, when there is such.
  bool legacy = false;
};

// Hears about a run while it goes on.
class RunListener {
 public:
  virtual ~RunListener() = default;
  // A new stage has begun ("Looking at the image").
  virtual void stageBegan(std::string_view stage) = 0;
  // A migrator has written this line to the system log.
  virtual void logLineCame(std::string_view line) = 0;
};

// Runs data-class migrators on one device image: checks, looks, runs each in a process of its own,
// looks again, and reports from what it saw. It knows nothing of what a migrator does but what the
// bundle's Info.plist says, and holds the image's lock from the first check to the last look.
//
// One run an object; one thread.
class MigrationHost {
 public:
  // Both outlive the object.
  MigrationHost(RunListener& listener, Interruption& interruption);

  MigrationReport run(const RunOptions& options);

 private:
  void _runUnderLock(const RunOptions& options, int lockDescriptor);
  void _readBundles(const RunOptions& options);
  void _refuse(std::string reason);
  bool _migrateLegacy(const RunOptions& options, int lockDescriptor);
  void _runMigrators(const RunOptions& options, int lockDescriptor);
  void _keepLogLine(std::string_view line);
  void _compare(const Observation& before, const Observation& after,
                const std::vector<std::string>& damage, const Selection& selection,
                const deviceimage::SyncAgent& agent);
  void _judge();

  RunListener& _listener;
  Interruption& _interruption;
  std::shared_ptr<const deviceimage::DeviceImage> _image;
  std::vector<MigratorBundle> _bundles;
  std::vector<UnusableDatabase> _leftAlone;
  MigrationReport _report;
  std::size_t _logSize = 0;                      // bytes
  std::vector<std::string> _leftWithoutAccount;  // sentences: what no migrator can move
  bool _isAnythingLeftBehind = false;
};

}  // namespace host
