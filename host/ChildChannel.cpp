#include "host/ChildChannel.h"

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>

namespace host {
namespace {

// Well below what the kernel takes as one message.
constexpr std::size_t kMaximumText = std::size_t{32} * 1024;
// A line that never ends is cut here.
constexpr std::size_t kMaximumLine = std::size_t{1024} * 1024;

void sendOne(int descriptor, MessageKind kind, std::string_view text) {
  std::string message(1, static_cast<char>(kind));
  message += text;
  while (send(descriptor, message.data(), message.size(), MSG_NOSIGNAL) < 0 && errno == EINTR) {
  }
}

}  // namespace

std::optional<Channel> makeChannel() {
  int ends[2] = {-1, -1};
  if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) return std::nullopt;
  return Channel{deviceimage::Descriptor(ends[0]), deviceimage::Descriptor(ends[1])};
}

void sendMessage(int descriptor, MessageKind kind, std::string_view text) {
  while (text.size() > kMaximumText) {
    sendOne(descriptor, MessageKind::linePart, text.substr(0, kMaximumText));
    text.remove_prefix(kMaximumText);
  }
  sendOne(descriptor, kind, text);
}

MessageReader::MessageReader() : _buffer(kMaximumText + 1) {}

bool MessageReader::receive(int descriptor, int limit, const Receiver& receiver) {
  for (int count = 0; count < limit; ++count) {
    const ssize_t size = recv(descriptor, _buffer.data(), _buffer.size(), MSG_DONTWAIT);
    if (size < 0 && errno == EINTR) continue;
    if (size < 0) return errno == EAGAIN;
    if (size == 0) return false;
    const auto kind = static_cast<MessageKind>(_buffer[0]);
    const std::string_view text(_buffer.data() + 1, static_cast<std::size_t>(size) - 1);
    _parts += text.substr(0, kMaximumLine - std::min(kMaximumLine, _parts.size()));
    if (kind == MessageKind::linePart) continue;
    receiver(kind, _parts);
    _parts.clear();
  }
  return true;
}

}  // namespace host
