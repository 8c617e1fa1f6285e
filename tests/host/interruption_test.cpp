#include "host/Interruption.h"

#include <gtest/gtest.h>

#include <csignal>

namespace host {
namespace {

TEST(Interruption, IsNoticedAndRemembered) {
  Interruption interruption;
  EXPECT_FALSE(interruption.requested());
  ASSERT_EQ(std::raise(SIGTERM), 0);
  EXPECT_TRUE(interruption.requested());
  EXPECT_TRUE(interruption.requested());
}

// The second Ctrl-C of an impatient user must not take the report away.
TEST(Interruption, ThatComesAfterTheLastLookDoesNotEndTheProcessWhenTheObjectGoes) {
  {
    Interruption interruption;
    ASSERT_EQ(std::raise(SIGINT), 0);
    EXPECT_TRUE(interruption.requested());
    ASSERT_EQ(std::raise(SIGINT), 0);
    ASSERT_EQ(std::raise(SIGHUP), 0);
  }
  SUCCEED();
}

TEST(Interruption, EndsTheProcessAgainOnceTheObjectIsGone) {
  { const Interruption interruption; }
  EXPECT_EXIT(std::raise(SIGINT), testing::KilledBySignal(SIGINT), "");
}

}  // namespace
}  // namespace host
