#include "platform/ClassicArchiveFormat.h"

#include <algorithm>

namespace platform::classicarchive {

const std::array<ClassDescription, classCount> classDescriptions{{
    {"NSObject", 0, std::nullopt},
    {"NSString", 1, Class::object},
    {"NSData", 0, Class::object},
    {"NSMutableData", 0, Class::data},
    {"NSArray", 0, Class::object},
    {"NSMutableArray", 0, Class::array},
    {"NSDictionary", 0, Class::object},
    {"NSMutableDictionary", 0, Class::dictionary},
    {"NSNumber", 0, Class::value},
    {"NSValue", 0, Class::object},
}};

const ClassDescription& description(Class archivedClass) {
  return classDescriptions[static_cast<size_t>(archivedClass)];
}

std::optional<Class> classNamed(std::string_view name) {
  for (size_t i = 0; i < classCount; ++i) {
    if (classDescriptions[i].name == name) {
      return static_cast<Class>(i);
    }
  }
  return std::nullopt;
}

std::string quoted(std::string_view bytes) {
  constexpr size_t longest = 40;
  constexpr std::string_view digits = "0123456789abcdef";
  std::string result = "\"";
  for (const char c : bytes.substr(0, longest)) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte >= 0x20 && byte < 0x7F && c != '"' && c != '\\') {
      result += c;
    } else {
      result += "\\x";
      result += digits[byte >> 4U];
      result += digits[byte & 0xFU];
    }
  }
  result += bytes.size() > longest ? "...\"" : "\"";
  return result;
}

std::optional<IntegerRange> integerRange(char code) {
  constexpr int64_t lowest = std::numeric_limits<int64_t>::min();
  constexpr int64_t highest = std::numeric_limits<int64_t>::max();
  constexpr int64_t two16 = int64_t{1} << 16U;
  constexpr int64_t two32 = int64_t{1} << 32U;
  switch (code) {
    case 's':
      return IntegerRange{-two16 / 2, two16 / 2 - 1, 0};
    case 'S':
      return IntegerRange{-two16 / 2, two16 - 1, two16};
    case 'i':
      return IntegerRange{-two32 / 2, two32 / 2 - 1, 0};
    case 'I':
      return IntegerRange{-two32 / 2, two32 - 1, two32};
    // A long has 32 bits where it is declared, but writers have put wider ones under its code;
    // those are not mistaken for anything else, so they may stay.
    case 'L':
      return IntegerRange{-two32 / 2, highest, two32};
    case 'l':
    case 'q':
    case 'Q':
      return IntegerRange{lowest, highest, 0};
    default:
      return std::nullopt;
  }
}

/// Goes over a type string once, with the brackets that are open on a list of its own.
class ScalarTypeParser {
 public:
  explicit ScalarTypeParser(std::string_view text) : _text(text) {}

  std::optional<ScalarType> parse(std::string& problem) {
    if (_text.size() > ScalarType::maximumLength) {
      problem = "type string too long";
      return std::nullopt;
    }
    _open.push_back({});
    while (_position < _text.size() && _problem.empty()) {
      _takeOne();
    }
    if (_problem.empty() && _open.size() > 1) {
      _problem = "unclosed bracket";
    }
    if (_problem.empty() && _open.front().typeCount != 1) {
      _problem = "not exactly one type";
    }
    if (!_problem.empty()) {
      problem = _problem + " in type string " + quoted(_text);
      return std::nullopt;
    }
    _type._scalarCount = _open.front().scalarCount;
    _type._isPlain = _text.size() == 1;
    return std::move(_type);
  }

 private:
  using Step = ScalarType::Step;

  /// An open bracket, or with kind 0 the outside of all.
  struct Open {
    char kind = 0;
    uint64_t repetitions = 1;
    size_t step = 0;
    size_t typeCount = 0;
    uint64_t scalarCount = 0;
  };

  void _takeOne() {
    const char code = _text[_position++];
    switch (code) {
      case '[':
        _openArray();
        return;
      case ']':
        _closeArray();
        return;
      case '{':
        _openStructure();
        return;
      case '}':
        if (_open.back().kind != '{') {
          _problem = "unexpected '}'";
          return;
        }
        _close(_open.back().scalarCount);
        return;
      case '@':
      case '#':
      case '+':
      case '*':
      case '%':
      case ':':
        _problem = "object or pointer code";
        return;
      default:
        _takeScalar(code);
    }
  }

  void _takeScalar(char code) {
    if (std::string_view("cCBfd").find(code) == std::string_view::npos && !integerRange(code)) {
      _problem = "unknown type code";
      return;
    }
    _type._steps.push_back({code, 1, 0});
    ++_open.back().typeCount;
    ++_open.back().scalarCount;
  }

  bool _mayOpen() {
    if (_open.size() > ScalarType::maximumNesting) {
      _problem = "brackets nested too deep";
      return false;
    }
    return true;
  }

  void _openArray() {
    if (!_mayOpen()) {
      return;
    }
    uint64_t count = 0;
    const size_t digits = _position;
    for (; _position < _text.size() && _text[_position] >= '0' && _text[_position] <= '9';
         ++_position) {
      count = count * 10 + static_cast<uint64_t>(_text[_position] - '0');
      if (count > largestCount) {
        _problem = "array too large";
        return;
      }
    }
    if (_position == digits) {
      _problem = "array without a length";
      return;
    }
    _open.push_back({'[', count, _type._steps.size(), 0, 0});
    _type._steps.push_back({'[', count, 0});
  }

  void _openStructure() {
    if (!_mayOpen()) {
      return;
    }
    const size_t nameEnd = _text.find_first_of("={}", _position);
    if (nameEnd == std::string_view::npos || _text[nameEnd] != '=') {
      _problem = "structure without fields";
      return;
    }
    _position = nameEnd + 1;
    _open.push_back({'{', 1, _type._steps.size(), 0, 0});
  }

  void _closeArray() {
    const Open array = _open.back();
    if (array.kind != '[' || array.typeCount != 1) {
      _problem = array.kind == '[' ? "array not of one type" : "unexpected ']'";
      return;
    }
    if (array.scalarCount > 0 && array.repetitions > largestCount / array.scalarCount) {
      _problem = "array too large";
      return;
    }
    std::vector<Step>& steps = _type._steps;
    const uint64_t total = array.repetitions * array.scalarCount;
    const size_t bodyLength = steps.size() - array.step - 1;
    if (total == 0) {
      steps.resize(array.step);
    } else if (array.repetitions == 1) {
      steps.erase(steps.begin() + static_cast<std::ptrdiff_t>(array.step));
    } else if (bodyLength == 1) {
      steps[array.step] = {steps.back().code, total, 0};
      steps.pop_back();
    } else {
      steps[array.step].bodyLength = bodyLength;
    }
    _close(total);
  }

  void _close(uint64_t scalarCount) {
    _open.pop_back();
    ++_open.back().typeCount;
    _open.back().scalarCount += scalarCount;
    // Both are at most largestCount, so the sum cannot have overflowed.
    if (_open.back().scalarCount > largestCount) {
      _problem = "too many values";
    }
  }

  /// More numbers than any archive holds, and far from the end of the integers.
  static constexpr uint64_t largestCount = uint64_t{1} << 48U;

  std::string_view _text;
  size_t _position = 0;
  std::vector<Open> _open;
  ScalarType _type;
  std::string _problem;
};

std::optional<ScalarType> ScalarType::parse(std::string_view text, std::string& problem) {
  return ScalarTypeParser(text).parse(problem);
}

void failArchive(const char* reason) {
  throw Exception(inconsistentArchiveException, std::string("classic archive: ") + reason);
}

namespace {

Value valueOfScalar(char code, const Scalar& scalar) {
  if (const auto* real = std::get_if<double>(&scalar)) {
    return *real;
  }
  const int64_t integer = std::get<int64_t>(scalar);
  if ((code == 'c' || code == 'B') && (integer == 0 || integer == 1)) {
    return integer == 1;
  }
  return code == 'Q' ? Value(static_cast<uint64_t>(integer)) : Value(integer);
}

}  // namespace

Value valueOfScalars(const ScalarType& type, const std::vector<Scalar>& scalars) {
  Value::Array values;
  values.reserve(scalars.size());
  type.forEachScalar(
      [&](char code) { values.push_back(valueOfScalar(code, scalars[values.size()])); });
  return values.size() == 1 ? values.front() : Value(std::move(values));
}

}  // namespace platform::classicarchive
