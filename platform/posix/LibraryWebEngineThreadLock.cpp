#include "platform/posix/LibraryWebEngineThreadLock.h"

#include <dlfcn.h>

#include <cstdio>
#include <cstdlib>
#include <utility>

namespace platform {
namespace {

[[noreturn]] void abortWithLoadersText() {
  const char* const text = ::dlerror();
  std::fprintf(stderr, "%s\n", text == nullptr ? "" : text);
  std::abort();
}

}  // namespace

LibraryWebEngineThreadLock::LibraryWebEngineThreadLock(std::string path, std::string isHeldName,
                                                       std::string acquireName)
    : _path(std::move(path)),
      _isHeldName(std::move(isHeldName)),
      _acquireName(std::move(acquireName)) {}

void* LibraryWebEngineThreadLock::_resolved(const std::string& name) {
  if (_library == nullptr) _library = ::dlopen(_path.c_str(), RTLD_NOW);
  if (_library == nullptr) abortWithLoadersText();
  void* const function = ::dlsym(_library, name.c_str());
  if (function == nullptr) abortWithLoadersText();
  return function;
}

bool LibraryWebEngineThreadLock::isHeld() {
  if (_isHeld == nullptr) _isHeld = reinterpret_cast<IsHeld>(_resolved(_isHeldName));
  return _isHeld.load()();
}

void LibraryWebEngineThreadLock::acquire() {
  if (_acquire == nullptr) _acquire = reinterpret_cast<Acquire>(_resolved(_acquireName));
  _acquire.load()();
}

}  // namespace platform
