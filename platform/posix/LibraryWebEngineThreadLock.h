#pragma once

#include <atomic>
#include <string>

#include "platform/WebEngineThreadLock.h"

namespace platform {

// The thread lock of a web engine that is a shared library with two C functions:
//
//   bool isHeld(void);    whether the calling thread holds the lock
//   void acquire(void);   waits until it does
//
// The library is opened, once, and each function found when it is first needed; the library stays
// open. A library or function that is not there aborts the process, with the loader's text on
// standard error.
class PLATFORM_EXPORT LibraryWebEngineThreadLock : public WebEngineThreadLock {
 public:
  //   path                  the library, as dlopen takes it
  //   isHeldName, ...       the names of its two functions
  LibraryWebEngineThreadLock(std::string path, std::string isHeldName, std::string acquireName);
  bool isHeld() override;
  void acquire() override;

 private:
  using IsHeld = bool (*)();
  using Acquire = void (*)();

  // The function of that name.
  void* _resolved(const std::string& name);

  const std::string _path;
  const std::string _isHeldName;
  const std::string _acquireName;
  // Two threads that come first at once find the same.
  std::atomic<void*> _library = nullptr;
  std::atomic<IsHeld> _isHeld = nullptr;
  std::atomic<Acquire> _acquire = nullptr;
};

}  // namespace platform
