#include "host/Interruption.h"

#include <sys/signalfd.h>

#include <csignal>

namespace host {
namespace {

sigset_t stoppingSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  for (const int number : {SIGINT, SIGTERM, SIGHUP}) sigaddset(&signals, number);
  return signals;
}

}  // namespace

Interruption::Interruption() {
  const sigset_t signals = stoppingSignals();
  _signals = deviceimage::Descriptor(signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK));
  if (_signals.isOpen()) sigprocmask(SIG_BLOCK, &signals, nullptr);
}

Interruption::~Interruption() {
  if (!_signals.isOpen()) return;
  requested();  // takes those that came meanwhile, which would end the process now
  const sigset_t signals = stoppingSignals();
  sigprocmask(SIG_UNBLOCK, &signals, nullptr);
}

bool Interruption::requested() {
  signalfd_siginfo information = {};
  while (_signals.isOpen() && read(_signals.number(), &information, sizeof information) > 0)
    _requested = true;
  return _requested;
}

}  // namespace host
