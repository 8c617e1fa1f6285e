// A web engine for the tests: its lock belongs to whoever acquired it last.
#include <thread>

#define EXPORTED __attribute__((visibility("default")))

namespace {
std::thread::id holder;
}

extern "C" {
EXPORTED bool webEngineThreadIsHeld() { return holder == std::this_thread::get_id(); }
EXPORTED void webEngineThreadAcquire() { holder = std::this_thread::get_id(); }
}
