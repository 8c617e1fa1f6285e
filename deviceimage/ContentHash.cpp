#include "deviceimage/ContentHash.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>

namespace deviceimage {
namespace {

constexpr std::size_t kBlockSize = 64;

constexpr std::array<std::uint32_t, 64> kRoundConstants = {
    0x428a2f98, 0x71374491, 0xb5c0fbcf, 0xe9b5dba5, 0x3956c25b, 0x59f111f1, 0x923f82a4, 0xab1c5ed5,
    0xd807aa98, 0x12835b01, 0x243185be, 0x550c7dc3, 0x72be5d74, 0x80deb1fe, 0x9bdc06a7, 0xc19bf174,
    0xe49b69c1, 0xefbe4786, 0x0fc19dc6, 0x240ca1cc, 0x2de92c6f, 0x4a7484aa, 0x5cb0a9dc, 0x76f988da,
    0x983e5152, 0xa831c66d, 0xb00327c8, 0xbf597fc7, 0xc6e00bf3, 0xd5a79147, 0x06ca6351, 0x14292967,
    0x27b70a85, 0x2e1b2138, 0x4d2c6dfc, 0x53380d13, 0x650a7354, 0x766a0abb, 0x81c2c92e, 0x92722c85,
    0xa2bfe8a1, 0xa81a664b, 0xc24b8b70, 0xc76c51a3, 0xd192e819, 0xd6990624, 0xf40e3585, 0x106aa070,
    0x19a4c116, 0x1e376c08, 0x2748774c, 0x34b0bcb5, 0x391c0cb3, 0x4ed8aa4a, 0x5b9cca4f, 0x682e6ff3,
    0x748f82ee, 0x78a5636f, 0x84c87814, 0x8cc70208, 0x90befffa, 0xa4506ceb, 0xbef9a3f7, 0xc67178f2};

using State = std::array<std::uint32_t, 8>;
constexpr State kInitialState = {0x6a09e667, 0xbb67ae85, 0x3c6ef372, 0xa54ff53a,
                                 0x510e527f, 0x9b05688c, 0x1f83d9ab, 0x5be0cd19};

using Word = std::uint32_t;

// One round: `d` becomes what the next round calls e, and `h` what it calls a.
inline void takeWord(Word a, Word b, Word c, Word& d, Word e, Word f, Word g, Word& h, Word word) {
  const Word s1 = std::rotr(e, 6) ^ std::rotr(e, 11) ^ std::rotr(e, 25);
  const Word s0 = std::rotr(a, 2) ^ std::rotr(a, 13) ^ std::rotr(a, 22);
  const Word t1 = h + s1 + ((e & f) ^ (~e & g)) + word;
  d += t1;
  h = t1 + s0 + ((a & b) ^ (a & c) ^ (b & c));
}

// Takes one block of 64 bytes into `state`.
void takeBlock(State& state, const unsigned char* block) {
  std::array<std::uint32_t, 64> w{};
  for (std::size_t i = 0; i < 16; ++i)
    for (std::size_t byte = 0; byte < 4; ++byte) w[i] = (w[i] << 8U) | block[i * 4 + byte];
  for (std::size_t i = 16; i < 64; ++i) {
    const std::uint32_t s0 = std::rotr(w[i - 15], 7) ^ std::rotr(w[i - 15], 18) ^ (w[i - 15] >> 3U);
    const std::uint32_t s1 = std::rotr(w[i - 2], 17) ^ std::rotr(w[i - 2], 19) ^ (w[i - 2] >> 10U);
    w[i] = w[i - 16] + s0 + w[i - 7] + s1;
  }
  auto [a, b, c, d, e, f, g, h] = state;
  // The variables change their roles from round to round instead of their values.
  for (std::size_t i = 0; i < 64; i += 8) {
    takeWord(a, b, c, d, e, f, g, h, kRoundConstants[i] + w[i]);
    takeWord(h, a, b, c, d, e, f, g, kRoundConstants[i + 1] + w[i + 1]);
    takeWord(g, h, a, b, c, d, e, f, kRoundConstants[i + 2] + w[i + 2]);
    takeWord(f, g, h, a, b, c, d, e, kRoundConstants[i + 3] + w[i + 3]);
    takeWord(e, f, g, h, a, b, c, d, kRoundConstants[i + 4] + w[i + 4]);
    takeWord(d, e, f, g, h, a, b, c, kRoundConstants[i + 5] + w[i + 5]);
    takeWord(c, d, e, f, g, h, a, b, kRoundConstants[i + 6] + w[i + 6]);
    takeWord(b, c, d, e, f, g, h, a, kRoundConstants[i + 7] + w[i + 7]);
  }
  const State worked = {a, b, c, d, e, f, g, h};
  for (std::size_t i = 0; i < state.size(); ++i) state[i] += worked[i];
}

}  // namespace

std::string contentHash(std::string_view content) {
  State state = kInitialState;
  const auto* const bytes = reinterpret_cast<const unsigned char*>(content.data());
  const std::size_t whole = content.size() / kBlockSize * kBlockSize;
  for (std::size_t at = 0; at < whole; at += kBlockSize) takeBlock(state, bytes + at);

  // What is left, one bit, zeros, and the length in bits as the last eight bytes of a block.
  constexpr std::size_t kLengthSize = 8;
  std::array<unsigned char, 2 * kBlockSize> tail{};
  const std::size_t left = content.size() - whole;
  if (left > 0) std::copy_n(bytes + whole, left, tail.begin());
  tail[left] = 0x80;
  const std::size_t tailSize = left + 1 + kLengthSize <= kBlockSize ? kBlockSize : 2 * kBlockSize;
  std::uint64_t bits = std::uint64_t{content.size()} * 8;
  for (std::size_t i = 1; i <= kLengthSize; ++i, bits >>= 8U)
    tail[tailSize - i] = static_cast<unsigned char>(bits & 0xffU);
  for (std::size_t at = 0; at < tailSize; at += kBlockSize) takeBlock(state, tail.data() + at);

  constexpr std::string_view kDigits = "0123456789abcdef";
  std::string digits;
  for (const std::uint32_t word : state)
    for (unsigned shift = 32; shift > 0; shift -= 4)
      digits += kDigits[(word >> (shift - 4)) & 0xfU];
  return digits;
}

}  // namespace deviceimage
