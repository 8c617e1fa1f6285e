#pragma once

#include <cstdint>
#include <random>
#include <string>

#include "propertylist/Value.h"

// Values of every kind, nested a few levels, the same for the same seed everywhere.
class RandomValues {
 public:
  // What the values are to be written as: XML holds fewer characters and whole seconds only.
  enum class Form { binary, xml };

  RandomValues(std::uint64_t seed, Form form) : _random(seed), _form(form) {}
  propertylist::Value next() { return _value(0); }

 private:
  propertylist::Value _value(unsigned depth);
  propertylist::Value _leaf();
  propertylist::Value _integer();
  double _real();
  propertylist::Date _date();
  std::string _text();
  // A number below `end`.
  std::uint64_t _below(std::uint64_t end) { return _random() % end; }

  std::mt19937_64 _random;
  Form _form;
};
