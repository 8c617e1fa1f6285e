#include "host/ChildChannel.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <utility>
#include <vector>

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

namespace host {
namespace {

struct Received {
  std::vector<std::pair<MessageKind, std::string>> messages;
  MessageReader reader;
  bool receive(int descriptor, int limit = 100) {
    return reader.receive(descriptor, limit, [this](MessageKind kind, std::string_view text) {
      messages.emplace_back(kind, text);
    });
  }
};

TEST(ChildChannel, HandsOnMessagesInOrder) {
  const std::optional<Channel> channel = makeChannel();
  sendMessage(channel->child.number(), MessageKind::line, "one");
  sendMessage(channel->child.number(), MessageKind::succeeded, "");
  Received received;
  EXPECT_TRUE(received.receive(channel->host.number()));
  EXPECT_THAT(received.messages,
              ElementsAre(Pair(MessageKind::line, "one"), Pair(MessageKind::succeeded, "")));
}

TEST(ChildChannel, PutsALongLineTogetherAgain) {
  const std::optional<Channel> channel = makeChannel();
  const std::string text(100'000, 'z');
  sendMessage(channel->child.number(), MessageKind::line, text);
  Received received;
  EXPECT_TRUE(received.receive(channel->host.number()));
  EXPECT_THAT(received.messages, ElementsAre(Pair(MessageKind::line, text)));
}

TEST(ChildChannel, TellsWhenTheSenderHasGone) {
  std::optional<Channel> channel = makeChannel();
  Received received;
  EXPECT_TRUE(received.receive(channel->host.number()));
  channel->child.reset();
  EXPECT_FALSE(received.receive(channel->host.number()));
  EXPECT_THAT(received.messages, IsEmpty());
}

TEST(ChildChannel, TakesNoMoreThanItsLimitAtATime) {
  const std::optional<Channel> channel = makeChannel();
  for (int count = 0; count < 3; ++count)
    sendMessage(channel->child.number(), MessageKind::line, "x");
  Received received;
  received.receive(channel->host.number(), 2);
  EXPECT_EQ(received.messages.size(), 2U);
}

TEST(ChildChannel, WritesNothingIntoAFileThatTookTheDescriptorsPlace) {
  std::FILE* file = std::tmpfile();
  sendMessage(fileno(file), MessageKind::line, "not for this file");
  struct stat status = {};
  ASSERT_EQ(fstat(fileno(file), &status), 0);
  EXPECT_EQ(status.st_size, 0);
  std::fclose(file);
}

TEST(ChildChannel, PassesOverASenderWithoutAReceiver) {
  std::optional<Channel> channel = makeChannel();
  channel->host.reset();
  sendMessage(channel->child.number(), MessageKind::line, "nobody hears this");
}

}  // namespace
}  // namespace host
