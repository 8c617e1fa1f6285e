#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/Descriptor.h"

namespace host {

// What the process that runs a migrator tells the host.
enum class MessageKind : char {
  name = 'n',       // the migrator's own name
  line = 'l',       // one line of the system log
  linePart = 'p',   // the beginning of a line that goes on in the next message
  succeeded = 's',  // performMigration answered true
  failed = 'f',     // performMigration answered false
  notLoaded = 'x',  // the bundle could not be loaded; the text says why
  waiting = 'w',    // the process waits for a lock that another program may hold
  begun = 'b',      // and has it
  notNeeded = 'u',  // there was nothing to do any more
  notBegun = 'y',   // what must come before the migrator failed; the text says why
  raised = 'r'      // the migrator raised; the text says what
};

// The two ends of the channel. A message arrives whole or not at all, also when the sender is
// killed. It is a socket on purpose: when a migrator closes the descriptor and opens a file that
// gets its number, sending fails instead of writing into that file.
struct Channel {
  deviceimage::Descriptor host;
  deviceimage::Descriptor child;
};
// Empty when the system gives no socket.
std::optional<Channel> makeChannel();

// Sends one message, a long one in parts. A failure is passed over: the host notices what is
// missing.
void sendMessage(int descriptor, MessageKind kind, std::string_view text);

// Puts the messages together again.
class MessageReader {
 public:
  using Receiver = std::function<void(MessageKind kind, std::string_view text)>;
  MessageReader();
  // Hands on up to `limit` messages that have arrived and does not wait. False when the sender has
  // closed its end.
  bool receive(int descriptor, int limit, const Receiver& receiver);

 private:
  std::vector<char> _buffer;  // for one message
  std::string _parts;
};

}  // namespace host
