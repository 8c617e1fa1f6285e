#pragma once

#include "deviceimage/Descriptor.h"

namespace host {

// The user's wish to stop: SIGINT, SIGTERM or SIGHUP. While an object lives, the signals are held
// back from the calling thread and noticed here instead, so that the work between two looks is
// whole. One object a process.
class Interruption {
 public:
  Interruption();
  // Signals that came after the last look are dropped.
  ~Interruption();
  Interruption(const Interruption&) = delete;
  Interruption& operator=(const Interruption&) = delete;

  // Whether one of the signals has come since the object was made.
  bool requested();
  // Readable once a signal has come; -1 when the system gave none.
  int descriptor() const { return _signals.number(); }

 private:
  deviceimage::Descriptor _signals;
  bool _requested = false;
};

}  // namespace host
