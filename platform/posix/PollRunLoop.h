#pragma once

#include <chrono>
#include <functional>
#include <map>
#include <mutex>
#include <thread>
#include <vector>

#include "platform/RunLoop.h"

namespace platform {

// A run loop for each thread, over timers and descriptors. A source belongs to the thread that adds
// it, and is served while that thread runs its loop. A handler may add and remove sources, and may
// run the loop, after it has read what made its descriptor ready. Any thread.
class PLATFORM_EXPORT PollRunLoop : public RunLoop {
 public:
  using Handler = std::function<void()>;
  using Source = int;

  // Calls `handler` each time that `interval`, which is more than nothing, has passed. A loop that
  // does not run lets beats pass by and makes up for none of them.
  Source addTimer(std::chrono::milliseconds interval, Handler handler);
  // Calls `handler` while the descriptor, which stays open until the source is removed, can be read
  // without waiting, is at its end or has failed. A number below 0 is no descriptor: nothing is
  // added, and -1 comes back.
  Source addDescriptor(int descriptor, Handler handler);
  // For the thread that added it, which does so before it ends: a later thread may have its name.
  // Nothing happens to a source that is not there.
  void remove(Source source);

  // Returns after the first source that was served. Sources take turns. A signal does not end the
  // slice.
  void runForAtMost(std::chrono::milliseconds slice) override;

 private:
  using Instant = std::chrono::steady_clock::time_point;
  struct Entry {
    Source source;
    int descriptor;  // -1 for a timer
    std::chrono::milliseconds interval;
    Instant due;  // of a timer
    Handler handler;
  };

  Source _add(Entry entry);
  // This thread's sources, the one that was served longest ago first.
  std::vector<Entry> _ownEntries();
  // Waits until `end` at most. The first source that is ready; -1 when there is none.
  Source _waitForSource(Instant end);
  void _serve(Source source);

  std::mutex _mutex;
  Source _last = 0;
  std::map<std::thread::id, std::vector<Entry>> _entries;
};

}  // namespace platform
