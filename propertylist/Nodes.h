#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "propertylist/Storage.h"
#include "propertylist/Value.h"

// The nodes behind values; see Storage.h. Those that begin with Own are made alone.
namespace propertylist {

struct Value::TextNode : storage::Node {
  TextNode(storage::Owner* o, std::string_view t) : Node(o), text(t) {}
  Text text;
};

struct Value::DataNode : storage::Node {
  DataNode(storage::Owner* o, Bytes b) : Node(o), data(std::move(b)) {}
  Bytes data;
};

struct Array::Node : storage::Node {
  Node(storage::Owner* o, const Value* f, std::size_t s) : storage::Node(o), first(f), size(s) {}
  const Value* first;
  std::size_t size;
  bool isShared = false;  // of an arena: its file refers to it more than once
};

struct Dictionary::Node : storage::Node {
  Node(storage::Owner* o, const Entry* f, std::size_t s) : storage::Node(o), first(f), size(s) {}
  const Entry* first;
  std::size_t size;
  bool isShared = false;  // of an arena: its file refers to it more than once
};

}  // namespace propertylist
