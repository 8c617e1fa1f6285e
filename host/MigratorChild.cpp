#include "host/MigratorChild.h"

#include <cxxabi.h>
#include <fcntl.h>
#include <pthread.h>
#include <unistd.h>

#include <cstdlib>
#include <exception>
#include <memory>
#include <string_view>
#include <typeinfo>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/DeviceImageServices.h"
#include "host/ChildChannel.h"
#include "platform/DataClassMigrator.h"
#include "platform/InternalConsistencyFailure.h"
#include "platform/Services.h"

namespace host {
namespace {

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

int tellNotLoaded(std::string_view why) {
  tell(MessageKind::notLoaded, why);
  return kExitNotLoaded;
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

int loadAndRun(const platform::Services& services, const std::string& folder,
               const std::string& executable, const std::string& principalClass) {
  // The library first, because it alone says what is wrong with it.
  if (const auto error = services.classRegistry.loadLibrary(executable))
    return tellNotLoaded(*error);
  const platform::CodeBundlePtr bundle = services.classRegistry.loadCodeBundle(folder);
  if (!bundle) return tellNotLoaded(folder + " could not be loaded");
  auto* migratorClass = dynamic_cast<platform::DataClassMigratorClass*>(
      services.classRegistry.classNamed(principalClass));
  if (migratorClass == nullptr)
    return tellNotLoaded(executable + " offers no migrator class named " + principalClass);
  const std::unique_ptr<platform::DataClassMigrator> migrator = migratorClass->create();
  if (!migrator) return tellNotLoaded(principalClass + " made no migrator");
  tell(MessageKind::name, migrator->dataClassName());
  tell(migrator->performMigration() ? MessageKind::succeeded : MessageKind::failed);
  return EXIT_SUCCESS;
}

}  // namespace

bool isMigratorProcess(int argumentCount, char** arguments) {
  return argumentCount == kRunMigratorArgumentCount &&
         std::string_view(arguments[1]) == kRunMigratorArgument;
}

int runMigratorInThisProcess(char** arguments) {
  keepDescriptorsFromChildren();
  const deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(arguments[2]);
  if (!opened.image) return tellNotLoaded(opened.error);
  deviceimage::ServiceOptions options;
  options.logSink = [](std::string_view line) { tell(MessageKind::line, line); };
  const deviceimage::DeviceImageServices services(opened.image, options);
  platform::install(services.services());
  try {
    return loadAndRun(services.services(), arguments[3], arguments[4], arguments[5]);
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
