#include "platform/posix/LibraryWebEngineThreadLock.h"

#include <dlfcn.h>
#include <gmock/gmock.h>

#include <filesystem>
#include <string>

#include "platform/testing/TemporaryDirectory.h"
#include "tests/contracts/WebEngineThreadLockContract.h"

namespace {

using platform::LibraryWebEngineThreadLock;

constexpr const char* kIsHeld = "webEngineThreadIsHeld";
constexpr const char* kAcquire = "webEngineThreadAcquire";

class WebEngineInALibrary : public WebEngineThreadLockUnderTest {
 public:
  platform::WebEngineThreadLock& service() override { return _lock; }

 private:
  LibraryWebEngineThreadLock _lock{WEB_ENGINE_LIBRARY, kIsHeld, kAcquire};
};
INSTANTIATE_TEST_SUITE_P(Library, WebEngineThreadLockContract,
                         testing::Values(portOf<WebEngineInALibrary>("Library")));

bool isLoaded() {
  void* const library = ::dlopen(WEB_ENGINE_LIBRARY, RTLD_NOW | RTLD_NOLOAD);
  if (library != nullptr) ::dlclose(library);
  return library != nullptr;
}

TEST(WebEngineLibrary, IsLoadedWhenItIsFirstNeeded) {
  LibraryWebEngineThreadLock lock(WEB_ENGINE_LIBRARY, kIsHeld, kAcquire);
  EXPECT_FALSE(isLoaded());
  EXPECT_FALSE(lock.isHeld());
  EXPECT_TRUE(isLoaded());
}

TEST(WebEngineLibrary, StaysLoadedWithoutTheLock) {
  { LibraryWebEngineThreadLock(WEB_ENGINE_LIBRARY, kIsHeld, kAcquire).acquire(); }
  EXPECT_TRUE(isLoaded());
}

TEST(WebEngineLibrary, AFunctionThatIsNotNeededMayBeMissing) {
  LibraryWebEngineThreadLock lock(WEB_ENGINE_LIBRARY, kIsHeld, "noSuchFunction");
  EXPECT_FALSE(lock.isHeld());
}

TEST(WebEngineLibrary, IsOpenedOnceAndItsFunctionsFoundOnce) {
  const platform::TemporaryDirectory directory;
  const std::string copy = directory.path() + "/engine.so";
  std::filesystem::copy_file(WEB_ENGINE_LIBRARY, copy);
  LibraryWebEngineThreadLock lock(copy, kIsHeld, kAcquire);
  EXPECT_FALSE(lock.isHeld());
  std::filesystem::remove(copy);
  lock.acquire();
  EXPECT_TRUE(lock.isHeld());
}

// Each of the two dies with the loader's text, and nothing else, on standard error.
TEST(WebEngineLibrary, AbortsWithTheLoadersTextWhenItLacksAFunction) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  LibraryWebEngineThreadLock lock(WEB_ENGINE_LIBRARY, kIsHeld, "noSuchFunction");
  EXPECT_EXIT(lock.acquire(), testing::KilledBySignal(SIGABRT),
              "^" WEB_ENGINE_LIBRARY ": undefined symbol: noSuchFunction\n$");
}

TEST(WebEngineLibrary, AbortsWithTheLoadersTextWhenItIsMissing) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  LibraryWebEngineThreadLock lock("/no/such/library.so", kIsHeld, kAcquire);
  EXPECT_EXIT(lock.isHeld(), testing::KilledBySignal(SIGABRT),
              "^/no/such/library.so: cannot open shared object file: No such file or directory\n$");
}

}  // namespace
