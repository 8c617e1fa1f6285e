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

// Registers another class while it tells its name, as a class does whose name is in a bundle that
// is loaded for it.
struct RegisteringClass : NamedClass {
  RegisteringClass(std::string given, RuntimeClass& first)
      : NamedClass(std::move(given)), other(first) {}
  std::string className() const override {
    registerClass(other);
    return registeredClass(other.className()) == &other ? name : "nobody";
  }
  RuntimeClass& other;
};

TEST(RegisteredClass, MayUseTheRegistryWhileItTellsItsName) {
  static NamedClass inner("Inner");
  static RegisteringClass outer("Outer", inner);
  registerClass(outer);
  EXPECT_EQ(registeredClass("Outer"), &outer);
  EXPECT_EQ(registeredClass("Inner"), &inner);
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
