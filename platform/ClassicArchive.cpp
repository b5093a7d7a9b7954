#include "platform/ClassicArchive.h"

#include <unordered_map>
#include <utility>

#include "platform/ClassicArchiveFormat.h"
#include "platform/Strings.h"

namespace platform {

namespace classicarchive {

namespace {

[[noreturn]] void failArgument(const char* reason) {
  throw Exception(invalidArgumentException, std::string("classic archive: ") + reason);
}

bool isDictionary(const ClassicArchive::Node& node) {
  return node.nodeClass == Class::dictionary || node.nodeClass == Class::mutableDictionary;
}

bool isContainer(const ClassicArchive::Node& node) {
  return isDictionary(node) || node.nodeClass == Class::array ||
         node.nodeClass == Class::mutableArray;
}

/// Builds values from the leaves up, so that each node of the graph becomes one value.
class ValueBuilder {
 public:
  explicit ValueBuilder(const ClassicArchive& archive)
      : _archive(archive), _values(archive.nodes.size()) {
    for (const ClassicArchive::Node& node : archive.nodes) {
      _keyBytesLeft += node.bytes.length();
    }
  }

  Value build(NodeIndex root) {
    for (const NodeIndex index : nodesChildrenFirst(_archive, {&root, 1})) {
      _values[index] = _build(_archive.nodes[index]);
    }
    return _values[root];
  }

 private:
  Value _build(const ClassicArchive::Node& node) {
    switch (node.nodeClass) {
      case Class::object:
        return Value::Dictionary();
      case Class::string:
        if (!isValidUTF8(node.bytes.view())) {
          failArchive(notUTF8);
        }
        return node.bytes.view();
      case Class::data:
      case Class::mutableData:
        return node.bytes;
      case Class::array:
      case Class::mutableArray:
        return _buildArray(node);
      case Class::dictionary:
      case Class::mutableDictionary:
        return _buildDictionary(node);
      case Class::number:
      case Class::value:
        return _buildScalars(node.scalars);
    }
    failArgument("unknown class");
  }

  const Value& _child(NodeIndex index) const {
    if (index == ClassicArchive::nil) {
      failArchive(nilInContainer);
    }
    return _values[index];
  }

  Value _buildArray(const ClassicArchive::Node& node) const {
    Value::Array array;
    array.reserve(node.children.size());
    for (const NodeIndex child : node.children) {
      array.push_back(_child(child));
    }
    return array;
  }

  Value _buildDictionary(const ClassicArchive::Node& node) {
    Value::Dictionary dictionary;
    for (size_t i = 0; i < node.children.size(); i += 2) {
      const std::string* key = _child(node.children[i]).stringIf();
      if (key == nullptr) {
        failArchive(keyIsNoString);
      }
      _payForKey(key->size());
      dictionary.insert_or_assign(*key, _child(node.children[i + 1]));
    }
    return dictionary;
  }

  Value _buildScalars(const ClassicArchive::Scalars& scalars) {
    const ScalarType& type = _type(scalars.typeCode);
    if (type.scalarCount() != scalars.values.size()) {
      failArgument("number that does not fit its type code");
    }
    return valueOfScalars(type, scalars.values);
  }

  const ScalarType& _type(const std::string& code) {
    const auto found = _types.find(code);
    if (found != _types.end()) {
      return found->second;
    }
    std::string problem;
    std::optional<ScalarType> type = ScalarType::parse(code, problem);
    if (!type) {
      failArgument("number of an unknown type code");
    }
    return _types.emplace(code, std::move(*type)).first->second;
  }

  void _payForKey(size_t length) {
    const size_t price = priceOfKey(length);
    if (price > _keyBytesLeft) {
      failArchive(multipliesKeys);
    }
    _keyBytesLeft -= price;
  }

  const ClassicArchive& _archive;
  std::vector<Value> _values;
  /// By type code; the strings belong to the archive.
  std::unordered_map<std::string_view, ScalarType> _types;
  size_t _keyBytesLeft = 0;
};

/// Walks over a value and gives each of its heap nodes one node of the graph.
class GraphBuilder {
 public:
  ClassicArchive build(const Value& root) {
    _archive.roots.push_back(_add(root));
    while (!_frames.empty()) {
      Frame& frame = _frames.back();
      if (frame.nextElement != frame.elementEnd) {
        const Value& element = *frame.nextElement++;
        _addTo(frame.node, element);
      } else if (frame.nextEntry != frame.entryEnd) {
        const auto& [key, value] = *frame.nextEntry++;
        const NodeIndex parent = frame.node;
        const NodeIndex keyNode = _newNode(Class::string);
        _archive.nodes[keyNode].bytes = Data::copy(key);
        _archive.nodes[parent].children.push_back(keyNode);
        _addTo(parent, value);
      } else {
        _frames.pop_back();
      }
    }
    return std::move(_archive);
  }

 private:
  /// A container whose content is being added; one of the two ranges is empty.
  struct Frame {
    NodeIndex node;
    const Value* nextElement = nullptr;
    const Value* elementEnd = nullptr;
    Value::Dictionary::const_iterator nextEntry{};
    Value::Dictionary::const_iterator entryEnd{};
  };

  NodeIndex _newNode(Class nodeClass) {
    if (_archive.nodes.size() >= ClassicArchive::nil) {
      failArgument("too many objects");
    }
    _archive.nodes.emplace_back().nodeClass = nodeClass;
    return static_cast<NodeIndex>(_archive.nodes.size() - 1);
  }

  NodeIndex _newNumber(const char* code, Scalar scalar) {
    const NodeIndex index = _newNode(Class::number);
    _archive.nodes[index].scalars = {code, {scalar}};
    return index;
  }

  void _addTo(NodeIndex parent, const Value& value) {
    const NodeIndex child = _add(value);
    _archive.nodes[parent].children.push_back(child);
  }

  NodeIndex _add(const Value& value) {
    if (value.identity() != nullptr) {
      const auto found = _nodeOfIdentity.find(value.identity());
      if (found != _nodeOfIdentity.end()) {
        return found->second;
      }
    }
    const NodeIndex index = _addNew(value);
    if (value.identity() != nullptr) {
      _nodeOfIdentity.emplace(value.identity(), index);
    }
    return index;
  }

  NodeIndex _addNew(const Value& value) {
    switch (value.kind()) {
      case Value::Kind::boolean:
        return _newNumber("c", int64_t{value.boolValue()});
      case Value::Kind::integer:
        return value.isAboveSignedRange()
                   ? _newNumber("Q", static_cast<int64_t>(value.unsignedValue()))
                   : _newNumber("q", value.integerValue());
      case Value::Kind::real:
        return _newNumber("d", value.doubleValue());
      case Value::Kind::string: {
        const NodeIndex index = _newNode(Class::string);
        _archive.nodes[index].bytes = Data::copy(*value.stringIf());
        return index;
      }
      case Value::Kind::data: {
        const NodeIndex index = _newNode(Class::data);
        _archive.nodes[index].bytes = *value.dataIf();
        return index;
      }
      case Value::Kind::array: {
        const NodeIndex index = _newNode(Class::array);
        const Value::Array& array = *value.arrayIf();
        _archive.nodes[index].children.reserve(array.size());
        _frames.push_back({index, array.data(), array.data() + array.size(), {}, {}});
        return index;
      }
      case Value::Kind::dictionary: {
        const NodeIndex index = _newNode(Class::dictionary);
        const Value::Dictionary& dictionary = *value.dictionaryIf();
        _archive.nodes[index].children.reserve(2 * dictionary.size());
        _frames.push_back({index, nullptr, nullptr, dictionary.begin(), dictionary.end()});
        return index;
      }
      case Value::Kind::absent:
        failArgument("absent value");
      case Value::Kind::date:
      case Value::Kind::uid:
      case Value::Kind::url:
        break;
    }
    failArgument("value of a kind that has no class");
  }

  ClassicArchive _archive;
  std::unordered_map<const void*, NodeIndex> _nodeOfIdentity;
  std::vector<Frame> _frames;
};

}  // namespace

std::vector<NodeIndex> nodesChildrenFirst(const ClassicArchive& archive,
                                          std::span<const NodeIndex> roots) {
  enum class State : uint8_t { unseen, open, done };
  struct Frame {
    NodeIndex node;
    size_t next;
  };
  std::vector<State> states(archive.nodes.size(), State::unseen);
  std::vector<Frame> frames;
  std::vector<NodeIndex> order;
  const auto enter = [&](NodeIndex index) {
    if (index == ClassicArchive::nil) {
      return;
    }
    if (index >= archive.nodes.size()) {
      failArgument("position of a node out of range");
    }
    if (states[index] == State::open) {
      failArgument("object that contains itself");
    }
    if (states[index] == State::done) {
      return;
    }
    const ClassicArchive::Node& node = archive.nodes[index];
    if (isDictionary(node) && node.children.size() % 2 != 0) {
      failArgument("dictionary with a key that lacks its value");
    }
    if (!isContainer(node) && !node.children.empty()) {
      failArgument("children of an object that is no container");
    }
    states[index] = State::open;
    frames.push_back({index, 0});
  };
  for (const NodeIndex root : roots) {
    enter(root);
    while (!frames.empty()) {
      Frame& frame = frames.back();
      const std::vector<NodeIndex>& children = archive.nodes[frame.node].children;
      if (frame.next < children.size()) {
        enter(children[frame.next++]);
        continue;
      }
      states[frame.node] = State::done;
      order.push_back(frame.node);
      frames.pop_back();
    }
  }
  return order;
}

Value value(const ClassicArchive& archive, size_t root) {
  if (root >= archive.roots.size()) {
    throw Exception(rangeException, "classic archive: no such root");
  }
  const NodeIndex index = archive.roots[root];
  return index == ClassicArchive::nil ? Value() : ValueBuilder(archive).build(index);
}

ClassicArchive graph(const Value& value) { return GraphBuilder().build(value); }

}  // namespace classicarchive

ClassicUnarchiver::ClassicUnarchiver(Data data) : _data(std::move(data)) {}

void ClassicUnarchiver::setAllowedClassNames(std::vector<std::string> names) {
  _allowedClassNames = std::move(names);
}

Value ClassicUnarchiver::decodeRootObject() {
  using namespace classicarchive;
  ClassSet allowed = allClasses;
  if (_allowedClassNames) {
    allowed = 0;
    for (const std::string& name : *_allowedClassNames) {
      const std::optional<Class> named = classNamed(name);
      allowed |= named ? classSetOf(*named) : 0;
    }
  }
  return decodeValueAllowing(_data, allowed);
}

Data classicArchiveWithRootObject(const Value& value) {
  return classicarchive::encode(classicarchive::graph(value));
}

}  // namespace platform
