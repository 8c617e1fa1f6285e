#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "platform/Services.h"
#include "platform/posix/PollRunLoop.h"

namespace deviceimage {

struct ServiceOptions {
  // What each line of the system log begins with, after the time.
  std::string processName = "migration-host";
  // False for a program that only looks: nothing is written to the image's log.
  bool writesLog = true;
  // Gets every line too, as it is written to the log (one line, control characters escaped,
  // without time and process). May be called on any thread, and writes no log line itself.
  std::function<void(std::string_view line)> logSink;
  // The user's languages, the preferred one first ("de", "en").
  std::vector<std::string> preferredLanguages = {"en"};
  // Where the resources of the account settings library lie; empty for the folder of the object
  // file that asks. A program that is no bundle has none beside it and names the plug-in's folder.
  std::optional<std::string> resourceDirectory = {};
  // Databases that cannot be used, by their paths in the image: whoever wants one gets a failure,
  // at once, and nothing in it changes.
  std::vector<std::string> databasesLeftAlone = {};
};

// Every platform service over one device image. What a service cannot read in the image counts as
// absent; what it cannot write is a failure of its own kind, or, for journals and log, passed over.
//
// Making it opens no database and writes nothing. The services live as long as this object, which
// is used by one process: a child made by fork makes its own.
class DeviceImageServices {
 public:
  explicit DeviceImageServices(const std::shared_ptr<const DeviceImage>& image,
                               ServiceOptions options = {});
  ~DeviceImageServices();

  // References into this object, to be given to platform::install.
  const platform::Services& services() const;
  // The run loop among them, for a program that has timers or descriptors served while it runs.
  platform::PollRunLoop& runLoop();

 private:
  class Implementation;
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace deviceimage
