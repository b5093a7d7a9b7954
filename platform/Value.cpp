#include "platform/Value.h"

#include <atomic>
#include <cmath>
#include <cstring>
#include <limits>
#include <unordered_map>

namespace platform {

// Nodes count their references themselves, so that the last release can take a graph apart with a
// list threaded through the dead nodes: no recursion, no allocation.
struct Value::Node {
  explicit Node(Kind nodeKind) : kind(nodeKind) {}

  std::atomic<uint64_t> references{1};
  const Kind kind;
  Node* nextDead = nullptr;
};

struct Value::StringNode : Node {
  explicit StringNode(std::string text) : Node(Kind::string), content(std::move(text)) {}
  const std::string content;
};

struct Value::DataNode : Node {
  explicit DataNode(Data data) : Node(Kind::data), content(std::move(data)) {}
  const Data content;
};

struct Value::URLNode : Node {
  explicit URLNode(URL url) : Node(Kind::url), content(std::move(url)) {}
  const URL content;
};

struct Value::ArrayNode : Node {
  explicit ArrayNode(Array array) : Node(Kind::array), content(std::move(array)) {}
  Array content;
};

struct Value::DictionaryNode : Node {
  explicit DictionaryNode(Dictionary dictionary)
      : Node(Kind::dictionary), content(std::move(dictionary)) {}
  Dictionary content;
};

Date Date::fromTimePoint(std::chrono::system_clock::time_point time) {
  constexpr double referenceSinceEpoch = 978307200;
  const std::chrono::duration<double> sinceEpoch = time.time_since_epoch();
  return {sinceEpoch.count() - referenceSinceEpoch};
}

Value::Value(Kind kind, Node* node) noexcept : _kind(kind), _node(node) {}
Value::Value(bool boolean) noexcept : _kind(Kind::boolean), _boolean(boolean) {}
Value::Value(uint64_t bits, bool negative) noexcept
    : _kind(Kind::integer), _negative(negative), _bits(bits) {}
Value::Value(double real) noexcept : _kind(Kind::real), _real(real) {}
Value::Value(Date date) noexcept : _kind(Kind::date), _date(date) {}
Value::Value(UID uid) noexcept : _kind(Kind::uid), _uid(uid) {}
Value::Value(std::string string) : Value(Kind::string, new StringNode(std::move(string))) {}
Value::Value(std::string_view string) : Value(std::string(string)) {}
Value::Value(const char* string) : Value(std::string(string)) {}
Value::Value(Data data) : Value(Kind::data, new DataNode(std::move(data))) {}
Value::Value(URL url) : Value(Kind::url, new URLNode(std::move(url))) {}
Value::Value(Array array) : Value(Kind::array, new ArrayNode(std::move(array))) {}
Value::Value(Dictionary dictionary)
    : Value(Kind::dictionary, new DictionaryNode(std::move(dictionary))) {}

Value::Value(const Value& other) noexcept
    : _kind(other._kind), _negative(other._negative), _bits(0) {
  if (_hasNode()) {
    _node = other._node;
    _node->references.fetch_add(1, std::memory_order_relaxed);
    return;
  }
  switch (_kind) {
    case Kind::boolean:
      _boolean = other._boolean;
      break;
    case Kind::real:
      _real = other._real;
      break;
    case Kind::date:
      _date = other._date;
      break;
    case Kind::uid:
      _uid = other._uid;
      break;
    default:
      _bits = other._bits;
      break;
  }
}

Value::Value(Value&& other) noexcept { _swap(other); }

Value& Value::operator=(Value other) noexcept {
  _swap(other);
  return *this;
}

void Value::_swap(Value& other) noexcept {
  std::swap(_kind, other._kind);
  std::swap(_negative, other._negative);
  // Every member of the union is eight plain bytes or fewer.
  static_assert(sizeof(uint64_t) >= sizeof(void*) && sizeof(uint64_t) == sizeof(Date));
  uint64_t mine = 0;
  uint64_t theirs = 0;
  std::memcpy(&mine, &_bits, sizeof mine);
  std::memcpy(&theirs, &other._bits, sizeof theirs);
  std::memcpy(static_cast<void*>(&_bits), &theirs, sizeof theirs);
  std::memcpy(static_cast<void*>(&other._bits), &mine, sizeof mine);
}

Value::~Value() {
  if (_hasNode()) {
    _release(_node);
  }
}

void Value::_release(Node* node) noexcept {
  if (node->references.fetch_sub(1, std::memory_order_acq_rel) != 1) {
    return;
  }
  Node* dead = node;
  // Takes a child out of its dead container; the child dies too when that was its last reference.
  const auto detach = [&dead](Value& child) {
    if (!child._hasNode()) {
      return;
    }
    Node* childNode = child._node;
    child._kind = Kind::absent;
    if (childNode->references.fetch_sub(1, std::memory_order_acq_rel) == 1) {
      childNode->nextDead = dead;
      dead = childNode;
    }
  };
  while (dead != nullptr) {
    Node* current = dead;
    dead = current->nextDead;
    switch (current->kind) {
      case Kind::string:
        delete static_cast<StringNode*>(current);
        break;
      case Kind::data:
        delete static_cast<DataNode*>(current);
        break;
      case Kind::url:
        delete static_cast<URLNode*>(current);
        break;
      case Kind::array: {
        auto* array = static_cast<ArrayNode*>(current);
        for (Value& child : array->content) {
          detach(child);
        }
        delete array;
        break;
      }
      default: {
        auto* dictionary = static_cast<DictionaryNode*>(current);
        for (auto& entry : dictionary->content) {
          detach(entry.second);
        }
        delete dictionary;
        break;
      }
    }
  }
}

bool Value::boolValue() const noexcept {
  switch (_kind) {
    case Kind::boolean:
      return _boolean;
    case Kind::integer:
      return _bits != 0;
    case Kind::real:
      return _real != 0;
    default:
      return false;
  }
}

int64_t Value::integerValue() const noexcept {
  constexpr auto highest = std::numeric_limits<int64_t>::max();
  switch (_kind) {
    case Kind::boolean:
      return _boolean ? 1 : 0;
    case Kind::integer:
      return isAboveSignedRange() ? highest : static_cast<int64_t>(_bits);
    case Kind::real:
      if (std::isnan(_real)) {
        return 0;
      }
      if (_real >= 0x1p63) {
        return highest;
      }
      if (_real < -0x1p63) {
        return std::numeric_limits<int64_t>::min();
      }
      return static_cast<int64_t>(_real);
    default:
      return 0;
  }
}

uint64_t Value::unsignedValue() const noexcept {
  switch (_kind) {
    case Kind::boolean:
      return _boolean ? 1 : 0;
    case Kind::integer:
      return _negative ? 0 : _bits;
    case Kind::real:
      if (!(_real > 0)) {
        return 0;
      }
      return _real >= 0x1p64 ? std::numeric_limits<uint64_t>::max() : static_cast<uint64_t>(_real);
    default:
      return 0;
  }
}

double Value::doubleValue() const noexcept {
  switch (_kind) {
    case Kind::boolean:
      return _boolean ? 1 : 0;
    case Kind::integer:
      return _negative ? static_cast<double>(static_cast<int64_t>(_bits))
                       : static_cast<double>(_bits);
    case Kind::real:
      return _real;
    default:
      return 0;
  }
}

bool Value::isAboveSignedRange() const noexcept {
  return _kind == Kind::integer && !_negative && (_bits >> 63U) != 0;
}

const std::string* Value::stringIf() const noexcept {
  return _kind == Kind::string ? &static_cast<StringNode*>(_node)->content : nullptr;
}

const Data* Value::dataIf() const noexcept {
  return _kind == Kind::data ? &static_cast<DataNode*>(_node)->content : nullptr;
}

const URL* Value::urlIf() const noexcept {
  return _kind == Kind::url ? &static_cast<URLNode*>(_node)->content : nullptr;
}

const Value::Array* Value::arrayIf() const noexcept {
  return _kind == Kind::array ? &static_cast<ArrayNode*>(_node)->content : nullptr;
}

const Value::Dictionary* Value::dictionaryIf() const noexcept {
  return _kind == Kind::dictionary ? &static_cast<DictionaryNode*>(_node)->content : nullptr;
}

const Date* Value::dateIf() const noexcept { return _kind == Kind::date ? &_date : nullptr; }

const UID* Value::uidIf() const noexcept { return _kind == Kind::uid ? &_uid : nullptr; }

std::optional<std::string> Value::stringValue() const {
  const std::string* string = stringIf();
  return string == nullptr ? std::nullopt : std::optional<std::string>(*string);
}

const Value& Value::operator[](std::string_view key) const noexcept {
  static const Value nothing{};
  const Dictionary* dictionary = dictionaryIf();
  if (dictionary == nullptr) {
    return nothing;
  }
  const auto found = dictionary->find(key);
  return found == dictionary->end() ? nothing : found->second;
}

const void* Value::identity() const noexcept { return _hasNode() ? _node : nullptr; }

namespace {

bool sameReal(double a, double b) { return a == b || (std::isnan(a) && std::isnan(b)); }

/// Containers assumed equal so far, as classes of a union-find forest. Two containers that are
/// already in one class need not be compared again: either their comparison is under way, or it
/// was found without a difference. This makes the comparison of two graphs linear (Hopcroft and
/// Karp, "A linear algorithm for testing equivalence of finite automata", 1971).
class AssumedEqual {
 public:
  /// Joins the classes of both; false when they were one class before.
  bool join(const void* a, const void* b) {
    const void* rootA = _find(a);
    const void* rootB = _find(b);
    if (rootA == rootB) {
      return false;
    }
    _parents[rootA] = rootB;
    return true;
  }

 private:
  const void* _find(const void* node) {
    const void* root = node;
    for (auto next = _parents.find(root); next != _parents.end(); next = _parents.find(root)) {
      root = next->second;
    }
    while (node != root) {
      node = std::exchange(_parents[node], root);
    }
    return root;
  }

  std::unordered_map<const void*, const void*> _parents;
};

}  // namespace

struct ValueInternals {
  /// Everything but the content of containers.
  static bool sameShallow(const Value& a, const Value& b) {
    if (a._kind != b._kind) {
      return false;
    }
    switch (a._kind) {
      case Value::Kind::absent:
        return true;
      case Value::Kind::boolean:
        return a._boolean == b._boolean;
      case Value::Kind::integer:
        return a._bits == b._bits && a._negative == b._negative;
      case Value::Kind::real:
        return sameReal(a._real, b._real);
      case Value::Kind::date:
        return sameReal(a._date.secondsSinceReference, b._date.secondsSinceReference);
      case Value::Kind::uid:
        return a._uid == b._uid;
      case Value::Kind::string:
        return *a.stringIf() == *b.stringIf();
      case Value::Kind::data:
        return *a.dataIf() == *b.dataIf();
      case Value::Kind::url:
        return *a.urlIf() == *b.urlIf();
      case Value::Kind::array:
        return a.arrayIf()->size() == b.arrayIf()->size();
      case Value::Kind::dictionary:
        return a.dictionaryIf()->size() == b.dictionaryIf()->size();
    }
    return false;
  }
};

bool operator==(const Value& a, const Value& b) {
  if (!ValueInternals::sameShallow(a, b)) {
    return false;
  }
  if (a._kind != Value::Kind::array && a._kind != Value::Kind::dictionary) {
    return true;
  }
  AssumedEqual assumed;
  std::vector<std::pair<const Value*, const Value*>> pending;
  const auto visit = [&](const Value& left, const Value& right) {
    if (left.identity() != nullptr && left.identity() == right.identity()) {
      return true;
    }
    if (!ValueInternals::sameShallow(left, right)) {
      return false;
    }
    const bool container =
        left.kind() == Value::Kind::array || left.kind() == Value::Kind::dictionary;
    if (container && assumed.join(left.identity(), right.identity())) {
      pending.emplace_back(&left, &right);
    }
    return true;
  };
  if (!visit(a, b)) {
    return false;
  }
  while (!pending.empty()) {
    const auto pair = pending.back();
    pending.pop_back();
    if (const Value::Array* left = pair.first->arrayIf()) {
      const Value::Array& right = *pair.second->arrayIf();
      for (size_t i = 0; i < left->size(); ++i) {
        if (!visit((*left)[i], right[i])) {
          return false;
        }
      }
      continue;
    }
    const Value::Dictionary& left = *pair.first->dictionaryIf();
    const Value::Dictionary& right = *pair.second->dictionaryIf();
    for (auto l = left.begin(), r = right.begin(); l != left.end(); ++l, ++r) {
      if (l->first != r->first || !visit(l->second, r->second)) {
        return false;
      }
    }
  }
  return true;
}

}  // namespace platform
