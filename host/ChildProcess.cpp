#include "host/ChildProcess.h"

#include <cxxabi.h>
#include <fcntl.h>
#include <pthread.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <memory>
#include <typeinfo>

#include "deviceimage/Descriptor.h"
#include "deviceimage/DeviceImageServices.h"
#include "host/ChildChannel.h"
#include "platform/InternalConsistencyFailure.h"

namespace host {
namespace {

constexpr int kExitByHand = 2;
constexpr int kExitNotLoaded = 71;
constexpr int kExitRaised = 72;

void tell(MessageKind kind, std::string_view text = {}) {
  sendMessage(kChannelDescriptor, kind, text);
}

// What the migrator starts must not keep the image locked when the migrator has gone.
void keepDescriptorsFromChildren() {
  fcntl(kChannelDescriptor, F_SETFD, FD_CLOEXEC);
  fcntl(kLockDescriptor, F_SETFD, FD_CLOEXEC);
  pthread_atfork(nullptr, nullptr, [] { close(kLockDescriptor); });
}

// Whether the descriptors are what a host gives. The lock is held when another open file of it
// cannot get it.
bool isStartedByHost(const deviceimage::DeviceImage& image) {
  struct stat channel = {};
  struct stat given = {};
  struct stat expected = {};
  const deviceimage::OpenedFile opened =
      image.openFile(deviceimage::DeviceImage::kLockFile, O_RDWR);
  if (!opened.status.isSuccess()) return false;
  const deviceimage::Descriptor lock(opened.descriptor);
  return fstat(kChannelDescriptor, &channel) == 0 && S_ISSOCK(channel.st_mode) &&
         fstat(kLockDescriptor, &given) == 0 && fstat(lock.number(), &expected) == 0 &&
         given.st_dev == expected.st_dev && given.st_ino == expected.st_ino &&
         flock(lock.number(), LOCK_EX | LOCK_NB) != 0;
}

int tellRaised(std::string_view what) {
  tell(MessageKind::raised, what);
  return kExitRaised;
}

std::string nameOfCurrentExceptionsType() {
  const std::type_info* type = abi::__cxa_current_exception_type();
  if (type == nullptr) return "something unknown";
  int status = 0;
  const std::unique_ptr<char, decltype(&std::free)> name(
      abi::__cxa_demangle(type->name(), nullptr, nullptr, &status), &std::free);
  return name ? name.get() : type->name();
}

}  // namespace

int tellEnd(bool hasSucceeded) {
  tell(hasSucceeded ? MessageKind::succeeded : MessageKind::failed);
  return EXIT_SUCCESS;
}

int tellNotLoaded(std::string_view why) {
  tell(MessageKind::notLoaded, why);
  return kExitNotLoaded;
}

int tellNotNeeded() {
  tell(MessageKind::notNeeded);
  return EXIT_SUCCESS;
}

int tellNotBegun(std::string_view why) {
  tell(MessageKind::notBegun, why);
  return kExitNotLoaded;
}

void tellWaiting() { tell(MessageKind::waiting); }

void tellBegun() { tell(MessageKind::begun); }

void tellName(std::string_view name) { tell(MessageKind::name, name); }

int workForHost(const std::string& imagePath, const ChildWork& work,
                const ChildOptions& childOptions) {
  keepDescriptorsFromChildren();
  const deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(imagePath);
  if (!opened.image) return tellNotLoaded(opened.error);
  if (!isStartedByHost(*opened.image)) {
    std::fputs("this argument is for processes that the program itself starts\n", stderr);
    return kExitByHand;
  }
  deviceimage::ServiceOptions options;
  options.processName = childOptions.processName;
  options.databasesLeftAlone = childOptions.databasesLeftAlone;
  options.logSink = [&childOptions](std::string_view line) {
    tell(MessageKind::line, line);
    if (childOptions.lineSink) childOptions.lineSink(line);
  };
  const deviceimage::DeviceImageServices services(opened.image, options);
  platform::install(services.services());
  try {
    return work(*opened.image);
  } catch (const platform::InternalConsistencyFailure& failure) {
    return tellRaised(failure.sourceFile() + ":" + std::to_string(failure.line()) + ": " +
                      failure.what());
  } catch (const std::exception& exception) {
    return tellRaised(nameOfCurrentExceptionsType() + ": " + exception.what());
  } catch (abi::__forced_unwind&) {
    throw;  // the migrator ended its own thread: not an exception, and not to be stopped
  } catch (...) {
    return tellRaised("an object of type " + nameOfCurrentExceptionsType());
  }
}

}  // namespace host
