#pragma once

#include <unistd.h>

#include <utility>

namespace deviceimage {

// Owns an open file descriptor; -1 is none.
class Descriptor {
 public:
  explicit Descriptor(int number = -1) : _number(number) {}
  Descriptor(Descriptor&& other) noexcept : _number(other.release()) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    if (this != &other) {
      reset();
      _number = other.release();
    }
    return *this;
  }
  ~Descriptor() { reset(); }

  bool isOpen() const { return _number >= 0; }
  int number() const { return _number; }
  // Hands the descriptor to the caller.
  int release() { return std::exchange(_number, -1); }
  void reset() {
    if (_number >= 0) ::close(_number);
    _number = -1;
  }

 private:
  int _number;
};

}  // namespace deviceimage
