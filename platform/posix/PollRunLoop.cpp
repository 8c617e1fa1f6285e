#include "platform/posix/PollRunLoop.h"

#include <poll.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>

namespace platform {
namespace {

using std::chrono::steady_clock;

constexpr PollRunLoop::Source kNoSource = -1;

// The time to poll for, in whole milliseconds that do not end before `end`.
int timeoutUntil(steady_clock::time_point end) {
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - steady_clock::now());
  return static_cast<int>(std::clamp<std::int64_t>(left.count(), 0, 3'600'000));
}

}  // namespace

PollRunLoop::Source PollRunLoop::_add(Entry entry) {
  const std::lock_guard guard(_mutex);
  entry.source = ++_last;
  _entries[std::this_thread::get_id()].push_back(std::move(entry));
  return _last;
}

PollRunLoop::Source PollRunLoop::addTimer(std::chrono::milliseconds interval, Handler handler) {
  return _add({0, -1, interval, steady_clock::now() + interval, std::move(handler)});
}

PollRunLoop::Source PollRunLoop::addDescriptor(int descriptor, Handler handler) {
  if (descriptor < 0) return kNoSource;
  return _add({0, descriptor, {}, {}, std::move(handler)});
}

void PollRunLoop::remove(Source source) {
  std::vector<Entry> removed;  // goes after the lock, since a handler's end may use this loop
  const std::lock_guard guard(_mutex);
  const auto own = _entries.find(std::this_thread::get_id());
  if (own == _entries.end()) return;
  std::vector<Entry>& entries = own->second;
  const auto found = std::find_if(entries.begin(), entries.end(),
                                  [&](const Entry& entry) { return entry.source == source; });
  if (found == entries.end()) return;
  removed.push_back(std::move(*found));
  entries.erase(found);
  if (entries.empty()) _entries.erase(own);
}

std::vector<PollRunLoop::Entry> PollRunLoop::_ownEntries() {
  const std::lock_guard guard(_mutex);
  const auto own = _entries.find(std::this_thread::get_id());
  return own == _entries.end() ? std::vector<Entry>() : own->second;
}

PollRunLoop::Source PollRunLoop::_waitForSource(Instant end) {
  const std::vector<Entry> entries = _ownEntries();
  std::vector<pollfd> descriptors;
  descriptors.reserve(entries.size());
  for (const Entry& entry : entries) descriptors.push_back({entry.descriptor, POLLIN, 0});
  for (;;) {
    Instant wake = end;
    for (const Entry& entry : entries)
      if (entry.descriptor < 0) wake = std::min(wake, entry.due);
    // poll passes over negative descriptors, those of the timers.
    const int ready = ::poll(descriptors.data(), descriptors.size(), timeoutUntil(wake));
    const int failure = errno;
    const Instant now = steady_clock::now();
    for (std::size_t i = 0; i < entries.size(); ++i) {
      const bool isReady = entries[i].descriptor < 0 ? entries[i].due <= now
                                                     : ready > 0 && descriptors[i].revents != 0;
      if (isReady) return entries[i].source;
    }
    if (now >= end) return kNoSource;
    // More descriptors than the process may have, or no memory: wait without them.
    if (ready < 0 && failure != EINTR) std::this_thread::sleep_until(wake);
  }
}

void PollRunLoop::_serve(Source source) {
  Handler handler;
  {
    const std::lock_guard guard(_mutex);
    std::vector<Entry>& own = _entries[std::this_thread::get_id()];
    const auto found = std::find_if(own.begin(), own.end(),
                                    [&](const Entry& entry) { return entry.source == source; });
    if (found->descriptor < 0) found->due = steady_clock::now() + found->interval;
    handler = found->handler;  // the handler may remove its own source
    std::rotate(found, found + 1, own.end());
  }
  handler();
}

void PollRunLoop::runForAtMost(std::chrono::milliseconds slice) {
  const Source ready = _waitForSource(steady_clock::now() + slice);
  if (ready != kNoSource) _serve(ready);
}

}  // namespace platform
