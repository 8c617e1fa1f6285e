#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "propertylist/Value.h"

namespace fuzz {

// How much room a value has for all laws to be tried on it each time: values, counted at each place
// where they are shared, and bytes of text and data in units of 64.
inline constexpr std::size_t kRoom = 1000;

// What is left of `room` after the value; 0 when it is too large.
inline std::size_t roomLeft(const propertylist::Value& value, std::size_t room) {
  if (room == 0) return 0;
  --room;
  const auto take = [&room](std::size_t bytes) { room -= bytes / 64 < room ? bytes / 64 : room; };
  if (const propertylist::Array* const array = value.asArray()) {
    for (auto member = array->begin(); member != array->end() && room > 0; ++member)
      room = roomLeft(*member, room);
  } else if (const propertylist::Dictionary* const dictionary = value.asDictionary()) {
    for (auto entry = dictionary->begin(); entry != dictionary->end() && room > 0; ++entry) {
      take(entry->key().size());
      room = roomLeft(entry->value(), room);
    }
  } else if (const propertylist::Text* const text = value.asString()) {
    take(text->size());
  } else if (const propertylist::Bytes* const data = value.asData()) {
    take(data->size());
  }
  return room;
}

// Whether an input is of the share of which there is one in `share`. By its content, so that an
// input always gets the same laws.
inline bool isOneOf(std::uint32_t share, std::span<const std::uint8_t> input) {
  std::uint32_t hash = 2166136261;
  for (const std::uint8_t byte : input) hash = (hash ^ byte) * 16777619;
  return (hash ^ hash >> 16U) % share == 0;
}

// Whether all laws are tried on the value of an input. A few hundred bytes can stand for a million
// values, on which the laws take a second: they are tried on one of 256 of such inputs.
inline bool isChosen(const propertylist::Value& value, std::span<const std::uint8_t> input) {
  return roomLeft(value, kRoom) > 0 || isOneOf(256, input);
}

}  // namespace fuzz
