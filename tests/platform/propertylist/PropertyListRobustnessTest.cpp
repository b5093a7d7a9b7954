// Random values through both forms, and samples damaged at every place. Under the sanitizers these
// show that no damage leads the readers out of their bytes.
#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "platform/PropertyList.h"
#include "platform/Strings.h"

namespace platform {
namespace {

// Random values without anything that either form refuses.
class RandomValues {
 public:
  explicit RandomValues(uint32_t seed) : _random(seed) {}

  Value value(size_t depth = 0) {
    const size_t kinds = depth < 5 ? 10 : 7;
    switch (_below(kinds)) {
      case 0:
        return _below(2) == 1;
      case 1:
        return static_cast<int64_t>(_bits());
      case 2:
        return _bits();
      case 3:
        return std::ldexp(static_cast<double>(static_cast<int64_t>(_bits())),
                          static_cast<int>(_below(200)) - 100);
      case 4:
        return Date{static_cast<double>(_below(2000000000)) - 1e9};
      case 5:
        return text();
      case 6:
        return Data::adopt(_bytes());
      case 7:
        return _known();
      case 8: {
        Value::Array elements;
        for (size_t i = _below(6); i-- > 0;) {
          elements.push_back(value(depth + 1));
        }
        return _keep(std::move(elements));
      }
      default: {
        Value::Dictionary entries;
        for (size_t i = _below(6); i-- > 0;) {
          entries.insert_or_assign(text(), value(depth + 1));
        }
        return _keep(std::move(entries));
      }
    }
  }

  std::string text() {
    static constexpr const char* parts[] = {"a",    "B",  " ",  "é", "ß",     "日本", "😀",
                                            "<&>'", "\n", "\r", "0", "]]>\t", "$",    "\u0085"};
    std::string result;
    for (size_t i = _below(20); i-- > 0;) {
      result += parts[_below(std::size(parts))];
    }
    return result;
  }

 private:
  size_t _below(size_t end) { return std::uniform_int_distribution<size_t>(0, end - 1)(_random); }

  // Numbers of every length.
  uint64_t _bits() { return std::uniform_int_distribution<uint64_t>()(_random) >> _below(64); }

  std::string _bytes() {
    std::string bytes(_below(40), '\0');
    for (char& byte : bytes) {
      byte = static_cast<char>(_below(256));
    }
    return bytes;
  }

  Value _keep(Value value) {
    _made.push_back(value);
    return value;
  }

  // A container once more, so that there is sharing.
  Value _known() { return _made.empty() ? Value("none") : _made[_below(_made.size())]; }

  std::mt19937 _random;
  std::vector<Value> _made;
};

TEST(PropertyListRobustness, randomValuesComeBackEqualInBothForms) {
  for (uint32_t seed = 0; seed < 1000; ++seed) {
    RandomValues random(seed);
    const Value value = Value::Array{random.value(), random.value(), random.value()};
    for (const PropertyListFormat format : {PropertyListFormat::binary, PropertyListFormat::xml}) {
      const Data data = dataFromPropertyList(value, format);
      Error error;
      const std::optional<Value> read = propertyListFromData(data, &error);
      ASSERT_TRUE(read) << "seed " << seed << ": " << error.description;
      ASSERT_EQ(*read, value) << "seed " << seed;
      ASSERT_EQ(dataFromPropertyList(*read, format), data) << "seed " << seed;
    }
  }
}

Value sample() {
  const Value shared = Value::Array{"shared", 300, -1, 1.5};
  return Value::Dictionary{{"array", Value::Array{shared, shared, true, UID{2}}},
                           {"bytes", Data::copy("some bytes that are longer than 15")},
                           {"date", Date{1000.0}},
                           {"text", "Grüße, 日本 😀 in UTF-16"},
                           {"dictionary", Value::Dictionary{{"a", 1}, {"b", shared}}}};
}

// Whatever is read from damaged bytes is either refused with a description or a value that can be
// walked whole.
void readDamaged(std::string bytes) {
  Error error;
  const std::optional<Value> value = propertyListFromData(Data::adopt(std::move(bytes)), &error);
  if (value) {
    EXPECT_EQ(*value, *value);
    EXPECT_NO_THROW(dataFromPropertyList(*value, PropertyListFormat::binary));
  } else {
    EXPECT_FALSE(error.description.empty());
    EXPECT_TRUE(isValidUTF8(error.description));
    EXPECT_LT(error.description.size(), 400U);
  }
}

class DamagedPropertyList : public ::testing::TestWithParam<PropertyListFormat> {
 protected:
  std::string _bytes{dataFromPropertyList(sample(), GetParam()).view()};
};

TEST_P(DamagedPropertyList, isRefusedWhereverItIsCut) {
  // The XML form is whole before its last line break.
  const size_t whole = GetParam() == PropertyListFormat::xml ? _bytes.size() - 1 : _bytes.size();
  for (size_t length = 0; length < whole; ++length) {
    EXPECT_FALSE(propertyListFromData(Data::copy(std::string_view(_bytes).substr(0, length))))
        << length;
  }
}

TEST_P(DamagedPropertyList, isReadOrRefusedWhateverBitIsFlipped) {
  for (size_t i = 0; i < _bytes.size(); ++i) {
    for (int bit = 0; bit < 8; ++bit) {
      std::string damaged = _bytes;
      damaged[i] = static_cast<char>(damaged[i] ^ (1 << bit));
      readDamaged(std::move(damaged));
    }
  }
}

TEST_P(DamagedPropertyList, isReadOrRefusedWhateverByteIsReplacedOrRemoved) {
  for (size_t i = 0; i < _bytes.size(); ++i) {
    for (const char byte : {'\0', '\x7F', '\x80', '\xFF', '<', '\xA1', '\xD1'}) {
      std::string damaged = _bytes;
      damaged[i] = byte;
      readDamaged(std::move(damaged));
    }
    std::string damaged = _bytes;
    damaged.erase(i, 1);
    readDamaged(std::move(damaged));
  }
}

INSTANTIATE_TEST_SUITE_P(Forms, DamagedPropertyList,
                         ::testing::Values(PropertyListFormat::binary, PropertyListFormat::xml),
                         [](const auto& form) {
                           return form.param == PropertyListFormat::binary ? "binary" : "xml";
                         });

}  // namespace
}  // namespace platform
