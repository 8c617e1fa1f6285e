#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "platform/Services.h"

// The process that runs a migrator, from the inside.
namespace host {

// Where it finds its end of the channel, and the image's lock, which it shares: when the host is
// killed, the image is free no sooner than the migrator has ended.
inline constexpr int kChannelDescriptor = 3;
inline constexpr int kLockDescriptor = 4;

// Does the process's work over the image, tells the host what came of it through one of the
// functions below, and gives its answer.
using ChildWork = std::function<int(const deviceimage::DeviceImage& image)>;
struct ChildOptions {
  std::string processName = "migration-host";  // in the lines of the image's log
  std::function<void(std::string_view line)>
      lineSink;                                      // gets the log's lines as well; may be empty
  std::vector<std::string> databasesLeftAlone = {};  // by their paths in the image
};

// Installs the services of the image at `imagePath`, does the work, passes every line of the log
// and whatever is thrown on to the host, and gives the exit status of the process. Nothing of the
// program's own may have been set up before. Does nothing and gives 2 in a process that was not
// started by a host: one without the channel, or without the image's lock held at its place.
int workForHost(const std::string& imagePath, const ChildWork& work,
                const ChildOptions& options = {});

// Each tells the host and gives the exit status.
int tellEnd(bool hasSucceeded);
int tellNotLoaded(std::string_view why);
int tellNotNeeded();                     // another program has done the work
int tellNotBegun(std::string_view why);  // what must come before the migrator failed
// Around the wait for a lock that another program may hold: a process that is ended for its time
// meanwhile counts as busy.
void tellWaiting();
void tellBegun();
void tellName(std::string_view name);  // what the migrator calls itself; before the end

}  // namespace host
