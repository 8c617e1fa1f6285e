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

// What the nodes of arrays and of dictionaries have in common.
template <typename Member>
struct ContainerNode : storage::Node {
  ContainerNode(storage::Owner* o, const Member* f, std::size_t s)
      : storage::Node(o), first(f), size(s & kMostMembers), isShared(false) {}
  void setSize(std::size_t s) { size = s & kMostMembers; }

  static constexpr std::size_t kMostMembers = ~std::size_t{0} >> 1U;
  const Member* first;
  std::size_t size : 63;
  bool isShared : 1;  // of an arena: its file refers to it more than once
};

struct Array::Node : ContainerNode<Value> {
  using ContainerNode::ContainerNode;
};

struct Dictionary::Node : ContainerNode<Dictionary::Entry> {
  using ContainerNode::ContainerNode;
};

}  // namespace propertylist
