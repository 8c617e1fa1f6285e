#include "platform/DeviceInfo.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(JoinedPath, PutsThePathBelowTheRoot) {
  const struct {
    const char* root;
    const char* path;
    const char* joined;
  } kCases[] = {
      {"/", "/a", "/a"},
      {"/", "a/b", "/a/b"},
      {"/image", "/var/mobile", "/image/var/mobile"},
      {"/image", "var/mobile", "/image/var/mobile"},
      {"/image/", "/var", "/image/var"},
      {"/image//", "//var//mobile/", "/image/var/mobile"},
      {"/image", "", "/image"},
      {"/image", "/", "/image"},
      {"/", "", "/"},
      {"/", "/", "/"},
      {"", "/a", "/a"},
      {"", "", "/"},
      {"image", "a", "image/a"},
  };
  for (const auto& c : kCases)
    EXPECT_EQ(joinedPath(c.root, c.path), c.joined) << c.root << " with " << c.path;
}

TEST(JoinedPath, NeverLeadsAboveTheRoot) {
  const struct {
    const char* path;
    const char* joined;
  } kCases[] = {
      {"..", "/image"},
      {"/../etc", "/image/etc"},
      {"../../../etc/passwd", "/image/etc/passwd"},
      {"a/../../b", "/image/b"},
      {"a/../..", "/image"},
      {"./a/./b/.", "/image/a/b"},
      {"a/b/../c", "/image/a/c"},
      {"..a/...", "/image/..a/..."},
  };
  for (const auto& c : kCases) EXPECT_EQ(joinedPath("/image", c.path), c.joined) << c.path;
}

}  // namespace
}  // namespace platform
