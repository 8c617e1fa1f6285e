#include "tests/propertylist/SmallStack.h"

#include <pthread.h>

#include <ctime>
#include <stdexcept>

namespace {

constexpr std::size_t kStackSize = std::size_t{256} << 10U;

struct Work {
  const std::function<void()>& run;
  double seconds;
};

double threadSeconds() {
  timespec time{};
  ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

void* runWork(void* argument) {
  auto* const work = static_cast<Work*>(argument);
  const double start = threadSeconds();
  work->run();
  work->seconds = threadSeconds() - start;
  return nullptr;
}

}  // namespace

double runOnSmallStack(const std::function<void()>& work) {
  Work argument{work, 0};
  pthread_attr_t attributes;
  pthread_t thread = 0;
  bool isGood = ::pthread_attr_init(&attributes) == 0;
  isGood = isGood && ::pthread_attr_setstacksize(&attributes, kStackSize) == 0;
  isGood = isGood && ::pthread_create(&thread, &attributes, runWork, &argument) == 0;
  if (!isGood) throw std::runtime_error("no thread with a small stack");
  ::pthread_join(thread, nullptr);
  ::pthread_attr_destroy(&attributes);
  return argument.seconds;
}
