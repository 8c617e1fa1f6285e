#include "platform/ClassRegistry.h"

#include <gtest/gtest.h>

#include <thread>
#include <vector>

namespace platform {
namespace {

struct NamedClass : RuntimeClass {
  explicit NamedClass(std::string given) : name(std::move(given)) {}
  std::string className() const override { return name; }
  std::string name;
};

TEST(RegisteredClass, IsTheFirstThatTookTheName) {
  static NamedClass first("Name");
  static NamedClass second("Name");
  EXPECT_EQ(registeredClass("Name"), nullptr);
  registerClass(first);
  registerClass(second);
  EXPECT_EQ(registeredClass("Name"), &first);
}

TEST(RegisteredClass, IsFoundWhileOtherThreadsRegister) {
  constexpr int kThreads = 4;
  constexpr int kClasses = 200;
  static std::vector<std::vector<NamedClass>> classes(kThreads);
  for (int t = 0; t < kThreads; ++t)
    for (int i = 0; i < kClasses; ++i)
      classes[static_cast<std::size_t>(t)].emplace_back(std::to_string(t) + "-" +
                                                        std::to_string(i));
  std::vector<int> found(kThreads, 0);
  std::vector<std::thread> threads;
  for (std::size_t t = 0; t < kThreads; ++t)
    threads.emplace_back([&found, t] {
      for (NamedClass& named : classes[t]) {
        registerClass(named);
        if (registeredClass(named.name) == &named) ++found[t];
      }
    });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(found, std::vector<int>(kThreads, kClasses));
}

}  // namespace
}  // namespace platform
